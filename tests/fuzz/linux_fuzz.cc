// Kernel files through the Linux readers. An input is one file or more, parted by bytes of 0xff:
// the first byte of each chooses the file of a recorded host that it stands in the place of, the
// rest is its content.
#include <algorithm>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <set>
#include <string>
#include <string_view>

#include "knvlibs/linux/linux_source.h"
#include "tests/fuzz/node_walk.h"
#include "tests/fuzz/scratch_directory.h"
#include "tests/fuzz/target.h"

namespace {

struct HostFile {
  std::string_view host;
  std::string_view file;
  std::string_view nodes;  // the path of those that it tells of
};

constexpr std::string_view kNew = "kvm-two-nodes";
constexpr std::string_view kOld = "cgroup-v1-vm";
constexpr std::string_view kPlain = "systemd-server";
constexpr std::string_view kMachine =
    "sys/fs/cgroup/machine.slice/machine-qemu\\x2d1\\x2dweb.scope/";

// In the order of the letters that choose them, from 'A' on: seeds depend on it.
constexpr HostFile kFiles[] = {
    {kNew, "proc/meminfo", "memory/"},
    {kNew, "proc/zoneinfo", "memory/"},
    {kNew, "proc/buddyinfo", "system/buddy"},
    {kNew, "proc/slabinfo", "system/heaps"},
    {kNew, "proc/iomem", "memory/"},
    {kNew, "proc/vmstat", "sched/globalStats"},
    {kNew, "proc/2100/status", "sched/"},
    {kNew, "proc/2100/cmdline", "sched/memClients"},
    {kNew, "proc/2100/smaps", "sched/memClients"},
    {kNew, "proc/2100/ksm_stat", "sched/"},
    {kNew, "proc/2100/limits", "sched/"},
    {kNew, "sys/kernel/mm/ksm/pages_shared", "sched/"},
    {kNew, "run/libvirt/qemu/web.monitor", "sched/memClients"},
    {kNew, "cgroup.procs", "sched/"},
    {kNew, "memory.stat", "sched/"},
    {kNew, "memory.max", "sched/groups"},
    {kNew, "sys/devices/system/node/has_memory", "memory/"},
    {kNew, "sys/bus/nd/devices/region0/size", "memory/pmem"},
    {kNew, "sys/bus/nd/devices/namespace0.0/uuid", "memory/pmem"},
    {kNew, "sys/bus/nd/devices/namespace0.0/holder", "memory/pmem"},
    {kNew, "sys/bus/nd/devices/namespace0.0/mode", "memory/pmem"},
    {kNew, "sys/kernel/mm/ksm/pages_sharing", "memory/pshare"},
    {kOld, "proc/903/cgroup", "sched/"},
    {kOld, "sys/fs/cgroup/memory/agents/memory.stat", "sched/"},
    {kOld, "sys/fs/cgroup/memory/agents/cgroup.procs", "sched/"},
    {kOld, "proc/903/status", "sched/"},
    {kPlain, "sys/kernel/slab/dentry/objects", "system/heaps"},
    {kPlain, "sys/kernel/slab/dentry/order", "system/heaps"},
};

class Hosts {
 public:
  Hosts() {
    for (const std::string_view host : {kNew, kOld, kPlain}) {
      std::filesystem::copy(std::string(TALLY_HOSTS_DIRECTORY "/").append(host), Root(host),
                            std::filesystem::copy_options::recursive);
    }
  }

  std::string Root(std::string_view host) const {
    return directory_.Path() + "/" + std::string(host);
  }

  std::string PathOf(const HostFile& file) const {
    const bool ofMachine = file.file.find('/') == std::string_view::npos;
    std::string path = Root(file.host) + "/";
    if (ofMachine) path += kMachine;
    return path.append(file.file);
  }

 private:
  fuzz::ScratchDirectory directory_;
};

// A file with another content as long as this lives.
class Replaced {
 public:
  Replaced(std::string path, std::string_view content) : path_(std::move(path)) {
    std::ifstream stream(path_, std::ios::binary);
    existed_ = stream.good();
    original_.assign(std::istreambuf_iterator<char>(stream), {});
    fuzz::WriteFile(path_, content);
  }
  ~Replaced() {
    if (existed_) {
      fuzz::WriteFile(path_, original_);
    } else {
      std::filesystem::remove(path_);
    }
  }
  Replaced(const Replaced&) = delete;
  Replaced& operator=(const Replaced&) = delete;

 private:
  std::string path_;
  bool existed_ = false;
  std::string original_;
};

void ReadWith(const Hosts& hosts, std::string_view input,
              std::set<std::pair<std::string_view, std::string_view>>* parts) {
  if (input.empty()) {
    for (const auto& [host, nodes] : *parts) {
      ksi::LinuxSource source(hosts.Root(host));
      fuzz::ReadAllNodes(source, nodes);
    }
    return;
  }
  const size_t end = std::min(input.find('\xff'), input.size());
  const std::string_view rest = input.substr(std::min(end + 1, input.size()));
  if (end == 0) return ReadWith(hosts, rest, parts);
  const auto choice = static_cast<uint8_t>(input[0] - 'A');
  const HostFile& file = kFiles[choice % std::size(kFiles)];
  parts->emplace(file.host, file.nodes);
  const Replaced replaced(hosts.PathOf(file), input.substr(1, end - 1));
  ReadWith(hosts, rest, parts);
}

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  static const Hosts hosts;
  // As deep as there are files to replace.
  if (std::count(data, data + size, 0xff) > 8) return 0;
  std::set<std::pair<std::string_view, std::string_view>> parts;
  ReadWith(hosts, {reinterpret_cast<const char*>(data), size}, &parts);
  return 0;
}
