// The messages of kernel return statuses, whatever library the program meets. Both names are part
// of the executable's interface and exported from it.
#ifndef FRAMEWORK_RETURN_STATUS_H_
#define FRAMEWORK_RETURN_STATUS_H_

#include <cstdint>

extern "C" {

// Entry n is the message of status 0xbad0000 + n; entry 0 that of success. Never null.
__attribute__((visibility("default"))) extern const char* const returnStatusStrs[352];

// The message of `status`: constant text, never null.
__attribute__((visibility("default"))) const char* KNV_ReturnStatusToString(uint32_t status);
}

#endif  // FRAMEWORK_RETURN_STATUS_H_
