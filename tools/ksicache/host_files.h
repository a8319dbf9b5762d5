// What a capture says of its host that is no reading: who it is.
#ifndef TOOLS_KSICACHE_HOST_FILES_H_
#define TOOLS_KSICACHE_HOST_FILES_H_

#include <string>

#include "tools/ksicache/command.h"

namespace ksicache {

// Of whom, if it is not this host: null for this one.
inline constexpr Option kRoot = {"root", "DIR", "take the host whose files are recorded below DIR"};

// Fails with an Error if no Linux host has its files there.
void CheckRoot(const std::string& root);

// "unknown" if it has none or, which is said and told by `isRead`, if it cannot be read.
std::string HostName(const std::string* root, bool& isRead);

// The kernel's random name for the time since it started; empty if there is none, or it cannot be
// read.
std::string BootOf(const std::string* root);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_HOST_FILES_H_
