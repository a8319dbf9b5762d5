// Answers from one moment of a recording.
#ifndef KNVLIBS_RECORDING_MOMENT_SOURCE_H_
#define KNVLIBS_RECORDING_MOMENT_SOURCE_H_

#include <cstdint>
#include <memory>
#include <optional>
#include <string>

#include "knvlibs/list_walk.h"
#include "knvlibs/recording/chunk_reader.h"
#include "knvlibs/recording/recording_file.h"
#include "knvlibs/source.h"

namespace ksi {

class MomentSource : public Source {
 public:
  // `moment` is that with the number of the recording; the file's name is for messages.
  MomentSource(std::string fileName, std::unique_ptr<RecordingFile> recording, int64_t number,
               ChunkReader moment);

  // A key that the moment does not have is KSI_STATUS_NOT_FOUND; a read that failed when it was
  // recorded fails with its status again. What is damaged is told, once.
  [[nodiscard]] Status Value(const Node& node, const Keys& keys, Buffer record) override;
  [[nodiscard]] Status Instances(const Node& node, const Keys& keys, ParamList& instances) override;
  std::optional<Origin> GetOrigin() const override {
    return Origin{moment_.Host().name, moment_.Facts().taken};
  }
  // What is the same in many moments takes no room in its file: after more answers than a file of
  // its size has there are no moments any more, which is told.
  [[nodiscard]] Status NextMoment() override;
  void Refresh() override { walk_.Restart(); }
  [[nodiscard]] Status WalkStatus() const override { return walk_.WalkStatus(); }
  Definitions KernelDefinitions() const override {
    return {moment_.Host().signature, moment_.Host().built};
  }

 private:
  [[nodiscard]] Status Find(const Node& node, Kind kind, const Keys& keys, NodeReader::View& view);
  [[nodiscard]] Status Damaged(const Node& node);

  std::string fileName_;
  std::unique_ptr<RecordingFile> recording_;
  int64_t number_;
  ChunkReader moment_;
  ListWalk walk_;
  bool told_ = false;
  uint64_t answers_ = 0;  // and entries of lists, of all moments so far
  bool isExhausted_ = false;
  NodePlaces places_;
};

}  // namespace ksi

#endif  // KNVLIBS_RECORDING_MOMENT_SOURCE_H_
