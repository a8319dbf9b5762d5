// Moments come out of a recording as they went in, however the host changed from one to the next.
//
// FULL_SWEEP=1 in the environment joins 1000 series by the program instead of some.
#include <algorithm>
#include <array>
#include <cctype>
#include <cstdlib>
#include <random>
#include <regex>
#include <set>
#include <string>
#include <vector>

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_status.h>
#include "knvlibs/times.h"
#include "tests/harness/report_names.h"
#include "tests/harness/tally.h"
#include "tests/ksicache/recording_fixture.h"
#include "tools/ksicache/cache_writer.h"
#include "tools/ksicache/moment_builder.h"
#include "tools/ksicache/opened_file.h"

namespace ksi {
namespace {

class RecordingSeries : public RecordingTest {
 protected:
  std::string Capture(size_t i) const { return Path("capture-" + std::to_string(i)); }

  static void MakeCapture(const Moment& moment, const std::string& fileName) {
    ksicache::CacheWriter writer(fileName, true);
    ksicache::PutReadings(moment, writer);
    writer.Commit(ksicache::CaptureOf(moment));
  }

  // Captures of all, joined; the order in which they are given does not matter.
  void Join(size_t count, uint32_t seed) {
    std::vector<std::string> words;
    for (size_t i = 0; i < count; ++i) words.push_back(Capture(i));
    std::ranges::shuffle(words, std::mt19937(seed));
    words.insert(words.begin(), {"join", "--force", Path("r.ksi")});
    EXPECT_EQ(Output(words), "");
  }

  std::string NameOf(const Moment& moment) const {
    return Path("r.ksi") + "@" + TextOfTime(moment.facts.taken);
  }
};

// A few moments each, of which the last ones are not packed yet.
TEST_F(RecordingSeries, MomentsAreAsTheyWere) {
  for (uint32_t seed = 0; seed < 1000; ++seed) {
    SCOPED_TRACE("series " + std::to_string(seed));
    const std::vector<Moment> moments = MakeMoments(seed, 3);
    if (seed % 10 == 0) MakeEmpty(Path("r.ksi"));
    ksicache::RecordingStore store(Path("r.ksi"), kUnbounded);
    ksicache::Recorder recorder(store);
    const int64_t number = store.Parts().empty() ? 0 : store.Parts().back().End();
    for (const Moment& moment : moments) {
      recorder.Add(moment.host, moment.facts, moment.readings);
    }
    if (seed % 2 == 0) recorder.Pack();
    const std::unique_ptr<RecordingFile> file = OpenFile(Path("r.ksi"));
    ASSERT_NE(file, nullptr);
    ASSERT_NO_FATAL_FAILURE(ExpectMoments(*file, moments, number));
  }
}

TEST_F(RecordingSeries, WhatIsExtractedIsTheCaptureThatWasJoined) {
  const uint32_t count = std::getenv("FULL_SWEEP") == nullptr ? 25 : 1000;
  for (uint32_t seed = 0; seed < count; ++seed) {
    SCOPED_TRACE("series " + std::to_string(seed));
    const std::vector<Moment> moments = MakeMoments(5000 + seed, 4);
    for (size_t i = 0; i < moments.size(); ++i) MakeCapture(moments[i], Capture(i));
    Join(moments.size(), seed);
    for (size_t i = 0; i < moments.size(); ++i) {
      Output({"extract", "--force", NameOf(moments[i]), Path("out.ksi")});
      // The same bytes dump the same.
      ASSERT_TRUE(FileContent(Path("out.ksi")) == FileContent(Capture(i))) << i;
    }
    ASSERT_EQ(Output({"dump", NameOf(moments[2])}), Output({"dump", Capture(2)}));
    ASSERT_EQ(Output({"dump", Path("r.ksi")}), Output({"dump", Capture(3)}));
  }
}

// Beyond the bounds of parts and of chunks; the one half of the moments lies between the other.
TEST_F(RecordingSeries, LongRecordingsAreJoined) {
  std::vector<Moment> moments = MakeMoments(1, 140, kStart, 10);
  Record(Path("even.ksi"), moments);
  const std::vector<Moment> others = MakeMoments(2, 140, kStart + 5 * kSecond, 10);
  Record(Path("odd.ksi"), others);
  moments.insert(moments.end(), others.begin(), others.end());
  std::ranges::sort(moments, {}, [](const Moment& moment) { return moment.facts.taken; });
  Output({"join", Path("r.ksi"), Path("odd.ksi"), Path("even.ksi")});

  const std::unique_ptr<RecordingFile> file = OpenFile(Path("r.ksi"));
  ASSERT_NE(file, nullptr);
  for (size_t i = 0; i < moments.size(); i += i % 60 == 58 ? 1 : 7) {
    ASSERT_NO_FATAL_FAILURE(ExpectMoments(*file, {moments[i]}, static_cast<int64_t>(i)));
  }
  std::vector<int64_t> sizes;
  std::set<int64_t> chunks;
  for (const RecordingFile::Part& part : file->Parts()) {
    sizes.push_back(part.moments);
    chunks.insert(part.chunk);
  }
  const size_t first = ksicache::Recorder::kPartMoments;
  EXPECT_EQ(sizes.size(), (moments.size() + first - 1) / first);
  EXPECT_EQ(sizes.front(), first);
  EXPECT_EQ(chunks, (std::set<int64_t>{0, ksicache::Recorder::kChunkMoments}));
}

// Past the bounds of parts and chunks, reboots and what was removed, from any moment on.
TEST_F(RecordingSeries, MomentsAreGoneThrough) {
  std::vector<Moment> moments = MakeMoments(4, 300);
  for (size_t i = 250; i < moments.size(); ++i) moments[i].host.boot = "2";
  Record(Path("r.ksi"), moments);
  const std::unique_ptr<RecordingFile> file = OpenFile(Path("r.ksi"));
  ASSERT_NE(file, nullptr);
  for (const int64_t from : {0, 57, 239, 299}) {
    int64_t number = from;
    ChunkReader reader;
    Status status = file->ReadMoment(number, reader);
    int64_t expected = from;
    for (; status == kOk; ++expected, status = file->ReadNext(number, reader)) {
      ASSERT_EQ(number, expected);
      const Moment& moment = moments[static_cast<size_t>(number)];
      ASSERT_EQ(reader.Facts(), moment.facts) << number;
      ASSERT_EQ(reader.Host(), moment.host) << number;
      if (number % 3 == 0 || number % 40 > 36) {
        Moment read;
        ASSERT_EQ(reader.ReadAll(read), kOk) << number;
        ASSERT_EQ(read.readings, moment.readings) << number;
      }
    }
    EXPECT_EQ(status, Status{KSI_STATUS_NOT_FOUND});
    EXPECT_EQ(expected, 300);
  }
}

TEST_F(RecordingSeries, ASourceGoesOnToTheNextMoment) {
  const std::vector<Moment> moments = MakeMoments(5, 3);
  Record(Path("r.ksi"), moments);
  KSI_Source* source = nullptr;
  ASSERT_EQ(KSI_OpenCache(Path("r.ksi@first").c_str(), &source), 0U);
  int64_t taken = 0;
  std::array<char, 3> host = {};
  for (size_t i = 0; i < moments.size(); ++i) {
    if (i != 0) {
      ASSERT_EQ(KSI_SourceNextMoment(source), 0U);
    }
    EXPECT_EQ(KSI_SourceOrigin(source, &taken, host.data(), host.size()), 0U);
    EXPECT_EQ(taken, moments[i].facts.taken);
    EXPECT_EQ(moments[i].host.name.substr(0, host.size() - 1), host.data());
  }
  EXPECT_EQ(KSI_SourceNextMoment(source), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(KSI_SourceOrigin(source, &taken, nullptr, 0), 0U);
  EXPECT_EQ(taken, moments.back().facts.taken);
  EXPECT_EQ(KSI_SourceOrigin(source, nullptr, nullptr, 0), KSI_STATUS_BAD_PARAM);
  EXPECT_EQ(KSI_SourceOrigin(source, &taken, host.data(), 0), KSI_STATUS_BAD_PARAM);
  KSI_CloseSource(source);

  MakeCapture(moments[1], Capture(1));
  ASSERT_EQ(KSI_OpenCache(Capture(1).c_str(), &source), 0U);
  EXPECT_EQ(KSI_SourceOrigin(source, &taken, nullptr, 0), 0U);
  EXPECT_EQ(taken, moments[1].facts.taken);
  EXPECT_EQ(KSI_SourceNextMoment(source), KSI_STATUS_NOT_FOUND);
  KSI_CloseSource(source);
  ASSERT_EQ(KSI_OpenHost(nullptr, &source), 0U);
  EXPECT_EQ(KSI_SourceOrigin(source, &taken, nullptr, 0), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(KSI_SourceNextMoment(source), KSI_STATUS_NOT_FOUND);
  KSI_CloseSource(source);
}

TEST_F(RecordingSeries, WhatSeveralFilesHaveIsJoinedOnce) {
  const std::vector<Moment> moments = MakeMoments(6, 8);
  Record(Path("first.ksi"), {moments.begin(), moments.begin() + 6});
  Record(Path("second.ksi"), {moments.begin() + 3, moments.end()});
  MakeCapture(moments[4], Capture(4));
  Output({"join", Path("r.ksi"), Path("second.ksi"), Path("first.ksi"), Capture(4)});
  const std::unique_ptr<RecordingFile> file = OpenFile(Path("r.ksi"));
  ASSERT_NE(file, nullptr);
  EXPECT_EQ(file->Parts().back().End(), 8);
  ExpectMoments(*file, moments);
}

// Times name seconds, in which there may be several moments.
TEST_F(RecordingSeries, SpansHaveAllMomentsOfTheirSeconds) {
  const auto node = std::ranges::find(RecordedNodes(), "memory/pshare/stats", &RecordedNode::path);
  Moment moment;
  moment.host = Host();
  moment.readings.emplace_back();
  moment.readings[0].question.node = static_cast<uint32_t>(node - RecordedNodes().begin());
  moment.readings[0].answer.record.resize(node->recordSize);
  std::vector<Moment> moments;
  for (int64_t i = 0; i < 20; ++i) {
    moment.facts.taken = kStart + i * kSecond / 5;
    moments.push_back(moment);
  }
  Record(Path("r.ksi"), moments);
  const auto rows = [this](const std::string& span) {
    return std::ranges::count(Output({"export", "pshare-stats", Path("r.ksi@" + span)}), '\n') - 1;
  };
  EXPECT_EQ(rows(".."), 20);
  EXPECT_EQ(rows("..10:00:00Z"), 5);
  EXPECT_EQ(rows("10:00:01Z..10:00:02Z"), 10);
  EXPECT_EQ(rows("10:00:03Z.."), 5);
}

TEST_F(RecordingSeries, HostsAreNotMixed) {
  std::vector<Moment> moments = MakeMoments(1, 2);
  moments[1].host.name = "other.example.org";
  for (size_t i = 0; i < moments.size(); ++i) MakeCapture(moments[i], Capture(i));
  ExpectFailure({"join", Path("r.ksi"), Capture(1), Capture(0)},
                Capture(1) + ": is of the host other.example.org, not of h");
  EXPECT_EQ(access(Path("r.ksi").c_str(), F_OK), -1);
}

// A host that reboots, whose clock is set, or that is recorded by another version.
TEST_F(RecordingSeries, AnotherBootOrAClockSetBackStartsAChunk) {
  std::vector<Moment> moments = MakeMoments(3, 9);
  for (size_t i = 3; i < 9; ++i) moments[i].host.boot = "2";
  for (size_t i = 6; i < 9; ++i) moments[i].facts.taken -= 3600 * kSecond;
  Record(Path("r.ksi"), moments);
  const std::unique_ptr<RecordingFile> file = OpenFile(Path("r.ksi"));
  ASSERT_NE(file, nullptr);
  ExpectMoments(*file, moments);
  std::set<int64_t> chunks;
  for (const RecordingFile::Part& part : file->Parts()) chunks.insert(part.chunk);
  EXPECT_EQ(chunks, (std::set<int64_t>{0, 3, 6}));
}

// The example host with other figures: the last digit of some is smaller.
std::string EditedExample(uint32_t seed, const std::string& taken) {
  std::string json = FileContent(TALLY_EXAMPLE_JSON);
  json =
      std::regex_replace(json, std::regex("\"taken\": *\"[^\"]*\""), "\"taken\":\"" + taken + "\"");
  std::mt19937 random(seed);
  for (size_t at = json.find("\"value\""); at != std::string::npos;
       at = json.find("\"value\"", at + 1)) {
    for (size_t i = json.find('{', at); json[i] != '}'; ++i) {
      const bool endsNumber = std::isdigit(static_cast<unsigned char>(json[i])) != 0 &&
                              (json[i + 1] == ',' || json[i + 1] == '}');
      if (endsNumber && std::isdigit(static_cast<unsigned char>(json[i - 1])) != 0 &&
          random() % 10 == 0) {
        json[i] = static_cast<char>('0' + random() % (static_cast<unsigned>(json[i] - '0') + 1));
      }
    }
  }
  return json;
}

// The title block tells the time of the run.
std::string WithoutTime(const std::string& output) {
  static const std::regex time("STATS: [A-Z][a-z]{2} [A-Z][a-z]{2} [ 0-9]{2} [0-9:]{8} [0-9]{4}\n");
  return std::regex_replace(output, time, "STATS: (the time)\n");
}

TEST_F(RecordingSeries, ReportsSayTheSameOfAMomentAsOfItsCapture) {
  const std::vector<std::string> times = {"2026-11-21T10:00:00Z", "2026-11-21T10:05:00Z",
                                          "2026-11-21T10:10:00Z"};
  for (size_t i = 0; i < times.size(); ++i) {
    WriteContent(Path("a.json"), EditedExample(static_cast<uint32_t>(i), times[i]));
    Output({"load", Path("a.json"), Capture(i)});
  }
  ASSERT_NE(FileContent(Capture(0)), FileContent(Capture(1)));
  Join(times.size(), 1);
  for (size_t i = 0; i < times.size(); ++i) {
    Output({"extract", "--force", Path("r.ksi") + "@" + times[i], Path("out.ksi")});
    EXPECT_EQ(Output({"dump", Path("out.ksi")}), Output({"dump", Capture(i)}));
    for (const char* report : harness::kReportNames) {
      const auto run = [report](const std::string& file) {
        harness::Result result =
            harness::RunProgram(harness::BuiltTally({"-c", file, "-r", report}));
        result.out = WithoutTime(result.out);
        return result;
      };
      const harness::Result ofCapture = run(Capture(i));
      const harness::Result ofMoment = run(Path("r.ksi") + "@" + times[i]);
      EXPECT_EQ(ofCapture.status, 0) << report;
      EXPECT_EQ(ofMoment.out, ofCapture.out) << report;
      EXPECT_EQ(ofMoment.err, ofCapture.err) << report;
      EXPECT_EQ(ofMoment.status, ofCapture.status) << report;
    }
  }
}

}  // namespace
}  // namespace ksi
