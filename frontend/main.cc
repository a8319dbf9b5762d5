// tally: reads the options up to the report's name, settles where the kernel's figures come from
// and that they are understood, and hands the command line to the report.

#include <getopt.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

#include <knvlibs/ksi.h>
#include "framework/return_status.h"
#include "frontend/usage.h"
#include "reports/reports.h"

// A library that reads no cache files has no need of it.
#pragma weak KSI_SourceWalkStatus

namespace tally {
namespace {

// sic: C1
constexpr char kShortOptions[] = "f:c:r:h";
constexpr option kLongOptions[] = {
    {"force", no_argument, nullptr, 'f'},
    {"cache", required_argument, nullptr, 'c'},
    {"report", required_argument, nullptr, 'r'},
    {"help", no_argument, nullptr, 'h'},
    {nullptr, 0, nullptr, 0},
};

struct Options {
  const Report* report = nullptr;
  const char* cacheFile = nullptr;
  bool checkVersion = true;
};

enum class Next { run, exitSuccess, exitFailure };

Next PrintUsageAndExit(const char* programName, Next next) {
  PrintUsage(programName);
  return next;
}

// Takes the option that the scan stands at.
Next TakeOption(int letter, const char* programName, Options& options) {
  switch (letter) {
    case 'f':
      options.checkVersion = false;
      break;
    case 'c':
      options.cacheFile = optarg;
      break;
    case 'h':
      return PrintUsageAndExit(programName, Next::exitSuccess);
    case 'r':
      options.report = FindReport(optarg);
      if (options.report != nullptr) break;
      Warning("Invalid report %s\n", optarg);
      return PrintUsageAndExit(programName, Next::exitFailure);
    default:
      Warning("Unexpected or out-of-sequence argument detected\n");
      return PrintUsageAndExit(programName, Next::exitFailure);
  }
  return Next::run;
}

// Reads up to the first report: all words after it are the report's.
Next ParseOptions(int argc, char** argv, Options& options) {
  opterr = 0;
  while (options.report == nullptr) {
    const int letter = getopt_long(argc, argv, kShortOptions, kLongOptions, nullptr);
    if (letter == -1) break;
    const Next next = TakeOption(letter, argv[0], options);
    if (next != Next::run) return next;
  }
  return Next::run;
}

bool OpenCache(const char* cacheFile) {
  const Status status = KSI_UseCache(cacheFile, 0);
  if (status != kSuccess) {
    Warning("Couldn't open cache file %s, error code: %u\n", cacheFile, status);
  }
  return status == kSuccess;
}

// Whether the library's definitions are the kernel's.
bool CheckVersion() {
  char buildBuffer[KSI_BUILD_DATE_SIZE] = {};
  const char* appBuild = nullptr;
  const Status status = KSI_CheckSig(buildBuffer, sizeof buildBuffer, &appBuild);
  if (status != kSuccess) {
    buildBuffer[sizeof buildBuffer - 1] = '\0';
    Warning(
        "%#x: md5 signature mismatch with running kernova built on %s. (vs %s for app sysinfo)\n",
        status, buildBuffer, appBuild);
  }
  return status == kSuccess;
}

// Groups of a damaged cache file that contain each other make a walk that is never whole, which the
// walk itself does not tell.
bool CheckWalk() {
  if (KSI_SourceWalkStatus == nullptr) return true;
  const Status status = KSI_SourceWalkStatus(nullptr);
  if (status != kSuccess) {
    Warning("tally: groups contain each other, rows are missing: %s\n",
            KNV_ReturnStatusToString(status));
  }
  return status == kSuccess;
}

int Run(int argc, char** argv) {
  Options options;
  switch (ParseOptions(argc, argv, options)) {
    case Next::run:
      break;
    case Next::exitSuccess:
      return EXIT_SUCCESS;
    case Next::exitFailure:
      return EXIT_FAILURE;
  }
  if (options.cacheFile != nullptr && !OpenCache(options.cacheFile)) return EXIT_FAILURE;
  if (!CheckVersion() && options.checkVersion) {
    Warning("Version check failed\n");
    return EXIT_FAILURE;
  }
  // sic: C52
  if (options.report == nullptr) {
    PrintUsage(argv[0]);
    return EXIT_SUCCESS;
  }
  const Status status = options.report->entry(argc, argv);
  const bool whole = options.cacheFile == nullptr || CheckWalk();
  return status == kSuccess && whole ? EXIT_SUCCESS : EXIT_FAILURE;
}

// Rows that were printed before memory ran out stay.
int RunGuarded(int argc, char** argv) {
  try {
    return Run(argc, argv);
  } catch (const std::bad_alloc&) {
    Warning("tally: out of memory\n");
    return EXIT_FAILURE;
  }
}

// Rows that could not be written must not pass for written.
bool CloseStandardOutput() {
  const bool lostRows = std::ferror(stdout) != 0;
  const int closed = std::fclose(stdout);
  if (closed == 0 && !lostRows) return true;
  Warning("tally: cannot write standard output: %s\n",
          closed != 0 ? std::strerror(errno) : "output was lost");
  return false;
}

}  // namespace
}  // namespace tally

int main(int argc, char** argv) {
  const int exitStatus = tally::RunGuarded(argc, argv);
  return tally::CloseStandardOutput() ? exitStatus : EXIT_FAILURE;
}
