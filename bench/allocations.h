// Counts what a benchmark takes from the heap.
#ifndef BENCH_ALLOCATIONS_H_
#define BENCH_ALLOCATIONS_H_

#include <cstdint>

// How often the program has called operator new so far.
uint64_t Allocations();

#endif  // BENCH_ALLOCATIONS_H_
