/* The records that are the values of the nodes (ksi_nodes.h).
 *
 * A record is what the kernel delivers: little-endian and packed, so fields lie at any offset and
 * are read by value, never through a pointer or a reference to the field. Bytes that no field
 * names are `unused` with their offset. Unless a comment says otherwise an all-ones memory figure
 * means that the kernel has no value.
 */
#ifndef KNVLIBS_KSI_RECORDS_H_
#define KNVLIBS_KSI_RECORDS_H_

#include <stddef.h>
#include <stdint.h>

#if defined(__BYTE_ORDER__) && __BYTE_ORDER__ != __ORDER_LITTLE_ENDIAN__
#error "the records are read as they lie, which takes a little-endian machine"
#endif

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

#pragma pack(push, 1)

/* A scheduler group's name: ends at the first NUL or at the field's size. */
struct KSI_GroupName {
  char text[64];
};

/* A scheduler group's tag, likewise. */
struct KSI_GroupTag {
  char text[8];
};

/* A scheduler group's configured memory allocation. */
struct KSI_GroupAllocation {
  int64_t min; /* KB; reservation */
  int64_t max; /* KB; limit, very large or -1: none */
  int32_t shares;
  int64_t minLimit; /* KB; bound of the reservation */
  uint8_t unused28[4];
};

/* A scheduler group's reservation bookkeeping. */
struct KSI_GroupCapacity {
  uint8_t unused0[8];
  uint64_t conResv;   /* KB; reserved by the children */
  uint64_t availResv; /* KB; left to reserve */
};

/* A scheduler group's memory statistics. The peaks are since the last reset. */
struct KSI_GroupMemoryStats {
  uint8_t unused0[4];
  uint64_t memSize; /* KB */
  uint8_t unused12[8];
  uint64_t ovhdResv; /* KB; reserved overhead */
  uint64_t ovhd;     /* KB; consumed overhead */
  uint8_t unused36[24];
  uint64_t sharedSaved; /* KB; saved by page sharing */
  uint8_t unused68[40];
  uint64_t consumed; /* KB */
  uint8_t unused116[24];
  uint64_t touched; /* KB */
  uint8_t unused148[8];
  uint64_t bMin;     /* KB; base reservation */
  uint64_t bMax;     /* KB; base limit */
  uint64_t bShares;  /* base shares */
  uint64_t fShares;  /* flattened base shares */
  uint64_t iMin;     /* KB; implicit reservation */
  uint64_t eMin;     /* KB; effective reservation */
  uint64_t bActive;  /* KB; base activeness */
  uint64_t allocTgt; /* KB; allocation target */
  uint8_t unused220[16];
  int64_t mps;       /* KB per share */
  uint64_t rMinPeak; /* KB; peak of the requested reservation */
  uint8_t unused252[8];
  uint64_t eMinPeak; /* KB */
  uint8_t unused268[8];
  uint64_t consumedPeak; /* KB */
  uint8_t unused284[8];
  uint64_t memSizePeak; /* KB */
  uint8_t unused300[8];
  uint8_t throttlePct; /* % of time allowed to run */
  uint8_t unused309[3];
};

/* What every memory client's tally has in common; no field of it is used yet. */
struct KSI_CommonTally {
  uint8_t unused0[264];
};

/* A virtual machine's memory, by the client id of its world group. */
struct KSI_VmmTally {
  uint8_t unused0[28];
  uint64_t memSizeLimit; /* KB */
  uint64_t memSize;      /* KB */
  uint64_t touched;      /* KB */
  uint8_t unused52[16];
  uint64_t allocTgt; /* KB */
  uint8_t unused76[24];
  uint64_t vpmemRO; /* KB; persistent memory cached read-only */
  uint8_t unused108[16];
  uint64_t vpmemUC;     /* KB; persistent memory not yet cached */
  uint64_t llswapped;   /* KB */
  uint64_t zipSaved;    /* KB */
  uint64_t shared;      /* KB */
  uint64_t zero;        /* KB */
  uint64_t llswapUsed;  /* KB */
  uint64_t mapped;      /* KB */
  uint64_t zipped;      /* KB */
  uint64_t vpmemRW;     /* KB; persistent memory cached read-write */
  uint64_t sharedSaved; /* KB */
  uint8_t unused204[8];
  uint64_t swapTgt; /* KB */
  uint8_t unused220[8];
  uint64_t swapScope;     /* a code */
  uint8_t useReliableMem; /* flag */
  uint8_t unused237[35];
  uint8_t balloonActive; /* flag */
  uint64_t ballooned;    /* KB */
  uint64_t balloonTgt;   /* KB */
  uint8_t unused289[43];
};

/* A user world's memory, by the client id of its world group. */
struct KSI_UwTally {
  int64_t min;      /* KB */
  int64_t max;      /* KB */
  int64_t minLimit; /* KB */
  int32_t shares;
  int32_t memSizeLimit; /* KB */
  uint8_t unused32[4];
  uint64_t memSize; /* KB */
  uint64_t touched; /* KB */
  uint8_t unused52[16];
  uint64_t allocTgt; /* KB */
  uint8_t unused76[48];
  uint64_t vpmemUC; /* KB */
  uint8_t unused132[40];
  uint64_t mapped; /* KB */
  uint8_t unused180[8];
  uint64_t vpmemRW;     /* KB */
  uint64_t sharedSaved; /* KB */
  uint8_t unused204[8];
  uint64_t swapTgt; /* KB */
  uint8_t unused220[8];
  uint64_t swapScope;     /* a code */
  uint8_t useReliableMem; /* flag */
  uint8_t unused237[27];
  uint64_t totalResv;      /* KB */
  uint64_t pinnedResv;     /* KB */
  uint64_t memBStore;      /* KB */
  uint64_t swapBStore;     /* KB */
  uint64_t swappable;      /* KB */
  uint64_t pinned;         /* KB */
  uint64_t cow;            /* KB */
  uint64_t pageable;       /* KB */
  uint64_t pageableUnacct; /* KB */
  uint64_t swapped;        /* KB */
  uint64_t prealloced;     /* KB */
  uint64_t shm;            /* KB */
};

/* What a virtual machine's guest reports of itself; all ones: not known. */
struct KSI_GuestTally {
  uint64_t memTotal;   /* KB */
  uint32_t lpageTotal; /* large pages */
  uint64_t memNeeded;  /* KB */
};

/* A virtual machine's host swapping, by the client id of its VMM leader. */
struct KSI_SwapInfo {
  uint8_t isSwapping; /* flag */
  uint64_t swapTgt;   /* KB */
  uint64_t swapped;   /* KB */
  uint64_t swapRead;  /* KB */
  uint64_t swapIn;    /* KB */
  uint64_t swapOut;   /* KB */
  uint8_t unused41[16];
  uint64_t gblSwapRead; /* KB */
  uint64_t gblSwapIn;   /* KB */
  uint64_t gblSwapOut;  /* KB */
  uint64_t COWSwapper;  /* KB */
  uint64_t discarded;   /* KB */
  uint32_t vmmSwapOn;   /* times */
  uint32_t knvSwapOn;   /* times */
  uint32_t curSwapper;  /* 0: vmm, else knv */
  uint8_t unused109[28];
  uint64_t totalReg;   /* KB */
  uint64_t freeReg;    /* KB */
  uint64_t cptTgt;     /* KB */
  uint64_t cptRead;    /* KB */
  uint64_t cptWritten; /* KB */
  uint64_t totalMig;   /* KB */
  uint64_t freeMig;    /* KB */
  uint32_t cacheUsage; /* KB */
  uint8_t unused197[12];
  uint64_t swapoutReady; /* ready time */
  uint8_t unused217[3];
};

/* A virtual machine's compression cache, by the client id of its world group. */
struct KSI_MemzipInfo {
  uint64_t totalCache;    /* KB */
  uint64_t usedCache;     /* KB */
  uint64_t maxCache;      /* KB */
  uint32_t nrFreeHalf;    /* half pages */
  uint32_t nrFreeQuarter; /* quarter pages */
  uint64_t zipped;        /* KB */
  uint64_t unZipped;      /* KB */
  uint8_t unused48[8];
  uint64_t zipRejected; /* KB */
  uint8_t unused64[16];
  uint64_t avgZipTime; /* microseconds */
  uint8_t unused88[16];
  uint64_t avgUnzipTime; /* microseconds */
  uint8_t unused112[24];
};

/* Pages of one remap type of a memory client. */
struct KSI_RemapType {
  uint64_t added;       /* pages ever */
  uint64_t filtered;    /* pages ever */
  uint64_t prepared;    /* pages ever */
  uint64_t staged;      /* pages ever */
  uint64_t canceled;    /* pages ever */
  uint64_t remapped;    /* pages ever */
  uint64_t cUnprepared; /* pages now */
  uint64_t cPrepared;   /* pages now */
  uint64_t cStaged;     /* pages now */
  uint8_t unused72[8];
};

/* Host-wide memory statistics of the scheduler. */
struct KSI_GlobalTally {
  uint8_t unused0[12];
  uint64_t managedByMemSched; /* KB */
  uint8_t unused20[16];
  uint64_t minFree; /* KB */
  uint8_t unused44[24];
  uint32_t memState; /* 0 high, 1 clear, 2 soft, 3 hard, 4 low */
  uint8_t unused72[280];
};

/* How often the host left one memory state. */
struct KSI_StateTransitions {
  uint8_t unused0[4];
  uint32_t up; /* times to the next better state */
  uint8_t unused8[12];
  uint32_t down; /* times to the next worse state */
  uint8_t unused24[8];
};

/* How the host's physical memory is divided. */
struct KSI_Comprehensive {
  uint64_t total;             /* KB */
  uint64_t managedByMemMap;   /* KB */
  uint64_t reliableMem;       /* KB */
  uint64_t discarded;         /* KB */
  uint64_t critical;          /* KB */
  uint64_t buddyOvhd;         /* KB */
  uint64_t kernelCode;        /* KB */
  uint64_t dataAndHeap;       /* KB */
  uint64_t knvClientConsumed; /* KB */
  uint64_t otherConsumed;     /* KB */
  uint64_t rsvdLow;           /* KB */
  uint64_t free;              /* KB */
};

/* The host's memory hardware. */
struct KSI_MemInfo {
  uint8_t unused0[20];
  uint32_t numNodes; /* memory nodes */
  uint8_t unused24[8];
};

/* A memory node. */
struct KSI_MemNode {
  uint8_t numaNode; /* NUMA node it belongs to */
  uint8_t unused1[27];
};

/* Page sharing, host-wide. */
struct KSI_PshareStats {
  uint64_t cow;  /* pages */
  uint64_t cow1; /* pages with one reference */
  uint64_t zero; /* pages */
  uint8_t unused24[8];
  uint64_t used;              /* pages */
  uint64_t reclaimed;         /* pages */
  uint64_t totAdd;            /* pages */
  uint64_t totRemove;         /* pages */
  uint64_t hintsActive;       /* pages */
  uint64_t hintsAdded;        /* pages */
  uint64_t hintsRemoved;      /* pages */
  uint64_t lpageHintsAdded;   /* pages */
  uint64_t lpageHintsRemoved; /* pages */
  uint8_t unused104[64];
  uint64_t peakChainLength;
  uint64_t peakChainIndex;
  uint64_t peakRefCount;
  uint8_t unused192[16];
};

/* The free and used buffers of one size of a buddy allocator. */
struct KSI_BuddyBuffers {
  uint32_t free;
  uint32_t used;
  uint8_t unused8[4];
};

/* Buffer sizes of a buddy allocator: 4 KB, each twice the one before, up to 1 GB. */
enum { KSI_BUDDY_SIZES = 19 };

/* A buddy allocator. */
struct KSI_BuddyStats {
  uint8_t unused0[8];
  struct KSI_BuddyBuffers buffers[KSI_BUDDY_SIZES];
};

/* A kernel heap. */
struct KSI_HeapStats {
  char name[36];
  uint8_t dynGrow; /* flag */
  uint8_t unused37[4];
  uint32_t lowerLimit;
  uint32_t upperLimit;
  uint8_t reserved;
  uint8_t unused50[8];
  uint32_t numRanges;
  uint32_t dlMallocOvdh; /* bytes */
  uint32_t size;         /* bytes */
  uint32_t initial;      /* bytes */
  uint8_t unused74[4];
  uint32_t avail; /* bytes */
  uint8_t unused82[4];
  uint32_t pctFreeOfCur; /* % */
  uint8_t unused90[4];
  uint32_t max;             /* bytes */
  uint32_t maxAvail;        /* bytes */
  uint32_t pctFreeOfMax;    /* % */
  uint32_t lowPctFreeOfMax; /* % */
  uint8_t unused110[4];
  uint32_t numSuccAllocs; /* times */
  uint32_t numFailAllocs; /* times */
  uint8_t unused122[4];
  uint32_t avgAllocSize;     /* bytes */
  uint32_t numReqsPerGrowth; /* times */
  uint32_t numGrowthOps;     /* times */
  uint32_t numShrinkOps;     /* times */
  uint8_t unused142[2];
};

/* A virtual machine's large pages, by the client id of its VMM leader. */
struct KSI_VmLargePages {
  uint32_t nrBackings;       /* large pages */
  uint32_t maxSwapThreshold; /* pages */
  uint64_t nrAllocSuccess;   /* times */
  uint64_t nrFailPinned;     /* times */
  uint64_t nrFailSwapped;    /* times */
  uint64_t nrFailPinnedLate; /* times */
  uint8_t unused40[16];
  uint64_t nrFailNoMem; /* times */
  uint8_t unused64[8];
  uint32_t nrLocked; /* times */
  uint64_t nrBroken; /* times */
};

/* A pool of large pages on one memory node. */
struct KSI_LargePagePool {
  uint32_t nrLPages;         /* 2 MB pages */
  uint32_t nrFreeSPages;     /* 4 KB pages */
  uint64_t nrSPageAllocs;    /* pages */
  uint64_t nrSPageFrees;     /* pages */
  uint64_t nrReapAttempts;   /* times */
  uint64_t nrSPagesReaped;   /* pages */
  uint64_t nrDefragAttempts; /* times */
  uint8_t unused48[8];
  uint64_t nrDefragCancelled;  /* times */
  uint64_t nrDefragReaped;     /* pages */
  uint64_t nrLPagesDefragged;  /* pages */
  uint64_t peakDefragAttempts; /* times */
  uint64_t nrCachehit;         /* times */
};

/* A persistent memory volume; no field of it is used yet. */
struct KSI_PmemVolume {
  uint8_t unused0[40];
};

/* The region store of a persistent memory volume. */
struct KSI_PmemRegionStore {
  uint64_t alloc2MBlocks; /* 2 MB blocks */
  uint64_t resvd2MBlocks; /* 2 MB blocks */
  uint64_t avail2MBlocks; /* 2 MB blocks */
  uint32_t totalRegions;
  uint32_t freeRegions;
  uint64_t total2MBlocks; /* 2 MB blocks */
};

/* A region of a persistent memory volume. */
struct KSI_PmemRegion {
  uint8_t unused0[37];
  uint64_t size;     /* bytes */
  uint64_t reserved; /* 2 MB blocks */
  uint32_t flags;    /* bits, from 0: allocated, deleting, locked, readOnly, blockDev, persistResv,
                        system */
  uint8_t unused57[3];
};

#pragma pack(pop)

#ifdef __cplusplus
#define KSI_AT(record, field, at) \
  static_assert(offsetof(struct record, field) == (at), #record "." #field)
#define KSI_SIZE(record, size) static_assert(sizeof(struct record) == (size), #record)
#else
#define KSI_AT(record, field, at) \
  _Static_assert(offsetof(struct record, field) == (at), #record "." #field)
#define KSI_SIZE(record, size) _Static_assert(sizeof(struct record) == (size), #record)
#endif

KSI_AT(KSI_GroupName, text, 0);
KSI_SIZE(KSI_GroupName, 64);
KSI_AT(KSI_GroupTag, text, 0);
KSI_SIZE(KSI_GroupTag, 8);
KSI_AT(KSI_GroupAllocation, min, 0);
KSI_AT(KSI_GroupAllocation, max, 8);
KSI_AT(KSI_GroupAllocation, shares, 16);
KSI_AT(KSI_GroupAllocation, minLimit, 20);
KSI_SIZE(KSI_GroupAllocation, 32);
KSI_AT(KSI_GroupCapacity, conResv, 8);
KSI_AT(KSI_GroupCapacity, availResv, 16);
KSI_SIZE(KSI_GroupCapacity, 24);
KSI_AT(KSI_GroupMemoryStats, memSize, 4);
KSI_AT(KSI_GroupMemoryStats, ovhdResv, 20);
KSI_AT(KSI_GroupMemoryStats, ovhd, 28);
KSI_AT(KSI_GroupMemoryStats, sharedSaved, 60);
KSI_AT(KSI_GroupMemoryStats, consumed, 108);
KSI_AT(KSI_GroupMemoryStats, touched, 140);
KSI_AT(KSI_GroupMemoryStats, bMin, 156);
KSI_AT(KSI_GroupMemoryStats, bMax, 164);
KSI_AT(KSI_GroupMemoryStats, bShares, 172);
KSI_AT(KSI_GroupMemoryStats, fShares, 180);
KSI_AT(KSI_GroupMemoryStats, iMin, 188);
KSI_AT(KSI_GroupMemoryStats, eMin, 196);
KSI_AT(KSI_GroupMemoryStats, bActive, 204);
KSI_AT(KSI_GroupMemoryStats, allocTgt, 212);
KSI_AT(KSI_GroupMemoryStats, mps, 236);
KSI_AT(KSI_GroupMemoryStats, rMinPeak, 244);
KSI_AT(KSI_GroupMemoryStats, eMinPeak, 260);
KSI_AT(KSI_GroupMemoryStats, consumedPeak, 276);
KSI_AT(KSI_GroupMemoryStats, memSizePeak, 292);
KSI_AT(KSI_GroupMemoryStats, throttlePct, 308);
KSI_SIZE(KSI_GroupMemoryStats, 312);
KSI_SIZE(KSI_CommonTally, 264);
KSI_AT(KSI_VmmTally, memSizeLimit, 28);
KSI_AT(KSI_VmmTally, memSize, 36);
KSI_AT(KSI_VmmTally, touched, 44);
KSI_AT(KSI_VmmTally, allocTgt, 68);
KSI_AT(KSI_VmmTally, vpmemRO, 100);
KSI_AT(KSI_VmmTally, vpmemUC, 124);
KSI_AT(KSI_VmmTally, llswapped, 132);
KSI_AT(KSI_VmmTally, zipSaved, 140);
KSI_AT(KSI_VmmTally, shared, 148);
KSI_AT(KSI_VmmTally, zero, 156);
KSI_AT(KSI_VmmTally, llswapUsed, 164);
KSI_AT(KSI_VmmTally, mapped, 172);
KSI_AT(KSI_VmmTally, zipped, 180);
KSI_AT(KSI_VmmTally, vpmemRW, 188);
KSI_AT(KSI_VmmTally, sharedSaved, 196);
KSI_AT(KSI_VmmTally, swapTgt, 212);
KSI_AT(KSI_VmmTally, swapScope, 228);
KSI_AT(KSI_VmmTally, useReliableMem, 236);
KSI_AT(KSI_VmmTally, balloonActive, 272);
KSI_AT(KSI_VmmTally, ballooned, 273);
KSI_AT(KSI_VmmTally, balloonTgt, 281);
KSI_SIZE(KSI_VmmTally, 332);
KSI_AT(KSI_UwTally, min, 0);
KSI_AT(KSI_UwTally, max, 8);
KSI_AT(KSI_UwTally, minLimit, 16);
KSI_AT(KSI_UwTally, shares, 24);
KSI_AT(KSI_UwTally, memSizeLimit, 28);
KSI_AT(KSI_UwTally, memSize, 36);
KSI_AT(KSI_UwTally, touched, 44);
KSI_AT(KSI_UwTally, allocTgt, 68);
KSI_AT(KSI_UwTally, vpmemUC, 124);
KSI_AT(KSI_UwTally, mapped, 172);
KSI_AT(KSI_UwTally, vpmemRW, 188);
KSI_AT(KSI_UwTally, sharedSaved, 196);
KSI_AT(KSI_UwTally, swapTgt, 212);
KSI_AT(KSI_UwTally, swapScope, 228);
KSI_AT(KSI_UwTally, useReliableMem, 236);
KSI_AT(KSI_UwTally, totalResv, 264);
KSI_AT(KSI_UwTally, pinnedResv, 272);
KSI_AT(KSI_UwTally, memBStore, 280);
KSI_AT(KSI_UwTally, swapBStore, 288);
KSI_AT(KSI_UwTally, swappable, 296);
KSI_AT(KSI_UwTally, pinned, 304);
KSI_AT(KSI_UwTally, cow, 312);
KSI_AT(KSI_UwTally, pageable, 320);
KSI_AT(KSI_UwTally, pageableUnacct, 328);
KSI_AT(KSI_UwTally, swapped, 336);
KSI_AT(KSI_UwTally, prealloced, 344);
KSI_AT(KSI_UwTally, shm, 352);
KSI_SIZE(KSI_UwTally, 360);
KSI_AT(KSI_GuestTally, memTotal, 0);
KSI_AT(KSI_GuestTally, lpageTotal, 8);
KSI_AT(KSI_GuestTally, memNeeded, 12);
KSI_SIZE(KSI_GuestTally, 20);
KSI_AT(KSI_SwapInfo, isSwapping, 0);
KSI_AT(KSI_SwapInfo, swapTgt, 1);
KSI_AT(KSI_SwapInfo, swapped, 9);
KSI_AT(KSI_SwapInfo, swapRead, 17);
KSI_AT(KSI_SwapInfo, swapIn, 25);
KSI_AT(KSI_SwapInfo, swapOut, 33);
KSI_AT(KSI_SwapInfo, gblSwapRead, 57);
KSI_AT(KSI_SwapInfo, gblSwapIn, 65);
KSI_AT(KSI_SwapInfo, gblSwapOut, 73);
KSI_AT(KSI_SwapInfo, COWSwapper, 81);
KSI_AT(KSI_SwapInfo, discarded, 89);
KSI_AT(KSI_SwapInfo, vmmSwapOn, 97);
KSI_AT(KSI_SwapInfo, knvSwapOn, 101);
KSI_AT(KSI_SwapInfo, curSwapper, 105);
KSI_AT(KSI_SwapInfo, totalReg, 137);
KSI_AT(KSI_SwapInfo, freeReg, 145);
KSI_AT(KSI_SwapInfo, cptTgt, 153);
KSI_AT(KSI_SwapInfo, cptRead, 161);
KSI_AT(KSI_SwapInfo, cptWritten, 169);
KSI_AT(KSI_SwapInfo, totalMig, 177);
KSI_AT(KSI_SwapInfo, freeMig, 185);
KSI_AT(KSI_SwapInfo, cacheUsage, 193);
KSI_AT(KSI_SwapInfo, swapoutReady, 209);
KSI_SIZE(KSI_SwapInfo, 220);
KSI_AT(KSI_MemzipInfo, totalCache, 0);
KSI_AT(KSI_MemzipInfo, usedCache, 8);
KSI_AT(KSI_MemzipInfo, maxCache, 16);
KSI_AT(KSI_MemzipInfo, nrFreeHalf, 24);
KSI_AT(KSI_MemzipInfo, nrFreeQuarter, 28);
KSI_AT(KSI_MemzipInfo, zipped, 32);
KSI_AT(KSI_MemzipInfo, unZipped, 40);
KSI_AT(KSI_MemzipInfo, zipRejected, 56);
KSI_AT(KSI_MemzipInfo, avgZipTime, 80);
KSI_AT(KSI_MemzipInfo, avgUnzipTime, 104);
KSI_SIZE(KSI_MemzipInfo, 136);
KSI_AT(KSI_RemapType, added, 0);
KSI_AT(KSI_RemapType, filtered, 8);
KSI_AT(KSI_RemapType, prepared, 16);
KSI_AT(KSI_RemapType, staged, 24);
KSI_AT(KSI_RemapType, canceled, 32);
KSI_AT(KSI_RemapType, remapped, 40);
KSI_AT(KSI_RemapType, cUnprepared, 48);
KSI_AT(KSI_RemapType, cPrepared, 56);
KSI_AT(KSI_RemapType, cStaged, 64);
KSI_SIZE(KSI_RemapType, 80);
KSI_AT(KSI_GlobalTally, managedByMemSched, 12);
KSI_AT(KSI_GlobalTally, minFree, 36);
KSI_AT(KSI_GlobalTally, memState, 68);
KSI_SIZE(KSI_GlobalTally, 352);
KSI_AT(KSI_StateTransitions, up, 4);
KSI_AT(KSI_StateTransitions, down, 20);
KSI_SIZE(KSI_StateTransitions, 32);
KSI_AT(KSI_Comprehensive, total, 0);
KSI_AT(KSI_Comprehensive, managedByMemMap, 8);
KSI_AT(KSI_Comprehensive, reliableMem, 16);
KSI_AT(KSI_Comprehensive, discarded, 24);
KSI_AT(KSI_Comprehensive, critical, 32);
KSI_AT(KSI_Comprehensive, buddyOvhd, 40);
KSI_AT(KSI_Comprehensive, kernelCode, 48);
KSI_AT(KSI_Comprehensive, dataAndHeap, 56);
KSI_AT(KSI_Comprehensive, knvClientConsumed, 64);
KSI_AT(KSI_Comprehensive, otherConsumed, 72);
KSI_AT(KSI_Comprehensive, rsvdLow, 80);
KSI_AT(KSI_Comprehensive, free, 88);
KSI_SIZE(KSI_Comprehensive, 96);
KSI_AT(KSI_MemInfo, numNodes, 20);
KSI_SIZE(KSI_MemInfo, 32);
KSI_AT(KSI_MemNode, numaNode, 0);
KSI_SIZE(KSI_MemNode, 28);
KSI_AT(KSI_PshareStats, cow, 0);
KSI_AT(KSI_PshareStats, cow1, 8);
KSI_AT(KSI_PshareStats, zero, 16);
KSI_AT(KSI_PshareStats, used, 32);
KSI_AT(KSI_PshareStats, reclaimed, 40);
KSI_AT(KSI_PshareStats, totAdd, 48);
KSI_AT(KSI_PshareStats, totRemove, 56);
KSI_AT(KSI_PshareStats, hintsActive, 64);
KSI_AT(KSI_PshareStats, hintsAdded, 72);
KSI_AT(KSI_PshareStats, hintsRemoved, 80);
KSI_AT(KSI_PshareStats, lpageHintsAdded, 88);
KSI_AT(KSI_PshareStats, lpageHintsRemoved, 96);
KSI_AT(KSI_PshareStats, peakChainLength, 168);
KSI_AT(KSI_PshareStats, peakChainIndex, 176);
KSI_AT(KSI_PshareStats, peakRefCount, 184);
KSI_SIZE(KSI_PshareStats, 208);
KSI_AT(KSI_HeapStats, name, 0);
KSI_AT(KSI_HeapStats, dynGrow, 36);
KSI_AT(KSI_HeapStats, lowerLimit, 41);
KSI_AT(KSI_HeapStats, upperLimit, 45);
KSI_AT(KSI_HeapStats, reserved, 49);
KSI_AT(KSI_HeapStats, numRanges, 58);
KSI_AT(KSI_HeapStats, dlMallocOvdh, 62);
KSI_AT(KSI_HeapStats, size, 66);
KSI_AT(KSI_HeapStats, initial, 70);
KSI_AT(KSI_HeapStats, avail, 78);
KSI_AT(KSI_HeapStats, pctFreeOfCur, 86);
KSI_AT(KSI_HeapStats, max, 94);
KSI_AT(KSI_HeapStats, maxAvail, 98);
KSI_AT(KSI_HeapStats, pctFreeOfMax, 102);
KSI_AT(KSI_HeapStats, lowPctFreeOfMax, 106);
KSI_AT(KSI_HeapStats, numSuccAllocs, 114);
KSI_AT(KSI_HeapStats, numFailAllocs, 118);
KSI_AT(KSI_HeapStats, avgAllocSize, 126);
KSI_AT(KSI_HeapStats, numReqsPerGrowth, 130);
KSI_AT(KSI_HeapStats, numGrowthOps, 134);
KSI_AT(KSI_HeapStats, numShrinkOps, 138);
KSI_SIZE(KSI_HeapStats, 144);
KSI_AT(KSI_VmLargePages, nrBackings, 0);
KSI_AT(KSI_VmLargePages, maxSwapThreshold, 4);
KSI_AT(KSI_VmLargePages, nrAllocSuccess, 8);
KSI_AT(KSI_VmLargePages, nrFailPinned, 16);
KSI_AT(KSI_VmLargePages, nrFailSwapped, 24);
KSI_AT(KSI_VmLargePages, nrFailPinnedLate, 32);
KSI_AT(KSI_VmLargePages, nrFailNoMem, 56);
KSI_AT(KSI_VmLargePages, nrLocked, 72);
KSI_AT(KSI_VmLargePages, nrBroken, 76);
KSI_SIZE(KSI_VmLargePages, 84);
KSI_AT(KSI_LargePagePool, nrLPages, 0);
KSI_AT(KSI_LargePagePool, nrFreeSPages, 4);
KSI_AT(KSI_LargePagePool, nrSPageAllocs, 8);
KSI_AT(KSI_LargePagePool, nrSPageFrees, 16);
KSI_AT(KSI_LargePagePool, nrReapAttempts, 24);
KSI_AT(KSI_LargePagePool, nrSPagesReaped, 32);
KSI_AT(KSI_LargePagePool, nrDefragAttempts, 40);
KSI_AT(KSI_LargePagePool, nrDefragCancelled, 56);
KSI_AT(KSI_LargePagePool, nrDefragReaped, 64);
KSI_AT(KSI_LargePagePool, nrLPagesDefragged, 72);
KSI_AT(KSI_LargePagePool, peakDefragAttempts, 80);
KSI_AT(KSI_LargePagePool, nrCachehit, 88);
KSI_SIZE(KSI_LargePagePool, 96);
KSI_SIZE(KSI_PmemVolume, 40);
KSI_AT(KSI_PmemRegionStore, alloc2MBlocks, 0);
KSI_AT(KSI_PmemRegionStore, resvd2MBlocks, 8);
KSI_AT(KSI_PmemRegionStore, avail2MBlocks, 16);
KSI_AT(KSI_PmemRegionStore, totalRegions, 24);
KSI_AT(KSI_PmemRegionStore, freeRegions, 28);
KSI_AT(KSI_PmemRegionStore, total2MBlocks, 32);
KSI_SIZE(KSI_PmemRegionStore, 40);
KSI_AT(KSI_PmemRegion, size, 37);
KSI_AT(KSI_PmemRegion, reserved, 45);
KSI_AT(KSI_PmemRegion, flags, 53);
KSI_SIZE(KSI_PmemRegion, 60);
KSI_AT(KSI_BuddyBuffers, free, 0);
KSI_AT(KSI_BuddyBuffers, used, 4);
KSI_SIZE(KSI_BuddyBuffers, 12);
KSI_AT(KSI_BuddyStats, buffers, 8);
KSI_SIZE(KSI_BuddyStats, 236);

#undef KSI_AT
#undef KSI_SIZE

#endif /* KNVLIBS_KSI_RECORDS_H_ */
