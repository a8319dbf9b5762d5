// The tables that bind readers to nodes.
#include <gtest/gtest.h>

#include <map>
#include <vector>

#include "knvlibs/catalogue.h"
#include "knvlibs/linux/linux_source.h"
#include "knvlibs/linux/reader_tables.h"
#include "tests/knvlibs/host_tree.h"

namespace ksi {
namespace {

TEST(ReadersTest, AQuestionHasNoMoreThanOneReader) {
  std::map<uint16_t, int> values;
  std::map<uint16_t, int> lists;
  for (const ReaderTable& table : ReaderTables()) {
    for (const Reader& reader : table) {
      values[reader.node] += reader.value != nullptr ? 1 : 0;
      lists[reader.node] += reader.list != nullptr ? 1 : 0;
    }
  }
  for (const Node& node : Catalogue()) {
    EXPECT_LE(values[IdOf(node)], node.HasValue() ? 1 : 0) << node.path;
    EXPECT_LE(lists[IdOf(node)], node.HasList() ? 1 : 0) << node.path;
  }
}

TEST(ReadersTest, WhatHasNoReaderIsAStatus) {
  const HostTree tree;
  LinuxSource source(tree.Root());
  ParamList list(ParamList::kNoLimit);
  EXPECT_EQ(source.Value(*FindNode("system/heaps"), Keys(), Buffer()), KSI_STATUS_NO_HANDLER);
  EXPECT_EQ(source.Instances(*FindNode("memory/memInfo"), Keys(), list), KSI_STATUS_NO_HANDLER);
}

// Keys of the kinds that a node takes.
Keys AnyKeys(const Keying& keying) {
  Keys keys;
  keys.count = keying.Count();
  for (size_t i = 0; i < keys.count; ++i) keys.at[i] = {KindOf(keying.at[i]), 100, "x"};
  return keys;
}

TEST(ReadersTest, WhereNoProcessCanBeListedNothingOfGroupsIsFound) {
  const HostTree tree;
  LinuxSource source(tree.Root());
  for (const Node& node : Catalogue()) {
    if (!node.path.starts_with("sched/") && !node.path.starts_with("worldGroups/")) continue;
    if (node.path.starts_with("sched/globalStats/memory")) continue;
    if (node.HasValue()) {
      std::vector<std::byte> record(node.recordSize);
      EXPECT_EQ(source.Value(node, AnyKeys(node.valueKeys), record), KSI_STATUS_NOT_FOUND)
          << node.path;
    }
    if (node.HasList()) {
      ParamList list(ParamList::kNoLimit);
      EXPECT_EQ(source.Instances(node, AnyKeys(node.listKeys), list), KSI_STATUS_NOT_FOUND)
          << node.path;
    }
  }
}

TEST(ReadersTest, ABufferOfAnotherSizeIsNotFilled) {
  const HostTree tree;
  LinuxSource source(tree.Root());
  std::byte buffer[4] = {};
  EXPECT_EQ(source.Value(*FindNode("memory/pshare/stats"), Keys(), buffer),
            KSI_STATUS_LENGTH_MISMATCH);
}

}  // namespace
}  // namespace ksi
