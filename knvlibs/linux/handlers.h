// Which function answers which node on a Linux host: the functions, in the source file of the
// kernel interface they read, and the table.
#ifndef KNVLIBS_LINUX_HANDLERS_H_
#define KNVLIBS_LINUX_HANDLERS_H_

#include <cstdint>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/param_list.h"
#include "knvlibs/source.h"

namespace ksi {

using ValueHandler = Status (*)(const LinuxHost&, const Keys&, Buffer);
using ListHandler = Status (*)(const LinuxHost&, const Keys&, ParamList&);

// Either may be null: the node has none, or Linux has no answer yet.
struct Handlers {
  ValueHandler value = nullptr;
  ListHandler list = nullptr;
};

Handlers HandlersOf(uint16_t node);

// buddyinfo.cc
Status ListBuddies(const LinuxHost& host, const Keys& keys, ParamList& instances);
Status ReadBuddy(const LinuxHost& host, const Keys& keys, Buffer buffer);

// heaps.cc
Status ListHeaps(const LinuxHost& host, const Keys& keys, ParamList& instances);
Status ReadHeapStats(const LinuxHost& host, const Keys& keys, Buffer buffer);

// hugepages.cc
Status ReadPsharePool(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ListPools(const LinuxHost& host, const Keys& keys, ParamList& instances);
Status ReadPool(const LinuxHost& host, const Keys& keys, Buffer buffer);

// ksm.cc
Status ReadPshareStats(const LinuxHost& host, const Keys& keys, Buffer buffer);

// memory.cc
Status ReadComprehensive(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadGlobalTally(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadStateTransitions(const LinuxHost& host, const Keys& keys, Buffer buffer);

// memory_nodes.cc
Status ReadMemInfo(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadMemNode(const LinuxHost& host, const Keys& keys, Buffer buffer);

// nvdimm.cc
Status ListVolumes(const LinuxHost& host, const Keys& keys, ParamList& instances);
Status ReadVolume(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadRegionStore(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadIsClean(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ListRegions(const LinuxHost& host, const Keys& keys, ParamList& instances);
Status ReadRegion(const LinuxHost& host, const Keys& keys, Buffer buffer);

// group_records.cc
Status ReadGroupName(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadGroupTag(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadParentGroupID(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadGroupFlags(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadGroupLeaderID(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadGroupAllocation(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadGroupCapacity(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadGroupMemoryStats(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ListChildGroups(const LinuxHost& host, const Keys& keys, ParamList& instances);
Status ListGroupClients(const LinuxHost& host, const Keys& keys, ParamList& instances);

// user_world.cc
Status ReadCommonTally(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadUwTally(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ListRemapTypes(const LinuxHost& host, const Keys& keys, ParamList& instances);
Status ReadRemapType(const LinuxHost& host, const Keys& keys, Buffer buffer);

// virtual_machine.cc
Status ReadVmmTally(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadGuestTally(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadSwapInfo(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadMemzipInfo(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadVmLargePages(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadVmmLeaderID(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadNumVMs(const LinuxHost& host, const Keys& keys, Buffer buffer);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_HANDLERS_H_
