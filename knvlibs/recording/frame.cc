#include "knvlibs/recording/frame.h"

#include <zstd.h>

#include <algorithm>
#include <memory>
#include <new>
#include <stdexcept>

namespace ksi {
namespace {

// A higher level takes much more time and hardly less room.
constexpr int kLevel = 3;

// What differs from moment to moment hardly repeats: shorter matches are chance, and cost more than
// they save.
constexpr int kShortestMatch = 7;

// A smaller piece costs more as a block of its own.
constexpr size_t kSmallestBlock = 1024;

struct FreeContext {
  void operator()(ZSTD_CCtx* context) const { ZSTD_freeCCtx(context); }
};

}  // namespace

Bytes Pack(std::span<const ByteView> pieces) {
  size_t size = 0;
  for (const ByteView piece : pieces) size += piece.size();
  if (size > kLargestFrame) throw std::length_error("more than a frame holds");
  const std::unique_ptr<ZSTD_CCtx, FreeContext> context(ZSTD_createCCtx());
  if (context == nullptr) throw std::bad_alloc();
  ZSTD_CCtx_setParameter(context.get(), ZSTD_c_compressionLevel, kLevel);
  ZSTD_CCtx_setParameter(context.get(), ZSTD_c_minMatch, kShortestMatch);
  ZSTD_CCtx_setParameter(context.get(), ZSTD_c_checksumFlag, 1);
  ZSTD_CCtx_setPledgedSrcSize(context.get(), size);

  constexpr size_t kBlockHead = 3;
  Bytes packed(ZSTD_compressBound(size) + 2 * kBlockHead * (pieces.size() + 1));
  ZSTD_outBuffer out = {packed.data(), packed.size(), 0};
  const auto put = [&](ByteView piece, ZSTD_EndDirective directive) {
    ZSTD_inBuffer in = {piece.data(), piece.size(), 0};
    // There is room for it, so it is memory that is wanting.
    if (ZSTD_compressStream2(context.get(), &out, &in, directive) != 0 &&
        directive != ZSTD_e_continue) {
      throw std::bad_alloc();
    }
  };
  for (const ByteView piece : pieces) {
    const bool isLarge = piece.size() >= kSmallestBlock;
    if (isLarge) put({}, ZSTD_e_flush);
    put(piece, isLarge ? ZSTD_e_flush : ZSTD_e_continue);
  }
  put({}, ZSTD_e_end);
  packed.resize(out.pos);
  return packed;
}

Status Unpack(ByteView packed, size_t most, Bytes& content) {
  const unsigned long long size = ZSTD_getFrameContentSize(packed.data(), packed.size());
  // So large are the two answers that are no size, too.
  if (size > std::min(most, kLargestFrame)) return KSI_STATUS_METADATA_READ_ERROR;
  content.resize(size);
  const size_t got = ZSTD_decompress(content.data(), content.size(), packed.data(), packed.size());
  return got == size ? kOk : Status{KSI_STATUS_METADATA_READ_ERROR};
}

}  // namespace ksi
