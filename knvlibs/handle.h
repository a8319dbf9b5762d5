// A source as the interface hands it out: with a lock, because any thread may ask it.
#ifndef KNVLIBS_HANDLE_H_
#define KNVLIBS_HANDLE_H_

#include <memory>
#include <mutex>
#include <utility>

#if __has_include(<sys/single_threaded.h>)
#include <sys/single_threaded.h>
#endif

#include "knvlibs/source.h"

namespace ksi {

// Holds a mutex, unless the process has one thread: then there is nobody to wait for, and nobody
// comes while the library works, because it starts none.
class Lock {
 public:
  explicit Lock(std::mutex& mutex) {
    if (!IsAlone()) held_ = std::unique_lock(mutex);
  }

 private:
  static bool IsAlone() {
#if __has_include(<sys/single_threaded.h>)
    return __libc_single_threaded != 0;
#else
    return false;
#endif
  }

  std::unique_lock<std::mutex> held_;
};

}  // namespace ksi

// The type behind the opaque handle of the interface.
struct KSI_Source {
 public:
  explicit KSI_Source(std::unique_ptr<ksi::Source> source) : source_(std::move(source)) {}

  // Asks the source, and nobody else does meanwhile.
  template <class Question>
  decltype(auto) Ask(Question&& question) {
    const ksi::Lock lock(mutex_);
    return question(*source_);
  }

  // Answers from another source from now on.
  void Become(std::unique_ptr<ksi::Source> source) {
    const ksi::Lock lock(mutex_);
    source_.swap(source);
  }

 private:
  std::mutex mutex_;
  std::unique_ptr<ksi::Source> source_;
};

#endif  // KNVLIBS_HANDLE_H_
