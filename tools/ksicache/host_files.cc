#include "tools/ksicache/host_files.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <string_view>

#include "knvlibs/linux/host/host_root.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/output.h"

namespace ksicache {
namespace {

// The start of a small file of a recorded host, empty if it is none. It may be whatever somebody
// left there: a pipe, or a link to where nothing is to be read.
std::string StartOf(const std::string& root, std::string_view path) {
  const std::string fileName = root + std::string(path);
  const ksi::HostRoot host(root);
  const ksi::FileDescriptor file = host.Open(path, O_RDONLY | O_NONBLOCK);
  if (!file.IsOpen() && (errno == ENOENT || errno == ENOTDIR || errno == ENXIO)) {
    if (host.LeadsOut(path)) throw Error(fileName + ": leads out of the recorded tree");
    return "";
  }
  struct stat info = {};
  if (!file.IsOpen() || fstat(file.Get(), &info) != 0) throw SystemError(fileName, errno);
  if (!S_ISREG(info.st_mode)) return "";
  std::array<char, 256> text;
  const ssize_t size = read(file.Get(), text.data(), text.size());
  if (size < 0) throw SystemError(fileName, errno);
  return {text.data(), static_cast<size_t>(size)};
}

// The text up to the end of the first line.
std::string LineOf(std::string text) {
  text.resize(std::min(text.size(), text.find_first_of(std::string_view("\n\0", 2))));
  return text;
}

}  // namespace

std::string HostName(const std::string* root, bool& isRead) {
  std::array<char, 256> own = {};
  std::string name;
  isRead = true;
  if (root != nullptr) {
    try {
      name = StartOf(*root, "/proc/sys/kernel/hostname");
    } catch (const Error& error) {
      PrintError(error.what());
      isRead = false;
    }
  } else if (gethostname(own.data(), own.size() - 1) == 0) {
    name = own.data();
  }
  name = LineOf(name);
  return name.empty() ? "unknown" : name;
}

void CheckRoot(const std::string& root) {
  if (access((root + "/proc/meminfo").c_str(), F_OK) == 0) return;
  if (errno != ENOENT && errno != ENOTDIR) throw SystemError(root, errno);
  throw Error(root + ": is not the root of a Linux host: it has no proc/meminfo");
}

std::string BootOf(const std::string* root) {
  try {
    return LineOf(StartOf(root == nullptr ? "/" : *root, "/proc/sys/kernel/random/boot_id"));
  } catch (const Error&) {
    return "";
  }
}

}  // namespace ksicache
