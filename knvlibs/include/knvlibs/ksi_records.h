/* The records that are the values of the nodes (ksi_nodes.h).
 *
 * A record is what the kernel delivers: little-endian and packed, so fields lie at any offset and
 * are read by value, never through a pointer or a reference to the field. Each is stated once, as a
 * table KSI_RECORD_<name>, from which its struct KSI_<name>, the checks of its layout and all that
 * is told of it derive. A line of a table is one of
 *
 *   FIELD(offset, type, name, unit, meaning)   the unit is "" where the meaning says it all;
 *                                              "bits": a word of flags
 *   TEXT(offset, size, name, meaning)          ends at the first NUL or at the field's size
 *   GAP(offset, size)                          bytes of no known meaning: `unused<offset>`
 *
 * Units: KB are 1024 bytes, pages 4 KB where no other size is said. A figure for which the
 * kernel has no value is KSI_NO_VALUE, or all ones in its own width.
 */
#ifndef KNVLIBS_KSI_RECORDS_H_
#define KNVLIBS_KSI_RECORDS_H_

#include <stddef.h>
#include <stdint.h>

#if defined(__BYTE_ORDER__) && __BYTE_ORDER__ != __ORDER_LITTLE_ENDIAN__
#error "the records are read as they lie, which takes a little-endian machine"
#endif

/* "No value": all ones, of a figure of 64 bits and of one of `bits` bits; -1 in a signed one. */
#define KSI_NO_VALUE UINT64_MAX
#define KSI_NO_VALUE_OF(bits) (KSI_NO_VALUE >> (64 - (bits)))

/* A limit in KB stands for none if it is negative; one of a group's allocation also above
 * KSI_GROUP_LARGEST_LIMIT, one of a user world from KSI_UW_NO_LIMIT on (compared unsigned). */
#define KSI_GROUP_LARGEST_LIMIT INT64_C(0xFFFFFFFFF0)
#define KSI_UW_NO_LIMIT UINT64_C(0x3FFFFFFF0)
#define KSI_NO_LIMIT INT64_C(-1)

/* A buddy allocator of memory, by its name: "memmap-03-lo" is that of memory node 3. */
#define KSI_BUDDY_PREFIX "memmap"
#define KSI_BUDDY_NODE_AT 7

/* The memory states of a host, best first: STATE(number, identifier, name, title). */
#define KSI_MEMORY_STATES(STATE)    \
  STATE(0, HIGH, "high", "High")    \
  STATE(1, CLEAR, "clear", "Clear") \
  STATE(2, SOFT, "soft", "Soft")    \
  STATE(3, HARD, "hard", "Hard")    \
  STATE(4, LOW, "low", "Low")

enum {
#define KSI_STATE(number, identifier, name, title) KSI_MEMORY_STATE_##identifier = (number),
  KSI_MEMORY_STATES(KSI_STATE)
#undef KSI_STATE
};

/* Bits of a scheduler group's flag word. */
enum {
  KSI_GROUP_PREDEFINED = 0x1,
  KSI_GROUP_LEAF = 0x2,
  KSI_GROUP_VM = 0x4,
  KSI_GROUP_USER_WORLD = 0x8,
  KSI_GROUP_SYSTEM_WORLD = 0x10,
  KSI_GROUP_TEST_WORLD = 0x20,
  KSI_GROUP_PROTECTED = 0x40,
  KSI_GROUP_SELF_DESTRUCT = 0x80,
  KSI_GROUP_NON_PERSISTENT = 0x100,
  KSI_GROUP_KERNEL_MEMORY = 0x200,
  KSI_GROUP_USER_CREATED = 0x400,
  KSI_GROUP_CONTAINER = 0x800,
  KSI_GROUP_SUB_CONTAINER = 0x1000,
  KSI_GROUP_VMM_SUB_CONTAINER = 0x2000,
  KSI_GROUP_UW_SUB_CONTAINER = 0x4000
};

/* Bits of a persistent memory region's flag word. */
enum {
  KSI_PMEM_ALLOCATED = 1,
  KSI_PMEM_DELETING = 2,
  KSI_PMEM_LOCKED = 4,
  KSI_PMEM_READ_ONLY = 8,
  KSI_PMEM_BLOCK_DEVICE = 16,
  KSI_PMEM_PERSISTENT_RESERVATION = 32,
  KSI_PMEM_SYSTEM = 64
};

/* clang-format off */

/* A scheduler group's name: ends at the first NUL or at the field's size. */
#define KSI_RECORD_GroupName(FIELD, TEXT, GAP)                                                     \
  TEXT(0, 64, text, "The name")

/* A scheduler group's tag, likewise. */
#define KSI_RECORD_GroupTag(FIELD, TEXT, GAP)                                                      \
  TEXT(0, 8, text, "The tag")

/* A scheduler group's configured memory allocation. */
#define KSI_RECORD_GroupAllocation(FIELD, TEXT, GAP)                                               \
  FIELD(0, int64_t, min, "KB", "Reservation")                                                      \
  FIELD(8, int64_t, max, "KB", "Limit; KSI_GROUP_LARGEST_LIMIT")                                   \
  FIELD(16, int32_t, shares, "", "Share of what is contended for")                                 \
  FIELD(20, int64_t, minLimit, "KB", "Bound of the reservation; as max")                           \
  GAP(28, 4)

/* A scheduler group's reservation bookkeeping. */
#define KSI_RECORD_GroupCapacity(FIELD, TEXT, GAP)                                                 \
  GAP(0, 8)                                                                                        \
  FIELD(8, uint64_t, conResv, "KB", "Reserved by the children")                                    \
  FIELD(16, uint64_t, availResv, "KB", "Left to reserve")

/* A scheduler group's memory statistics. The peaks are since the last reset. */
#define KSI_RECORD_GroupMemoryStats(FIELD, TEXT, GAP)                                              \
  GAP(0, 4)                                                                                        \
  FIELD(4, uint64_t, memSize, "KB", "Address space in use")                                        \
  GAP(12, 8)                                                                                       \
  FIELD(20, uint64_t, ovhdResv, "KB", "Reserved overhead")                                         \
  FIELD(28, uint64_t, ovhd, "KB", "Consumed overhead")                                             \
  GAP(36, 24)                                                                                      \
  FIELD(60, uint64_t, sharedSaved, "KB", "Saved by page sharing")                                  \
  GAP(68, 40)                                                                                      \
  FIELD(108, uint64_t, consumed, "KB", "Host memory in use")                                       \
  GAP(116, 24)                                                                                     \
  FIELD(140, uint64_t, touched, "KB", "Memory in active use, estimated")                           \
  GAP(148, 8)                                                                                      \
  FIELD(156, uint64_t, bMin, "KB", "Base reservation")                                             \
  FIELD(164, uint64_t, bMax, "KB", "Base limit")                                                   \
  FIELD(172, uint64_t, bShares, "", "Base shares")                                                 \
  FIELD(180, uint64_t, fShares, "", "Base shares, flattened")                                      \
  FIELD(188, uint64_t, iMin, "KB", "Implicit reservation")                                         \
  FIELD(196, uint64_t, eMin, "KB", "Effective reservation")                                        \
  FIELD(204, uint64_t, bActive, "KB", "Base activeness")                                           \
  FIELD(212, uint64_t, allocTgt, "KB", "Allocation target")                                        \
  GAP(220, 16)                                                                                     \
  FIELD(236, int64_t, mps, "KB per share", "Memory for each share")                                \
  FIELD(244, uint64_t, rMinPeak, "KB", "Peak of the requested reservation")                        \
  GAP(252, 8)                                                                                      \
  FIELD(260, uint64_t, eMinPeak, "KB", "Peak of eMin")                                             \
  GAP(268, 8)                                                                                      \
  FIELD(276, uint64_t, consumedPeak, "KB", "Peak of consumed")                                     \
  GAP(284, 8)                                                                                      \
  FIELD(292, uint64_t, memSizePeak, "KB", "Peak of memSize")                                       \
  GAP(300, 8)                                                                                      \
  FIELD(308, uint8_t, throttlePct, "%", "Part of the time that it may run")                        \
  GAP(309, 3)

/* What every memory client's tally has in common; no field of it is used yet. */
#define KSI_RECORD_CommonTally(FIELD, TEXT, GAP)                                                   \
  GAP(0, 264)

/* A virtual machine's memory, by the client id of its world group. */
#define KSI_RECORD_VmmTally(FIELD, TEXT, GAP)                                                      \
  GAP(0, 28)                                                                                       \
  FIELD(28, uint64_t, memSizeLimit, "KB", "What the guest may grow to")                            \
  FIELD(36, uint64_t, memSize, "KB", "Guest physical memory")                                      \
  FIELD(44, uint64_t, touched, "KB", "Guest memory in active use")                                 \
  GAP(52, 16)                                                                                      \
  FIELD(68, uint64_t, allocTgt, "KB", "Allocation target")                                         \
  GAP(76, 24)                                                                                      \
  FIELD(100, uint64_t, vpmemRO, "KB", "Persistent memory cached read-only")                        \
  GAP(108, 16)                                                                                     \
  FIELD(124, uint64_t, vpmemUC, "KB", "Persistent memory not yet cached")                          \
  FIELD(132, uint64_t, llswapped, "KB", "Swapped to llswap")                                       \
  FIELD(140, uint64_t, zipSaved, "KB", "Saved by compression")                                     \
  FIELD(148, uint64_t, shared, "KB", "Mapped memory marked COW by page sharing")                   \
  FIELD(156, uint64_t, zero, "KB", "Shared memory that is zero-filled")                            \
  FIELD(164, uint64_t, llswapUsed, "KB", "Space used in llswap with fragments")                    \
  FIELD(172, uint64_t, mapped, "KB", "Guest memory backed by host memory")                         \
  FIELD(180, uint64_t, zipped, "KB", "Guest memory that is compressed")                            \
  FIELD(188, uint64_t, vpmemRW, "KB", "Persistent memory cached read-write")                       \
  FIELD(196, uint64_t, sharedSaved, "KB", "Saved by page sharing")                                 \
  GAP(204, 8)                                                                                      \
  FIELD(212, uint64_t, swapTgt, "KB", "Swap target")                                               \
  GAP(220, 8)                                                                                      \
  FIELD(228, uint64_t, swapScope, "code", "Where it is swapped to")                                \
  FIELD(236, uint8_t, useReliableMem, "flag", "Placed in reliable memory")                         \
  GAP(237, 35)                                                                                     \
  FIELD(272, uint8_t, balloonActive, "flag", "The balloon driver runs")                            \
  FIELD(273, uint64_t, ballooned, "KB", "Size of the balloon")                                     \
  FIELD(281, uint64_t, balloonTgt, "KB", "Target size of the balloon")                             \
  GAP(289, 43)

/* A user world's memory, by the client id of its world group. */
#define KSI_RECORD_UwTally(FIELD, TEXT, GAP)                                                       \
  FIELD(0, int64_t, min, "KB", "Reservation")                                                      \
  FIELD(8, int64_t, max, "KB", "Limit; KSI_UW_NO_LIMIT")                                           \
  FIELD(16, int64_t, minLimit, "KB", "Bound of the reservation; as max")                           \
  FIELD(24, int32_t, shares, "", "Share of what is contended for")                                 \
  FIELD(28, int32_t, memSizeLimit, "KB", "What the address space may grow to")                     \
  GAP(32, 4)                                                                                       \
  FIELD(36, uint64_t, memSize, "KB", "Address space")                                              \
  FIELD(44, uint64_t, touched, "KB", "Memory in active use")                                       \
  GAP(52, 16)                                                                                      \
  FIELD(68, uint64_t, allocTgt, "KB", "Allocation target")                                         \
  GAP(76, 48)                                                                                      \
  FIELD(124, uint64_t, vpmemUC, "KB", "Persistent memory not yet cached")                          \
  GAP(132, 40)                                                                                     \
  FIELD(172, uint64_t, mapped, "KB", "Address space backed by host memory")                        \
  GAP(180, 8)                                                                                      \
  FIELD(188, uint64_t, vpmemRW, "KB", "Persistent memory cached read-write")                       \
  FIELD(196, uint64_t, sharedSaved, "KB", "Saved by page sharing")                                 \
  GAP(204, 8)                                                                                      \
  FIELD(212, uint64_t, swapTgt, "KB", "Swap target")                                               \
  GAP(220, 8)                                                                                      \
  FIELD(228, uint64_t, swapScope, "code", "Where it is swapped to")                                \
  FIELD(236, uint8_t, useReliableMem, "flag", "Placed in reliable memory")                         \
  GAP(237, 27)                                                                                     \
  FIELD(264, uint64_t, totalResv, "KB", "Reserved in all")                                         \
  FIELD(272, uint64_t, pinnedResv, "KB", "Reserved for pinning")                                   \
  FIELD(280, uint64_t, memBStore, "KB", "Backing store in memory")                                 \
  FIELD(288, uint64_t, swapBStore, "KB", "Backing store in swap")                                  \
  FIELD(296, uint64_t, swappable, "KB", "Mapped, not shared, can be reclaimed")                    \
  FIELD(304, uint64_t, pinned, "KB", "Mapped, cannot be swapped")                                  \
  FIELD(312, uint64_t, cow, "KB", "Marked copy-on-write")                                          \
  FIELD(320, uint64_t, pageable, "KB", "Pageable, accounted")                                      \
  FIELD(328, uint64_t, pageableUnacct, "KB", "Pageable, not accounted")                            \
  FIELD(336, uint64_t, swapped, "KB", "Swapped to secondary storage")                              \
  FIELD(344, uint64_t, prealloced, "KB", "Allocated beforehand")                                   \
  FIELD(352, uint64_t, shm, "KB", "Shared memory objects")

/* What a virtual machine's guest reports of itself; all ones: not known. */
#define KSI_RECORD_GuestTally(FIELD, TEXT, GAP)                                                    \
  FIELD(0, uint64_t, memTotal, "KB", "Memory that the guest sees")                                 \
  FIELD(8, uint32_t, lpageTotal, "large pages", "Large pages for the guest's programs")            \
  FIELD(12, uint64_t, memNeeded, "KB", "What its present work needs")

/* A virtual machine's host swapping, by the client id of its VMM leader. */
#define KSI_RECORD_SwapInfo(FIELD, TEXT, GAP)                                                      \
  FIELD(0, uint8_t, isSwapping, "flag", "It is being swapped out now")                             \
  FIELD(1, uint64_t, swapTgt, "KB", "Swap target")                                                 \
  FIELD(9, uint64_t, swapped, "KB", "Swapped by the host")                                         \
  FIELD(17, uint64_t, swapRead, "KB", "Ever read from swap and kept there")                        \
  FIELD(25, uint64_t, swapIn, "KB", "Ever swapped in and released there")                          \
  FIELD(33, uint64_t, swapOut, "KB", "Ever swapped out")                                           \
  GAP(41, 16)                                                                                      \
  FIELD(57, uint64_t, gblSwapRead, "KB", "swapRead of the global swap file")                       \
  FIELD(65, uint64_t, gblSwapIn, "KB", "swapIn of the global swap file")                           \
  FIELD(73, uint64_t, gblSwapOut, "KB", "swapOut of the global swap file")                         \
  FIELD(81, uint64_t, COWSwapper, "KB", "Swapped out while marked COW")                            \
  FIELD(89, uint64_t, discarded, "KB", "Swapped memory that was discarded")                        \
  FIELD(97, uint32_t, vmmSwapOn, "times", "The vmm swapper was turned on")                         \
  FIELD(101, uint32_t, knvSwapOn, "times", "The knv swapper was turned on")                        \
  FIELD(105, uint32_t, curSwapper, "code", "Active swapper; 0: vmm, else knv")                     \
  GAP(109, 28)                                                                                     \
  FIELD(137, uint64_t, totalReg, "KB", "Size of the regular swap file")                            \
  FIELD(145, uint64_t, freeReg, "KB", "Free in the regular swap file")                             \
  FIELD(153, uint64_t, cptTgt, "KB", "Checkpoint memory to read")                                  \
  FIELD(161, uint64_t, cptRead, "KB", "Checkpoint memory read")                                    \
  FIELD(169, uint64_t, cptWritten, "KB", "Checkpoint memory written")                              \
  FIELD(177, uint64_t, totalMig, "KB", "Size of the migration swap file")                          \
  FIELD(185, uint64_t, freeMig, "KB", "Free in the migration swap file")                           \
  FIELD(193, uint32_t, cacheUsage, "KB", "Cache of swap slots in use")                             \
  GAP(197, 12)                                                                                     \
  FIELD(209, uint64_t, swapoutReady, "", "Ready time spent by swapping out")                       \
  GAP(217, 3)

/* A virtual machine's compression cache, by the client id of its world group. */
#define KSI_RECORD_MemzipInfo(FIELD, TEXT, GAP)                                                    \
  FIELD(0, uint64_t, totalCache, "KB", "Cache as configured")                                      \
  FIELD(8, uint64_t, usedCache, "KB", "Cache in use")                                              \
  FIELD(16, uint64_t, maxCache, "KB", "Cache at most")                                             \
  FIELD(24, uint32_t, nrFreeHalf, "half pages", "Free halves of pages")                            \
  FIELD(28, uint32_t, nrFreeQuarter, "quarter pages", "Free quarters of pages")                    \
  FIELD(32, uint64_t, zipped, "KB", "Ever compressed")                                             \
  FIELD(40, uint64_t, unZipped, "KB", "Ever decompressed")                                         \
  GAP(48, 8)                                                                                       \
  FIELD(56, uint64_t, zipRejected, "KB", "Ever found not worth compressing")                       \
  GAP(64, 16)                                                                                      \
  FIELD(80, uint64_t, avgZipTime, "us", "To compress a page, on average")                          \
  GAP(88, 16)                                                                                      \
  FIELD(104, uint64_t, avgUnzipTime, "us", "To decompress a page, on average")                     \
  GAP(112, 24)

/* Pages of one remap type of a memory client. */
#define KSI_RECORD_RemapType(FIELD, TEXT, GAP)                                                     \
  FIELD(0, uint64_t, added, "pages", "Ever added")                                                 \
  FIELD(8, uint64_t, filtered, "pages", "Ever filtered out")                                       \
  FIELD(16, uint64_t, prepared, "pages", "Ever prepared")                                          \
  FIELD(24, uint64_t, staged, "pages", "Ever staged")                                              \
  FIELD(32, uint64_t, canceled, "pages", "Ever canceled")                                          \
  FIELD(40, uint64_t, remapped, "pages", "Ever remapped")                                          \
  FIELD(48, uint64_t, cUnprepared, "pages", "Unprepared now")                                      \
  FIELD(56, uint64_t, cPrepared, "pages", "Prepared now")                                          \
  FIELD(64, uint64_t, cStaged, "pages", "Staged now")                                              \
  GAP(72, 8)

/* Host-wide memory statistics of the scheduler. */
#define KSI_RECORD_GlobalTally(FIELD, TEXT, GAP)                                                   \
  GAP(0, 12)                                                                                       \
  FIELD(12, uint64_t, managedByMemSched, "KB", "Managed by the memory scheduler")                  \
  GAP(20, 16)                                                                                      \
  FIELD(36, uint64_t, minFree, "KB", "Free memory that it keeps to")                               \
  GAP(44, 24)                                                                                      \
  FIELD(68, uint32_t, memState, "state", "KSI_MEMORY_STATE_ now")                                  \
  GAP(72, 280)

/* How often the host left one memory state. */
#define KSI_RECORD_StateTransitions(FIELD, TEXT, GAP)                                              \
  GAP(0, 4)                                                                                        \
  FIELD(4, uint32_t, up, "times", "Left for the next better state")                                \
  GAP(8, 12)                                                                                       \
  FIELD(20, uint32_t, down, "times", "Left for the next worse state")                              \
  GAP(24, 8)

/* How the host's physical memory is divided. */
#define KSI_RECORD_Comprehensive(FIELD, TEXT, GAP)                                                 \
  FIELD(0, uint64_t, total, "KB", "Physical memory")                                               \
  FIELD(8, uint64_t, managedByMemMap, "KB", "Managed by the memory map")                           \
  FIELD(16, uint64_t, reliableMem, "KB", "Reliable memory")                                        \
  FIELD(24, uint64_t, discarded, "KB", "Discarded by the kernel")                                  \
  FIELD(32, uint64_t, critical, "KB", "Space for critical allocations")                            \
  FIELD(40, uint64_t, buddyOvhd, "KB", "Overhead of the buddy allocators")                         \
  FIELD(48, uint64_t, kernelCode, "KB", "Code of the kernel")                                      \
  FIELD(56, uint64_t, dataAndHeap, "KB", "Data and heaps of the kernel")                           \
  FIELD(64, uint64_t, knvClientConsumed, "KB", "In use by clients of the kernel")                  \
  FIELD(72, uint64_t, otherConsumed, "KB", "In use by others")                                     \
  FIELD(80, uint64_t, rsvdLow, "KB", "Low memory that is reserved")                                \
  FIELD(88, uint64_t, free, "KB", "Free memory")

/* The host's memory hardware. */
#define KSI_RECORD_MemInfo(FIELD, TEXT, GAP)                                                       \
  GAP(0, 20)                                                                                       \
  FIELD(20, uint32_t, numNodes, "", "Memory nodes")                                                \
  GAP(24, 8)

/* A memory node. */
#define KSI_RECORD_MemNode(FIELD, TEXT, GAP)                                                       \
  FIELD(0, uint8_t, numaNode, "", "The NUMA node that it belongs to")                              \
  GAP(1, 27)

/* Page sharing, host-wide. */
#define KSI_RECORD_PshareStats(FIELD, TEXT, GAP)                                                   \
  FIELD(0, uint64_t, cow, "pages", "Client memory marked copy-on-write")                           \
  FIELD(8, uint64_t, cow1, "pages", "Of cow: with a single reference")                             \
  FIELD(16, uint64_t, zero, "pages", "Client memory that is zero-filled")                          \
  GAP(24, 8)                                                                                       \
  FIELD(32, uint64_t, used, "pages", "Host memory behind cow")                                     \
  FIELD(40, uint64_t, reclaimed, "pages", "Host memory reclaimed by sharing")                      \
  FIELD(48, uint64_t, totAdd, "pages", "Ever added to the table")                                  \
  FIELD(56, uint64_t, totRemove, "pages", "Ever removed from the table")                           \
  FIELD(64, uint64_t, hintsActive, "pages", "Hints now")                                           \
  FIELD(72, uint64_t, hintsAdded, "pages", "Hints ever added")                                     \
  FIELD(80, uint64_t, hintsRemoved, "pages", "Hints ever removed")                                 \
  FIELD(88, uint64_t, lpageHintsAdded, "pages", "Hints of large pages ever added")                 \
  FIELD(96, uint64_t, lpageHintsRemoved, "pages", "Hints of large pages ever removed")             \
  GAP(104, 64)                                                                                     \
  FIELD(168, uint64_t, peakChainLength, "", "Longest chain of the table")                          \
  FIELD(176, uint64_t, peakChainIndex, "", "Where that chain stands")                              \
  FIELD(184, uint64_t, peakRefCount, "", "Most references to one page")                            \
  GAP(192, 16)

/* The free and used buffers of one size of a buddy allocator. */
#define KSI_RECORD_BuddyBuffers(FIELD, TEXT, GAP)                                                  \
  FIELD(0, uint32_t, free, "buffers", "Free")                                                      \
  FIELD(4, uint32_t, used, "buffers", "In use")                                                    \
  GAP(8, 4)

/* The buffer sizes of a buddy allocator, in the order of its record: each twice the one before. */
#define KSI_BUDDY_SIZE_TABLE(SIZE)                                                                 \
  SIZE("4KB") SIZE("8KB") SIZE("16KB") SIZE("32KB") SIZE("64KB") SIZE("128KB") SIZE("256KB")       \
  SIZE("512KB") SIZE("1MB") SIZE("2MB") SIZE("4MB") SIZE("8MB") SIZE("16MB") SIZE("32MB")          \
  SIZE("64MB") SIZE("128MB") SIZE("256MB") SIZE("512MB") SIZE("1GB")

/* A kernel heap. */
#define KSI_RECORD_HeapStats(FIELD, TEXT, GAP)                                                     \
  TEXT(0, 36, name, "The name")                                                                    \
  FIELD(36, uint8_t, dynGrow, "flag", "It may grow")                                               \
  GAP(37, 4)                                                                                       \
  FIELD(41, uint32_t, lowerLimit, "", "Lower limit of its addresses")                              \
  FIELD(45, uint32_t, upperLimit, "", "Upper limit of its addresses")                              \
  FIELD(49, uint8_t, reserved, "", "Reserved")                                                     \
  GAP(50, 8)                                                                                       \
  FIELD(58, uint32_t, numRanges, "", "Ranges that it consists of")                                 \
  FIELD(62, uint32_t, dlMallocOvdh, "bytes", "Overhead of the allocator")                          \
  FIELD(66, uint32_t, size, "bytes", "Size now")                                                   \
  FIELD(70, uint32_t, initial, "bytes", "Size at first")                                           \
  GAP(74, 4)                                                                                       \
  FIELD(78, uint32_t, avail, "bytes", "Free now")                                                  \
  GAP(82, 4)                                                                                       \
  FIELD(86, uint32_t, pctFreeOfCur, "%", "Free part of size")                                      \
  GAP(90, 4)                                                                                       \
  FIELD(94, uint32_t, max, "bytes", "What it may grow to")                                         \
  FIELD(98, uint32_t, maxAvail, "bytes", "Free if grown so far")                                   \
  FIELD(102, uint32_t, pctFreeOfMax, "%", "Free part of max")                                      \
  FIELD(106, uint32_t, lowPctFreeOfMax, "%", "Lowest pctFreeOfMax ever")                           \
  GAP(110, 4)                                                                                      \
  FIELD(114, uint32_t, numSuccAllocs, "times", "Allocations that succeeded")                       \
  FIELD(118, uint32_t, numFailAllocs, "times", "Allocations that failed")                          \
  GAP(122, 4)                                                                                      \
  FIELD(126, uint32_t, avgAllocSize, "bytes", "An allocation, on average")                         \
  FIELD(130, uint32_t, numReqsPerGrowth, "times", "Requests for each growth")                      \
  FIELD(134, uint32_t, numGrowthOps, "times", "It has grown")                                      \
  FIELD(138, uint32_t, numShrinkOps, "times", "It has shrunk")                                     \
  GAP(142, 2)

/* A virtual machine's large pages, by the client id of its VMM leader. */
#define KSI_RECORD_VmLargePages(FIELD, TEXT, GAP)                                                  \
  FIELD(0, uint32_t, nrBackings, "large pages", "Backed by large pages now")                       \
  FIELD(4, uint32_t, maxSwapThreshold, "pages", "Most swapped pages to map a large one")           \
  FIELD(8, uint64_t, nrAllocSuccess, "times", "Mapping succeeded")                                 \
  FIELD(16, uint64_t, nrFailPinned, "times", "Mapping failed: pinned pages")                       \
  FIELD(24, uint64_t, nrFailSwapped, "times", "Mapping failed: too much to swap in")               \
  FIELD(32, uint64_t, nrFailPinnedLate, "times", "Mapping failed: pages pinned late")              \
  GAP(40, 16)                                                                                      \
  FIELD(56, uint64_t, nrFailNoMem, "times", "Mapping failed: no memory")                           \
  GAP(64, 8)                                                                                       \
  FIELD(72, uint32_t, nrLocked, "times", "A mapping of the guest was made")                        \
  FIELD(76, uint64_t, nrBroken, "times", "A mapping of the guest was broken up")

/* A pool of large pages on one memory node. */
#define KSI_RECORD_LargePagePool(FIELD, TEXT, GAP)                                                 \
  FIELD(0, uint32_t, nrLPages, "2 MB pages", "Large pages in the pool")                            \
  FIELD(4, uint32_t, nrFreeSPages, "4 KB pages", "Small pages of them that are free")              \
  FIELD(8, uint64_t, nrSPageAllocs, "pages", "Small pages ever allocated")                         \
  FIELD(16, uint64_t, nrSPageFrees, "pages", "Small pages ever freed")                             \
  FIELD(24, uint64_t, nrReapAttempts, "times", "Reaping was tried")                                \
  FIELD(32, uint64_t, nrSPagesReaped, "pages", "Small pages ever reaped")                          \
  FIELD(40, uint64_t, nrDefragAttempts, "times", "Defragmenting was tried")                        \
  GAP(48, 8)                                                                                       \
  FIELD(56, uint64_t, nrDefragCancelled, "times", "Defragmenting was given up")                    \
  FIELD(64, uint64_t, nrDefragReaped, "pages", "Pages reaped by defragmenting")                    \
  FIELD(72, uint64_t, nrLPagesDefragged, "pages", "Large pages defragmented")                      \
  FIELD(80, uint64_t, peakDefragAttempts, "times", "Most tries for one large page")                \
  FIELD(88, uint64_t, nrCachehit, "times", "Found in the cache of victims")

/* A persistent memory volume; no field of it is used yet. */
#define KSI_RECORD_PmemVolume(FIELD, TEXT, GAP)                                                    \
  GAP(0, 40)

/* The region store of a persistent memory volume. */
#define KSI_RECORD_PmemRegionStore(FIELD, TEXT, GAP)                                               \
  FIELD(0, uint64_t, alloc2MBlocks, "2 MB blocks", "Allocated")                                    \
  FIELD(8, uint64_t, resvd2MBlocks, "2 MB blocks", "Reserved")                                     \
  FIELD(16, uint64_t, avail2MBlocks, "2 MB blocks", "Left to reserve")                             \
  FIELD(24, uint32_t, totalRegions, "", "Regions that it has room for")                            \
  FIELD(28, uint32_t, freeRegions, "", "Regions not in use")                                       \
  FIELD(32, uint64_t, total2MBlocks, "2 MB blocks", "All blocks")

/* A region of a persistent memory volume. */
#define KSI_RECORD_PmemRegion(FIELD, TEXT, GAP)                                                    \
  GAP(0, 37)                                                                                       \
  FIELD(37, uint64_t, size, "bytes", "Memory of the region")                                       \
  FIELD(45, uint64_t, reserved, "2 MB blocks", "Reserved")                                         \
  FIELD(53, uint32_t, flags, "bits", "KSI_PMEM_ bits")                                             \
  GAP(57, 3)

/* Values that are one number: NUMBER(name, type, field, unit, meaning); KSI_<name> is the type. */
#define KSI_NUMBERS(NUMBER)                                                                        \
  NUMBER(ParentGroupID, int64_t, parentGroupID, "", "Id of the group above")                       \
  NUMBER(GroupFlags, uint32_t, groupFlags, "bits", "KSI_GROUP_ bits")                              \
  NUMBER(GroupLeaderID, int32_t, groupLeaderID, "", "World group that leads the group")            \
  NUMBER(VmmLeaderID, int32_t, vmmLeaderID, "", "VMM leader of a world group")                     \
  NUMBER(NumVMs, uint32_t, numVMs, "", "Virtual machines on the host")                             \
  NUMBER(IsClean, uint8_t, isClean, "flag", "The store was closed in order")

/* All records with their sizes in bytes. A buddy's stands apart: its buffers are an array. */
#define KSI_RECORDS(RECORD)                                                                        \
  RECORD(GroupName, 64)                                                                            \
  RECORD(GroupTag, 8)                                                                              \
  RECORD(GroupAllocation, 32)                                                                      \
  RECORD(GroupCapacity, 24)                                                                        \
  RECORD(GroupMemoryStats, 312)                                                                    \
  RECORD(CommonTally, 264)                                                                         \
  RECORD(VmmTally, 332)                                                                            \
  RECORD(UwTally, 360)                                                                             \
  RECORD(GuestTally, 20)                                                                           \
  RECORD(SwapInfo, 220)                                                                            \
  RECORD(MemzipInfo, 136)                                                                          \
  RECORD(RemapType, 80)                                                                            \
  RECORD(GlobalTally, 352)                                                                         \
  RECORD(StateTransitions, 32)                                                                     \
  RECORD(Comprehensive, 96)                                                                        \
  RECORD(MemInfo, 32)                                                                              \
  RECORD(MemNode, 28)                                                                              \
  RECORD(PshareStats, 208)                                                                         \
  RECORD(BuddyBuffers, 12)                                                                         \
  RECORD(HeapStats, 144)                                                                           \
  RECORD(VmLargePages, 84)                                                                         \
  RECORD(LargePagePool, 96)                                                                        \
  RECORD(PmemVolume, 40)                                                                           \
  RECORD(PmemRegionStore, 40)                                                                      \
  RECORD(PmemRegion, 60)
/* clang-format on */

#define KSI_FIELD(offset, type, name, unit, meaning) type name;
#define KSI_TEXT(offset, size, name, meaning) char name[size];
#define KSI_GAP(offset, size) uint8_t unused##offset[size];
#define KSI_STRUCT(record, size)                      \
  struct KSI_##record {                               \
    KSI_RECORD_##record(KSI_FIELD, KSI_TEXT, KSI_GAP) \
  };
#define KSI_NUMBER(record, type, name, unit, meaning) typedef type KSI_##record;

#pragma pack(push, 1)
KSI_RECORDS(KSI_STRUCT)

/* A buddy allocator. */
#define KSI_COUNT(size) +1 /* NOLINT(bugprone-macro-parentheses): a term */
enum { KSI_BUDDY_SIZES = 0 KSI_BUDDY_SIZE_TABLE(KSI_COUNT) };
struct KSI_BuddyStats {
  uint8_t unused0[8];
  struct KSI_BuddyBuffers buffers[KSI_BUDDY_SIZES];
};
#pragma pack(pop)

KSI_NUMBERS(KSI_NUMBER)

#undef KSI_FIELD
#undef KSI_TEXT
#undef KSI_GAP
#undef KSI_STRUCT
#undef KSI_NUMBER
#undef KSI_COUNT

/* The sizes of all values in bytes, those of nodes without a value (None) included. */
enum {
  KSI_SIZE_None = 0,
  KSI_SIZE_BuddyStats = 236,
#define KSI_SIZE(record, size) KSI_SIZE_##record = (size),
  KSI_RECORDS(KSI_SIZE)
#undef KSI_SIZE
#define KSI_SIZE(record, type, name, unit, meaning) KSI_SIZE_##record = sizeof(type),
      KSI_NUMBERS(KSI_SIZE)
#undef KSI_SIZE
};

/* The structs lie as the tables say. */
#ifdef __cplusplus
#define KSI_CHECK(condition, what) static_assert(condition, what)
#else
#define KSI_CHECK(condition, what) _Static_assert(condition, what)
#endif
#define KSI_AT(at, name) KSI_CHECK(offsetof(Record, name) == (at), #name);
#define KSI_FIELD(offset, type, name, unit, meaning) KSI_AT(offset, name)
#define KSI_TEXT(offset, size, name, meaning) KSI_AT(offset, name)
#define KSI_GAP(offset, size) KSI_AT(offset, unused##offset)
#define KSI_LAYOUT(record, size)                       \
  static inline void KSI_CheckLayoutOf##record(void) { \
    typedef struct KSI_##record Record;                \
    KSI_CHECK(sizeof(Record) == (size), #record);      \
    KSI_RECORD_##record(KSI_FIELD, KSI_TEXT, KSI_GAP)  \
  }
KSI_RECORDS(KSI_LAYOUT)
KSI_CHECK(offsetof(struct KSI_BuddyStats, buffers) == 8, "BuddyStats.buffers");
KSI_CHECK(sizeof(struct KSI_BuddyStats) == KSI_SIZE_BuddyStats, "BuddyStats");

#undef KSI_CHECK
#undef KSI_AT
#undef KSI_FIELD
#undef KSI_TEXT
#undef KSI_GAP
#undef KSI_LAYOUT

#endif /* KNVLIBS_KSI_RECORDS_H_ */
