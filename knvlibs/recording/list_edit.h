// How a list became another one.
//
// Again and again: how many entries stayed, how many went, how many came, and those that came; at
// the end 0, 0, 0, before which the rest of the old list stayed. An entry is 0 and a signed number,
// as difference from the number before it in the edit, or 1 and a text.
#ifndef KNVLIBS_RECORDING_LIST_EDIT_H_
#define KNVLIBS_RECORDING_LIST_EDIT_H_

#include <cstddef>
#include <cstdint>
#include <vector>

#include "knvlibs/recording/bytes.h"
#include "knvlibs/recording/moment.h"

namespace ksi {

// One entry, or key; `before` is the number before it. The text of one that is taken lies in what
// is read.
void PutEntry(const OwnKey& entry, int64_t& before, ByteWriter& out);
Key TakeEntry(ByteReader& in, int64_t& before);

void PutEdit(const std::vector<OwnKey>& before, const std::vector<OwnKey>& after, ByteWriter& out);

// Changes the list; false if the edit is not one of it, or leads to more than `most` entries.
[[nodiscard]] bool TakeEdit(ByteReader& in, size_t most, std::vector<Key>& entries);

// Passes over an edit of a list that is not known.
void PassEdit(ByteReader& in);

}  // namespace ksi

#endif  // KNVLIBS_RECORDING_LIST_EDIT_H_
