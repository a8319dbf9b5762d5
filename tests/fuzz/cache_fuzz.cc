// A cache file's bytes through the library's interface: all that can be read of it is read.
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <string_view>

#include <knvlibs/ksi.h>
#include "knvlibs/catalogue.h"
#include "knvlibs/param_list.h"
#include "knvlibs/source.h"
#include "tests/fuzz/node_walk.h"
#include "tests/fuzz/scratch_directory.h"
#include "tests/fuzz/target.h"

namespace {

void Require(bool kept, const char* what) {
  if (kept) return;
  std::fprintf(stderr, "not kept: %s\n", what);
  std::abort();
}

// The library as programs see it.
class Interface : public ksi::Source {
 public:
  ksi::Status Value(const ksi::Node& node, const ksi::Keys& keys, ksi::Buffer record) override {
    const std::string before(record.size(), '\x5a');
    std::memcpy(record.data(), before.data(), before.size());
    KSI_ParamList* list = ListOf(keys);
    const ksi::Status status = KSI_Get(ksi::IdOf(node), list, record.data(), record.size());
    KSI_ParamListDestroy(list);
    Require(status == ksi::kOk || std::memcmp(record.data(), before.data(), before.size()) == 0,
            "a read that fails leaves its output");
    return status;
  }

  ksi::Status Instances(const ksi::Node& node, const ksi::Keys& keys,
                        ksi::ParamList& instances) override {
    KSI_ParamList* list = ListOf(keys);
    KSI_ParamList* entries = nullptr;
    const ksi::Status status = KSI_GetInstanceListAlloc(ksi::IdOf(node), list, &entries);
    KSI_ParamListDestroy(list);
    Require((status == ksi::kOk) == (entries != nullptr), "a list comes with success alone");
    if (entries == nullptr) return status;
    for (uint32_t i = 0; i < KSI_ParamListUsedCount(entries); ++i) {
      const char* text = nullptr;
      int64_t number = 0;
      if (KSI_ParamListGetString(entries, i, &text) == ksi::kOk) {
        Require(instances.AddText(text) == ksi::kOk, "room for an entry");
      } else {
        Require(KSI_ParamListGetInt64(entries, i, &number) == ksi::kOk, "an entry has a kind");
        Require(instances.AddNumber(static_cast<uint64_t>(number)) == ksi::kOk,
                "room for an entry");
      }
    }
    KSI_ParamListDestroy(entries);
    return status;
  }

  ksi::Definitions KernelDefinitions() const override { return {}; }

 private:
  static KSI_ParamList* ListOf(const ksi::Keys& keys) {
    if (keys.count == 0) return nullptr;
    KSI_ParamList* list = KSI_ParamListCreate(1, static_cast<int>(keys.count));
    for (size_t i = 0; i < keys.count; ++i) {
      const ksi::Status status =
          keys[i].kind == ksi::KeyKind::kNumber
              ? KSI_ParamListAddInt(list, static_cast<uint64_t>(keys[i].number))
              : KSI_ParamListAddString(list, std::string(keys[i].text).c_str());
      Require(status == ksi::kOk, "room for a key");
    }
    return list;
  }
};

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  static const fuzz::ScratchDirectory directory;
  static const std::string file = directory.Path() + "/cache.ksi";
  fuzz::WriteFile(file, {reinterpret_cast<const char*>(data), size});
  if (KSI_UseCache(file.c_str(), 0) != ksi::kOk) return 0;

  char built[21];
  std::memset(built, 'x', sizeof built);
  const char* appBuilt = nullptr;
  // Both dates are told whatever the status.
  static_cast<void>(KSI_CheckSig(built, sizeof built, &appBuilt));
  Require(std::strlen(appBuilt) == 20, "the date of the library's definitions");
  Require(std::memchr(built, '\0', sizeof built) != nullptr, "the end of a date");

  Interface library;
  fuzz::ReadAllNodes(library);
  return 0;
}
