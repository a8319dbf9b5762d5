// Opens a cache file, of one moment or of many, as a source.
#ifndef KNVLIBS_OPEN_CACHE_H_
#define KNVLIBS_OPEN_CACHE_H_

#include <cstdint>
#include <memory>
#include <optional>
#include <string>

#include "knvlibs/cache_file.h"
#include "knvlibs/recording/recording_file.h"
#include "knvlibs/source.h"
#include "knvlibs/status.h"

namespace ksi {

// A capture, or a recording with one of its moments.
struct OpenedCache {
  std::unique_ptr<CacheFile> capture;
  std::unique_ptr<RecordingFile> recording;
  int64_t number = 0;     // of the moment
  bool isMoment = false;  // one of many, or asked for by its time; told of what is not opened, too
  bool hasWhen = false;   // whether the name has a time
  bool isLast = false;    // whether the last moment is wanted
  std::string remark = {};            // what is to be said of the moment, if anything
  std::optional<int64_t> asked = {};  // the time that was asked for, us since 1970
};

// Opens what `name` says: a file, or "FILE@WHEN" (recording/when.h) if no file has the whole name;
// a recording without a time is its last moment. The statuses are those of CacheDatabase::Open, and
// KSI_STATUS_NOT_FOUND and KSI_STATUS_BAD_PARAM for a time that it does not have or that is none;
// `why` receives what is wrong, if there is more to say than the status does.
[[nodiscard]] Status OpenCache(const std::string& name, OpenedCache* opened, std::string* why);

// The same with the moment, if it is one of a recording. Somebody may be recording it meanwhile.
// Where the last one is wanted and damaged, as by a loss of power, this is the last one that is
// not, which the remark says.
[[nodiscard]] Status ReadCache(const std::string& name, OpenedCache* opened, ChunkReader* moment,
                               std::string* why);

// The same as a source; says by a diagnostic what is wrong with a recording, or with a time.
[[nodiscard]] Status OpenCacheSource(const char* name, std::unique_ptr<Source>* source);

}  // namespace ksi

#endif  // KNVLIBS_OPEN_CACHE_H_
