#ifndef FRONTEND_USAGE_H_
#define FRONTEND_USAGE_H_

namespace tally {

// Prints the usage text to standard output; `programName` is the word the program was started as.
void PrintUsage(const char* programName);

}  // namespace tally

#endif  // FRONTEND_USAGE_H_
