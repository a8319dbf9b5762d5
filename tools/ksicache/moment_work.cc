#include "tools/ksicache/moment_work.h"

namespace ksicache {

void MomentWork::Add(const ksi::Moment& moment) {
  constexpr uint64_t kEach = 256;  // that a reading, or an entry, is like
  for (const ksi::MomentReading& reading : moment.readings) {
    work_ += kEach * (1 + reading.answer.entries.size()) + reading.answer.record.size();
  }
}

bool MomentWork::IsTooMuch() const {
  constexpr uint64_t kTakenFast = 4;
  return work_ + file_.Taken() / kTakenFast > most_;
}

}  // namespace ksicache
