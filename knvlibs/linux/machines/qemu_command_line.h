// What a QEMU process's command line tells of its virtual machine.
#ifndef KNVLIBS_LINUX_MACHINES_QEMU_COMMAND_LINE_H_
#define KNVLIBS_LINUX_MACHINES_QEMU_COMMAND_LINE_H_

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "knvlibs/linux/host/figure.h"
#include "knvlibs/linux/machines/machine_memory.h"

namespace ksi {

struct QemuCommandLine {
  std::string name;          // -name; may be empty
  std::string uuid;          // -uuid; may be empty
  MachineMemory memory;      // that the machine starts with: -m, and the modules that are named
  Figure maxMemory;          // with all modules it has room for, maxmem=, in KB
  std::string monitor;       // path of the socket that answers QMP; may be empty
  bool isOfLibvirt = false;  // libvirt has started it, and holds its monitor
  // QEMU makes its machine only when that socket has had its first client.
  bool waitsForClient = false;
  bool hasSpares = false;  // memory backends that the machine may have no use for
  bool hasBalloon = false;
  std::string balloon;          // id of the balloon device; may be empty
  std::optional<bool> usesKvm;  // none if the command line does not tell

  // Whether the machine may have other memory than it started with.
  bool MayChange() const;
  // Whether what memory it has, and nothing else that may be taken for it, is told here.
  bool TellsMemory() const { return memory.base && !MayChange() && !hasSpares; }
};

// Whether this command line is that of QEMU running a whole machine.
bool IsQemu(const std::vector<std::string>& words);

QemuCommandLine ParseQemuCommandLine(const std::vector<std::string>& words);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_QEMU_COMMAND_LINE_H_
