// The commands of ksicache, in the order of its help.
#ifndef TOOLS_KSICACHE_COMMANDS_COMMANDS_H_
#define TOOLS_KSICACHE_COMMANDS_COMMANDS_H_

#include "tools/ksicache/command.h"

namespace ksicache {

extern const Command kCapture;
extern const Command kRecord;
extern const Command kMoments;
extern const Command kExtract;
extern const Command kJoin;
extern const Command kInfo;
extern const Command kDump;
extern const Command kDiff;
extern const Command kExport;
extern const Command kPage;
extern const Command kLoad;
extern const Command kCheck;

inline constexpr const Command* kCommands[] = {&kCapture, &kRecord, &kMoments, &kExtract,
                                               &kJoin,    &kInfo,   &kDump,    &kDiff,
                                               &kExport,  &kPage,   &kLoad,    &kCheck};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_COMMANDS_COMMANDS_H_
