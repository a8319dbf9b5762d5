// What runs in a machine whose figures are compared: fills some of its memory, lets its balloon
// grow as it is told, and sends its statistics when it is asked. Loaded by the multiboot protocol;
// the rest of its world is a virtio balloon on the ports of a PCI device.
#include <stdint.h>

enum { kPage = 4096, kMB = 1 << 20 };

// The memory that it uses: pages that differ, pages that are the same, pages of zeros.
enum { kDistinct = 16 * kMB, kSame = 32 * kMB, kZero = 48 * kMB, kEnd = 56 * kMB };
// What the balloon takes: from here up.
enum { kBalloon = 64 * kMB };
// What it says of itself, in bytes.
enum { kTotal = 90 * kMB, kAvailable = 50 * kMB };

__attribute__((section(".multiboot"), used)) static const uint32_t kMultiboot[] = {0x1BADB002, 0,
                                                                                   -0x1BADB002u};

static void Out8(uint16_t port, uint8_t value) {
  __asm__ volatile("outb %0, %1" ::"a"(value), "Nd"(port));
}
static void Out16(uint16_t port, uint16_t value) {
  __asm__ volatile("outw %0, %1" ::"a"(value), "Nd"(port));
}
static void Out32(uint16_t port, uint32_t value) {
  __asm__ volatile("outl %0, %1" ::"a"(value), "Nd"(port));
}
static uint16_t In16(uint16_t port) {
  uint16_t value;
  __asm__ volatile("inw %1, %0" : "=a"(value) : "Nd"(port));
  return value;
}
static uint32_t In32(uint16_t port) {
  uint32_t value;
  __asm__ volatile("inl %1, %0" : "=a"(value) : "Nd"(port));
  return value;
}

static uint32_t ReadPci(uint32_t device, uint32_t at) {
  Out32(0xCF8, 0x80000000u | device << 11 | at);
  return In32(0xCFC);
}

// The ports of the balloon, 0 if there is none.
static uint16_t FindBalloon(void) {
  for (uint32_t device = 0; device < 32; ++device) {
    if (ReadPci(device, 0) != 0x10021AF4) continue;
    Out32(0xCF8, 0x80000000u | device << 11 | 4);
    Out16(0xCFC, 7);  // ports, memory, bus master
    return ReadPci(device, 0x10) & ~3u;
  }
  return 0;
}

// The registers of a virtio device, and those of a balloon behind them.
enum { kFeatures = 4, kQueuePage = 8, kQueueSize = 12, kQueue = 14, kNotify = 16, kStatus = 18 };
enum { kWanted = 20, kActual = 24 };
enum { kInflate = 0, kStatistics = 2 };

typedef struct {
  uint64_t address;
  uint32_t length;
  uint16_t flags;
  uint16_t next;
} Descriptor;

// A queue that holds one buffer at a time.
typedef struct {
  Descriptor* descriptors;
  volatile uint16_t* available;  // flags, index, ring
  volatile uint16_t* used;       // flags, index, ...
  uint16_t size;
} Queue;

static uint8_t rings[2][4 * kPage] __attribute__((aligned(4096)));

static Queue MakeQueue(uint16_t ports, uint16_t number, uint8_t* at) {
  Out16(ports + kQueue, number);
  const uint16_t size = In16(ports + kQueueSize);
  const uint32_t available = 16u * size;
  const uint32_t used = (available + 6u + 2u * size + kPage - 1) & ~(kPage - 1u);
  Out32(ports + kQueuePage, (uint32_t)at / kPage);
  return (Queue){(Descriptor*)at, (uint16_t*)(at + available), (uint16_t*)(at + used), size};
}

static void Give(uint16_t ports, uint16_t number, Queue* queue, const void* data, uint32_t length) {
  queue->descriptors[0] = (Descriptor){(uint32_t)data, length, 0, 0};
  queue->available[2 + queue->available[1] % queue->size] = 0;
  __asm__ volatile("" ::: "memory");
  ++queue->available[1];
  Out16(ports + kNotify, number);
}

static int IsTaken(const Queue* queue) { return queue->used[1] == queue->available[1]; }

// The timer of the board, which wakes the processor some twenty times a second: without it the
// machine would keep a processor of the host busy.
static const uint64_t kSegments[] = {0, 0x00CF9A000000FFFF, 0x00CF92000000FFFF};
static uint64_t gates[33];

typedef struct __attribute__((packed)) {
  uint16_t limit;
  const void* at;
} Table;

__asm__(
    "OnTimer: push %eax\n mov $0x20, %al\n outb %al, $0x20\n pop %eax\n iret\n"
    "UseSegments: lgdt (%eax)\n ljmp $8, $1f\n 1: ret\n");
void OnTimer(void);
void UseSegments(void);

static void StartTimer(void) {
  enum { kInterrupt = 32 };
  static const uint8_t kWords[][2] = {{0x20, 0x11}, {0x21, kInterrupt}, {0x21, 4},
                                      {0x21, 1},    {0x21, 0xFE},       {0xA1, 0xFF}};
  const Table segments = {sizeof kSegments - 1, kSegments};
  const Table interrupts = {sizeof gates - 1, gates};
  const uint32_t handler = (uint32_t)OnTimer;
  gates[kInterrupt] =
      (uint64_t)((handler & 0xFFFF0000u) | 0x8E00) << 32 | 8u << 16 | (handler & 0xFFFFu);
  __asm__ volatile("call UseSegments" ::"a"(&segments) : "memory");
  __asm__ volatile("lidt %0" ::"m"(interrupts));
  for (uint32_t i = 0; i < sizeof kWords / sizeof *kWords; ++i) Out8(kWords[i][0], kWords[i][1]);
}

static void Sleep(void) { __asm__ volatile("sti; hlt; cli" ::: "memory"); }

static void FillMemory(void) {
  for (uint32_t at = kDistinct; at < kSame; at += kPage) *(uint32_t*)at = at;
  for (uint32_t at = kSame; at < kZero; at += kPage) *(uint32_t*)at = 0x5A5A5A5A;
  for (volatile uint32_t* at = (uint32_t*)kZero; at < (uint32_t*)kEnd; at += kPage / 4) *at = 0;
}

typedef struct __attribute__((packed)) {
  uint16_t tag;
  uint64_t value;
} Statistic;

static const Statistic kSaid[] = {{5, kTotal}, {6, kAvailable}};
static uint32_t page;

static void Serve(uint16_t ports) {
  Out8(ports + kStatus, 0);
  Out8(ports + kStatus, 3);           // seen, driven
  Out32(ports + kFeatures, 1u << 1);  // statistics
  Queue inflate = MakeQueue(ports, kInflate, rings[0]);
  Queue statistics = MakeQueue(ports, kStatistics, rings[1]);
  Out8(ports + kStatus, 7);
  Give(ports, kStatistics, &statistics, kSaid, sizeof kSaid);
  for (uint32_t held = 0;;) {
    if (IsTaken(&statistics)) Give(ports, kStatistics, &statistics, kSaid, sizeof kSaid);
    if (held >= In32(ports + kWanted)) {
      Sleep();
      continue;
    }
    page = kBalloon / kPage + held;
    Give(ports, kInflate, &inflate, &page, sizeof page);
    while (!IsTaken(&inflate)) {
    }
    Out32(ports + kActual, ++held);
  }
}

static uint8_t stack[kPage] __attribute__((aligned(16), used));

static void __attribute__((used)) Main(void) {
  StartTimer();
  FillMemory();
  const uint16_t ports = FindBalloon();
  if (ports != 0) Serve(ports);
  for (;;) Sleep();
}

__asm__(".globl _start\n_start: mov $stack + 4096, %esp\n call Main\n");
