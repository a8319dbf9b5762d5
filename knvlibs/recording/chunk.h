// Some moments in a row, packed by what they have in common.
//
// Most of what is read of a host is as it was a moment ago, and most of the rest differs by little.
// So what is kept of a moment is what differs from the one before it. Moments that follow each
// other are kept together in a part, in which all that happened to one figure lies side by side,
// and the figures of one column too: so they compress best.
//
// A part that starts a chunk stands for itself. A part that continues one holds what differs from
// the moment before its first; a recorder writes such a part for each new moment, until a chunk's
// moments can be packed together. A part is
//
//   size of the first frame, 4 bytes, little-endian
//   frame: the index
//   frames: the nodes
//
// and the frames (frame.h) hold, in the terms of bytes.h:
//
//   index    1 if it starts a chunk, else 0
//            if it starts one, the host: the texts signature, built, name, boot; the number of
//              nodes, and of each the text path, 0 for a value and 1 for a list, the size of its
//              record, the number of its cells and of each the width times 2, plus 1 for a figure
//            the number of moments and of each, signed and as difference from the one before,
//              taken and uptime, then duration, cpu, skipped, loss, refused, failed
//            of each node the size of what happened to it: 0 if nothing did
//            of each further frame its size, as it is packed
//   nodes    what happened to each, the smallest first (of equals, the first node); a frame has as
//            many as are together no larger than kFrameSize, or one
//
// What happened to a node is the sizes of its eight streams and the streams:
//
//     events   of each moment with any: how many moments lie between it and the one before it; how
//              many readings went, and of each how many numbers lie between it and the one before
//              it; how many came, and of each the keys and the status; how many lists changed, and
//              of each the reading's number and the edit (list_edit.h)
//     first    the figures that came, column by column, signed
//     raw      the other cells that came, likewise, as they are
//     gaps     of each cell that changed: how many lie between it and the one before it
//     counts   of each cell that changed: how often, less 1
//     steps    of each change: how many moments lie between it and the cell's one before it
//     deltas   of each change: by how much, signed, modulo the cell's width; of each the first byte
//     more     and the bytes that follow it, which are distributed otherwise
//
// The readings of a node are numbered as they come, from 0 in each chunk. A list comes empty. Cells
// are ordered by their place in the record, then by the number of the reading; readings that had
// gone before the part have none, and those that failed.
//
// So who wants a few nodes unpacks these, and a day is read moment by moment at the cost of what
// happened in it.
#ifndef KNVLIBS_RECORDING_CHUNK_H_
#define KNVLIBS_RECORDING_CHUNK_H_

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <span>
#include <vector>

#include "knvlibs/recording/bytes.h"
#include "knvlibs/recording/moment.h"

namespace ksi::chunk {

// The most moments of a part, and of a chunk.
constexpr size_t kMostMoments = 4096;

// The most readings that a chunk numbers, and entries that its lists have together at a moment:
// those of the largest hosts, many times over.
constexpr size_t kMostReadings = size_t{1} << 20;
constexpr size_t kMostEntries = size_t{1} << 20;

// The bytes of the size of the first frame.
constexpr size_t kPrefixSize = 4;

// In so large a frame nothing is won by another node.
constexpr size_t kFrameSize = size_t{16} << 10;

enum Stream { kEvents, kFirst, kRaw, kGaps, kCounts, kSteps, kDeltas, kMore, kStreams };

inline uint64_t BitsOf(const RecordCell& cell, const Bytes& record) {
  uint64_t bits = 0;
  std::memcpy(&bits, record.data() + cell.offset, cell.width);
  return bits;
}

// The bits as a number that is small where its amount is.
inline int64_t SignedOf(uint64_t bits, const RecordCell& cell) {
  const unsigned unused = 64 - 8 * unsigned{cell.width};
  return static_cast<int64_t>(bits << unused) >> unused;
}

// Sums and differences that wrap around.
inline int64_t Plus(int64_t a, int64_t b) {
  return static_cast<int64_t>(static_cast<uint64_t>(a) + static_cast<uint64_t>(b));
}
inline int64_t Minus(int64_t a, int64_t b) {
  return static_cast<int64_t>(static_cast<uint64_t>(a) - static_cast<uint64_t>(b));
}

// The nodes of each frame of a part, by the sizes of what happened to them.
std::vector<std::vector<size_t>> FramesOf(std::span<const uint64_t> sizes);

}  // namespace ksi::chunk

#endif  // KNVLIBS_RECORDING_CHUNK_H_
