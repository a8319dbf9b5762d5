#include "tools/ksicache/sampler.h"

#include <ctime>

#include "knvlibs/times.h"
#include "tools/ksicache/host_files.h"
#include "tools/ksicache/host_library.h"
#include "tools/ksicache/host_walk.h"
#include "tools/ksicache/moment_builder.h"

namespace ksicache {
namespace {

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
  facts.taken = ksi::ReadClock(CLOCK_REALTIME);
  if (root_ == nullptr) facts.uptime = ksi::ReadClock(CLOCK_BOOTTIME);
  const int64_t begin = ksi::ReadClock(CLOCK_MONOTONIC);
  const int64_t cpu = ksi::ReadClock(CLOCK_PROCESS_CPUTIME_ID);

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
  facts.duration = static_cast<uint64_t>(ksi::ReadClock(CLOCK_MONOTONIC) - begin);
  facts.cpu = static_cast<uint64_t>(ksi::ReadClock(CLOCK_PROCESS_CPUTIME_ID) - cpu);
  return moment;
}

}  // namespace ksicache
