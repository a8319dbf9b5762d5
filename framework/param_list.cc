#include "framework/param_list.h"

namespace tally {

Status ListInstances(uint16_t node, KSI_ParamList* keys, ParamList& instances,
                     std::optional<uint32_t> hint) {
  KSI_ParamList* made = nullptr;
  const Status status = hint ? KSI_GetInstanceListAllocHint(node, keys, *hint, &made)
                             : KSI_GetInstanceListAlloc(node, keys, &made);
  if (status == kSuccess) instances.reset(made);
  return status;
}

Status ListInstances(uint16_t node, const KeyList& keys, const ReaderTexts& texts,
                     ParamList& instances, std::optional<uint32_t> hint) {
  return KeyedRead(keys, texts,
                   [&](KSI_ParamList* list) { return ListInstances(node, list, instances, hint); });
}

}  // namespace tally
