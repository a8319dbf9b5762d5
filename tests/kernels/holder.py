"""A process that holds memory in one way: holder.py WAY MB [FILE]. It says "ready" when it does."""

import ctypes
import mmap
import os
import random
import signal
import sys

HUGE_1G = 30 << 26  # the size of a huge page is part of the flags of mmap
HUGE_2M = 21 << 26
MAP_HUGETLB = 0x40000
LIBC = ctypes.CDLL(None, use_errno=True)


def private(size, flags=0):
    return mmap.mmap(-1, size, flags=mmap.MAP_PRIVATE | mmap.MAP_ANONYMOUS | flags)


def fill(memory, seed, step=mmap.PAGESIZE):
    """Pages that differ from each other, and are the same for the same seed."""
    source = random.Random(seed)
    for at in range(0, len(memory), step):
        memory[at : at + 64] = source.randbytes(64)
    return memory


def lock(memory):
    address = ctypes.addressof(ctypes.c_char.from_buffer(memory))
    if LIBC.mlock(ctypes.c_void_p(address), ctypes.c_size_t(len(memory))) != 0:
        raise OSError(ctypes.get_errno(), "mlock")


def hold(way, size, path):
    if way == "distinct":
        return fill(private(size), os.getpid())
    if way == "same":  # what two of these hold can be merged, page by page
        memory = private(size)
        memory.madvise(mmap.MADV_MERGEABLE)
        memory.madvise(mmap.MADV_NOHUGEPAGE)
        return fill(memory, 1)
    if way == "zero":  # pages of zeros that were written: the zero page can take their place
        memory = private(size)
        memory.madvise(mmap.MADV_MERGEABLE)
        memory.madvise(mmap.MADV_NOHUGEPAGE)
        memory.write(bytes(size))
        return memory
    if way == "locked":  # a file that several of these lock
        with open(path, "r+b") as file:
            memory = mmap.mmap(file.fileno(), size)
        lock(memory)
        return memory
    if way == "shared":
        memory = mmap.mmap(-1, size)
        return fill(memory, 2)
    if way == "huge-2M":
        return fill(private(size, MAP_HUGETLB | HUGE_2M), 3, 2 << 20)
    if way == "huge-1G":
        return fill(private(size, MAP_HUGETLB | HUGE_1G), 4, 1 << 30)
    raise ValueError(way)


way, megabytes, *rest = sys.argv[1:]
held = hold(way, int(megabytes) << 20, rest[0] if rest else None)
print("ready", flush=True)
signal.pause()
