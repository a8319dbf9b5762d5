#include "knvlibs/linux/linux_source.h"

#include <vector>

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

void LinuxSource::BeginQuestion(ReadingSpan::Question question, const Keys& keys) {
  if (span_.Begins(question, keys, host_.Now())) host_.BeginReading();
}

Status LinuxSource::Value(const Node& node, const Keys& keys, Buffer record) {
  BeginQuestion({IdOf(node), false}, keys);
  const ValueReader read = ReaderOf(node).value;
  const Status status = read == nullptr ? KSI_STATUS_NO_HANDLER : read(host_, keys, record);
  span_.Answered(host_.Now());
  return status;
}

Status LinuxSource::Instances(const Node& node, const Keys& keys, ParamList& instances) {
  BeginQuestion({IdOf(node), true}, keys);
  const ListReader read = ReaderOf(node).list;
  const Status status = read == nullptr ? KSI_STATUS_NO_HANDLER : read(host_, keys, instances);
  span_.Answered(host_.Now());
  return status;
}

}  // namespace ksi
