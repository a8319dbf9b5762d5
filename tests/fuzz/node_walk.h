#ifndef TESTS_FUZZ_NODE_WALK_H_
#define TESTS_FUZZ_NODE_WALK_H_

#include <string_view>

#include "knvlibs/source.h"

namespace fuzz {

// Reads and lists all nodes below `path` for the keys that every host has, and for those that the
// lists name.
void ReadAllNodes(ksi::Source& source, std::string_view path = "");

}  // namespace fuzz

#endif  // TESTS_FUZZ_NODE_WALK_H_
