// The status word of every operation that can fail.
#ifndef KNVLIBS_STATUS_H_
#define KNVLIBS_STATUS_H_

#include <cstdint>

#include <knvlibs/ksi_status.h>

namespace ksi {

using Status = uint32_t;

constexpr Status kOk = KSI_STATUS_SUCCESS;

// The status for a failed system call's errno.
[[nodiscard]] Status StatusOfErrno(int error);

}  // namespace ksi

#endif  // KNVLIBS_STATUS_H_
