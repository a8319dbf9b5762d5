// Answers from a Linux host.
#ifndef KNVLIBS_LINUX_LINUX_SOURCE_H_
#define KNVLIBS_LINUX_LINUX_SOURCE_H_

#include <string_view>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/linux/reading_span.h"
#include "knvlibs/source.h"

namespace ksi {

class LinuxSource : public Source {
 public:
  explicit LinuxSource(std::string_view root,
                       LinuxHost::Clock clock = std::chrono::steady_clock::now)
      : host_(root, clock) {}

  [[nodiscard]] Status Value(const Node& node, const Keys& keys, Buffer record) override;
  [[nodiscard]] Status Instances(const Node& node, const Keys& keys, ParamList& instances) override;
  void Refresh() override { span_.End(); }

  [[nodiscard]] Status LossStatus() const override { return host_.LossStatus(); }

  // The library is built for the host it runs on: its own definitions are the kernel's.
  Definitions KernelDefinitions() const override { return kDefinitions; }

  const LinuxHost& Host() const { return host_; }

 private:
  template <class Read>
  Status Answer(ReadingSpan::Question question, const Keys& keys, Read&& read);
  template <class Operation>
  Status WithMemory(Operation&& operation);

  LinuxHost host_;
  ReadingSpan span_;
  bool isMemoryTold_ = false;  // that there was none, in this reading
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_LINUX_SOURCE_H_
