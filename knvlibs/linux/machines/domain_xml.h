// What libvirt's description of a running domain tells of its memory.
#ifndef KNVLIBS_LINUX_MACHINES_DOMAIN_XML_H_
#define KNVLIBS_LINUX_MACHINES_DOMAIN_XML_H_

#include <optional>
#include <string_view>
#include <vector>

#include "knvlibs/linux/machines/machine_memory.h"

namespace ksi {

struct DomainXml {
  std::optional<std::vector<MemoryModule>> modules;  // none if they are not understood
  Figure period;  // seconds between the questions for the guest's statistics
};

DomainXml ParseDomainXml(std::string_view xml);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_DOMAIN_XML_H_
