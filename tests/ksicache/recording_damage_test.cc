// Recordings that are damaged, or that somebody made to do harm: each ends with a status, in
// bounded memory and time.
//
// FULL_SWEEP=1 in the environment flips 100,000 bits instead of some.
#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <random>
#include <span>
#include <string>
#include <vector>

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_status.h>
#include "knvlibs/recording/frame.h"
#include "knvlibs/times.h"
#include "tests/knvlibs/host_tree.h"
#include "tests/ksicache/recording_fixture.h"
#include "tests/ksicache/write_log.h"
#include "tools/ksicache/error.h"

namespace ksi {
namespace {

using ksicache::Recorder;
using ksicache::RecordingStore;
using Part = RecordingFile::Part;

constexpr size_t kPage = 4096;

// Reads all moments of a recording, and tries to go on with it, whatever becomes of that.
void Use(const std::string& name) {
  auto database = std::make_unique<CacheDatabase>();
  std::unique_ptr<RecordingFile> file;
  if (database->Open(name.c_str()) != kOk || database->Version() != cache::kRecordingVersion ||
      RecordingFile::Make(std::move(database), &file) != kOk) {
    return;
  }
  for (const Part& part : file->Parts()) {
    std::vector<MomentFacts> facts;
    HostIdentity host;
    Moment moment;
    ChunkReader reader;
    static_cast<void>(file->ReadFacts(part, facts));
    static_cast<void>(file->ReadHost(part, host));
    static_cast<void>(file->ReadWhole(part.number, reader, moment));
    static_cast<void>(file->ReadWhole(part.End() - 1, reader, moment, part.number));
    int64_t number = 0;
    static_cast<void>(file->FindMoment(part.first, number));
  }
}

class RecordingDamage : public RecordingTest {
 protected:
  // Some moments that are packed, and some that are not.
  RecordingDamage() {
    MakeEmpty(file_);
    RecordingStore store(file_, kUnbounded);
    Recorder recorder(store);
    for (int64_t i = 0; i < 10; ++i) {
      moments_.push_back(NoiseAt(i));
      // As the recorded host is called with which it is gone on.
      moments_.back().host = Host("unknown");
      recorder.Add(moments_.back().host, moments_.back().facts, moments_.back().readings);
      if (i == 6) recorder.Pack();
    }
    content_ = FileContent(file_);
  }

  // The pages that are not as in an empty recording, and the first ones.
  std::vector<size_t> PagesInUse() const {
    const Bytes empty = RecordingStore::Empty("h");
    std::vector<size_t> pages;
    for (size_t at = 0; at < content_.size(); at += kPage) {
      if (at < 3 * kPage || at >= empty.size() ||
          std::memcmp(content_.data() + at, empty.data() + at, kPage) != 0) {
        pages.push_back(at);
      }
    }
    return pages;
  }

  // Expects the file to be found damaged after this change of its owner, and nothing worse.
  void ExpectDamaged(const std::string& sql) {
    SCOPED_TRACE(sql);
    WriteContent(file_, content_);
    RunSql(file_, sql);
    const harness::Result check = Run({"check", file_});
    EXPECT_EQ(check.status, 1);
    EXPECT_NE((check.out + check.err).find("damaged: "), std::string::npos)
        << check.out << check.err;
    for (const char* command : {"dump", "moments", "info"}) {
      const int status = Run({command, file_}).status;
      EXPECT_TRUE(status == 0 || status == 1) << command << ": " << status;
    }
    ExpectBounded([this] { Use(file_); });
  }

  std::vector<Moment> moments_;
  const std::string file_ = Path("r.ksi");
  std::string content_;
};

TEST_F(RecordingDamage, TruncatedAtEachPage) {
  size_t refused = 0;
  for (size_t size = 0; size < content_.size(); size += kPage) {
    SCOPED_TRACE(size);
    WriteContent(file_, content_.substr(0, size));
    const harness::Result check = Run({"check", file_});
    ASSERT_TRUE(check.status == 0 || check.status == 1) << check.status;
    if (check.status == 1) ++refused;
    ASSERT_NO_FATAL_FAILURE(ExpectBounded([this] { Use(file_); }));
  }
  // Also where the pages that are gone are of free blocks.
  EXPECT_EQ(refused, content_.size() / kPage);
}

TEST_F(RecordingDamage, FlippedBits) {
  const std::vector<size_t> pages = PagesInUse();
  const int flips = std::getenv("FULL_SWEEP") == nullptr ? 600 : 100'000;
  constexpr int kAtOnce = 200;
  for (int i = 0; i < flips; i += kAtOnce) {
    SCOPED_TRACE("seed " + std::to_string(i));
    ASSERT_NO_FATAL_FAILURE(ExpectBounded([&] {
      std::mt19937 random(static_cast<uint32_t>(i));
      const Image image(content_);
      for (int n = 0; n < kAtOnce; ++n) {
        const size_t at = pages[random() % pages.size()] + random() % kPage;
        const auto flipped = static_cast<char>(content_[at] ^ 1 << random() % 8);
        image.Apply({static_cast<off_t>(at), std::string(1, flipped)});
        Use(image.Name());
        image.Apply({static_cast<off_t>(at), std::string(1, content_[at])});
      }
    }));
  }
}

TEST_F(RecordingDamage, RowsThatLie) {
  const std::string ofFirst = " WHERE id = (SELECT id FROM part WHERE moments > 1)";
  for (const char* change : {"number = -5",
                             "number = 140737488355328",
                             "chunk = -1",
                             "chunk = number + 1",
                             "moments = 4097",
                             "moments = 9223372036854775807",
                             "size = 0",
                             "size = -1",
                             "size = 67108865",
                             "size = 9223372036854775807",
                             "size = 3",
                             "block = 0",
                             "block = -7",
                             "block = 1099511627776",
                             "first = last + 1",
                             "first = first + 1",
                             "moments = moments + 1",
                             "moments = moments - 1",
                             "size = size - 1",
                             "size = size * 2",
                             "block = block + 1",
                             "size = 67108864"}) {
    ExpectDamaged(std::string("UPDATE part SET ") + change + ofFirst);
  }
  ExpectDamaged("UPDATE part SET moments = 0 WHERE number = 0");  // what follows has no start
  ExpectDamaged("DELETE FROM block");
  ExpectDamaged("UPDATE block SET data = zeroblob(100)");
  ExpectDamaged("UPDATE block SET data = zeroblob(9000)");
  ExpectDamaged("UPDATE block SET data = zeroblob(4572)");
  ExpectDamaged("UPDATE block SET data = 'text'");
  ExpectDamaged(
      "UPDATE part SET id = id + 9223372036854700000 WHERE id > 3; UPDATE part SET size = "
      "size + 1" +
      ofFirst);
}

// Blocks that lead to themselves, of a part that is as large as parts are.
TEST_F(RecordingDamage, BlocksInACircle) {
  ExpectDamaged(
      "UPDATE part SET size = 67108864, block = 1; "
      "UPDATE block SET data = cast(x'01000000' || zeroblob(4568) AS BLOB)");
}

TEST_F(RecordingDamage, NumbersThatOverlapAreThereOnce) {
  RunSql(file_, "UPDATE part SET number = 7 WHERE moments = 1");
  ExpectBounded([this] { Use(file_); });
  const std::unique_ptr<RecordingFile> file = OpenFile(file_);
  ASSERT_NE(file, nullptr);
  EXPECT_EQ(file->Parts().size(), 2u);
}

// What zeros are packed into is small; how large they are is known before.
TEST_F(RecordingDamage, FramesOfZeros) {
  const Bytes zeros(kLargestFrame);
  const ByteView pieces[] = {zeros};
  for (const uint32_t more : {0u, 1u}) {
    SCOPED_TRACE(more);
    Bytes frame = Pack(pieces);
    ASSERT_LT(frame.size(), 100'000u);
    // The head has the size of what is packed.
    uint32_t size = kLargestFrame;
    const auto head = std::as_bytes(std::span(&size, 1));
    const auto found = std::search(frame.begin(), frame.begin() + 16, head.begin(), head.end());
    ASSERT_NE(found, frame.begin() + 16);
    size += more;
    std::ranges::copy(head, found);
    Bytes part(4);
    const auto frameSize = static_cast<uint32_t>(frame.size());
    std::memcpy(part.data(), &frameSize, sizeof frameSize);
    for (int i = 0; i < 2; ++i) part.insert(part.end(), frame.begin(), frame.end());
    WriteContent(file_, content_);
    RecordingStore(file_, kUnbounded).Add({0, 1, 1000, 1000, 0, 0, 0, 0}, part);
    ExpectBounded([this] { Use(file_); });
    const harness::Result check = Run({"check", file_});
    EXPECT_EQ(check.status, 1);
    EXPECT_EQ(check.out, file_ +
                             "@1970-01-01T00:00:00Z: damaged: the part of "
                             "1970-01-01T00:00:00Z is damaged\n");
  }
}

TEST_F(RecordingDamage, CheckNamesTheMoment) {
  const std::unique_ptr<RecordingFile> file = OpenFile(file_);
  ASSERT_NE(file, nullptr);
  const Part last = file->Parts().back();
  RunSql(file_, "UPDATE block SET data = zeroblob(4572) WHERE id = " + std::to_string(last.block));
  const std::string time = TextOfTime(last.first);
  const harness::Result check = Run({"check", file_});
  EXPECT_EQ(check.status, 1);
  EXPECT_NE(check.out.find(file_ + "@" + time + ": damaged: the part of " + time + " is damaged\n"),
            std::string::npos)
      << check.out;
  // The moments before it are as they were, and recording goes on.
  std::vector<Moment> before(moments_.end() - 3, moments_.end() - 1);
  ExpectMoments(*OpenFile(file_), before, static_cast<int64_t>(moments_.size()) - 3);
  const harness::Result result = Run(
      {"record", "--root", RecordedHost("systemd-server"), "--every", "1s", "--count", "1", file_});
  EXPECT_EQ(result.status, 0);
  EXPECT_EQ(result.err, "ksicache: " + file_ + ": its last moments are damaged, and stay so: 1\n");
  Output({"dump", file_});
}

// Of the last parts what a loss of power leaves: the first of them is there and not what it was.
TEST_F(RecordingDamage, TheLastMomentIsTheLastOneThatCanBeRead) {
  const std::vector<Part> parts = OpenFile(file_)->Parts();
  ASSERT_EQ(parts.size(), 4u);
  const auto zero = [this](const Part& part, const char* data) {
    RunSql(file_, std::string("UPDATE block SET data = ") + data +
                      " WHERE id = " + std::to_string(part.block));
  };
  // A frame behind the index that cannot be unpacked, and nothing at all.
  for (const char* data : {"zeroblob(4572)",
                           "cast(substr(data, 1, 1500) || zeroblob(100) || substr(data, 1601) AS "
                           "BLOB)"}) {
    for (const size_t from : {3u, 2u, 1u, 0u}) {
      SCOPED_TRACE(data + std::to_string(from));
      WriteContent(file_, content_);
      zero(parts[from], data);
      const harness::Result result = Run({"dump", file_});
      if (from == 0) {
        EXPECT_EQ(result.status, 1);
        continue;
      }
      const std::string time = TextOfTime(parts[from - 1].last);
      EXPECT_EQ(result.status, 0);
      EXPECT_EQ(result.err, "ksicache: " + file_ +
                                ": its last moments are damaged; this is the one of " + time +
                                "\n");
      EXPECT_EQ(result.out, Output({"dump", file_ + "@" + time}));
      const harness::Result moments = Run({"moments", file_ + "@last"});
      EXPECT_NE(moments.out.find("\n" + time + " "), std::string::npos) << moments.out;
      KSI_Source* source = nullptr;
      int64_t taken = 0;
      ASSERT_EQ(KSI_OpenCache(file_.c_str(), &source), 0U);
      EXPECT_EQ(KSI_SourceOrigin(source, &taken, nullptr, 0), 0U);
      EXPECT_EQ(taken, parts[from - 1].last);
      KSI_CloseSource(source);
      // One that is asked for by its time is not another one.
      EXPECT_EQ(Run({"dump", file_ + "@" + TextOfTime(parts[from].last)}).status, 1);
    }
  }
}

// What continues a damaged part is lost with it, and said with it.
TEST_F(RecordingDamage, WhatIsLostIsSaid) {
  const std::vector<Part> parts = OpenFile(file_)->Parts();
  RunSql(
      file_,
      "UPDATE block SET data = cast(substr(data, 1, 1500) || zeroblob(100) || substr(data, 1601) "
      "AS BLOB) WHERE id = " +
          std::to_string(parts[1].block));
  const std::string first = TextOfTime(parts[1].first);
  const std::string why = ": damaged: the part of " + first + " is damaged: 3 moments of " + first +
                          " to " + TextOfTime(parts[3].last) + " cannot be read\n";
  const harness::Result check = Run({"check", file_});
  EXPECT_EQ(check.status, 1);
  EXPECT_NE(check.out.find(file_ + "@" + first + why), std::string::npos) << check.out;
  const harness::Result moments = Run({"moments", file_});
  EXPECT_EQ(moments.status, 1);
  EXPECT_EQ(moments.err, "ksicache: " + file_ + why);
  EXPECT_EQ(std::ranges::count(moments.out, '\n'), 1 + 7);
}

TEST_F(RecordingDamage, RecordSaysThatAnOlderChunkIsDamaged) {
  std::vector<Moment> moments = MakeMoments(1, 500);
  for (Moment& moment : moments) moment.host = Host("unknown");
  Record(file_, moments);
  RunSql(file_,
         "UPDATE block SET data = zeroblob(4572) WHERE id = (SELECT block FROM part WHERE "
         "moments > 0 AND number = 0)");
  const harness::Result result = Run(
      {"record", "--root", RecordedHost("systemd-server"), "--every", "1s", "--count", "1", file_});
  EXPECT_EQ(result.status, 0);
  EXPECT_NE(
      result.err.find("ksicache: " + file_ +
                      ": is damaged, and stays so, which check tells more of; chunks of it: 1\n"),
      std::string::npos)
      << result.err;
}

TEST_F(RecordingDamage, CheckLooksAtTheTables) {
  const auto expect = [this](const std::string& sql, const std::string& line) {
    SCOPED_TRACE(sql);
    WriteContent(file_, content_);
    RunSql(file_, sql);
    const harness::Result check = Run({"check", file_});
    EXPECT_EQ(check.status, 1);
    EXPECT_NE(check.out.find(file_ + ": " + line + "\n"), std::string::npos) << check.out;
  };
  expect("DELETE FROM recording", "the table recording has 0 rows");
  expect("INSERT INTO recording SELECT * FROM recording", "the table recording has 2 rows");
  expect("UPDATE recording SET host = zeroblob(3)", "the name of its host is no text");
  expect("UPDATE recording SET made = zeroblob(3)", "when it was made is no date and time");
  expect("UPDATE part SET moments = -1 WHERE id = 1000", "rows have no number of moments: 1");
  expect("DELETE FROM part WHERE id = 1000", "rows of the table part are missing: 1");
  expect("DELETE FROM part", "rows of the table part are missing: 1");
  expect("DELETE FROM block WHERE id = 3", "rows of the table block are missing: 1");
  expect("UPDATE block SET data = zeroblob(4573)", "blocks have not 4572 bytes: 16");
  expect(
      "INSERT INTO part SELECT 1 + max(part.id), p.moments, p.number, p.chunk, p.first, p.last, "
      "p.size, p.block FROM part, (SELECT * FROM part WHERE moments > 1) AS p",
      "the part of 2026-11-21T10:00:00Z is there twice");
  // Pages that stand in each other's place.
  std::string swapped = content_;
  std::swap_ranges(swapped.begin() + 8 * kPage, swapped.begin() + 9 * kPage,
                   swapped.begin() + 9 * kPage);
  WriteContent(file_, swapped);
  const harness::Result check = Run({"check", file_});
  EXPECT_EQ(check.status, 1);
  EXPECT_NE(check.out.find("Rowid "), std::string::npos) << check.out;
}

// Sums and differences of times are made everywhere, and so none that there is not is read. The
// facts of a part are those of its row.
TEST_F(RecordingDamage, TimesThatThereAreNotAreDamage) {
  const auto expect = [this](const std::string& why) {
    for (const std::vector<std::string>& args :
         std::vector<std::vector<std::string>>{{"info", file_ + "@last"},
                                               {"moments", file_},
                                               {"moments", "--summary", file_ + "@-1h.."},
                                               {"check", file_},
                                               {"diff", file_},
                                               {"diff", "--since", "1h", file_},
                                               {"export", "comp-stats", file_ + "@-7d.."},
                                               {"join", Path("joined.ksi"), file_}}) {
      const harness::Result result = Run(args);
      EXPECT_EQ(result.status, 1) << args[0];
      EXPECT_NE((result.out + result.err).find(why), std::string::npos)
          << args[0] << ": " << result.out << result.err;
    }
  };
  for (const char* set : {"first = -9223372036854775808", "last = 9223372036854775807",
                          "first = -62167219200000001", "last = 253402300800000000"}) {
    SCOPED_TRACE(set);
    WriteContent(file_, content_);
    RunSql(file_, std::string("UPDATE part SET ") + set + " WHERE moments > 0");
    expect("is not understood");
  }
  const auto write = [this](const MomentFacts& facts) {
    MakeEmpty(file_);
    ChunkWriter writer(Host());
    writer.Add(facts, MakeMoments(1, 1)[0].readings);
    ksicache::RecordingStore(file_, kUnbounded)
        .Add({0, 1, 0, 0, facts.taken, facts.taken, 0, 0}, writer.PartFrom(0));
  };
  const auto expectBad = [&](auto MomentFacts::*fact, auto value) {
    MomentFacts facts;
    facts.taken = kStart;
    facts.*fact = value;
    write(facts);
    expect("has times or numbers that there are not");
  };
  expectBad(&MomentFacts::uptime, INT64_MIN);
  expectBad(&MomentFacts::uptime, INT64_MAX);
  expectBad(&MomentFacts::uptime, int64_t{-1});
  expectBad(&MomentFacts::duration, UINT64_MAX);
  expectBad(&MomentFacts::cpu, UINT64_MAX);
  expectBad(&MomentFacts::skipped, UINT64_MAX);
  expectBad(&MomentFacts::refused, UINT64_MAX);
  expectBad(&MomentFacts::failed, UINT64_MAX);
}

// Whoever asks for a span is told of its own damage, once.
TEST_F(RecordingDamage, DamageBesideASpanIsNotOfIt) {
  std::vector<Moment> moments = MakeMoments(1, 600);
  Record(file_, moments);
  // Of the second chunk, which begins at 10:20, the second part.
  RunSql(file_,
         "UPDATE block SET data = zeroblob(4572) WHERE id = (SELECT block FROM part WHERE "
         "moments > 0 AND number = 280)");
  for (const char* span : {"10:00Z..10:19:55Z", "10:00Z..10:23:19Z", "10:40Z..", "-5m.."}) {
    const std::string name = file_ + "@" + span;
    EXPECT_EQ(Run({"moments", name}).err, "") << span;
    EXPECT_EQ(Run({"export", "moments", name}).err, "") << span;
  }
  const auto expect = [this](const std::string& span, const std::string& lost) {
    const std::string name = "ksicache: " + file_ + "@" + span + ": ";
    const std::string why = "the part of 2026-11-21T10:23:20Z has not all its blocks";
    EXPECT_EQ(Run({"moments", file_ + "@" + span}).err, name + "damaged: " + why + ": " + lost);
    const harness::Result result = Run({"export", "moments", file_ + "@" + span});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err, name + why + "\n" + name + lost);
  };
  expect("10:00Z..10:23:20Z",
         "40 moments of 2026-11-21T10:23:20Z to 2026-11-21T10:26:35Z cannot be read\n");
  expect("10:39:55Z..",
         "40 moments of 2026-11-21T10:36:40Z to 2026-11-21T10:39:55Z cannot be read\n");
  expect("..", "200 moments of 2026-11-21T10:23:20Z to 2026-11-21T10:39:55Z cannot be read\n");
}

// SQLite would keep a file beside it, which no reader knows of.
TEST_F(RecordingDamage, OneThatSqliteWritesAheadIsNotGoneOnWith) {
  std::vector<Moment> moments = MakeMoments(1, 3);
  for (Moment& moment : moments) moment.host = Host("unknown");
  Record(file_, moments);
  const std::string dump = Output({"dump", file_});
  const std::string why =
      ": is in SQLite's write-ahead (WAL) mode, which PRAGMA journal_mode=DELETE ends";
  const std::vector<std::string> record = {
      "record", "--root", RecordedHost("systemd-server"), "--every", "1s", "--count", "1", file_};
  RunSql(file_, "PRAGMA journal_mode = WAL");
  ExpectFailure(record, file_ + why);
  EXPECT_EQ(Run({"check", file_}).out, file_ + why + "\n");
  EXPECT_EQ(Output({"dump", file_}), dump);
  RunSql(file_, "PRAGMA journal_mode = DELETE");
  EXPECT_EQ(Output({"check", file_}), "");
  EXPECT_EQ(Run(record).status, 0);
}

// The facts of a moment are those of its row, whoever asks.
TEST_F(RecordingDamage, ARowThatLiesAboutTimesIsDamagedForAll) {
  RunSql(file_, "UPDATE part SET first = first + 1 WHERE moments > 1");
  for (const char* when : {"@first", "@last", "@2026-11-21T10:00:05Z"}) {
    for (const std::string command : {"dump", "info"}) {
      const harness::Result result = Run({command, file_ + when});
      EXPECT_EQ(result.status, 1) << command << when;
      EXPECT_NE(result.err.find("is not what its row says"), std::string::npos) << result.err;
    }
  }
}

class RecordingNames : public RecordingTest {
 protected:
  RecordingNames() { Record(file_, MakeMoments(1, 3)); }

  const std::string file_ = Path("r.ksi");
};

TEST_F(RecordingNames, AFileThatHasTheWholeNameWins) {
  const std::string name = file_ + "@first";
  WriteSmallHost(name);
  EXPECT_NE(Output({"info", name}).find("test.example.org"), std::string::npos);
  EXPECT_EQ(Output({"dump", name}), Output({"dump", name + "@last"}));
  std::filesystem::remove(name);
  EXPECT_EQ(Output({"dump", name}), Output({"dump", file_ + "@2026-11-21T10:00:00Z"}));
  std::filesystem::rename(file_, name);
  EXPECT_EQ(Output({"dump", name}), Output({"dump", name + "@-0s"}));
  EXPECT_NE(Output({"dump", name}), Output({"dump", name + "@first"}));
}

TEST_F(RecordingNames, LinksAreReadAndNotWritten) {
  const std::string link = Path("link");
  std::filesystem::create_symlink("r.ksi", link);
  EXPECT_EQ(Output({"dump", link}), Output({"dump", file_}));
  EXPECT_EQ(Output({"moments", link}), Output({"moments", file_}));
  EXPECT_EQ(Output({"dump", link + "@first"}), Output({"dump", file_ + "@first"}));
  Output({"extract", link + "@first", Path("first.ksi")});
  Output({"join", Path("joined.ksi"), link, Path("first.ksi")});
  const std::string before = FileContent(file_);
  ExpectFailure({"record", "--count", "1", link},
                link + ": is a symbolic link: record to its target");
  EXPECT_TRUE(FileContent(file_) == before);
}

TEST_F(RecordingNames, ErrorsNameTheSpan) {
  const std::string early = file_ + "@2026-11-21T09:59:59Z";
  const std::string span = "moments are of 2026-11-21T10:00:00Z to 2026-11-21T10:00:10Z";
  ExpectFailure({"dump", early}, early + ": there is no moment so early: " + span);
  ExpectFailure({"extract", file_ + "@-1h", Path("out.ksi")},
                file_ + "@-1h: there is no moment so early: " + span);
  ExpectFailure(
      {"dump", file_ + "@noon"},
      file_ + "@noon: noon is no time, as 2026-11-21T10:05, 10:05, -10m and last are: " + span);
  ExpectFailure({"dump", Path("none@first")}, Path("none@first") + ": No such file or directory");
  MakeEmpty(Path("empty.ksi"));
  ExpectFailure({"dump", Path("empty.ksi")}, Path("empty.ksi") + ": it has no moments yet");
  // Later than the last is the last.
  EXPECT_EQ(Output({"dump", file_ + "@2030-01-01T00:00"}), Output({"dump", file_}));
}

}  // namespace
}  // namespace ksi
