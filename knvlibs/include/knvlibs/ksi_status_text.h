/* The messages of the return statuses. A program that may meet a library without KSI_StatusText
 * (ksi.h) has them from here.
 */
#ifndef KNVLIBS_KSI_STATUS_TEXT_H_
#define KNVLIBS_KSI_STATUS_TEXT_H_

#include <stdint.h>

/* Where statuses begin, and where those of the service console do, whose messages are its own. */
#define KSI_STATUS_BASE 0xbad0000u
#define KSI_STATUS_SERVICE_CONSOLE_BASE 0x2bad0000u

/* TEXT(row, message): row n is the message of status KSI_STATUS_BASE + n, row 0 that of success. */
/* clang-format off */
#define KSI_STATUS_TEXTS(TEXT)                                                                     \
  TEXT(0x000, "Success")                                                                           \
  TEXT(0x001, "Failure")                                                                           \
  TEXT(0x002, "Would block")                                                                       \
  TEXT(0x003, "Not found")                                                                         \
  TEXT(0x004, "Busy")                                                                              \
  TEXT(0x005, "Already exists")                                                                    \
  TEXT(0x006, "Limit exceeded")                                                                    \
  TEXT(0x007, "Bad parameter")                                                                     \
  TEXT(0x008, "Metadata read error")                                                               \
  TEXT(0x009, "Metadata write error")                                                              \
  TEXT(0x00a, "I/O error")                                                                         \
  TEXT(0x00b, "Read error")                                                                        \
  TEXT(0x00c, "Write error")                                                                       \
  TEXT(0x00d, "Invalid name")                                                                      \
  TEXT(0x00e, "Invalid handle")                                                                    \
  TEXT(0x00f, "No such SCSI adapter")                                                              \
  TEXT(0x010, "No such target on adapter")                                                         \
  TEXT(0x011, "No such partition on target")                                                       \
  TEXT(0x012, "No filesystem on the device")                                                       \
  TEXT(0x013, "Memory map mismatch")                                                               \
  TEXT(0x014, "Out of memory")                                                                     \
  TEXT(0x015, "Out of memory (ok to retry)")                                                       \
  TEXT(0x016, "Out of large pages")                                                                \
  TEXT(0x017, "Out of resources")                                                                  \
  TEXT(0x018, "No free handles")                                                                   \
  TEXT(0x019, "Exceeded maximum number of allowed handles")                                        \
  TEXT(0x01a, "No free pointer blocks (deprecated)")                                               \
  TEXT(0x01b, "No free data blocks (deprecated)")                                                  \
  TEXT(0x01c, "Corrupt RedoLog")                                                                   \
  TEXT(0x01d, "Status pending")                                                                    \
  TEXT(0x01e, "Status free")                                                                       \
  TEXT(0x01f, "Unsupported CPU")                                                                   \
  TEXT(0x020, "Not supported")                                                                     \
  TEXT(0x021, "Timeout")                                                                           \
  TEXT(0x022, "Read only")                                                                         \
  TEXT(0x023, "SCSI reservation conflict")                                                         \
  TEXT(0x024, "File system locked")                                                                \
  TEXT(0x025, "Out of slots")                                                                      \
  TEXT(0x026, "Invalid address")                                                                   \
  TEXT(0x027, "Not shared")                                                                        \
  TEXT(0x028, "Page is shared")                                                                    \
  TEXT(0x029, "Kseg pair flushed")                                                                 \
  TEXT(0x02a, "Max async I/O requests pending")                                                    \
  TEXT(0x02b, "Minor version mismatch")                                                            \
  TEXT(0x02c, "Major version mismatch")                                                            \
  TEXT(0x02d, "Already connected")                                                                 \
  TEXT(0x02e, "Already disconnected")                                                              \
  TEXT(0x02f, "Already enabled")                                                                   \
  TEXT(0x030, "Already disabled")                                                                  \
  TEXT(0x031, "Not initialized")                                                                   \
  TEXT(0x032, "Wait interrupted")                                                                  \
  TEXT(0x033, "Name too long")                                                                     \
  TEXT(0x034, "KNFS volume missing physical extents")                                              \
  TEXT(0x035, "NIC teaming master valid")                                                          \
  TEXT(0x036, "NIC teaming slave")                                                                 \
  TEXT(0x037, "NIC teaming regular KNIC")                                                          \
  TEXT(0x038, "Abort not running")                                                                 \
  TEXT(0x039, "Not ready")                                                                         \
  TEXT(0x03a, "Checksum mismatch")                                                                 \
  TEXT(0x03b, "VLan HW Acceleration not supported")                                                \
  TEXT(0x03c, "VLan is not supported in kernova")                                                  \
  TEXT(0x03d, "Not a VLan handle")                                                                 \
  TEXT(0x03e, "Couldn't retrieve VLan id")                                                         \
  TEXT(0x03f, "Connection closed by remote host, possibly due to timeout")                         \
  TEXT(0x040, "No connection")                                                                     \
  TEXT(0x041, "Segment overlap")                                                                   \
  TEXT(0x042, "Error parsing MPS Table")                                                           \
  TEXT(0x043, "Error parsing ACPI Table")                                                          \
  TEXT(0x044, "Failed to resume virtual machine")                                                  \
  TEXT(0x045, "Insufficient address space for operation")                                          \
  TEXT(0x046, "Bad address range")                                                                 \
  TEXT(0x047, "Network is down")                                                                   \
  TEXT(0x048, "Network unreachable")                                                               \
  TEXT(0x049, "Network dropped connection on reset")                                               \
  TEXT(0x04a, "Software caused connection abort")                                                  \
  TEXT(0x04b, "Connection reset by peer")                                                          \
  TEXT(0x04c, "Socket is not connected")                                                           \
  TEXT(0x04d, "Cannot send after socket shutdown")                                                 \
  TEXT(0x04e, "Too many references: cannot splice")                                                \
  TEXT(0x04f, "Connection refused")                                                                \
  TEXT(0x050, "Host is down")                                                                      \
  TEXT(0x051, "No route to host")                                                                  \
  TEXT(0x052, "Address already in use")                                                            \
  TEXT(0x053, "Broken pipe")                                                                       \
  TEXT(0x054, "Not a directory")                                                                   \
  TEXT(0x055, "Is a directory")                                                                    \
  TEXT(0x056, "Directory not empty")                                                               \
  TEXT(0x057, "Not implemented")                                                                   \
  TEXT(0x058, "No signal handler")                                                                 \
  TEXT(0x059, "Fatal signal blocked")                                                              \
  TEXT(0x05a, "Permission denied")                                                                 \
  TEXT(0x05b, "Operation not permitted")                                                           \
  TEXT(0x05c, "Undefined syscall")                                                                 \
  TEXT(0x05d, "Result too large")                                                                  \
  TEXT(0x05e, "Pkts dropped because of VLAN (support) mismatch")                                   \
  TEXT(0x05f, "Unsafe exception frame")                                                            \
  TEXT(0x060, "Necessary module isn't loaded")                                                     \
  TEXT(0x061, "No dead world by that name")                                                        \
  TEXT(0x062, "No cartel by that name")                                                            \
  TEXT(0x063, "Is a symbolic link")                                                                \
  TEXT(0x064, "Cross-device link")                                                                 \
  TEXT(0x065, "Not a socket")                                                                      \
  TEXT(0x066, "Illegal seek")                                                                      \
  TEXT(0x067, "Unsupported address family")                                                        \
  TEXT(0x068, "Already connected")                                                                 \
  TEXT(0x069, "World is marked for death")                                                         \
  TEXT(0x06a, "No valid scheduler assignment")                                                     \
  TEXT(0x06b, "Invalid cpu min")                                                                   \
  TEXT(0x06c, "Invalid cpu minLimit")                                                              \
  TEXT(0x06d, "Invalid cpu max")                                                                   \
  TEXT(0x06e, "Invalid cpu shares")                                                                \
  TEXT(0x06f, "CPU min outside valid range")                                                       \
  TEXT(0x070, "CPU minLimit outside valid range")                                                  \
  TEXT(0x071, "CPU max outside valid range")                                                       \
  TEXT(0x072, "CPU min exceeds minLimit")                                                          \
  TEXT(0x073, "CPU min exceeds max")                                                               \
  TEXT(0x074, "CPU minLimit less than cpu already reserved by children")                           \
  TEXT(0x075, "CPU max less than cpu already reserved by children")                                \
  TEXT(0x076, "Admission check failed for cpu resource")                                           \
  TEXT(0x077, "Invalid memory min")                                                                \
  TEXT(0x078, "Invalid memory minLimit")                                                           \
  TEXT(0x079, "Invalid memory max")                                                                \
  TEXT(0x07a, "Memory min outside valid range")                                                    \
  TEXT(0x07b, "Memory minLimit outside valid range")                                               \
  TEXT(0x07c, "Memory max outside valid range")                                                    \
  TEXT(0x07d, "Memory min exceeds minLimit")                                                       \
  TEXT(0x07e, "Memory min exceeds max")                                                            \
  TEXT(0x07f, "Memory minLimit less than memory already reserved by children")                     \
  TEXT(0x080, "Memory max less than memory already reserved by children")                          \
  TEXT(0x081, "Admission check failed for memory resource")                                        \
  TEXT(0x082, "No swap file")                                                                      \
  TEXT(0x083, "Bad parameter count")                                                               \
  TEXT(0x084, "Bad parameter type")                                                                \
  TEXT(0x085, "Dueling unmaps (ok to retry)")                                                      \
  TEXT(0x086, "Inappropriate ioctl for device")                                                    \
  TEXT(0x087, "Mmap changed under page fault (ok to retry)")                                       \
  TEXT(0x088, "Operation now in progress")                                                         \
  TEXT(0x089, "Address temporarily unmapped")                                                      \
  TEXT(0x08a, "Invalid buddy type")                                                                \
  TEXT(0x08b, "Large page info not found")                                                         \
  TEXT(0x08c, "Invalid large page info")                                                           \
  TEXT(0x08d, "SCSI LUN is in snapshot state")                                                     \
  TEXT(0x08e, "SCSI LUN is in transition")                                                         \
  TEXT(0x08f, "Transaction ran out of lock space or log space")                                    \
  TEXT(0x090, "Lock was not free")                                                                 \
  TEXT(0x091, "Exceed maximum number of files on the filesystem")                                  \
  TEXT(0x092, "Migration determined a failure by the KMX")                                         \
  TEXT(0x093, "KSI GetList handler overflow")                                                      \
  TEXT(0x094, "Invalid world")                                                                     \
  TEXT(0x095, "Invalid vmm")                                                                       \
  TEXT(0x096, "Invalid transaction")                                                               \
  TEXT(0x097, "Transient file system condition, suggest retry")                                    \
  TEXT(0x098, "Number of running VCPUs limit exceeded")                                            \
  TEXT(0x099, "Invalid metadata")                                                                  \
  TEXT(0x09a, "Invalid page number")                                                               \
  TEXT(0x09b, "Not in executable format")                                                          \
  TEXT(0x09c, "Unable to connect to NFS server")                                                   \
  TEXT(0x09d, "The NFS server does not support MOUNT version 3 over TCP")                          \
  TEXT(0x09e, "The NFS server does not support NFS version 3 over TCP")                            \
  TEXT(0x09f, "The NFS server denied the mount request")                                           \
  TEXT(0x0a0, "The specified mount path was not a directory")                                      \
  TEXT(0x0a1, "Unable to query remote mount point's attributes")                                   \
  TEXT(0x0a2, "NFS has reached the maximum number of supported volumes")                           \
  TEXT(0x0a3, "Out of nice memory")                                                                \
  TEXT(0x0a4, "Migration failed to start due to lack of CPU or memory resources")                  \
  TEXT(0x0a5, "Cache miss")                                                                        \
  TEXT(0x0a6, "Error induced when stress options are enabled")                                     \
  TEXT(0x0a7, "Maximum number of concurrent hosts are already accessing this resource")            \
  TEXT(0x0a8, "Host doesn't have a journal")                                                       \
  TEXT(0x0a9, "Lock rank violation detected")                                                      \
  TEXT(0x0aa, "Module failed")                                                                     \
  TEXT(0x0ab, "Unable to open slave if no master pty")                                             \
  TEXT(0x0ac, "Not IOAble")                                                                        \
  TEXT(0x0ad, "No free inodes")                                                                    \
  TEXT(0x0ae, "No free memory for file data")                                                      \
  TEXT(0x0af, "No free space to expand file or meta data")                                         \
  TEXT(0x0b0, "Unable to open writer if no fifo reader")                                           \
  TEXT(0x0b1, "No underlying device for major,minor")                                              \
  TEXT(0x0b2, "Memory min exceeds memSize")                                                        \
  TEXT(0x0b3, "No virtual terminal for number")                                                    \
  TEXT(0x0b4, "Too many elements for list")                                                        \
  TEXT(0x0b5, "VMM<->KNV shared area mismatch")                                                    \
  TEXT(0x0b6, "Failure during exec while original state already lost")                             \
  TEXT(0x0b7, "Invalid module")                                                                    \
  TEXT(0x0b8, "Address is not aligned on required boundary")                                       \
  TEXT(0x0b9, "Address is not mapped in address space")                                            \
  TEXT(0x0ba, "No space to record a message")                                                      \
  TEXT(0x0bb, "Invalid exception handler")                                                         \
  TEXT(0x0bc, "Exception not handled by exception handler")                                        \
  TEXT(0x0bd, "Cannot open sparse/TBZ files in multiwriter mode")                                  \
  TEXT(0x0be, "Transient storage condition, suggest retry")                                        \
  TEXT(0x0bf, "Storage initiator error")                                                           \
  TEXT(0x0c0, "Timer initialization failed")                                                       \
  TEXT(0x0c1, "Module not found")                                                                  \
  TEXT(0x0c2, "Socket not owned by cartel")                                                        \
  TEXT(0x0c3, "No KSI handler found for the requested node")                                       \
  TEXT(0x0c4, "Invalid mmap protection flags")                                                     \
  TEXT(0x0c5, "Invalid chunk size for contiguous mmap ")                                           \
  TEXT(0x0c6, "Invalid MPN max for contiguous mmap ")                                              \
  TEXT(0x0c7, "Invalid mmap flag on contiguous mmap ")                                             \
  TEXT(0x0c8, "Unexpected fault on pre-faulted memory region")                                     \
  TEXT(0x0c9, "Memory region cannot be split (remap/unmap)")                                       \
  TEXT(0x0ca, "Cache Information not available")                                                   \
  TEXT(0x0cb, "Cannot remap pinned memory")                                                        \
  TEXT(0x0cc, "No cartel group by that name")                                                      \
  TEXT(0x0cd, "SPLock stats collection disabled")                                                  \
  TEXT(0x0ce, "Boot image is corrupted")                                                           \
  TEXT(0x0cf, "Branched file cannot be modified")                                                  \
  TEXT(0x0d0, "Name is reserved for branched file")                                                \
  TEXT(0x0d1, "Unlinked file cannot be branched")                                                  \
  TEXT(0x0d2, "Maximum kernel-level retries exceeded")                                             \
  TEXT(0x0d3, "Optimistic lock acquired by another host")                                          \
  TEXT(0x0d4, "Object cannot be mmapped")                                                          \
  TEXT(0x0d5, "Invalid cpu affinity")                                                              \
  TEXT(0x0d6, "Device does not contain a logical volume")                                          \
  TEXT(0x0d7, "No space left on device")                                                           \
  TEXT(0x0d8, "Invalid ksi node ID")                                                               \
  TEXT(0x0d9, "Too many users accessing this resource")                                            \
  TEXT(0x0da, "Operation already in progress")                                                     \
  TEXT(0x0db, "Buffer too small to complete the operation")                                        \
  TEXT(0x0dc, "Snapshot device disallowed")                                                        \
  TEXT(0x0dd, "LVM device unreachable")                                                            \
  TEXT(0x0de, "Invalid cpu resource units")                                                        \
  TEXT(0x0df, "Invalid memory resource units")                                                     \
  TEXT(0x0e0, "IO was aborted")                                                                    \
  TEXT(0x0e1, "Memory min less than memory already reserved by children")                          \
  TEXT(0x0e2, "Memory min less than memory required to support current consumption")               \
  TEXT(0x0e3, "Memory max less than memory required to support current consumption")               \
  TEXT(0x0e4, "Timeout (ok to retry) DEPRECATED")                                                  \
  TEXT(0x0e5, "Reservation Lost")                                                                  \
  TEXT(0x0e6, "Cached metadata is stale")                                                          \
  TEXT(0x0e7, "No fcntl lock slot left")                                                           \
  TEXT(0x0e8, "No fcntl lock holder slot left")                                                    \
  TEXT(0x0e9, "No fcntl lock record found")                                                        \
  TEXT(0x0ea, "Kernova module necessary for this ksi call not loaded")                             \
  TEXT(0x0eb, "Transient LVM device condition, suggest retry")                                     \
  TEXT(0x0ec, "Snapshot LV incomplete")                                                            \
  TEXT(0x0ed, "Medium not found")                                                                  \
  TEXT(0x0ee, "Maximum allowed SCSI paths have already been claimed")                              \
  TEXT(0x0ef, "Filesystem is not mountable")                                                       \
  TEXT(0x0f0, "Memory size exceeds memSizeLimit")                                                  \
  TEXT(0x0f1, "An error occurred trying to write to the log")                                      \
  TEXT(0x0f2, "An error occurred trying to read from the log")                                     \
  TEXT(0x0f3, "There was a type mismatch while reading from the log")                              \
  TEXT(0x0f4, "A divergence was detected during replay")                                           \
  TEXT(0x0f5, "The remote side of an FT pair isn't responding")                                    \
  TEXT(0x0f6, "An error occurred during replay of networking.")                                    \
  TEXT(0x0f7, "Kob ID invalid")                                                                    \
  TEXT(0x0f8, "Kob format string too long")                                                        \
  TEXT(0x0f9, "Invalid format specifier in KOB format string")                                     \
  TEXT(0x0fa, "Invalid attribute specifier in KOB format string")                                  \
  TEXT(0x0fb, "ELF file is corrupt.")                                                              \
  TEXT(0x0fc, "Address not available")                                                             \
  TEXT(0x0fd, "Destination address required")                                                      \
  TEXT(0x0fe, "Cached LVM metadata is stale.")                                                     \
  TEXT(0x0ff, "RPC table does not exist")                                                          \
  TEXT(0x100, "Device already has UID")                                                            \
  TEXT(0x101, "Unresolved symbol")                                                                 \
  TEXT(0x102, "Kernova does not own the device")                                                   \
  TEXT(0x103, "Device has no name")                                                                \
  TEXT(0x104, "Protocol not supported")                                                            \
  TEXT(0x105, "Operation not supported")                                                           \
  TEXT(0x106, "Undefined KNVCall")                                                                 \
  TEXT(0x107, "Maximum switchover time for migration exceeded")                                    \
  TEXT(0x108, "Multiple RO/MW locks held by the same host")                                        \
  TEXT(0x109, "Migration failed due to lack of pre-copy forward progress")                         \
  TEXT(0x10a, "Device UID changed")                                                                \
  TEXT(0x10b, "The Hostra hosts failed to connect over the LiveMove network")                      \
  TEXT(0x10c, "No migration in progress")                                                          \
  TEXT(0x10d, "File is being executed, write access denied")                                       \
  TEXT(0x10e, "File system timeout (Ok to retry)")                                                 \
  TEXT(0x10f, "COW timeout (Ok to retry)")                                                         \
  TEXT(0x110, "Lock state is in transition (ok to retry) DEPRECATED")                              \
  TEXT(0x111, "Lost previously held disk lock")                                                    \
  TEXT(0x112, "Underlying device has no free space")                                               \
  TEXT(0x113, "Value too large for defined data type")                                             \
  TEXT(0x114, "Invalid memory shares")                                                             \
  TEXT(0x115, "LVM lockless op reads in an inconsistent state")                                    \
  TEXT(0x116, "Invalid security label")                                                            \
  TEXT(0x117, "Access denied by kernova access control policy")                                    \
  TEXT(0x118, "Work has already completed")                                                        \
  TEXT(0x119, "Work is currently running")                                                         \
  TEXT(0x11a, "Work is already pending")                                                           \
  TEXT(0x11b, "Work or properties provided invalid")                                               \
  TEXT(0x11c, "KOB context overflow")                                                              \
  TEXT(0x11d, "KOB context invalid")                                                               \
  TEXT(0x11e, "KOB context conflict for lock")                                                     \
  TEXT(0x11f, "Retry the operation")                                                               \
  TEXT(0x120, "Module has no heap to allocate from")                                               \
  TEXT(0x121, "Remote page fault failure")                                                         \
  TEXT(0x122, "KSI data length mismatch")                                                          \
  TEXT(0x123, "Mapping operation failed")                                                          \
  TEXT(0x124, "Atomic test and set of disk block returned false for equality")                     \
  TEXT(0x125, "No buffer space available")                                                         \
  TEXT(0x126, "FT vm is not enabled")                                                              \
  TEXT(0x127, "FT vm is already enabled")                                                          \
  TEXT(0x128, "ELF file contains invalid relocation types")                                        \
  TEXT(0x129, "Message too long")                                                                  \
  TEXT(0x12a, "Invalid or missing namespace")                                                      \
  TEXT(0x12b, "Operation not allowed because the Kernova is shutting down")                        \
  TEXT(0x12c, "Skipped freeing of resource with no reference")                                     \
  TEXT(0x12d, "IO was aborted by KNFS via a virt-reset on the device")                             \
  TEXT(0x12e, "Write not allowed on tardisks")                                                     \
  TEXT(0x12f, "Re-issue IO at a later time")                                                       \
  TEXT(0x130, "Write not allowed on sealed files")                                                 \
  TEXT(0x131, "Device is temporarily unavailable")                                                 \
  TEXT(0x132, "Device is permanently unavailable")                                                 \
  TEXT(0x133, "Reissue IO at a later time for SE disks")                                           \
  TEXT(0x134, "Address space type is not supported for operation")                                 \
  TEXT(0x135, "DMA mapping could not be completed")                                                \
  TEXT(0x136, "Memory pool reservation is greater than limit")                                     \
  TEXT(0x137, "Module tried to export a symbol but didn't provide a name space")                   \
  TEXT(0x138, "File system object is unlinked")                                                    \
  TEXT(0x139, "Replication instance was aborted")                                                  \
  TEXT(0x13a, "Replicated disk needs full synchronization")                                        \
  TEXT(0x13b, "The set of disks on the replication server doesn't match")                          \
  TEXT(0x13c, "The checksum for the replication request was invalid")                              \
  TEXT(0x13d, "The checksum for the replication response was invalid")                             \
  TEXT(0x13e, "The replication group was removed on the server side")                              \
  TEXT(0x13f, "A newer client for this group is connected to the replication server")              \
  TEXT(0x140, "Corrupt response from replication server")                                          \
  TEXT(0x141, "Portset handle is not mutable")                                                     \
  TEXT(0x142, "Suspend the IO in question")                                                        \
  TEXT(0x143, "No working paths to select")                                                        \
  TEXT(0x144, "Invalid protocol for connection")                                                   \
  TEXT(0x145, "Consumed resource count of module is not zero")                                     \
  TEXT(0x146, "Orbis Replication Server does not support request")                                 \
  TEXT(0x147, "Stale file handle")                                                                 \
  TEXT(0x148, "Virtual volume is not bound")                                                       \
  TEXT(0x149, "Device open failed with no-retry")                                                  \
  TEXT(0x14a, "Not for this device")                                                               \
  TEXT(0x14b, "Ignore")                                                                            \
  TEXT(0x14c, "Object is being or has been destroyed")                                             \
  TEXT(0x14d, "Protocol Endpoint not ready for I/O to given secondary level ID")                   \
  TEXT(0x14e, "T10 PI GUARD tag check failed")                                                     \
  TEXT(0x14f, "T10 PI REF tag check failed")                                                       \
  TEXT(0x150, "Cached resource metadata is stale")                                                 \
  TEXT(0x151, "Page is not pinned")                                                                \
  TEXT(0x152, "Incorrect swap scope")                                                              \
  TEXT(0x153, "Consumed memory is more than zero")                                                 \
  TEXT(0x154, "Lock held by a transaction in progress")                                            \
  TEXT(0x155, "The file being sent already exists and is identical")                               \
  TEXT(0x156, "The volume is already mounted")                                                     \
  TEXT(0x157, "Out of volumes")                                                                    \
  TEXT(0x158, "Super block not found")                                                             \
  TEXT(0x159, "Out of persistent memory")                                                          \
  TEXT(0x15a, "Another operation is in progress")                                                  \
  TEXT(0x15b, "Shrinking is not allowed")                                                          \
  TEXT(0x15c, "Not a base disk")                                                                   \
  TEXT(0x15d, "Disk has snapshots")                                                                \
  TEXT(0x15e, "Invalid error code")                                                                \
  TEXT(0x15f, "Generic service console error")
/* clang-format on */

enum {
#define KSI_TEXT(row, message) +1 /* NOLINT(bugprone-macro-parentheses): a term */
  KSI_STATUS_TEXT_COUNT = 0 KSI_STATUS_TEXTS(KSI_TEXT)
#undef KSI_TEXT
};

/* The message of `status` among `texts`, which are those of KSI_STATUS_TEXTS. Never NULL. */
static inline const char* KSI_FindStatusText(const char* const* texts, uint32_t status) {
  /* Small values are rows themselves; the base alone is neither. */
  const uint32_t row = status > KSI_STATUS_BASE ? status - KSI_STATUS_BASE : status;
  if (status >= KSI_STATUS_SERVICE_CONSOLE_BASE) return "Opaque service console status";
  return row < KSI_STATUS_TEXT_COUNT ? texts[row] : "Unknown status";
}

#endif /* KNVLIBS_KSI_STATUS_TEXT_H_ */
