// What has been read of a host for one report: the parts that answer for many instances, so that a
// report's rows are of one moment, and what it costs and tells once.
#ifndef KNVLIBS_LINUX_READING_H_
#define KNVLIBS_LINUX_READING_H_

#include <chrono>
#include <functional>
#include <optional>
#include <set>
#include <string>

#include "knvlibs/linux/groups/groups.h"
#include "knvlibs/linux/heaps/heaps.h"
#include "knvlibs/linux/host/figure_file.h"
#include "knvlibs/linux/host/once.h"
#include "knvlibs/linux/host/walk_time.h"
#include "knvlibs/linux/machines/libvirt.h"
#include "knvlibs/linux/machines/qmp.h"
#include "knvlibs/linux/memory/buddyinfo.h"
#include "knvlibs/linux/memory/ksm.h"
#include "knvlibs/linux/memory/memory_nodes.h"
#include "knvlibs/linux/memory/pressure.h"
#include "knvlibs/linux/memory/zoneinfo.h"
#include "knvlibs/linux/pmem/nvdimm.h"

namespace ksi {

struct Reading {
  Once<FigureFile, FigureFile::ReadMeminfo> meminfo;
  Once<FigureFile, FigureFile::ReadVmstat> vmstat;
  Once<Zones, ReadZones> zones;
  Once<MemoryNodes, ReadMemoryNodes> memoryNodes;
  Once<Buddies, ReadBuddies> buddies;
  Once<Heaps, ReadHeaps> heaps;
  Once<NvdimmDevices, ReadNvdimmDevices> nvdimms;
  Once<Ksm, ReadKsm> ksm;
  Once<Pressure, ReadPressure> pressure;
  Once<HugetlbCharges, ReadHugetlbCharges> hugetlbCharges;
  Once<GroupTree, GroupTree::Read> groups;

  // What is left of the time that monitors may take.
  std::chrono::steady_clock::duration monitorTime = kMonitorTime;
  int heldLooks = kHeldLooks;

  // The machines of libvirt, once one was asked for.
  std::optional<LibvirtDomains> libvirt;

  // What is left of the processor's time that walks may take.
  std::chrono::nanoseconds walkTime = kWalkTime;

  // The first file that may not be read of those that a question takes.
  std::string denied;

  // What has been said (LinuxHost::First).
  std::set<std::string, std::less<>> told;
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_READING_H_
