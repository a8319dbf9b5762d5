// A conversation with a QEMU monitor, in JSON (QMP). Only questions are sent, nothing that changes
// anything.
#ifndef KNVLIBS_LINUX_MACHINES_CONVERSATION_H_
#define KNVLIBS_LINUX_MACHINES_CONVERSATION_H_

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "knvlibs/json.h"
#include "knvlibs/linux/machines/channel.h"

namespace ksi {

class Conversation {
 public:
  // Events of a busy guest may stand between answers, but no more of them.
  static constexpr size_t kMostMessages = 256;

  explicit Conversation(Channel& channel) : channel_(channel) {}

  // Whether the monitor greets and takes questions.
  bool Begin();

  // Sends a command; the answer is what comes back that is no event.
  std::optional<Json> Ask(std::string_view command);

 private:
  std::optional<Json> Receive();

  Channel& channel_;
  size_t messages_ = 0;
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_CONVERSATION_H_
