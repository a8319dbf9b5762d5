/* Stands before the C library: the clock on the wall stands still at SET_CLOCK, seconds since 1970,
 * but who waits for a time is at it at once. The host has been up for a day then.
 *
 * CLOCK_STEPS is such as "400:2592000:0 404:-2592000:0": with the 400th wait the clock is set forth
 * by 30 days, with the 404th back. What stands behind the second colon are seconds that pass,
 * besides.
 *
 * A process takes a millisecond of CPU for each write into the midst of a file, and for nothing
 * else. */
#define _GNU_SOURCE
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/syscall.h>
#include <sys/timerfd.h>
#include <time.h>
#include <unistd.h>

static const long long kSecond = 1000000000;

static long long wall;
static long long up = 86400 * 1000000000LL;
static long waits;
static long long writes = 1;

__attribute__((constructor)) static void Set(void) {
  const char* seconds = getenv("SET_CLOCK");
  if (seconds != NULL) wall = strtoll(seconds, NULL, 10) * kSecond;
}

static void Step(void) {
  const char* step = getenv("CLOCK_STEPS");
  ++waits;
  for (; step != NULL; step = strchr(step, ' ')) {
    long number = 0;
    double set = 0;
    double passed = 0;
    step += strspn(step, " ");
    if (sscanf(step, "%ld:%lf:%lf", &number, &set, &passed) != 3 || number != waits) continue;
    wall += (long long)((set + passed) * 1e9);
    up += (long long)(passed * 1e9);
  }
}

__attribute__((visibility("default"))) int clock_gettime(clockid_t clock, struct timespec* time) {
  long long now = 0;
  if (clock == CLOCK_REALTIME) {
    now = wall;
  } else if (clock == CLOCK_BOOTTIME) {
    now = up;
  } else if (clock == CLOCK_PROCESS_CPUTIME_ID) {
    now = writes * 1000000;
  } else {
    return (int)syscall(SYS_clock_gettime, clock, time);
  }
  time->tv_sec = now / kSecond;
  time->tv_nsec = now % kSecond;
  return 0;
}

__attribute__((visibility("default"))) int timerfd_settime(int timer, int flags,
                                                           const struct itimerspec* due,
                                                           struct itimerspec* before) {
  static const struct itimerspec at_once = {{0, 0}, {0, 1}};
  const long long then = due->it_value.tv_sec * kSecond + due->it_value.tv_nsec;
  up += then > wall ? then - wall : 0;
  wall = then;
  Step();
  (void)flags;
  return (int)syscall(SYS_timerfd_settime, timer, 0, &at_once, before);
}

__attribute__((visibility("default"))) ssize_t pwrite(int file, const void* bytes, size_t size,
                                                      off_t offset) {
  ++writes;
  return syscall(SYS_pwrite64, file, bytes, size, offset);
}
