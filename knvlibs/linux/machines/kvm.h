// Which processes run virtual machines with KVM, whatever program they are: they hold a descriptor
// of the kind that the kernel hands out for a machine.
#ifndef KNVLIBS_LINUX_MACHINES_KVM_H_
#define KNVLIBS_LINUX_MACHINES_KVM_H_

#include <cstdint>
#include <optional>
#include <set>

#include "knvlibs/linux/groups/process.h"
#include "knvlibs/linux/host/host.h"

namespace ksi {

// Whether a process holds the descriptor of a machine; none if its descriptors may not be read, or
// are more than anybody means to have.
std::optional<bool> HoldsMachine(const LinuxHost& host, const Process& process);

// Looks for them among the processes of one scan.
class KvmSearch {
 public:
  // All descriptors that are looked at where the kernel does not list its machines: some ten
  // milliseconds.
  static constexpr uint64_t kMostDescriptors = 32'768;

  KvmSearch() = default;  // finds none
  explicit KvmSearch(const LinuxHost& host);

  // Whether a process runs a machine. That not all can be looked at is told once.
  bool IsMachine(const LinuxHost& host, const Process& process);

  // Whether none can have been missed.
  bool IsWhole() const { return isWhole_; }

 private:
  enum class By : uint8_t { kNothing, kList, kDescriptors };

  bool FindList(const LinuxHost& host);
  void Miss(const LinuxHost& host);

  By by_ = By::kNothing;
  std::set<int32_t> listed_;
  uint64_t left_ = kMostDescriptors;
  bool isWhole_ = true;
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_KVM_H_
