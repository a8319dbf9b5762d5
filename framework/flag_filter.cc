#include "framework/flag_filter.h"

#include <string>

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_records.h>

namespace tally {

const FlagName groupFlagNames[] = {
    {KSI_GROUP_PREDEFINED, "pre"},         // Predefined group
    {KSI_GROUP_LEAF, "lf"},                // Leaf group
    {KSI_GROUP_VM, "vm"},                  // VM
    {KSI_GROUP_USER_WORLD, "uw"},          // User world
    {KSI_GROUP_SYSTEM_WORLD, "sys"},       // System world
    {KSI_GROUP_TEST_WORLD, "tw"},          // Test world
    {KSI_GROUP_PROTECTED, "pr"},           // Protected group
    {KSI_GROUP_SELF_DESTRUCT, "sd"},       // Self-destruct group
    {KSI_GROUP_NON_PERSISTENT, "np"},      // Non-persistent group
    {KSI_GROUP_KERNEL_MEMORY, "ke"},       // Kernel memory group
    {KSI_GROUP_USER_CREATED, "ug"},        // User created group
    {KSI_GROUP_CONTAINER, "co"},           // Container group
    {KSI_GROUP_SUB_CONTAINER, "sc"},       // Sub-container group
    {KSI_GROUP_VMM_SUB_CONTAINER, "vmm"},  // VMM sub-container group
    {KSI_GROUP_UW_SUB_CONTAINER, "usr"},   // UW sub-container group
    {0, nullptr},
};

const FlagName uwTypeNames[] = {
    {KSI_GROUP_USER_WORLD, "uw"},  // Stand-alone user world
    {KSI_GROUP_VM, "vm"},          // VM-based user world
    {0, nullptr},
};

namespace {

// The row of a flag name, or null for a name that the table does not have.
const FlagName* FindFlag(std::string_view name, const FlagName* table) {
  for (; table->name != nullptr; ++table) {
    if (SameName(name, table->name)) return table;
  }
  return nullptr;
}

}  // namespace

Status ParseFlagFilter(const char* text, const FlagName* table, uint32_t& mask, bool isExclusion) {
  if (text == nullptr) {
    mask = isExclusion ? 0 : UINT32_MAX;
    return kSuccess;
  }
  mask = 0;
  NameReader words(text);
  for (std::string_view word; words.Next(word);) {
    const FlagName* flag = FindFlag(word, table);
    if (flag == nullptr) {
      Warning("Invalid flag (%s) in filter\n", std::string(word).c_str());
      mask = 0;
      return kBadParameter;
    }
    mask |= flag->bit;
  }
  return kSuccess;
}

NameWriter FormatFlagMask(uint32_t mask, const FlagName* table) {
  NameWriter names;
  for (; table->name != nullptr; ++table) names.Put(table->name, (mask & table->bit) != 0);
  return names;
}

}  // namespace tally
