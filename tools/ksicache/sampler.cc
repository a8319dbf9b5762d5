#include "tools/ksicache/sampler.h"

#include <ctime>

#include "tools/ksicache/host_files.h"
#include "tools/ksicache/host_library.h"
#include "tools/ksicache/host_walk.h"
#include "tools/ksicache/moment_builder.h"

namespace ksicache {
namespace {

int64_t MicrosecondsOf(clockid_t clock) {
  struct timespec now = {};
  clock_gettime(clock, &now);
  return int64_t{now.tv_sec} * 1'000'000 + now.tv_nsec / 1000;
}

// A library that is opened anew keeps nothing of what was read before.
const std::string* RootToOpen(const std::string* root) {
  static const std::string kOwn = "/";
  return root == nullptr && HostLibrary::OpensHosts() ? &kOwn : root;
}

}  // namespace

Sampler::Sampler(const std::string* root) : root_(root) {}

ksi::Moment Sampler::Take() {
  ksi::Moment moment;
  ksi::MomentFacts& facts = moment.facts;
  facts.taken = MicrosecondsOf(CLOCK_REALTIME);
  if (root_ == nullptr) facts.uptime = MicrosecondsOf(CLOCK_BOOTTIME);
  const int64_t begin = MicrosecondsOf(CLOCK_MONOTONIC);
  const int64_t cpu = MicrosecondsOf(CLOCK_PROCESS_CPUTIME_ID);

  HostLibrary library(RootToOpen(root_));
  MomentBuilder builder(count_);
  HostWalk walk(library, builder);
  walk.Run(false);
  walk.RequireFound();
  moment.readings = builder.Take();
  count_ = moment.readings.size();

  facts.refused = walk.GetFailures().refused.Count();
  facts.failed = walk.GetFailures().failed.Count();
  facts.loss = library.LossStatus();
  const HostLibrary::Definitions definitions = library.KernelDefinitions();
  bool isNameRead = false;
  moment.host = {definitions.signature, definitions.built, HostName(root_, isNameRead),
                 BootOf(root_), ksi::RecordedNodes()};
  facts.duration = static_cast<uint64_t>(MicrosecondsOf(CLOCK_MONOTONIC) - begin);
  facts.cpu = static_cast<uint64_t>(MicrosecondsOf(CLOCK_PROCESS_CPUTIME_ID) - cpu);
  return moment;
}

}  // namespace ksicache
