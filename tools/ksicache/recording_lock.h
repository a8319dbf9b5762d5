// Who records into a file: two locks, one that is the opening's, and one that tells whose it is.
#ifndef TOOLS_KSICACHE_RECORDING_LOCK_H_
#define TOOLS_KSICACHE_RECORDING_LOCK_H_

#include <string>

namespace ksicache {

// Takes the one for this opening of the file, for as long as it is open. False if there is another
// one's or, errno says why, it cannot be taken.
[[nodiscard]] bool LockRecording(int file);

// Lets others know which process this is. They do not any more once this process has closed any
// descriptor of the file.
void TellRecorder(int file);

// "process 123" or "another process"; empty if nobody records into it.
std::string RecorderOf(int file);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_RECORDING_LOCK_H_
