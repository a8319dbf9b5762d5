// capture: records a host, whatever libknvlibs.so answers of it.
#include <unistd.h>

#include <ctime>
#include <string>
#include <string_view>

#include "knvlibs/times.h"
#include "tools/ksicache/cache_writer.h"
#include "tools/ksicache/commands/commands.h"
#include "tools/ksicache/diagnostics.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/host_files.h"
#include "tools/ksicache/host_library.h"
#include "tools/ksicache/host_walk.h"
#include "tools/ksicache/new_file.h"
#include "tools/ksicache/output.h"

namespace ksicache {
namespace {

constexpr const Option* kOptions[] = {&kForce, &kMode, &kRoot};

// The lines on what was captured; on standard error if the file itself is on standard output.
class Account {
 public:
  explicit Account(bool onStandardError) : say_(onStandardError ? PrintError : PrintLine) {}

  void OfFile(const CacheWriter& writer, const std::string& host) const {
    say_(writer.Name() + ": " + std::to_string(writer.Values()) + " values and " +
         std::to_string(writer.Lists()) + " lists of " + host);
  }

  // `loss`: why the library left out what could not be read.
  void OfFailures(const Failures& failures, const Diagnostics& diagnostics,
                  ksi::Status loss) const {
    if (failures.absent.Count() != 0) {
      say_("absent     " + std::to_string(failures.absent.Count()) +
           ": not everything has every node");
    }
    if (failures.refused.Count() != 0) {
      say_("refused    " + failures.refused.Text());
    }
    // What is refused of a record that is read otherwise is a figure without a value in it.
    const size_t said = diagnostics.Count();
    if (said != 0 || geteuid() != 0) {
      say_("no value   figures without one may have been refused" +
           (said == 0 ? "" : "; diagnostics: " + std::to_string(said)));
    }
    if (geteuid() != 0 || diagnostics.TellRefusals() || failures.refused.Count() != 0) OfRights();
    if (failures.failed.Count() != 0) say_("failed     " + failures.failed.Text());
    if (loss != ksi::kOk) say_("left out   what could not be read: " + StatusText(loss));
  }

 private:
  void OfRights() const {
    say_(geteuid() == 0 ? "           it needs CAP_SYS_PTRACE and CAP_DAC_READ_SEARCH to read all"
                        : "           run it as root to read all");
  }

  void (*say_)(std::string_view);
};

int Capture(const CommandLine& line) {
  const std::string& fileName = line.arguments[0];
  const std::string* root = line.ValueOf(kRoot);
  CheckOptionsFor(fileName, line);
  const mode_t mode = ModeOf(line);
  if (root != nullptr || HostLibrary::OpensHosts()) CheckRoot(root == nullptr ? "/" : *root);
  CacheWriter writer(fileName, line.Has(kForce), mode);
  Diagnostics diagnostics;
  HostLibrary library(root);
  const std::string taken = ksi::TextOfTime(ksi::ReadClock(CLOCK_REALTIME));
  HostWalk walk(library, writer);
  walk.Run(true);
  diagnostics.Say();
  walk.RequireFound();

  const HostLibrary::Definitions definitions = library.KernelDefinitions();
  bool isNameRead = false;
  const std::string host = HostName(root, isNameRead);
  writer.Commit({definitions.signature, definitions.built, host, taken});
  const Account account(fileName == "-");
  account.OfFile(writer, host);
  const ksi::Status loss = library.LossStatus();
  account.OfFailures(walk.GetFailures(), diagnostics, loss);
  return walk.GetFailures().failed.Count() == 0 && loss == ksi::kOk && isNameRead ? 0 : 1;
}

}  // namespace

const Command kCapture = {
    .name = "capture",
    .arguments = "FILE",
    .summary = "record every node and instance of this host in FILE",
    .help =
        R"(Records every node and every instance of this host in FILE, as libknvlibs.so
tells them; "-" is standard output. A read that fails is recorded with its
status, and fails again when the file is read. What failed is said:

  absent   of nodes that the host, or a thing on it, does not have
  refused  for want of rights; the superuser sees most
  failed   for another reason, which makes the exit status 1
  left out of an answer for such a reason, which does so too

Figures without a value in what was read may have been refused too. It is said
where that can be: without the superuser's rights, or after diagnostics.
)",
    .options = kOptions,
    .fewest = 1,
    .most = 1,
    .run = Capture,
};

}  // namespace ksicache
