#include "knvlibs/status.h"

#include <cerrno>

namespace ksi {

Status StatusOfErrno(int error) {
  switch (error) {
    case ENOENT:
    case ENOTDIR:
    case ESRCH:   // a process that ended between the opening and the reading of its file
    case ENODEV:  // the same of a cgroup
      return KSI_STATUS_NOT_FOUND;
    case EACCES:
    case EPERM:
      return KSI_STATUS_PERMISSION_DENIED;
    case EISDIR:
      return KSI_STATUS_IS_A_DIRECTORY;
    case ENOMEM:
      return KSI_STATUS_NO_MEMORY;
    default:
      return KSI_STATUS_IO_ERROR;
  }
}

}  // namespace ksi
