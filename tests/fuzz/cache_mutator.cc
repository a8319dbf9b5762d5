// Changes cache files so that they stay files of SQLite: bytes change where they are, for what
// follows them is found by its place, and the head is put in order most of the time.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <random>

extern "C" size_t LLVMFuzzerMutate(uint8_t* data, size_t size, size_t maxSize);
extern "C" size_t LLVMFuzzerCustomMutator(uint8_t* data, size_t size, size_t maxSize,
                                          unsigned int seed);

namespace {

constexpr size_t kHeadSize = 100;
constexpr uint8_t kMagic[16] = {'S', 'Q', 'L', 'i', 't', 'e', ' ', 'f',
                                'o', 'r', 'm', 'a', 't', ' ', '3'};

void PutNumber(uint8_t* data, size_t at, size_t number) {
  for (size_t i = 0; i < 4; ++i) data[at + i] = static_cast<uint8_t>(number >> (24 - 8 * i));
}

void RepairHead(uint8_t* data, size_t size) {
  std::memcpy(data, kMagic, sizeof kMagic);
  // The seeds' pages have 512 bytes.
  data[16] = 2;
  data[17] = 0;
  data[18] = data[19] = 1;          // not for writing ahead
  data[20] = 0;                     // no room kept at the end of a page
  data[21] = 64;                    // the fractions that a file must have
  data[22] = data[23] = 32;         //
  PutNumber(data, 24, 1);           // changes: the count of pages is of the latest
  PutNumber(data, 28, size / 512);  // pages
  PutNumber(data, 44, 4);           // schema format
  PutNumber(data, 56, 1);           // UTF-8
  // Schema version: a recording stays one.
  PutNumber(data, 60, data[63] == 2 ? 2 : 1);
  PutNumber(data, 68, 0x4b534963);  // a cache file
  PutNumber(data, 92, 1);
}

}  // namespace

size_t LLVMFuzzerCustomMutator(uint8_t* data, size_t size, size_t maxSize, unsigned int seed) {
  std::minstd_rand random(seed);
  if (size < kHeadSize || random() % 16 == 0) {
    size = LLVMFuzzerMutate(data, size, maxSize);
  } else {
    for (auto rounds = 1 + random() % 3; rounds > 0; --rounds) {
      const size_t at = random() % size;
      const size_t length = std::min<size_t>(size - at, 1 + random() % 64);
      LLVMFuzzerMutate(data + at, length, length);
    }
  }
  if (size >= kHeadSize && random() % 8 != 0) RepairHead(data, size);
  return size;
}
