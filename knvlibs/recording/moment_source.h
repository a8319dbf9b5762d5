// Answers from one moment of a recording.
#ifndef KNVLIBS_RECORDING_MOMENT_SOURCE_H_
#define KNVLIBS_RECORDING_MOMENT_SOURCE_H_

#include <array>
#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "knvlibs/list_walk.h"
#include "knvlibs/recording/chunk_reader.h"
#include "knvlibs/source.h"

namespace ksi {

class MomentSource : public Source {
 public:
  // `moment` has taken the parts up to it; the file's name is for messages.
  MomentSource(std::string fileName, ChunkReader moment);

  // A key that the moment does not have is KSI_STATUS_NOT_FOUND; a read that failed when it was
  // recorded fails with its status again. What is damaged is told, once.
  [[nodiscard]] Status Value(const Node& node, const Keys& keys, Buffer record) override;
  [[nodiscard]] Status Instances(const Node& node, const Keys& keys, ParamList& instances) override;
  void Refresh() override { walk_.Restart(); }
  [[nodiscard]] Status WalkStatus() const override { return walk_.WalkStatus(); }
  Definitions KernelDefinitions() const override {
    return {moment_.Host().signature, moment_.Host().built};
  }

 private:
  [[nodiscard]] Status Find(const Node& node, Kind kind, const Keys& keys, ChunkReader::View& view);
  [[nodiscard]] Status Damaged(const Node& node);

  std::string fileName_;
  ChunkReader moment_;
  ListWalk walk_;
  bool told_ = false;
  NodePlaces places_;
  // Of each node of the moment the readings by their keys, once they have been asked for.
  std::vector<std::optional<std::vector<size_t>>> readings_;
};

}  // namespace ksi

#endif  // KNVLIBS_RECORDING_MOMENT_SOURCE_H_
