// Answers from a Linux host.
#ifndef KNVLIBS_LINUX_LINUX_SOURCE_H_
#define KNVLIBS_LINUX_LINUX_SOURCE_H_

#include <string>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/source.h"

namespace ksi {

class LinuxSource : public Source {
 public:
  explicit LinuxSource(std::string root) : host_(std::move(root)) {}

  Status Value(const Node& node, const Keys& keys, Buffer record) override;
  Status Instances(const Node& node, const Keys& keys, ParamList& instances) override;

  // The library is built for the host it runs on: its own definitions are the kernel's.
  Definitions KernelDefinitions() const override { return kDefinitions; }

  const LinuxHost& Host() const { return host_; }

 private:
  LinuxHost host_;
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_LINUX_SOURCE_H_
