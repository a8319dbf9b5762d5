// Answers from one moment of a recording.
#ifndef KNVLIBS_RECORDING_MOMENT_SOURCE_H_
#define KNVLIBS_RECORDING_MOMENT_SOURCE_H_

#include <string>
#include <vector>

#include "knvlibs/list_walk.h"
#include "knvlibs/recording/moment.h"
#include "knvlibs/source.h"

namespace ksi {

class MomentSource : public Source {
 public:
  explicit MomentSource(Moment moment);

  // A key that the moment does not have is KSI_STATUS_NOT_FOUND; a read that failed when it was
  // recorded fails with its status again.
  [[nodiscard]] Status Value(const Node& node, const Keys& keys, Buffer record) override;
  [[nodiscard]] Status Instances(const Node& node, const Keys& keys, ParamList& instances) override;
  void Refresh() override { walk_.Restart(); }
  [[nodiscard]] Status WalkStatus() const override { return walk_.WalkStatus(); }
  Definitions KernelDefinitions() const override {
    return {moment_.host.signature, moment_.host.built};
  }

 private:
  const Answer* Find(const Node& node, Kind kind, const Keys& keys) const;

  Moment moment_;  // its readings in their order
  ListWalk walk_;
  // The places that the nodes of the catalogue have among those of the moment, by kind.
  std::vector<uint32_t> places_[2];
};

}  // namespace ksi

#endif  // KNVLIBS_RECORDING_MOMENT_SOURCE_H_
