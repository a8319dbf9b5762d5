// The least program on libknvlibs: prints the host's physical memory.
#include <knvlibs/ksi.h>
#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>

#include <cinttypes>
#include <cstdio>

int main() {
  KSI_Comprehensive memory;
  const uint32_t status = KSI_Get(KSI_NODE_memory_comprehensive, nullptr, &memory, sizeof memory);
  if (status != 0) {
    std::fprintf(stderr, "no figures: %#" PRIx32 "\n", status);
    return 1;
  }
  std::printf("%" PRIu64 " KB\n", memory.total);
}
