// info: what a cache file is, in a few lines.
#include <sys/stat.h>

#include <cerrno>

#include "knvlibs/cache_format.h"
#include "tools/ksicache/commands.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/reading_walk.h"

namespace ksicache {

int Info(const Options& options) {
  if (options.arguments.size() != 1) throw UsageError("info takes one file");
  const std::string& fileName = options.arguments[0];
  const std::unique_ptr<ksi::CacheFile> file = OpenCacheFile(fileName);
  struct stat status;
  if (stat(fileName.c_str(), &status) != 0) throw SystemError(fileName, errno);

  size_t values = 0;
  size_t lists = 0;
  size_t failures = 0;
  int64_t instances = 0;
  ForEachReading(*file, [&](const Reading& reading) {
    if (reading.status != ksi::kOk) {
      ++failures;
    } else if (reading.row != nullptr && reading.row->kind == ksi::Kind::kList) {
      ++lists;
      instances += reading.count;
    } else {
      ++values;
    }
  });

  const ksi::CacheFile::Capture& capture = file->GetCapture();
  const bool own = capture.signature == ksi::kDefinitions.signature;
  Print("host       " + Printable(capture.host) + "\n");
  Print("taken      " + capture.taken + "\n");
  Print("size       " + std::to_string(status.st_size) + " bytes, schema " +
        std::to_string(ksi::cache::kSchemaVersion) + "\n");
  Print("built      " + capture.built + "\n");
  Print("signature  " + capture.signature +
        (own ? "\n" : ", not " + std::string(ksi::kDefinitions.signature) + " of this version\n"));
  Print("values     " + std::to_string(values) + "\n");
  Print("lists      " + std::to_string(lists) + " of " + std::to_string(instances) +
        " instances\n");
  Print("failed     " + std::to_string(failures) + "\n");
  return 0;
}

}  // namespace ksicache
