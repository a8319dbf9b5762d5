// What `ksicache moments` and `ksicache info` say of recordings.
#include <sys/stat.h>

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <functional>
#include <regex>
#include <string>
#include <vector>

#include "tests/ksicache/recording_fixture.h"

namespace ksi {
namespace {

constexpr const char* kHead = "taken                   bytes  took ms  cpu ms  remarks\n";

class MomentsTest : public RecordingTest {
 protected:
  // A moment so many seconds after kStart, by the clock on the wall and by that which nobody sets.
  void Add(int64_t taken, int64_t uptime, const std::function<void(Moment&)>& change = {}) {
    Moment moment = MakeMoments(1, 1).front();
    moment.host.boot = "a";
    moment.facts.taken = kStart + taken * kSecond;
    moment.facts.uptime = (1000 + uptime) * kSecond;
    moment.facts.duration = 20'000;
    moment.facts.cpu = 5'000;
    if (!moments_.empty()) moment.host = moments_.back().host;
    if (change) change(moment);
    moments_.push_back(std::move(moment));
  }

  // An eventful minute, one each 5 s.
  void AddAll() {
    for (int64_t at : {0, 5, 10}) Add(at, at);
    Add(25, 25, [](Moment& moment) { moment.facts.skipped = 2; });
    for (int64_t at : {30, 35}) Add(at, at);
    for (int64_t at : {335, 340, 345, 350}) Add(at, at);          // a gap
    for (int64_t at : {355, 360, 365, 370}) Add(at - 3600, at);   // set back by an hour
    for (int64_t at : {375, 380, 385}) Add(at, at);               // and forward
    Add(400, 3, [](Moment& moment) { moment.host.boot = "b"; });  // after a boot
    for (int64_t at : {405, 410, 415}) Add(at, at - 397);
    moments_.back().facts.refused = 7;
    moments_.back().facts.failed = 2;
    moments_.back().facts.loss = 0xbad0014;
    Record(file_, moments_);
  }

  // The times and remarks of a list of moments; nothing if it is none.
  static std::string Remarks(const std::string& list) {
    std::string remarks;
    const std::regex line("2026-11-21T([0-9:]{8})Z +[0-9]+ +20\\.0 +5\\.0(  .*)?\n");
    for (std::sregex_iterator at(list.begin(), list.end(), line), end; at != end; ++at) {
      remarks += (*at)[1].str() + (*at)[2].str() + "\n";
    }
    return list.starts_with(kHead) ? remarks : "";
  }

  static uint64_t NumberAfter(const std::string& text, const std::string& label) {
    const size_t at = text.find("\n" + label);
    EXPECT_NE(at, text.npos) << label;
    return at == text.npos ? 0 : std::stoull(text.substr(at + 1 + label.size()));
  }

  static constexpr const char* kRemarked =
      "10:00:25  2 skipped\n"
      "10:05:35  gap 00:05:00\n"
      "09:05:55  clock -01:00:00\n"
      "10:06:15  clock +01:00:00\n"
      "10:06:40  rebooted, gap 00:00:15\n"
      "10:06:55  7 refused, 2 failed, left out: 0xbad0014 ";

  const std::string file_ = Path("r.ksi");
  std::vector<Moment> moments_;
};

TEST_F(MomentsTest, AreRemarkedOn) {
  AddAll();
  const std::string all = Remarks(Output({"moments", file_}));
  EXPECT_EQ(all.substr(0, 27), "10:00:00\n10:00:05\n10:00:10\n");
  EXPECT_EQ(std::ranges::count(all, '\n'), 21);
  const std::string remarked = Remarks(Output({"moments", "--remarks", file_}));
  EXPECT_EQ(remarked.substr(0, strlen(kRemarked)), kRemarked);
  EXPECT_EQ(std::ranges::count(remarked, '\n'), 6);
}

TEST_F(MomentsTest, OfASpanOrATimeAreListedWithWhatTheWholeSaysOfThem) {
  AddAll();
  const auto list = [this](const std::string& when) {
    return Remarks(Output({"moments", file_ + "@2026-11-21T" + when}));
  };
  EXPECT_EQ(list("10:05:35Z"), "10:05:35  gap 00:05:00\n");
  EXPECT_EQ(list("10:05:34Z"), "10:00:35\n");
  EXPECT_EQ(list("10:06:14Z..2026-11-21T10:06:41Z"),
            "10:06:15  clock +01:00:00\n10:06:20\n10:06:25\n"
            "10:06:40  rebooted, gap 00:00:15\n");
  EXPECT_EQ(Remarks(Output({"moments", "--remarks", file_ + "@2026-11-21T10:00Z..-6m"})),
            "10:00:25  2 skipped\n");
}

TEST_F(MomentsTest, ATimeWithoutAnyNamesTheSpan) {
  AddAll();
  const std::string span = "moments are of 2026-11-21T09:05:55Z to 2026-11-21T10:06:55Z\n";
  for (const char* when : {"@2026-11-21T09:50Z..2026-11-21T09:55Z", "@2027-01-01T00:00.."}) {
    const harness::Result result = Run({"moments", file_ + when});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err,
              "ksicache: " + file_ + when + ": there is no moment in that time: " + span);
  }
  const harness::Result result = Run({"moments", file_ + "@2026-11-20T10:00Z"});
  EXPECT_EQ(result.err,
            "ksicache: " + file_ + "@2026-11-20T10:00Z: there is no moment so early: " + span);
}

TEST_F(MomentsTest, AreSummedUpOnOneScreen) {
  AddAll();
  const std::string summary = Output({"moments", "--summary", file_});
  const uint64_t bytes = NumberAfter(summary, "size       ");
  const auto rounded = [](double number) { return std::to_string(std::llround(number)); };
  const auto each = static_cast<double>(bytes) / 21;
  EXPECT_EQ(summary, "file       " + file_ + R"(
host       h
span       2026-11-21T09:05:55Z to 2026-11-21T10:06:55Z
moments    21, one each 5.0 s
gaps       2, of 00:05:15 in all, 00:05:00 at most before 2026-11-21T10:05:35Z
reboots    1, the last before 2026-11-21T10:06:40Z
forward    1, by 01:00:00 at most before 2026-11-21T10:06:15Z
back       1, by 01:00:00 at most before 2026-11-21T09:05:55Z
skipped    2 that were due
missing    in 1 moments refused, in 1 failed, in 1 left out
took       20.0 ms, at most 20.0; of CPU 5.0 ms, at most 5.0
size       )" + std::to_string(bytes) +
                         " bytes, " + rounded(each) + " a moment, " + rounded(each * 17280) +
                         " a day\n");
  ExpectFailure({"moments", "--summary", "--remarks", file_},
                "--remarks is of a list, and --summary is none", 2);
}

// What captures took was not recorded.
TEST_F(MomentsTest, OfCapturesTakeNobodyKnowsWhat) {
  WriteSmallHost(Path("c.ksi"));
  Output({"join", file_, Path("c.ksi")});
  EXPECT_NE(Output({"moments", file_}).find("        -       -  "), std::string::npos);
  EXPECT_NE(Output({"moments", "--summary", file_}).find("\ntook       -; of CPU -\n"),
            std::string::npos);
}

// Recorders that follow each other may take moments in steps of their own.
TEST_F(MomentsTest, AnotherStepIsNoGap) {
  for (const int64_t at : {0, 5, 10, 15, 75, 135, 195, 255, 315, 375, 380, 385, 390}) Add(at, at);
  Record(file_, moments_);
  EXPECT_EQ(Remarks(Output({"moments", "--remarks", file_})), "");
}

TEST_F(MomentsTest, OfSeveralFilesAreListedUnderTheirNames) {
  Add(0, 0);
  const std::string other = Path("s.ksi");
  Record(file_, moments_);
  Record(other, moments_);
  const std::string list = Output({"moments", file_});
  EXPECT_EQ(Output({"moments", file_, other}), file_ + ":\n" + list + "\n" + other + ":\n" + list);
}

// Moments that cannot be read are no gap.
TEST_F(MomentsTest, OfADamagedRecordingAreThoseThatCanBeRead) {
  for (int64_t at = 0; at < 200; ++at) Add(at, at);
  Record(file_, moments_);
  const RecordingFile::Part part = OpenFile(file_)->Parts()[2];
  RunSql(file_, "UPDATE block SET data = zeroblob(4572) WHERE id = " + std::to_string(part.block));
  for (const char* option : {"--remarks", "--summary"}) {
    const harness::Result result = Run({"moments", option, file_});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err,
              "ksicache: " + file_ +
                  ": damaged: the part of 2026-11-21T10:01:20Z is damaged: 120 moments of "
                  "2026-11-21T10:01:20Z to 2026-11-21T10:03:19Z cannot be read\n");
    if (option == std::string("--remarks")) {
      EXPECT_EQ(result.out, kHead);
    } else {
      EXPECT_NE(result.out.find("\nmoments    80, one each 1.0 s\n"), std::string::npos);
      EXPECT_NE(result.out.find("\ndamaged    some moments cannot be read"), std::string::npos);
    }
  }
}

TEST_F(MomentsTest, SizesAddUpToTheFile) {
  Record(file_, MakeMoments(1, 90));
  const std::string info = Output({"info", file_});
  struct stat file = {};
  ASSERT_EQ(stat(file_.c_str(), &file), 0);
  const auto size = static_cast<uint64_t>(file.st_size);
  const uint64_t moments = NumberAfter(info, "  moments  ");
  EXPECT_EQ(NumberAfter(info, "size       "), size);
  EXPECT_EQ(moments + NumberAfter(info, "  replaced ") + NumberAfter(info, "  free     ") +
                NumberAfter(info, "  rest     "),
            size);
  EXPECT_GT(moments, 0u);
  EXPECT_LT(NumberAfter(info, "  rest     "), size / 2);
  EXPECT_EQ(NumberAfter(Output({"moments", "--summary", file_}), "size       "), moments);
}

TEST_F(MomentsTest, InfoSaysHowOldAMomentIs) {
  for (const int64_t at : {0, 5, 10}) Add(at, at);
  Record(file_, moments_);
  const auto info = [this](const std::string& when) {
    harness::Program program = Command({"info", file_ + when});
#ifdef KSICACHE_SET_CLOCK
    program.environment.emplace_back("LD_PRELOAD=" KSICACHE_SET_CLOCK);
    program.environment.push_back("SET_CLOCK=" + std::to_string(kStart / kSecond + 93'784 + 5));
#endif
    const std::string out = harness::RunProgram(program).out;
    const size_t at = out.find("\ntaken ");
    return at == out.npos ? "" : out.substr(at + 1, out.find("\nbuilt ") - at);
  };
  const std::string later = info("@2026-11-21T10:00:09Z");
  const std::string head =
      "taken      2026-11-21T10:00:05Z\nasked      2026-11-21T10:00:09Z, 00:00:04 later\nage ";
  EXPECT_EQ(later.substr(0, head.size()), head);
#ifdef KSICACHE_SET_CLOCK
  EXPECT_EQ(later, head + "       1d 02:03:04\n");
  EXPECT_EQ(info("@first"), "taken      2026-11-21T10:00:00Z\nage        1d 02:03:09\n");
#endif
  EXPECT_EQ(info(""), "");
  WriteSmallHost(Path("c.ksi"));
  EXPECT_NE(Output({"info", Path("c.ksi@2030-01-01T00:00Z")}).find("\nasked      2030-01-01"),
            std::string::npos);
  EXPECT_EQ(Output({"info", Path("c.ksi")}).find("\nasked "), std::string::npos);
}

}  // namespace
}  // namespace ksi
