#include <gtest/gtest.h>

#include <string_view>

#include "tests/harness/golden.h"

int main(int argc, char** argv) {
  testing::InitGoogleTest(&argc, argv);
  for (int i = 1; i < argc; ++i) {
    if (std::string_view(argv[i]) == "--update-golden") harness::UpdateGolden(true);
  }
  return RUN_ALL_TESTS();
}
