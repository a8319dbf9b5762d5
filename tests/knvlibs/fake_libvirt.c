// A library with the names of libvirt's, which answers as the connection's address bids it.
#include <errno.h>
#include <signal.h>
#include <stdlib.h>
#include <string.h>
#include <unistd.h>

#pragma GCC visibility push(default)

struct Stat {
  int tag;
  unsigned long long value;
};

static const char* mode = "";

static int Is(const char* name) { return strcmp(mode, name) == 0; }

void virSetErrorFunc(void* data, void (*handler)(void*, void*)) {
  (void)data;
  (void)handler;
}

void* virConnectOpenReadOnly(const char* uri) {
  mode = uri;
  if (Is("hangs")) pause();
  if (Is("crashes")) raise(SIGSEGV);
  if (Is("exits")) exit(0);
  return Is("refuses") ? NULL : &mode;
}

int virConnectListAllDomains(void* connection, void*** domains, unsigned flags) {
  static char numbers[] = {0, 1, 2};
  static void* all[] = {numbers, numbers + 1, numbers + 2};
  if (connection != &mode || flags != 1 || Is("fails")) return -1;
  *domains = all;
  return Is("two") ? 2 : 3;
}

const char* virDomainGetName(void* domain) {
  static char tooLong[300];
  switch (*(const char*)domain) {
    case 0:
      return "web";
    case 1:
      if (Is("stalls")) pause();
      return "db";
    default:
      memset(tooLong, 'x', sizeof tooLong - 1);
      return Is("nameless") ? NULL : tooLong;
  }
}

int virDomainGetUUIDString(void* domain, char* text) {
  strcpy(text, "11111111-2222-4333-8444-000000000000");
  text[35] = (char)('0' + *(const char*)domain);
  return 0;
}

int virDomainMemoryStats(void* domain, struct Stat* stats, unsigned count, unsigned flags) {
  static const struct Stat kAll[] = {{6, 1024}, {4, 7}, {5, 900}, {8, 300}, {9, 1095}, {7, 8}};
  errno = EINTR;  // of something inside
  if (flags != 0 || *(const char*)domain == 1 || count < 6) return -1;
  memcpy(stats, kAll, sizeof kAll);
  return Is("boasts") ? 1000000 : 6;
}

char* virDomainGetXMLDesc(void* domain, unsigned flags) {
  static char text[] =
      "<domain type='kvm'><devices><memory model='dimm'><target><size unit='KiB'>2048</size>"
      "</target></memory><memballoon model='virtio'><stats period='10'/></memballoon></devices>"
      "</domain>";
  return flags != 0 || *(const char*)domain == 1 ? NULL : text;
}
