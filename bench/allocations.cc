// The operators stand apart from the code that calls them: inlined there, a compiler sees memory of
// malloc handed to delete.
#include "bench/allocations.h"

#include <cstdlib>
#include <new>

namespace {

uint64_t allocations = 0;

}  // namespace

void* operator new(size_t size) {
  ++allocations;
  if (void* const memory = std::malloc(size)) return memory;
  throw std::bad_alloc();
}
void operator delete(void* memory) noexcept { std::free(memory); }
void operator delete(void* memory, size_t) noexcept { std::free(memory); }

uint64_t Allocations() { return allocations; }
