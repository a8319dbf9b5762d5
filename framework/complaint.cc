#include "framework/complaint.h"

#include <knvlibs/ksi.h>
#include "framework/return_status.h"

namespace tally {

void Complaint::Say(Status status) const {
  switch (style) {
    case Style::silent:
      break;
    case Style::plain:
      Warning("%s\n", text);
      break;
    case Style::code:
      Warning("%s, error code: %u\n", text, status);
      break;
    case Style::message:
      Warning("%s: %s\n", text, KNV_ReturnStatusToString(status));
      break;
    case Style::listNotMade:
      Warning("The param list for %s could not be created: %#x", text, status);
      break;
    case Style::errorReading:
      Warning("Error %#x while reading %s", status, text);
      break;
  }
}

}  // namespace tally
