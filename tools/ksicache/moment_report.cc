#include "tools/ksicache/moment_report.h"

#include <array>
#include <string_view>

#include <knvlibs/ksi.h>
#include "knvlibs/status.h"

namespace ksicache {
namespace {

using tally::Column;
using tally::Status;
using tally::Text;

constexpr tally::ReportFrame kFrame = {.title = "MOMENTS", .ruleLength = 17, .options = "s:vq"};

struct MomentRow {
  std::string_view built;
};

constexpr Column<MomentRow> kColumns[] = {
    Text("built", "when the kernel's definitions were built",
         [](const MomentRow& row) { return row.built; }),
};
static_assert(tally::IsSound(kColumns));

Status Run(const tally::ReportOptions& options, tally::Sink& sink) {
  tally::ReportContext<MomentRow> context(kFrame, kColumns, sink);
  Status status = context.Settle(options);
  if (status != ksi::kOk) return status;
  std::array<char, KSI_BUILD_DATE_SIZE> built = {};
  const char* own = "";
  status = KSI_CheckSig(built.data(), built.size(), &own);
  if (status != ksi::kOk) return status;
  context.SelectColumns();
  context.Begin();
  context.PrintRow({built.data()});
  return ksi::kOk;
}

}  // namespace

const tally::Report kMomentReport = {.name = "moments",
                                     .frame = &kFrame,
                                     .variants = tally::kOnlyVariant<kColumns>,
                                     .run = Run,
                                     .entry = nullptr};

}  // namespace ksicache
