// Recordings of hosts that change at random.
#ifndef TESTS_KSICACHE_RECORDING_FIXTURE_H_
#define TESTS_KSICACHE_RECORDING_FIXTURE_H_

#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <functional>
#include <memory>
#include <random>
#include <string>
#include <vector>

#include "knvlibs/recording/moment.h"
#include "knvlibs/recording/recording_file.h"
#include "tests/knvlibs/recording/random_host.h"
#include "tests/ksicache/ksicache_fixture.h"
#include "tools/ksicache/recorder.h"
#include "tools/ksicache/recording_store.h"

namespace ksi {

class RecordingTest : public Ksicache {
 protected:
  static constexpr int64_t kSecond = 1'000'000;
  static constexpr int64_t kUnbounded = int64_t{1} << 40;

  // 2026-11-21T10:00:00Z
  static constexpr int64_t kStart = 1'795'255'200 * kSecond;

  static HostIdentity Host(const std::string& name = "h") {
    return {std::string(kDefinitions.signature), std::string(kDefinitions.built), name, "",
            RecordedNodes()};
  }

  // Moments each `every` seconds from `start` on.
  static std::vector<Moment> MakeMoments(uint32_t seed, size_t count, int64_t start = kStart,
                                         int64_t every = 5) {
    RandomHost host(seed);
    std::vector<Moment> moments;
    for (size_t i = 0; i < count; ++i) {
      Moment& moment = moments.emplace_back();
      moment.host = Host();
      moment.facts.taken = start + static_cast<int64_t>(i) * every * kSecond;
      moment.readings = host.Next();
    }
    return moments;
  }

  // A moment that takes some KB, however it is packed: for each group some hundred bytes.
  static Moment NoiseAt(int64_t number, int64_t groups = 8) {
    std::mt19937_64 random(static_cast<uint64_t>(number));
    Moment moment;
    moment.host = Host();
    moment.facts.taken = kStart + number * kSecond;
    const auto node =
        std::ranges::find(RecordedNodes(), "sched/groups/stats/memoryStats", &RecordedNode::path);
    for (int64_t group = 0; group < groups; ++group) {
      MomentReading& reading = moment.readings.emplace_back();
      reading.question.node = static_cast<uint32_t>(node - RecordedNodes().begin());
      reading.question.keys[0] = group;
      for (size_t i = 0; i < node->recordSize; ++i) {
        reading.answer.record.push_back(static_cast<std::byte>(random()));
      }
    }
    return moment;
  }

  static void MakeEmpty(const std::string& fileName) {
    const Bytes empty = ksicache::RecordingStore::Empty("h");
    WriteContent(fileName, {reinterpret_cast<const char*>(empty.data()), empty.size()});
  }

  // A recording of such moments.
  static void Record(const std::string& fileName, const std::vector<Moment>& moments) {
    MakeEmpty(fileName);
    ksicache::RecordingStore store(fileName, kUnbounded);
    ksicache::Recorder recorder(store);
    for (const Moment& moment : moments) {
      recorder.Add(moment.host, moment.facts, moment.readings);
      recorder.Tidy();
    }
  }

  // Null, and a failed test, if it cannot be opened.
  static std::unique_ptr<RecordingFile> OpenFile(const std::string& fileName) {
    auto database = std::make_unique<CacheDatabase>();
    std::unique_ptr<RecordingFile> file;
    std::string why;
    EXPECT_EQ(database->Open(fileName.c_str()), kOk) << database->Why();
    EXPECT_EQ(RecordingFile::Make(std::move(database), &file, &why), kOk) << why;
    return file;
  }

  // Runs in a process of its own, and programs from there, that may take neither much memory nor
  // long.
  static void ExpectBounded(const std::function<void()>& run) {
    const pid_t child = fork();
    if (child == 0) {
#ifndef TALLY_SANITIZED
      const rlimit memory = {rlim_t{1} << 30, rlim_t{1} << 30};
      setrlimit(RLIMIT_AS, &memory);
#endif
      const rlimit seconds = {20, 20};
      setrlimit(RLIMIT_CPU, &seconds);
      run();
      _exit(HasFailure() ? 1 : 0);
    }
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    ASSERT_EQ(status, 0);
  }

  // Expects the moments from `number` on to be these.
  static void ExpectMoments(RecordingFile& file, const std::vector<Moment>& moments,
                            int64_t number = 0) {
    for (const Moment& wanted : moments) {
      SCOPED_TRACE("moment " + std::to_string(number));
      Moment moment;
      ChunkReader reader;
      ASSERT_EQ(file.ReadWhole(number++, reader, moment), kOk) << file.Why();
      SortReadings(moment.readings);
      ASSERT_EQ(moment.facts, wanted.facts);
      ASSERT_EQ(moment.host, wanted.host);
      ASSERT_EQ(moment.readings, wanted.readings);
    }
  }
};

}  // namespace ksi

#endif  // TESTS_KSICACHE_RECORDING_FIXTURE_H_
