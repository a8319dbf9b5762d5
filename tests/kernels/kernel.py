"""What the kernel's files say, by readers that share nothing with the library. Sizes are in KB."""

import array
import functools
import os
import re
import time

PAGE = 4  # KB


def text(path):
    with open(path, encoding="utf-8", errors="replace") as file:
        return file.read().strip()


def text_or(path, other):
    try:
        return text(path)
    except FileNotFoundError:
        return other


def write(path, value):
    with open(path, "w", encoding="ascii") as file:
        file.write(str(value))


def wait_for(what, condition, seconds=120):
    """Waits until something is so."""
    end = time.monotonic() + seconds
    while not condition():
        if time.monotonic() > end:
            raise TimeoutError(what)
        time.sleep(0.1)


def version():
    return tuple(int(part) for part in re.match(r"(\d+)\.(\d+)", os.uname().release).groups())


def pairs(path):
    """The first number of each line of a file such as meminfo or memory.stat, by name."""
    found = {}
    for line in text(path).splitlines():
        words = line.replace(":", " ").split()
        if len(words) > 1 and words[1].lstrip("-").isdigit():
            found[words[0]] = int(words[1])
    return found


def meminfo():
    return pairs("/proc/meminfo")


def vmstat():
    return pairs("/proc/vmstat")


def zones():
    """The zones of the host in KB: a list of dicts with node, zone, free, min, low, high..."""
    found = []
    for line in text("/proc/zoneinfo").splitlines():
        head = re.match(r"Node (\d+), zone +(\w+)", line)
        if head:
            found.append({"node": int(head[1]), "zone": head[2]})
            continue
        figure = re.match(r" +(?:pages )?(free|min|low|high|present|managed) +(\d+)$", line)
        if figure and figure[1] not in found[-1]:
            found[-1][figure[1]] = int(figure[2]) * PAGE
    return [zone for zone in found if "present" in zone]


def kept_by_processors():
    """Free pages on the lists of single processors, in KB."""
    counts = re.findall(r"cpu: \d+\n +count: +(\d+)", text("/proc/zoneinfo"))
    return sum(map(int, counts)) * PAGE


def processes():
    """The user processes: threads of the kernel have a flag of their own in stat."""
    found = []
    for name in os.listdir("/proc"):
        if not name.isdigit():
            continue
        try:
            stat = text(f"/proc/{name}/stat").rpartition(")")[2].split()
        except (FileNotFoundError, ProcessLookupError):
            continue
        if stat[0] not in "ZX" and not int(stat[6]) & 0x00200000:
            found.append(int(name))
    return sorted(found)


def status(pid):
    return pairs(f"/proc/{pid}/status")


@functools.cache
def frame_flags():
    """What each frame of the host is: /proc/kpageflags."""
    flags = array.array("Q")
    descriptor = os.open("/proc/kpageflags", os.O_RDONLY)
    while piece := os.read(descriptor, 1 << 20):
        flags.frombytes(piece)
    os.close(descriptor)
    return flags


# Bits of kpageflags.
MERGED, HUGE, ZERO = 21, 22, 24


def count_pages(entries):
    """Of the entries of a page map, how much is what, in KB."""
    flags = frame_flags()
    count = dict.fromkeys(("anon", "file", "swapped", "merged", "thp", "zero"), 0)
    for entry in filter(None, entries):
        if entry >> 63:
            frame = entry & ((1 << 55) - 1)
            what = flags[frame] if frame < len(flags) else 0
            if what >> ZERO & 1:
                count["zero"] += PAGE
                continue
            count["file" if entry >> 61 & 1 else "anon"] += PAGE
            count["merged"] += (what >> MERGED & 1) * PAGE
            count["thp"] += (what >> HUGE & 1) * PAGE
        elif entry >> 62 & 1:
            count["swapped"] += PAGE
    return count


@functools.cache
def mappings(pid):
    """The mappings of a process, with what smaps says of each and what its page map does.

    The page map is the judge: smaps of Linux before 6.6 leaves out transparent huge pages that are
    marked to see which memory node uses them.
    """
    found = []
    for line in text(f"/proc/{pid}/smaps").splitlines():
        head = re.match(r"([0-9a-f]+)-([0-9a-f]+) (\S+) \S+ \S+ \S+ *(.*)", line)
        if head:
            size = (int(head[2], 16) - int(head[1], 16)) // 1024
            found.append({"start": int(head[1], 16), "size": size, "name": head[4]})
        elif line.startswith("VmFlags:"):
            found[-1]["flags"] = line.split()[1:]
        else:
            words = line.split()
            if words[1].isdigit():
                found[-1][words[0].rstrip(":")] = int(words[1])
    with open(f"/proc/{pid}/pagemap", "rb", buffering=0) as file:
        for mapping in found:
            entries = array.array("Q")
            if "ht" not in mapping["flags"] and mapping["start"] < 1 << 47:
                file.seek(mapping["start"] // 4096 * 8)
                entries.frombytes(file.read(mapping["size"] // PAGE * 8))
            mapping.update(count_pages(entries))
    return found


def forget():
    """Has all be read anew."""
    frame_flags.cache_clear()
    mappings.cache_clear()


def command_line(pid):
    return text(f"/proc/{pid}/cmdline").rstrip("\0").split("\0")


def limit(path, missing=None):
    """An amount of a control group in KB, None for max."""
    said = text_or(path, None)
    if said is None:
        return missing
    return None if said == "max" else int(said) // 1024


def pressure(path):
    """In what part of the last ten seconds processes have waited for memory: some and all, in percent."""
    return [float(re.search(rf"^{kind} avg10=([0-9.]+)", text(path), re.M)[1]) for kind in ("some", "full")]


def ksm(name):
    said = text_or(f"/sys/kernel/mm/ksm/{name}", None)
    return None if said is None else int(said)


def ksm_of(pid):
    """What samepage merging says of a process; figures that the kernel does not have are missing."""
    try:
        said = pairs(f"/proc/{pid}/ksm_stat")
    except FileNotFoundError:
        said = {}
    if "ksm_merging_pages" not in said:
        said["ksm_merging_pages"] = int(text(f"/proc/{pid}/ksm_merging_pages"))
    return said
