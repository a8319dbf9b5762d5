#include "knvlibs/linux/reading_span.h"

namespace ksi {
namespace {

constexpr std::chrono::seconds kPause{1};
constexpr std::chrono::minutes kLongest{1};

std::string TextOf(const Keys& keys) {
  std::string text;
  for (size_t i = 0; i < keys.count; ++i) {
    text +=
        keys[i].kind == KeyKind::kText ? std::string(keys[i].text) : std::to_string(keys[i].number);
    text += '\0';
  }
  return text;
}

}  // namespace

bool ReadingSpan::GoesOn(Question question, const Keys& keys, TimePoint now) const {
  if (!answered_ || now - *answered_ > kPause || now - began_ > kLongest) return false;
  const bool comesRoundAgain =
      now - began_ > kPause && question == first_ && TextOf(keys) == firstKeys_;
  return !comesRoundAgain;
}

bool ReadingSpan::Begins(Question question, const Keys& keys, TimePoint now) {
  if (GoesOn(question, keys, now)) return false;
  first_ = question;
  firstKeys_ = TextOf(keys);
  answered_.reset();
  return true;
}

void ReadingSpan::Answered(TimePoint now) {
  if (!answered_) began_ = now;
  answered_ = now;
}

}  // namespace ksi
