// The catalogue agrees with itself, with the records and with the exported objects.
#include "knvlibs/catalogue.h"

#include <gtest/gtest.h>

#include <set>
#include <string>
#include <type_traits>

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "knvlibs/node_table.h"
#include "knvlibs/source.h"

namespace ksi {
namespace {

TEST(Catalogue, FindsEachNodeByIdentifierAndByPath) {
  std::set<std::string_view> paths;
  for (const Node& node : Catalogue()) {
    EXPECT_EQ(FindNode(IdOf(node)), &node);
    EXPECT_EQ(FindNode(node.path), &node);
    EXPECT_TRUE(paths.insert(node.path).second) << node.path;
  }
  EXPECT_EQ(paths.size(), Catalogue().size());
}

TEST(Catalogue, HasNoOtherNodes) {
  EXPECT_EQ(FindNode(uint16_t{0}), nullptr);
  EXPECT_EQ(FindNode(static_cast<uint16_t>(Catalogue().size() + 1)), nullptr);
  EXPECT_EQ(FindNode(uint16_t{0xffff}), nullptr);
  EXPECT_EQ(FindNode("sched/groups"), nullptr);
  EXPECT_EQ(FindNode(""), nullptr);
}

// The objects come from the library, the catalogue is linked into the test.
TEST(Catalogue, ExportedObjectsHoldTheIdentifiers) {
  const auto at = [](uint16_t id) {
    const Node* node = FindNode(id);
    return node == nullptr ? std::string_view() : node->path;
  };
  EXPECT_EQ(at(KSI_NODE_sched_groups_groupName), "sched/groups/groupName");
  EXPECT_EQ(at(KSI_NODE_sched_groups_groupTag), "sched/groups/groupTag");
  EXPECT_EQ(at(KSI_NODE_sched_groups_parentGroupID), "sched/groups/parentGroupID");
  EXPECT_EQ(at(KSI_NODE_sched_groups_groupFlags), "sched/groups/groupFlags");
  EXPECT_EQ(at(KSI_NODE_sched_groups_groupLeaderID), "sched/groups/groupLeaderID");
  EXPECT_EQ(at(KSI_NODE_sched_groups_memAllocationInKB), "sched/groups/memAllocationInKB");
  EXPECT_EQ(at(KSI_NODE_sched_groups_stats_capacity), "sched/groups/stats/capacity");
  EXPECT_EQ(at(KSI_NODE_sched_groups_stats_memoryStats), "sched/groups/stats/memoryStats");
  EXPECT_EQ(at(KSI_NODE_sched_groups_members_groups), "sched/groups/members/groups");
  EXPECT_EQ(at(KSI_NODE_sched_groups_members_memClients), "sched/groups/members/memClients");
  EXPECT_EQ(at(KSI_NODE_sched_memClients_tally_totalCommon), "sched/memClients/tally/totalCommon");
  EXPECT_EQ(at(KSI_NODE_sched_memClients_tally_vmm), "sched/memClients/tally/vmm");
  EXPECT_EQ(at(KSI_NODE_sched_memClients_tally_uw), "sched/memClients/tally/uw");
  EXPECT_EQ(at(KSI_NODE_sched_memClients_tally_guest), "sched/memClients/tally/guest");
  EXPECT_EQ(at(KSI_NODE_sched_memClients_swapInfo), "sched/memClients/swapInfo");
  EXPECT_EQ(at(KSI_NODE_sched_memClients_memzipInfo), "sched/memClients/memzipInfo");
  EXPECT_EQ(at(KSI_NODE_sched_memClients_remapTypes), "sched/memClients/remapTypes");
  EXPECT_EQ(at(KSI_NODE_worldGroups_vmmLeaderID), "worldGroups/vmmLeaderID");
  EXPECT_EQ(at(KSI_NODE_sched_globalStats_numVMs), "sched/globalStats/numVMs");
  EXPECT_EQ(at(KSI_NODE_sched_globalStats_memory_tally), "sched/globalStats/memory/tally");
  EXPECT_EQ(at(KSI_NODE_sched_globalStats_memory_stateTransitions),
            "sched/globalStats/memory/stateTransitions");
  EXPECT_EQ(at(KSI_NODE_memory_comprehensive), "memory/comprehensive");
  EXPECT_EQ(at(KSI_NODE_memory_memInfo), "memory/memInfo");
  EXPECT_EQ(at(KSI_NODE_memory_memNodes), "memory/memNodes");
  EXPECT_EQ(at(KSI_NODE_memory_pshare_stats), "memory/pshare/stats");
  EXPECT_EQ(at(KSI_NODE_system_buddy), "system/buddy");
  EXPECT_EQ(at(KSI_NODE_system_buddy_comprehensive), "system/buddy/comprehensive");
  EXPECT_EQ(at(KSI_NODE_system_heaps), "system/heaps");
  EXPECT_EQ(at(KSI_NODE_system_heaps_stats), "system/heaps/stats");
  EXPECT_EQ(at(KSI_NODE_memory_lpage_vmLPage), "memory/lpage/vmLPage");
  EXPECT_EQ(at(KSI_NODE_memory_lpage_nodeList_psharePool), "memory/lpage/nodeList/psharePool");
  EXPECT_EQ(at(KSI_NODE_memory_lpage_nodeList_vmPools), "memory/lpage/nodeList/vmPools");
  EXPECT_EQ(at(KSI_NODE_memory_pmem_volumes), "memory/pmem/volumes");
  EXPECT_EQ(at(KSI_NODE_memory_pmem_volumes_info), "memory/pmem/volumes/info");
  EXPECT_EQ(at(KSI_NODE_memory_pmem_volumes_regionStore_info),
            "memory/pmem/volumes/regionStore/info");
  EXPECT_EQ(at(KSI_NODE_memory_pmem_volumes_regionStore_isClean),
            "memory/pmem/volumes/regionStore/isClean");
  EXPECT_EQ(at(KSI_NODE_memory_pmem_volumes_regionStore_regions),
            "memory/pmem/volumes/regionStore/regions");
  EXPECT_EQ(at(KSI_NODE_memory_pmem_volumes_regionStore_regions_info),
            "memory/pmem/volumes/regionStore/regions/info");
}

const Field* FindField(const Node& node, std::string_view name) {
  for (const Field& field : node.fields) {
    if (field.name == name) return &field;
  }
  return nullptr;
}

TEST(Catalogue, FieldsAreThoseOfTheRecord) {
  const Node& swap = *FindNode("sched/memClients/swapInfo");
  EXPECT_EQ(swap.recordSize, 220);
  const Field* usage = FindField(swap, "cacheUsage");
  ASSERT_NE(usage, nullptr);
  EXPECT_EQ(usage->offset, 193);
  EXPECT_EQ(usage->width, 4);
  EXPECT_EQ(usage->type, FieldType::kUnsigned);
  EXPECT_STREQ(usage->unit, "KB");
  EXPECT_EQ(FindField(swap, "unused41"), nullptr);

  const Node& allocation = *FindNode("sched/groups/memAllocationInKB");
  EXPECT_EQ(FindField(allocation, "minLimit")->offset, 20);
  EXPECT_EQ(FindField(allocation, "minLimit")->type, FieldType::kSigned);
}

TEST(Catalogue, BuffersOfABuddyHaveTheirSizesForNames) {
  const Node& buddy = *FindNode("system/buddy/comprehensive");
  EXPECT_EQ(FindField(buddy, "free4KB")->offset, 8);
  EXPECT_EQ(FindField(buddy, "used4KB")->offset, 12);
  EXPECT_EQ(FindField(buddy, "free1GB")->offset, 8 + 18 * 12);
}

TEST(Catalogue, KeysAreKnown) {
  const Node& types = *FindNode("sched/memClients/remapTypes");
  EXPECT_EQ(types.valueKeys, (Keying{{Instance::kClient, Instance::kRemapType}}));
  EXPECT_EQ(types.listKeys, (Keying{{Instance::kClient, Instance::kNone}}));
  EXPECT_EQ(types.entries, Instance::kRemapType);
  EXPECT_EQ(KindOf(Instance::kRemapType), KeyKind::kText);
  EXPECT_EQ(KindOf(Instance::kMemNode), KeyKind::kNumber);
  EXPECT_FALSE(FindNode("system/heaps")->HasValue());
  EXPECT_FALSE(FindNode("memory/memInfo")->HasList());
}

TEST(Catalogue, SaysWhatEveryNodeAndEveryFieldIs) {
  for (const Node& node : Catalogue()) {
    EXPECT_STRNE(node.meaning, "") << node.path;
    for (const Field& field : node.fields) EXPECT_STRNE(field.meaning, "") << field.name;
  }
}

TEST(Catalogue, NamesEveryInstance) {
  EXPECT_STREQ(NameOf(Instance::kNone), "none");
  EXPECT_STREQ(NameOf(Instance::kGroup), "group");
  EXPECT_STREQ(NameOf(Instance::kRemapType), "remap type");
  EXPECT_STREQ(NameOf(Instance::kRegion), "region");
}

// A node's value is of one type, also where it is one number.
static_assert(std::is_same_v<node::Record<node::sched_groups_groupFlags>, uint32_t>);
static_assert(std::is_same_v<node::Record<node::system_heaps_stats>, KSI_HeapStats>);
static_assert(std::is_same_v<node::Record<node::memory_lpage_nodeList_psharePool>,
                             node::Record<node::memory_lpage_nodeList_vmPools>>);
static_assert(std::is_same_v<node::Record<node::system_heaps>, KSI_None>);

TEST(Catalogue, StatesAreInTheirOrder) {
  EXPECT_EQ(kMemoryStates[KSI_MEMORY_STATE_HIGH], "high");
  EXPECT_EQ(kMemoryStates[KSI_MEMORY_STATE_CLEAR], "clear");
  EXPECT_EQ(kMemoryStates[KSI_MEMORY_STATE_SOFT], "soft");
  EXPECT_EQ(kMemoryStates[KSI_MEMORY_STATE_HARD], "hard");
  EXPECT_EQ(kMemoryStates[KSI_MEMORY_STATE_LOW], "low");
}

// Captures bear it: another signature is a change of what a read means.
TEST(Definitions, HaveTheSignatureOfTheCapturesThatThereAre) {
  EXPECT_EQ(kDefinitions.signature, "1ef96ca059bf6e0ce741ce53e37060cf");
}

TEST(Definitions, AreADigestAndADate) {
  EXPECT_EQ(kDefinitions.signature.size(), 32u);
  EXPECT_EQ(kDefinitions.signature.find_first_not_of("0123456789abcdef"), std::string::npos);
  // "Nov 21 2026 10:00:00"
  ASSERT_EQ(kDefinitions.built.size(), 20u);
  std::string shape(kDefinitions.built);
  for (char& c : shape) {
    if (c >= '0' && c <= '9') c = '0';
    if ((c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z')) c = 'a';
  }
  EXPECT_EQ(shape, "aaa 00 0000 00:00:00");
}

}  // namespace
}  // namespace ksi
