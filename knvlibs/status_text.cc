// The messages of the statuses, for whoever uses the library.
#pragma GCC visibility push(default)
#include <knvlibs/ksi.h>
#pragma GCC visibility pop

#include <algorithm>
#include <iterator>

#include <knvlibs/ksi_status_text.h>

namespace {

#define TEXT(row, message) message,
constexpr const char* kTexts[] = {KSI_STATUS_TEXTS(TEXT)};
#undef TEXT

#define ROW(row, message) row,
constexpr uint32_t kRows[] = {KSI_STATUS_TEXTS(ROW)};
#undef ROW
static_assert(std::ranges::all_of(kRows, [](const uint32_t& row) {
  return row == static_cast<uint32_t>(&row - kRows);
}));

}  // namespace

const char* KSI_StatusText(uint32_t status) { return KSI_FindStatusText(kTexts, status); }
