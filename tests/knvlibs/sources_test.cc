// Sources of a program's own, and what the library says to people.
#include <gtest/gtest.h>

#include <unistd.h>

#include <cstring>
#include <filesystem>
#include <fstream>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include <knvlibs/ksi_status.h>

extern "C" {
uint32_t NameOfFirstChild(const char* fileName, char* name, size_t size);
void KeepText(void* context, const char* text);
}

namespace {

const char* const kServer = TALLY_TESTS_DIRECTORY "/knvlibs/hosts/systemd-server";
const char* const kMachines = TALLY_TESTS_DIRECTORY "/knvlibs/hosts/kvm-two-nodes";
const char* const kNoHost = TALLY_TESTS_DIRECTORY "/knvlibs/hosts/no such host";

// A source closed with its owner.
class Handle {
 public:
  explicit Handle(KSI_Source* source) : source_(source) {}
  ~Handle() { KSI_CloseSource(source_); }
  Handle(const Handle&) = delete;
  Handle& operator=(const Handle&) = delete;

  operator KSI_Source*() const { return source_; }  // NOLINT: implicit, as in the calls

 private:
  KSI_Source* source_;
};

KSI_Source* Host(const char* root) {
  KSI_Source* source = nullptr;
  EXPECT_EQ(KSI_OpenHost(root, &source), 0U);
  return source;
}

KSI_Source* Cache(const char* fileName) {
  KSI_Source* source = nullptr;
  EXPECT_EQ(KSI_OpenCache(fileName, &source), 0U);
  return source;
}

// The host's memory in KB.
uint64_t TotalOf(KSI_Source* source) {
  KSI_Comprehensive memory;
  EXPECT_EQ(KSI_SourceGet(source, KSI_NODE_memory_comprehensive, nullptr, &memory, sizeof memory),
            0U);
  return memory.total;
}

// The number of the host's heaps; each can be read.
uint32_t CountHeaps(KSI_Source* source) {
  KSI_ParamList* heaps = nullptr;
  if (KSI_SourceGetInstanceListAlloc(source, KSI_NODE_system_heaps, nullptr, &heaps) != 0) return 0;
  const uint32_t count = KSI_ParamListUsedCount(heaps);
  for (uint32_t i = 0; i < count; ++i) {
    const char* name = "";
    KSI_HeapStats heap;
    KSI_ParamList* keys = KSI_ParamListCreate(1, 1);
    EXPECT_EQ(KSI_ParamListGetString(heaps, i, &name), 0U);
    EXPECT_EQ(KSI_ParamListAddString(keys, name), 0U);
    EXPECT_EQ(KSI_SourceGet(source, KSI_NODE_system_heaps_stats, keys, &heap, sizeof heap), 0U);
    EXPECT_EQ(std::strncmp(heap.name, name, sizeof heap.name), 0) << name;
    KSI_ParamListDestroy(keys);
  }
  KSI_ParamListDestroy(heaps);
  return count;
}

TEST(Sources, AreReadSideBySide) {
  const Handle server(Host(kServer));
  const Handle machines(Host(kMachines));
  const Handle example(Cache(TALLY_EXAMPLE));
  const std::set<uint64_t> totals = {TotalOf(server), TotalOf(machines), TotalOf(example)};
  EXPECT_EQ(totals.size(), 3U);
}

TEST(Sources, WithoutAHandleAreTheCurrentOne) {
  ASSERT_EQ(KSI_UseCache(TALLY_EXAMPLE, 0), 0U);
  const Handle server(Host(kServer));
  const Handle example(Cache(TALLY_EXAMPLE));
  EXPECT_EQ(TotalOf(nullptr), TotalOf(example));
  EXPECT_NE(TotalOf(nullptr), TotalOf(server));
  EXPECT_EQ(CountHeaps(nullptr), CountHeaps(example));
  KSI_RefreshSource(nullptr);
  EXPECT_EQ(TotalOf(nullptr), TotalOf(example));
}

TEST(Sources, WithoutARootAreTheHostThatThisIs) {
  const Handle here(Host(nullptr));
  const Handle root(Host("/"));
  EXPECT_EQ(TotalOf(here), TotalOf(root));
}

TEST(Sources, AreReadAgainAfterARefresh) {
  const Handle server(Host(kServer));
  const uint64_t total = TotalOf(server);
  KSI_RefreshSource(server);
  EXPECT_EQ(TotalOf(server), total);
}

TEST(Sources, TellTheirDefinitions) {
  const Handle example(Cache(TALLY_EXAMPLE));
  char kernel[KSI_BUILD_DATE_SIZE] = "";
  const char* own = nullptr;
  const char* built = nullptr;
  EXPECT_EQ(KSI_CheckSig(kernel, sizeof kernel, &own), 0U);
  EXPECT_EQ(KSI_SourceCheckSig(example, kernel, sizeof kernel, &built), 0U);
  EXPECT_STREQ(built, own);
  EXPECT_EQ(std::strlen(kernel), 20U);
  EXPECT_EQ(KSI_SourceCheckSig(example, nullptr, 0, &built), KSI_STATUS_BAD_PARAM);
}

TEST(Sources, ThatDoNotOpenLeaveTheOutput) {
  const Handle server(Host(kServer));
  KSI_Source* source = server;
  EXPECT_EQ(KSI_OpenHost(kNoHost, &source), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(KSI_OpenHost(TALLY_EXAMPLE, &source), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(KSI_OpenHost(kServer, nullptr), KSI_STATUS_BAD_PARAM);
  EXPECT_EQ(KSI_OpenCache(kNoHost, &source), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(KSI_OpenCache(kServer, &source), KSI_STATUS_IS_A_DIRECTORY);
  EXPECT_EQ(KSI_OpenCache(nullptr, &source), KSI_STATUS_BAD_PARAM);
  EXPECT_EQ(KSI_OpenCache(TALLY_EXAMPLE, nullptr), KSI_STATUS_BAD_PARAM);
  EXPECT_EQ(source, static_cast<KSI_Source*>(server));
}

TEST(Sources, MayBeClosedWithoutHavingBeenOpened) {
  ASSERT_EQ(KSI_UseCache(TALLY_EXAMPLE, 0), 0U);
  const uint64_t total = TotalOf(nullptr);
  KSI_CloseSource(nullptr);
  EXPECT_EQ(TotalOf(nullptr), total);
}

TEST(Sources, LeaveTheListsThatWereReadFromThem) {
  KSI_ParamList* heaps = nullptr;
  {
    const Handle example(Cache(TALLY_EXAMPLE));
    ASSERT_EQ(KSI_SourceGetInstanceListAlloc(example, KSI_NODE_system_heaps, nullptr, &heaps), 0U);
  }
  const char* name = "";
  EXPECT_EQ(KSI_ParamListGetString(heaps, 0, &name), 0U);
  EXPECT_STRNE(name, "");
  KSI_ParamListDestroy(heaps);
}

TEST(Sources, RefuseMisuseAsTheReadsDo) {
  const Handle server(Host(kServer));
  KSI_Comprehensive memory;
  const size_t size = sizeof memory;
  EXPECT_EQ(KSI_SourceGet(server, 0, nullptr, &memory, size), KSI_STATUS_INVALID_NODE);
  EXPECT_EQ(KSI_SourceGet(server, KSI_NODE_memory_comprehensive, nullptr, &memory, size - 1),
            KSI_STATUS_LENGTH_MISMATCH);
  EXPECT_EQ(KSI_SourceGet(server, KSI_NODE_memory_comprehensive, nullptr, nullptr, size),
            KSI_STATUS_BAD_PARAM);
  KSI_ParamList* list = nullptr;
  EXPECT_EQ(KSI_SourceGetInstanceListAlloc(server, KSI_NODE_memory_comprehensive, nullptr, &list),
            KSI_STATUS_NO_HANDLER);
  EXPECT_EQ(list, nullptr);
}

TEST(Sources, AreReadFromC) {
  char name[64] = "";
  EXPECT_EQ(NameOfFirstChild(TALLY_EXAMPLE, name, sizeof name), 0U);
  EXPECT_STRNE(name, "");
  EXPECT_EQ(NameOfFirstChild(kNoHost, name, sizeof name), KSI_STATUS_NOT_FOUND);
}

// Reads all heaps of `source` some times; `isRight` is false if an answer was another one.
void ReadRepeatedly(KSI_Source* source, uint32_t heaps, bool* isRight) {
  for (int i = 0; i < 20; ++i) {
    *isRight = *isRight && CountHeaps(source) == heaps;
    if (i % 5 == 0) KSI_RefreshSource(source);
  }
}

void ExpectThreadsToRead(KSI_Source* first, KSI_Source* second) {
  const uint32_t heapsOfFirst = CountHeaps(first);
  const uint32_t heapsOfSecond = CountHeaps(second);
  bool firstIsRight = heapsOfFirst != 0;
  bool secondIsRight = heapsOfSecond != 0;
  std::thread other([&] { ReadRepeatedly(first, heapsOfFirst, &firstIsRight); });
  ReadRepeatedly(second, heapsOfSecond, &secondIsRight);
  other.join();
  EXPECT_TRUE(firstIsRight);
  EXPECT_TRUE(secondIsRight);
}

TEST(Threads, ReadTwoSources) {
  const Handle server(Host(kServer));
  const Handle machines(Host(kMachines));
  const Handle example(Cache(TALLY_EXAMPLE));
  ExpectThreadsToRead(server, machines);
  ExpectThreadsToRead(server, example);
}

TEST(Threads, ReadOneSource) {
  const Handle server(Host(kServer));
  const Handle example(Cache(TALLY_EXAMPLE));
  ExpectThreadsToRead(server, server);
  ExpectThreadsToRead(example, example);
}

TEST(Threads, ReadTheCurrentSourceWhileItIsReplaced) {
  ASSERT_EQ(KSI_UseCache(TALLY_EXAMPLE, 0), 0U);
  const uint32_t heaps = CountHeaps(nullptr);
  bool isRight = true;
  std::thread other([&] { ReadRepeatedly(nullptr, heaps, &isRight); });
  for (int i = 0; i < 20; ++i) EXPECT_EQ(KSI_UseCache(TALLY_EXAMPLE, 0), 0U);
  other.join();
  EXPECT_TRUE(isRight);
}

TEST(StatusText, IsThatOfTheStatus) {
  EXPECT_STREQ(KSI_StatusText(KSI_STATUS_SUCCESS), "Success");
  EXPECT_STREQ(KSI_StatusText(KSI_STATUS_FAILURE), "Failure");
  EXPECT_STREQ(KSI_StatusText(KSI_STATUS_NOT_FOUND), "Not found");
  EXPECT_STREQ(KSI_StatusText(KSI_STATUS_PERMISSION_DENIED), "Permission denied");
  EXPECT_STREQ(KSI_StatusText(KSI_STATUS_LENGTH_MISMATCH), "KSI data length mismatch");
  EXPECT_STREQ(KSI_StatusText(0xbad0000), "Unknown status");
  EXPECT_STREQ(KSI_StatusText(0xbad0160), "Unknown status");
  EXPECT_STREQ(KSI_StatusText(0x2bad0000), "Opaque service console status");
}

// Keeps diagnostics while it lives.
class Diagnostics {
 public:
  Diagnostics() { KSI_SetDiagnosticHandler(&Keep, this); }
  ~Diagnostics() { KSI_SetDiagnosticHandler(nullptr, nullptr); }
  Diagnostics(const Diagnostics&) = delete;
  Diagnostics& operator=(const Diagnostics&) = delete;

  const std::vector<std::string>& Texts() const { return texts_; }

 private:
  static void Keep(void* context, const char* text) {
    static_cast<Diagnostics*>(context)->texts_.emplace_back(text);
  }

  std::vector<std::string> texts_;
};

TEST(DiagnosticHandler, ReceivesWhatIsSaid) {
  testing::internal::CaptureStderr();
  const Diagnostics diagnostics;
  Warning("%s: %u", "read", 7U);
  Warning("%s", "");
  EXPECT_EQ(diagnostics.Texts(), (std::vector<std::string>{"read: 7", ""}));
  EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
}

TEST(DiagnosticHandler, ReceivesWhatTheLibrarySays) {
  namespace fs = std::filesystem;
  const fs::path root = fs::path(testing::TempDir()) / ("tally-said-" + std::to_string(getpid()));
  fs::create_directories(root / "proc");
  std::ofstream(root / "proc/meminfo") << "MemTotal: many kB\n";
  {
    const Diagnostics diagnostics;
    const Handle host(Host(root.c_str()));
    KSI_Comprehensive memory;
    EXPECT_NE(KSI_SourceGet(host, KSI_NODE_memory_comprehensive, nullptr, &memory, sizeof memory),
              0U);
    ASSERT_EQ(diagnostics.Texts().size(), 1U);
    EXPECT_EQ(diagnostics.Texts()[0], "/proc/meminfo: line 1 is not understood\n");
  }
  fs::remove_all(root);
}

TEST(DiagnosticHandler, ReceivesLongTextsWhole) {
  const Diagnostics diagnostics;
  const std::string text(100000, 'x');
  Warning("%s.", text.c_str());
  EXPECT_EQ(diagnostics.Texts(), std::vector<std::string>{text + "."});
}

TEST(DiagnosticHandler, IsReplacedAndTakenAway) {
  char text[64] = "";
  testing::internal::CaptureStderr();
  {
    const Diagnostics diagnostics;
    KSI_SetDiagnosticHandler(&KeepText, text);
    Warning("later");
    EXPECT_TRUE(diagnostics.Texts().empty());
  }
  EXPECT_STREQ(text, "later");
  Warning("to standard error");
  EXPECT_EQ(testing::internal::GetCapturedStderr(), "to standard error");
}

}  // namespace
