// What a QEMU process's command line tells of its virtual machine.
#ifndef KNVLIBS_LINUX_MACHINES_QEMU_COMMAND_LINE_H_
#define KNVLIBS_LINUX_MACHINES_QEMU_COMMAND_LINE_H_

#include <cstdint>
#include <string>
#include <vector>

#include "knvlibs/linux/host/figure.h"

namespace ksi {

struct QemuCommandLine {
  std::string name;  // -name; may be empty
  // KB.
  Figure memory;     // what the machine starts with, -m, and the modules plugged in
  Figure maxMemory;  // with all modules it has room for, maxmem=
  // The sizes of the blocks that this memory is made of, in KB.
  std::vector<Figure> blocks;
  std::string monitor;  // path of the socket that answers QMP; may be empty
  // QEMU makes its machine only when that socket has had its first client.
  bool waitsForClient = false;
  bool hasBalloon = false;
  std::string balloon;  // id of the balloon device; may be empty
};

// Whether this command line is that of QEMU running a whole machine.
bool IsQemu(const std::vector<std::string>& words);

QemuCommandLine ParseQemuCommandLine(const std::vector<std::string>& words);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_QEMU_COMMAND_LINE_H_
