// A program that misuses the library in the way its argument names, for the tests of the double.
#include <cstdio>
#include <cstring>
#include <ctime>
#include <string>

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>

namespace {

KSI_ParamList* Heaps() {
  KSI_ParamList* heaps = nullptr;
  (void)KSI_GetInstanceListAlloc(KSI_NODE_system_heaps, nullptr, &heaps);
  return heaps;
}

void Misuse(const std::string& how) {
  KSI_ParamList* list = KSI_ParamListCreate(how == "version" ? 2 : 1, 1);
  if (how == "leak") {
    (void)KSI_ParamListAddInt(list, 7);
    return;
  }
  if (how == "full") {
    (void)KSI_ParamListAddInt(list, 7);
    (void)KSI_ParamListAddInt(list, 8);
  }
  if (how == "size") {
    uint64_t flags = 0;
    (void)KSI_ParamListAddInt(list, 4);
    (void)KSI_Get(KSI_NODE_sched_groups_groupFlags, list, &flags, sizeof flags);
  }
  if (how == "node") {
    uint32_t flags = 0;
    (void)KSI_Get(0, list, &flags, sizeof flags);
  }
  if (how == "unanswered") {
    uint32_t machines = 0;
    (void)KSI_Get(KSI_NODE_sched_globalStats_numVMs, nullptr, &machines, sizeof machines);
  }
  if (how == "append") {
    KSI_ParamList* heaps = Heaps();
    (void)KSI_ParamListAddInt(heaps, 1);
    KSI_ParamListDestroy(heaps);
  }
  if (how == "leak-instances") Heaps();
  if (how == "use-after-destroy") {
    KSI_ParamList* heaps = Heaps();
    KSI_ParamListDestroy(heaps);
    KSI_ParamListUsedCount(heaps);
  }
  if (how == "text-after-destroy") {
    KSI_ParamList* heaps = Heaps();
    const char* name = "";
    (void)KSI_ParamListGetString(heaps, 0, &name);
    std::puts(name);
    KSI_ParamListDestroy(heaps);
    std::puts(name);
  }
  if (how == "kinds") {
    KSI_ParamList* heaps = Heaps();
    const char* text = "untouched";
    int64_t number = -5;
    uint32_t low = 5;
    std::printf("%u", KSI_ParamListUsedCount(heaps));
    std::printf(" %#x", KSI_ParamListGetInt64(heaps, 0, &number));
    std::printf(" %#x", KSI_ParamListGetString(heaps, 1, &text));
    std::printf(" %#x", KSI_ParamListGetString(heaps, 2, &text));
    std::printf(" %#x", KSI_ParamListGetString(heaps, 3, &text));
    std::printf(" %s %d", text, static_cast<int>(number));
    (void)KSI_ParamListGetUInt32(heaps, 1, &low);
    (void)KSI_ParamListGetInt64(heaps, 1, &number);
    std::printf(" %u %lld\n", low, static_cast<long long>(number));
    KSI_ParamListDestroy(heaps);
  }
  if (how == "room") {
    KSI_ParamList* heaps = KSI_ParamListCreateAndAllocateParams(1, 2, 100);
    std::printf("%#x\n", KSI_GetInstanceList(KSI_NODE_system_heaps, nullptr, heaps));
    KSI_ParamListDestroy(heaps);
  }
  if (how == "time") {
    const std::time_t now = std::time(nullptr);
    std::printf("%lld\n", static_cast<long long>(now));
  }
  if (how == "abort") __builtin_trap();
  if (how == "stderr") std::fputs("not a Warning\n", stderr);
  KSI_ParamListDestroy(list);
  if (how == "twice") KSI_ParamListDestroy(list);
}

}  // namespace

int main(int argc, char** argv) {
  Misuse(argc > 1 ? argv[1] : "");
  return 0;
}
