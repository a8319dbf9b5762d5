// What a failure is worded with: data, so that a reader's messages stand beside each other.
#ifndef FRAMEWORK_COMPLAINT_H_
#define FRAMEWORK_COMPLAINT_H_

#include <cstdint>

#include "framework/status.h"

namespace tally {

// How a complaint tells the status.
enum class Style : uint8_t {
  silent,   // says nothing
  plain,    // "TEXT\n"
  code,     // "TEXT, error code: 3134980099\n"
  message,  // "TEXT: Not found\n"
  // sic: C9
  listNotMade,   // "The param list for TEXT could not be created: 0xbad0003"
  errorReading,  // "Error 0xbad0003 while reading TEXT"
};

struct Complaint {
  Style style = Style::silent;
  const char* text = "";

  // Passes a status on, a failure after its message.
  [[nodiscard]] Status Of(Status status) const {
    if (status != kSuccess) Say(status);
    return status;
  }

  void Say(Status status) const;
};

}  // namespace tally

#endif  // FRAMEWORK_COMPLAINT_H_
