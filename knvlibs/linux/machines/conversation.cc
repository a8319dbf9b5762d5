#include "knvlibs/linux/machines/conversation.h"

namespace ksi {
namespace {

// Tells where a message ends, which a monitor may write on several lines.
class Brackets {
 public:
  // Whether all are closed after this line.
  bool AreClosedAfter(std::string_view line) {
    for (const char c : line) Take(c);
    return open_ <= 0;
  }

 private:
  void Take(char c) {
    if (isEscaped_) {
      isEscaped_ = false;
    } else if (isText_) {
      isEscaped_ = c == '\\';
      isText_ = c != '"';
    } else {
      isText_ = c == '"';
      if (c == '{' || c == '[') ++open_;
      if (c == '}' || c == ']') --open_;
    }
  }

  long open_ = 0;
  bool isText_ = false;
  bool isEscaped_ = false;
};

}  // namespace

std::optional<Json> Conversation::Receive() {
  if (++messages_ > kMostMessages) return std::nullopt;
  std::string message;
  std::string line;
  Brackets brackets;
  do {
    if (!channel_.Receive(line)) return std::nullopt;
    message += line;
    message += '\n';
  } while (!brackets.AreClosedAfter(line));
  return ParseJson(message);
}

std::optional<Json> Conversation::Ask(std::string_view command) {
  if (!channel_.Send(command)) return std::nullopt;
  for (;;) {
    std::optional<Json> answer = Receive();
    if (!answer || FindMember(&*answer, "return") != nullptr ||
        FindMember(&*answer, "error") != nullptr) {
      return answer;
    }
  }
}

bool Conversation::Begin() {
  const std::optional<Json> hello = Receive();
  return hello && FindMember(&*hello, "QMP") != nullptr &&
         Ask(R"({"execute":"qmp_capabilities"})").has_value();
}

}  // namespace ksi
