#include "knvlibs/linux/linux_source.h"

#include <new>
#include <vector>

#include <knvlibs/ksi.h>
#include "knvlibs/linux/reader_tables.h"

namespace ksi {
namespace {

// The readers of each node, by its identifier; null where Linux has no answer.
std::vector<Reader> Joined() {
  std::vector<Reader> readers(Catalogue().size() + 1);
  for (const ReaderTable& table : ReaderTables()) {
    for (const Reader& reader : table) {
      Reader& joined = readers[reader.node];
      if (reader.value != nullptr) joined.value = reader.value;
      if (reader.list != nullptr) joined.list = reader.list;
    }
  }
  return readers;
}

const Reader& ReaderOf(const Node& node) {
  // Never destroyed: a program may still ask while it ends.
  static const auto* const readers = new std::vector<Reader>(Joined());
  return (*readers)[IdOf(node)];
}

}  // namespace

std::span<const ReaderTable> ReaderTables() {
  static const ReaderTable tables[] = {kBuddyReaders,         kGroupReaders,  kHeapReaders,
                                       kHugePageReaders,      kKsmReaders,    kMemoryNodeReaders,
                                       kMemoryReaders,        kNvdimmReaders, kUserWorldReaders,
                                       kVirtualMachineReaders};
  return tables;
}

// Runs an operation; without the memory for it that is told, once in a reading and without any.
template <class Operation>
Status LinuxSource::WithMemory(Operation&& operation) {
  try {
    return operation();
  } catch (const std::bad_alloc&) {
    if (!isMemoryTold_) Warning("out of memory: what cannot be read is left out or has no value\n");
    isMemoryTold_ = true;
    host_.Lose(KSI_STATUS_NO_MEMORY);
    return KSI_STATUS_NO_MEMORY;
  }
}

template <class Read>
Status LinuxSource::Answer(ReadingSpan::Question question, const Keys& keys, Read&& read) {
  Status status = WithMemory([&] {
    if (span_.Begins(question, keys, host_.Now())) {
      host_.BeginReading();
      isMemoryTold_ = false;
    }
    host_.BeginQuestion();
    return kOk;
  });
  if (status != kOk) {
    span_.End();
    return status;
  }
  status = WithMemory([&] {
    const Status answer = read();
    if (answer == KSI_STATUS_PERMISSION_DENIED) host_.TellDenied();
    return answer;
  });
  span_.Answered(host_.Now());
  return status;
}

Status LinuxSource::Value(const Node& node, const Keys& keys, Buffer record) {
  return Answer({IdOf(node), false}, keys, [&]() -> Status {
    const ValueReader read = ReaderOf(node).value;
    return read == nullptr ? KSI_STATUS_NO_HANDLER : read(host_, keys, record);
  });
}

Status LinuxSource::Instances(const Node& node, const Keys& keys, ParamList& instances) {
  return Answer({IdOf(node), true}, keys, [&]() -> Status {
    const ListReader read = ReaderOf(node).list;
    return read == nullptr ? KSI_STATUS_NO_HANDLER : read(host_, keys, instances);
  });
}

}  // namespace ksi
