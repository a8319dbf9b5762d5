// The kernel information library inside the program: each call takes its status, record and list
// from the bytes of an input. A call that no library has to bear (a wrong size, a list used after
// it was destroyed) ends the program, as does a list that is left when a run is over.
#ifndef TESTS_FUZZ_FED_LIBRARY_H_
#define TESTS_FUZZ_FED_LIBRARY_H_

#include <cstdint>
#include <span>

namespace fuzz {

// Answers the calls from `answers` as long as it lives; one at a time.
class FedLibrary {
 public:
  explicit FedLibrary(std::span<const uint8_t> answers);
  ~FedLibrary();
  FedLibrary(const FedLibrary&) = delete;
  FedLibrary& operator=(const FedLibrary&) = delete;
};

}  // namespace fuzz

#endif  // TESTS_FUZZ_FED_LIBRARY_H_
