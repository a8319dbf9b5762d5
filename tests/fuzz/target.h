// What libFuzzer and the replay program call in a target.
#ifndef TESTS_FUZZ_TARGET_H_
#define TESTS_FUZZ_TARGET_H_

#include <cstddef>
#include <cstdint>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size);

#endif  // TESTS_FUZZ_TARGET_H_
