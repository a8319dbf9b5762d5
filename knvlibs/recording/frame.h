// Bytes that are compressed by zstd, with a check of what they were.
#ifndef KNVLIBS_RECORDING_FRAME_H_
#define KNVLIBS_RECORDING_FRAME_H_

#include "knvlibs/recording/bytes.h"
#include "knvlibs/status.h"

namespace ksi {

// The most that a frame may hold. The largest hosts take a part of it; what says that it holds more
// is damaged.
constexpr size_t kLargestFrame = size_t{64} << 20;

// Packs pieces, one after the other, that are together no larger than kLargestFrame. What is of one
// kind compresses best by itself, so each larger one has blocks of its own. Fails with
// std::bad_alloc, and with std::length_error.
Bytes Pack(std::span<const ByteView> pieces);

// The status is KSI_STATUS_METADATA_READ_ERROR if `packed` is no frame, not whole, or holds more
// than `most` bytes, which are no more than kLargestFrame.
[[nodiscard]] Status Unpack(ByteView packed, size_t most, Bytes& content);

}  // namespace ksi

#endif  // KNVLIBS_RECORDING_FRAME_H_
