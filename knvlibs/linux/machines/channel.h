// A conversation in lines.
#ifndef KNVLIBS_LINUX_MACHINES_CHANNEL_H_
#define KNVLIBS_LINUX_MACHINES_CHANNEL_H_

#include <string>
#include <string_view>

namespace ksi {

class Channel {
 public:
  Channel() = default;
  Channel(const Channel&) = delete;
  Channel& operator=(const Channel&) = delete;
  virtual ~Channel() = default;

  // False if the conversation is over.
  virtual bool Send(std::string_view line) = 0;
  virtual bool Receive(std::string& line) = 0;
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_CHANNEL_H_
