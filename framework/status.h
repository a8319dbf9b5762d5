// Status words: the only error channel of the program.
#ifndef FRAMEWORK_STATUS_H_
#define FRAMEWORK_STATUS_H_

#include <cstdint>

#include <knvlibs/ksi_status.h>

namespace tally {

// A kernel return status: 0 for success, else 0xbad0001 and upward.
using Status = uint32_t;

constexpr Status kSuccess = KSI_STATUS_SUCCESS;
constexpr Status kFailure = KSI_STATUS_FAILURE;         // a parameter list could not be created
constexpr Status kNotFound = KSI_STATUS_NOT_FOUND;      // an expected object is missing
constexpr Status kBadParameter = KSI_STATUS_BAD_PARAM;  // what the user typed cannot be taken
constexpr Status kOutOfMemory = KSI_STATUS_NO_MEMORY;   // too many distinct tags

}  // namespace tally

#endif  // FRAMEWORK_STATUS_H_
