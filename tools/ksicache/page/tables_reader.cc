#include "tools/ksicache/page/tables_reader.h"

#include <algorithm>
#include <optional>
#include <utility>

#include "reports/reports.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/page/memory_rows.h"
#include "tools/ksicache/page/packing.h"
#include "tools/ksicache/page/report_rows.h"
#include "tools/ksicache/page/roles.h"
#include "tools/ksicache/progress.h"

namespace ksicache {
namespace {

// Ends the reading of moments when all that is wanted has been read.
struct Enough {};

class Reader {
 public:
  Reader(const Survey& survey, const WantedMoments& wanted, PageTexts& texts, const Names& names,
         Problems& problems)
      : survey_(survey), wanted_(wanted), names_(names), problems_(problems) {
    const TableStream empty(texts);
    tables_.full.streams = std::vector<TableStream>(tally::Reports().size() + 1, empty);
    tables_.points.streams = std::vector<TableStream>(1, empty);
  }

  // A moment of the survey, which the library answers from.
  void Read(size_t place, const Origin& origin) {
    if (std::ranges::binary_search(wanted_.points, place)) ReadPoint(place, origin);
    if (std::ranges::binary_search(wanted_.full, place)) ReadFull(place, origin);
  }

  size_t Full() const { return tables_.full.moments.size(); }
  size_t SizeOfFull() const { return packedFull_.Size(); }

  PageTables Finish(bool isTooMuch) {
    tables_.full.bytes = packedFull_.Finish();
    tables_.points.bytes = packedPoints_.Finish();
    tables_.isTooMuch = isTooMuch;
    return std::move(tables_);
  }

 private:
  void ReadPoint(size_t place, const Origin& origin) {
    std::string bytes;
    Put(*tally::FindReport(roles::kHostReport), origin, tables_.points.streams[0], bytes);
    packedPoints_.Put(bytes);
    tables_.points.moments.push_back(place);
  }

  void ReadFull(size_t place, const Origin& origin) {
    const auto reports = tally::Reports();
    std::string bytes;
    for (size_t i = 0; i < reports.size(); ++i) {
      Put(*reports[i], origin, tables_.full.streams[i], bytes);
    }
    PutMemoryRows(origin, survey_.hasReboots, tables_.full.streams.back(), bytes, names_,
                  problems_);
    // The first one in place of one that cannot be read.
    if (tables_.full.moments.empty() || place == wanted_.told) Keep(place);
    packedFull_.Put(bytes);
    tables_.full.moments.push_back(place);
  }

  void Keep(size_t place) {
    tables_.told = place;
    for (TableStream& stream : tables_.full.streams) stream.Keep();
  }

  void Put(const tally::Report& report, const Origin& origin, TableStream& stream,
           std::string& bytes) {
    const bool isWhole = GiveRows(report, origin, {}, stream, problems_);
    stream.End(isWhole, bytes);
  }

  const Survey& survey_;
  const WantedMoments& wanted_;
  const Names& names_;
  Problems& problems_;
  PageTables tables_;
  Packer packedFull_;
  Packer packedPoints_;
};

}  // namespace

PageTables ReadTables(const std::string& name, const Survey& survey, const WantedMoments& wanted,
                      size_t fewest, size_t room, PageTexts& texts, const Names& names,
                      Problems& problems) {
  Reader reader(survey, wanted, texts, names, problems);
  Progress progress("reading");
  bool isTooMuch = false;
  size_t next = 0;
  try {
    ForEachMoment(name, [&](const Origin& origin) {
      const std::optional<size_t> place = survey.Find(origin.taken, next);
      if (!place) return;
      next = *place + 1;
      progress.Show(next, survey.moments.size());
      problems.At(origin.taken);
      reader.Read(*place, origin);
      isTooMuch = reader.Full() >= fewest && reader.SizeOfFull() > room;
      // Moments that were added meanwhile are not the page's.
      if (isTooMuch || next == survey.moments.size()) throw Enough();
    });
  } catch (const Enough&) {
  } catch (const DataError& error) {
    problems.At(std::nullopt);
    problems.Add(error.what());
  }
  return reader.Finish(isTooMuch);
}

}  // namespace ksicache
