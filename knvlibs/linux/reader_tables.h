// The tables of readers, one for each file that answers nodes.
#ifndef KNVLIBS_LINUX_READER_TABLES_H_
#define KNVLIBS_LINUX_READER_TABLES_H_

#include <span>

#include "knvlibs/linux/reader.h"

namespace ksi {

using ReaderTable = std::span<const Reader>;

extern const ReaderTable kBuddyReaders;
extern const ReaderTable kGroupReaders;
extern const ReaderTable kHeapReaders;
extern const ReaderTable kHugePageReaders;
extern const ReaderTable kKsmReaders;
extern const ReaderTable kMemoryNodeReaders;
extern const ReaderTable kMemoryReaders;
extern const ReaderTable kNvdimmReaders;
extern const ReaderTable kUserWorldReaders;
extern const ReaderTable kVirtualMachineReaders;

// All of them.
std::span<const ReaderTable> ReaderTables();

}  // namespace ksi

#endif  // KNVLIBS_LINUX_READER_TABLES_H_
