// Cache files in bad company: in places and states that an honest one is never in.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include <knvlibs/ksi_records.h>
#include "knvlibs/cache_file.h"
#include "knvlibs/open_cache.h"
#include "tests/harness/program.h"
#include "tests/harness/tally.h"
#include "tests/knvlibs/cache_fixture.h"
#include "tests/knvlibs/hostile_pages.h"

namespace ksi {
namespace {

class HostileCache : public SmallHostTest {
 protected:
  void ExpectAnswers() {
    uint32_t flags = 0;
    EXPECT_EQ(Flags(7, &flags), kOk);
    EXPECT_EQ(flags, 107u);
  }
};

using Strings = std::vector<std::string>;

TEST_F(HostileCache, LockedByAnotherIsReadAllTheSame) {
  const Database other = OpenAsOwner(file_);
  ExecuteSql(other.get(), "BEGIN EXCLUSIVE");
  ASSERT_EQ(Open(), kOk);
  ExpectAnswers();
}

// More than SQLite keeps in memory, so that it comes back for what is no longer there.
void WriteLargeHost(const std::string& fileName) {
  ksicache::CacheWriter writer(fileName, true);
  KSI_GroupMemoryStats stats = {};
  for (int64_t group = 0; group < 20000; ++group) {
    stats.memSize = static_cast<uint64_t>(group);
    writer.AddValue(NodeAt("sched/groups/stats/memoryStats"), MakeKeys({group}), BytesOf(stats));
  }
  writer.Commit(TestCapture());
}

TEST_F(HostileCache, InTheMiddleOfAChangeIsDamage) {
  WriteLargeHost(file_);
  const Database other = OpenAsOwner(file_);
  ExecuteSql(other.get(), "PRAGMA cache_size = 10; BEGIN; UPDATE reading SET status = 5");
  ASSERT_EQ(directory_.Names(), (Strings{"host.ksi", "host.ksi-journal"}));
  std::unique_ptr<CacheFile> file;
  std::string why;
  EXPECT_EQ(CacheFile::Open(file_.c_str(), &file, &why), KSI_STATUS_METADATA_READ_ERROR);
  EXPECT_EQ(why, "changes of it lie beside it in " + file_ + "-journal");
  ExecuteSql(other.get(), "ROLLBACK");
  EXPECT_EQ(Open(), kOk);
}

TEST_F(HostileCache, BesideAJournalIsLeftAsItIs) {
  const std::string journal = file_ + "-journal";
  WriteContent(journal, std::string("\xd9\xd5\x05\xf9 half of a change", 21));
  EXPECT_EQ(Open(), KSI_STATUS_METADATA_READ_ERROR);
  EXPECT_EQ(directory_.Names(), (Strings{"host.ksi", "host.ksi-journal"}));
  EXPECT_EQ(FileContent(journal).size(), 21u);
}

TEST_F(HostileCache, BesideAJournalThroughALink) {
  std::filesystem::create_symlink(file_, directory_.Path("link"));
  ASSERT_EQ(Open(directory_.Path("link")), kOk);
  ExpectAnswers();
  WriteContent(file_ + "-journal", "half of a change");
  EXPECT_EQ(Open(directory_.Path("link")), KSI_STATUS_METADATA_READ_ERROR);
}

TEST_F(HostileCache, JournalsWithoutChangesAreNone) {
  const std::string journal = file_ + "-journal";
  const std::string invalid("\0 half of a change", 18);
  for (const std::string& content : {std::string(), std::string(512, '\0'), invalid}) {
    WriteContent(journal, content);
    ASSERT_EQ(Open(), kOk);
    ExpectAnswers();
  }
  std::filesystem::remove(journal);
  ASSERT_EQ(mkfifo(journal.c_str(), 0600), 0);
  EXPECT_EQ(Open(), kOk);
  std::filesystem::remove(journal);
  std::filesystem::create_directory(journal);
  EXPECT_EQ(Open(), kOk);
}

TEST_F(HostileCache, WrittenAheadIsReadWhenAllIsInIt) {
  RunSql(file_, "PRAGMA journal_mode = WAL; UPDATE node SET id = id");
  ASSERT_EQ(directory_.Names(), Strings{"host.ksi"});
  ASSERT_EQ(FileContent(file_)[18], 2);
  ASSERT_EQ(Open(), kOk);
  ExpectAnswers();
  EXPECT_EQ(directory_.Names(), Strings{"host.ksi"});
}

TEST_F(HostileCache, WrittenAheadWithChangesBesideItIsDamage) {
  const Database other = OpenAsOwner(file_);
  ExecuteSql(other.get(), "PRAGMA journal_mode = WAL; UPDATE reading SET status = 5");
  const Strings names = {"host.ksi", "host.ksi-shm", "host.ksi-wal"};
  ASSERT_EQ(directory_.Names(), names);
  EXPECT_EQ(Open(), KSI_STATUS_METADATA_READ_ERROR);
  EXPECT_EQ(directory_.Names(), names);
}

TEST_F(HostileCache, ReplacedWhileItIsReadStaysTheOneThatWasOpened) {
  ASSERT_EQ(Open(), kOk);
  WriteContent(directory_.Path("other"), std::string(65536, 'x'));
  std::filesystem::rename(directory_.Path("other"), file_);
  ExpectAnswers();
  std::filesystem::remove(file_);
  uint32_t flags = 0;
  EXPECT_EQ(Flags(9, &flags), kOk);
  EXPECT_EQ(flags, 109u);
}

// Reads all groups of the large host; each gives its own figure or fails with the status for
// damage. Gives the number that did not fail.
size_t CountAnswers(Source& source) {
  size_t answers = 0;
  for (int64_t group = 0; group < 20000; ++group) {
    KSI_GroupMemoryStats stats = {};
    const Status status = source.Value(NodeAt("sched/groups/stats/memoryStats"), MakeKeys({group}),
                                       std::as_writable_bytes(std::span(&stats, 1)));
    if (status == kOk) {
      EXPECT_EQ(uint64_t{stats.memSize}, static_cast<uint64_t>(group));
      ++answers;
    } else {
      EXPECT_EQ(status, KSI_STATUS_METADATA_READ_ERROR) << group;
    }
  }
  return answers;
}

TEST_F(HostileCache, TruncatedWhileItIsReadIsDamage) {
  for (const uintmax_t left : {4'000'000U, 4096U, 100U, 0U}) {
    WriteLargeHost(file_);
    ASSERT_GT(std::filesystem::file_size(file_), 6'000'000u);
    ASSERT_EQ(Open(), kOk);
    ASSERT_EQ(CountAnswers(*source_), 20000u);
    std::filesystem::resize_file(file_, left);
    EXPECT_LT(CountAnswers(*source_), 10000u) << left;
  }
}

TEST_F(HostileCache, WrittenToWhileItIsReadIsDamage) {
  WriteLargeHost(file_);
  std::filesystem::last_write_time(file_, std::filesystem::file_time_type());
  ASSERT_EQ(Open(), kOk);
  const int fd = open(file_.c_str(), O_WRONLY);
  ASSERT_GE(fd, 0);
  ASSERT_EQ(pwrite(fd, "x", 1, 5'000'000), 1);
  close(fd);
  EXPECT_LT(CountAnswers(*source_), 10000u);
}

TEST_F(HostileCache, InADirectoryWhereNothingCanBeWritten) {
  ASSERT_EQ(chmod(directory_.Path("").c_str(), 0555), 0);
  const bool root = geteuid() == 0;
  if (root) {
    ASSERT_EQ(chmod(file_.c_str(), 0444), 0);
    ASSERT_EQ(seteuid(65534), 0);
  }
  EXPECT_EQ(Open(), kOk);
  if (root) {
    ASSERT_EQ(seteuid(0), 0);
  }
  ExpectAnswers();
  EXPECT_EQ(directory_.Names(), Strings{"host.ksi"});
  ASSERT_EQ(chmod(directory_.Path("").c_str(), 0755), 0);
}

TEST_F(HostileCache, LinksThatLeadInCircles) {
  std::filesystem::create_symlink("b", directory_.Path("a"));
  std::filesystem::create_symlink("a", directory_.Path("b"));
  EXPECT_EQ(Open(directory_.Path("a")), KSI_STATUS_IO_ERROR);
}

TEST_F(HostileCache, PlacesThatAreNoFiles) {
  const std::string pipe = directory_.Path("pipe");
  ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
  std::filesystem::create_symlink("pipe", directory_.Path("link"));
  EXPECT_EQ(Open(directory_.Path("link")), KSI_STATUS_INVALID_METADATA);
  EXPECT_EQ(Open("/dev/null"), KSI_STATUS_INVALID_METADATA);
  EXPECT_EQ(Open("/proc/self/cmdline"), KSI_STATUS_INVALID_METADATA);
  EXPECT_EQ(Open(std::string(10000, 'x')), KSI_STATUS_IO_ERROR);
}

TEST_F(HostileCache, WithoutADescriptorLeft) {
  // A sanitizer takes descriptors, too, when it looks at the test itself.
  const std::string file = file_;
  std::unique_ptr<Source> source;
  const int lowest = dup(0);
  ASSERT_GE(lowest, 0);
  close(lowest);
  rlimit before{};
  ASSERT_EQ(getrlimit(RLIMIT_NOFILE, &before), 0);
  rlimit none = before;
  none.rlim_cur = static_cast<rlim_t>(lowest);
  ASSERT_EQ(setrlimit(RLIMIT_NOFILE, &none), 0);
  const Status status = OpenCacheSource(file.c_str(), &source);
  ASSERT_EQ(setrlimit(RLIMIT_NOFILE, &before), 0);
  EXPECT_EQ(status, KSI_STATUS_IO_ERROR);
}

TEST_F(HostileCache, NodesThatAreNotInTheOrderOfTheirNumbers) {
  const std::string good = FileContent(file_);
  // The places of a page's cells, two bytes each.
  const size_t cells = (PageFile::RootOf(file_, "node") - 1) * PageFile::kPage + 8;
  const std::string first = good.substr(cells, 2);
  const std::string second = good.substr(cells + 2, 2);
  for (const std::string& places : {second + first, first + first}) {
    WriteContent(file_, std::string(good).replace(cells, 4, places));
    std::unique_ptr<CacheFile> file;
    std::string why;
    EXPECT_EQ(CacheFile::Open(file_.c_str(), &file, &why), KSI_STATUS_METADATA_READ_ERROR);
    EXPECT_EQ(why, "the table node is not understood");
  }
}

#ifdef TALLY_SWAPPED
// A file that somebody puts in the place of the one that was looked at is not waited for. (A
// sanitizer does not share its process with another library that stands before it.)
TEST_F(HostileCache, SwappedForAPipeBeforeItIsOpened) {
  for (const std::string file : {"host.ksi", "host.ksi-journal"}) {
    WriteSmallHost(file_);
    WriteContent(directory_.Path("host.ksi-journal"), "half of a change");
    ASSERT_EQ(mkfifo(directory_.Path("pipe").c_str(), 0600), 0);
    harness::Program program;
    program.path = KSICACHE_PROGRAM;
    program.args = {"ksicache", "info", file_};
    program.environment = harness::OwnEnvironment();
    program.environment.emplace_back("LD_PRELOAD=" TALLY_SWAPPED);
    program.environment.push_back("SWAPPED=" + directory_.Path(file));
    program.environment.push_back("SWAPPED_FOR=" + directory_.Path("pipe"));
    const harness::Result result = harness::RunProgram(program);
    EXPECT_EQ(result.status, 1) << file << ": " << result.err;
    EXPECT_TRUE(std::filesystem::is_fifo(directory_.Path(file)));
    std::filesystem::remove(directory_.Path(file));
  }
}
#endif

// A file of which only the head was made, larger than any capture.
TEST_F(HostileCache, HolesOfATerabyte) {
  ASSERT_EQ(truncate(file_.c_str(), off_t{1} << 40), 0);
  ASSERT_EQ(Open(), kOk);
  ExpectAnswers();
}

// What is told of files that are damaged where nobody looked when they were opened.
class ToldDamage : public HostileCache {
 protected:
  // What is said while `ask` asks a file that was changed by this SQL.
  template <class Ask>
  std::string Said(const std::string& sql, Ask&& ask) {
    WriteSmallHost(file_);
    RunSql(file_, sql);
    testing::internal::CaptureStderr();
    EXPECT_EQ(Open(), kOk);
    ask();
    return testing::internal::GetCapturedStderr();
  }

  std::string Line(const std::string& what) const { return file_ + ": " + what + "\n"; }
};

TEST_F(ToldDamage, OfValues) {
  const auto ask = [this] { EXPECT_NE(Flags(7), kOk); };
  EXPECT_EQ(Said("UPDATE reading SET answer = zeroblob(5) WHERE key1 = 7", ask),
            Line("sched/groups/groupFlags: has no record of this version"));
  EXPECT_EQ(Said("UPDATE reading SET answer = 5 WHERE key1 = 7", ask),
            Line("sched/groups/groupFlags: has no record of this version"));
  EXPECT_EQ(Said("UPDATE reading SET status = -1 WHERE key1 = 7", ask),
            Line("sched/groups/groupFlags: a reading has no good status"));
  EXPECT_EQ(Said("UPDATE reading SET answer = zeroblob(50000000) WHERE key1 = 7", ask),
            Line("sched/groups/groupFlags: string or blob too big"));
}

TEST_F(ToldDamage, OfLists) {
  const auto ask = [this] { EXPECT_NE(ChildrenOf(0), kOk); };
  const std::string list = "sched/groups/members/groups: ";
  EXPECT_EQ(Said("UPDATE reading SET answer = 'two' WHERE key1 = 0 AND answer = 2", ask),
            Line(list + "has no number of entries"));
  EXPECT_EQ(Said("UPDATE reading SET answer = 3 WHERE key1 = 0 AND answer = 2", ask),
            Line(list + "has other entries than it says"));
  EXPECT_EQ(Said("DELETE FROM instance WHERE key1 = 0 AND position = 0", ask),
            Line(list + "has other entries than it says"));
  EXPECT_EQ(Said("UPDATE instance SET entry = 'x' WHERE key1 = 0 AND position = 1", ask),
            Line(list + "has an entry that is no number"));
  EXPECT_EQ(Said("UPDATE instance SET entry = 5 WHERE key1 = 30 AND position = 1",
                 [this] {
                   ParamList types(ParamList::kNoLimit);
                   EXPECT_NE(source_->Instances(NodeAt("sched/memClients/remapTypes"),
                                                MakeKeys({30}), types),
                             kOk);
                 }),
            Line("sched/memClients/remapTypes: has an entry that is no text"));
}

TEST_F(ToldDamage, OfAFileCutShort) {
  WriteLargeHost(file_);
  testing::internal::CaptureStderr();
  ASSERT_EQ(Open(), kOk);
  std::filesystem::resize_file(file_, 4096);
  EXPECT_EQ(CountAnswers(*source_), 0u);
  EXPECT_EQ(testing::internal::GetCapturedStderr(),
            Line("sched/groups/stats/memoryStats: database disk image is malformed"));
}

TEST_F(ToldDamage, Once) {
  EXPECT_EQ(Said("UPDATE reading SET status = -1",
                 [this] {
                   EXPECT_NE(Flags(9), kOk);
                   EXPECT_NE(Flags(7), kOk);
                   EXPECT_NE(ChildrenOf(0), kOk);
                 }),
            Line("sched/groups/groupFlags: a reading has no good status"));
}

// Reads that failed on the host, and those that there are not, are no damage.
TEST_F(ToldDamage, IsNoneInAGoodFile) {
  EXPECT_EQ(Said("UPDATE reading SET status = 0xbad0008, answer = NULL WHERE key1 = 7",
                 [this] {
                   EXPECT_EQ(Flags(7), KSI_STATUS_METADATA_READ_ERROR);
                   EXPECT_EQ(ChildrenOf(9), KSI_STATUS_IO_ERROR);
                   EXPECT_EQ(ChildrenOf(8), KSI_STATUS_NOT_FOUND);
                   EXPECT_EQ(Flags(0), kOk);
                 }),
            "");
}

TEST_F(ToldDamage, IsPrintable) {
  file_ = directory_.Path("\x1b[31mred.ksi");
  EXPECT_EQ(Said("UPDATE reading SET status = -1", [this] { EXPECT_NE(Flags(7), kOk); }),
            directory_.Path("?[31mred.ksi") +
                ": sched/groups/groupFlags: a reading has no good status\n");
}

// Reports whose own messages do not tell of a list or a record that cannot be read.
TEST_F(ToldDamage, OfReportsThatSayNothing) {
  const std::vector<std::pair<std::string, std::string>> reports = {
      {"buddy-stats", "system/buddy"},
      {"comp-stats", "memory/comprehensive"},
      {"pmem-stats", "memory/pmem/volumes"},
      {"pshare-stats", "memory/pshare/stats"},
      {"pshareHint-stats", "memory/pshare/stats"}};
  for (const auto& [report, node] : reports) {
    std::filesystem::copy_file(TALLY_EXAMPLE, file_,
                               std::filesystem::copy_options::overwrite_existing);
    RunSql(file_,
           "UPDATE reading SET answer = 'x' WHERE node IN (SELECT id FROM node WHERE path = '" +
               node + "')");
    const harness::Result result =
        harness::RunProgram(harness::BuiltTally({"-c", file_, "-r", report, "-q"}));
    EXPECT_TRUE(result.err.starts_with(file_ + ": " + node + ": has no ")) << result.err;
  }
}

}  // namespace
}  // namespace ksi
