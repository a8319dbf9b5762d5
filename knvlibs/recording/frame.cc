#include "knvlibs/recording/frame.h"

#include <zstd.h>

#include <memory>
#include <new>

namespace ksi {
namespace {

// A higher level takes much more time and hardly less room.
constexpr int kLevel = 3;

struct FreeContext {
  void operator()(ZSTD_CCtx* context) const { ZSTD_freeCCtx(context); }
};

}  // namespace

Bytes Pack(ByteView content) {
  const std::unique_ptr<ZSTD_CCtx, FreeContext> context(ZSTD_createCCtx());
  if (context == nullptr) throw std::bad_alloc();
  ZSTD_CCtx_setParameter(context.get(), ZSTD_c_compressionLevel, kLevel);
  ZSTD_CCtx_setParameter(context.get(), ZSTD_c_checksumFlag, 1);
  Bytes packed(ZSTD_compressBound(content.size()));
  const size_t size =
      ZSTD_compress2(context.get(), packed.data(), packed.size(), content.data(), content.size());
  // There is room for it, so it is memory that is wanting.
  if (ZSTD_isError(size) != 0) throw std::bad_alloc();
  packed.resize(size);
  return packed;
}

Status Unpack(ByteView packed, Bytes& content) {
  const unsigned long long size = ZSTD_getFrameContentSize(packed.data(), packed.size());
  // So large are the two answers that are no size, too.
  if (size > kLargestFrame) return KSI_STATUS_METADATA_READ_ERROR;
  content.resize(size);
  const size_t got = ZSTD_decompress(content.data(), content.size(), packed.data(), packed.size());
  return got == size ? kOk : Status{KSI_STATUS_METADATA_READ_ERROR};
}

}  // namespace ksi
