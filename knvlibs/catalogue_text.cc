// Prints the canonical text of the node catalogue, of which the definitions' signature is the
// digest: whatever changes the meaning of a read changes this text. With --remarks, what nodes and
// fields are is told behind '#', which is not part of it.
#include <cstdio>
#include <cstring>

#include "knvlibs/catalogue.h"

namespace {

// Where the remarks of fields stand.
constexpr int kRemarkColumn = 38;

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

void PrintField(const ksi::Field& field, bool remarks) {
  const int length = std::printf("  %u %c%u %s (%s)", field.offset, TypeLetter(field.type),
                                 field.width, field.name, field.unit);
  if (remarks) std::printf("%*s # %s", kRemarkColumn - length, "", field.meaning);
  std::putchar('\n');
}

void PrintNode(const ksi::Node& node, bool remarks) {
  if (remarks) std::printf("# %s\n", node.meaning);
  if (node.HasValue()) {
    std::printf("%s", node.path.data());
    PrintKeys(node.valueKeys);
    std::printf(" record %u\n", node.recordSize);
    for (const ksi::Field& field : node.fields) PrintField(field, remarks);
  }
  if (node.HasList()) {
    std::printf("%s", node.path.data());
    PrintKeys(node.listKeys);
    std::printf(" list of %s\n", ksi::NameOf(node.entries));
  }
}

}  // namespace

int main(int argc, char** argv) {
  const bool remarks = argc == 2 && std::strcmp(argv[1], "--remarks") == 0;
  for (const ksi::Node& node : ksi::Catalogue()) PrintNode(node, remarks);
  return std::fflush(stdout) == 0 ? 0 : 1;
}
