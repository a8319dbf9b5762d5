// Prints the canonical text of the node catalogue, of which the definitions' signature is the
// digest: whatever changes the meaning of a read changes this text.
#include <cstdio>

#include "knvlibs/catalogue.h"

namespace {

void PrintKeys(const ksi::Keying& keys) {
  for (size_t i = 0; i < keys.Count(); ++i) std::printf(" [%s]", ksi::NameOf(keys.at[i]));
}

constexpr char TypeLetter(ksi::FieldType type) {
  switch (type) {
    case ksi::FieldType::kUnsigned:
      return 'u';
    case ksi::FieldType::kSigned:
      return 'i';
    case ksi::FieldType::kBits:
      return 'b';
    case ksi::FieldType::kText:
      return 't';
  }
  return '?';
}

}  // namespace

int main() {
  for (const ksi::Node& node : ksi::Catalogue()) {
    if (node.HasValue()) {
      std::printf("%s", node.path.data());
      PrintKeys(node.valueKeys);
      std::printf(" record %u\n", node.recordSize);
      for (const ksi::Field& field : node.fields) {
        std::printf("  %u %c%u %s (%s)\n", field.offset, TypeLetter(field.type), field.width,
                    field.name, field.unit);
      }
    }
    if (node.HasList()) {
      std::printf("%s", node.path.data());
      PrintKeys(node.listKeys);
      std::printf(" list of %s\n", ksi::NameOf(node.entries));
    }
  }
  return std::fflush(stdout) == 0 ? 0 : 1;
}
