"""What each report ought to show, by the kernel's files: for each row, by its key, its columns."""

import os
import resource

import kernel
from figures import BESIDE, ROMS, RUNNING, OfRow, Within, batched
from scene import CGROUPS, PLUGGED

PROCESS = 1 << 40
MONITOR = 1 << 41
RELEASE = kernel.version()
IGNORED = set()  # processes of the test itself, which does not stand still

SAID_BY_GUEST = {"total": 90 * 1024, "available": 50 * 1024}
GUEST_BALLOON = 24 * 1024


def zeros(*columns):
    return dict.fromkeys(columns, 0)


def nones(*columns):
    return dict.fromkeys(columns)


# What processes and machines are.


def is_machine(pid):
    return os.path.basename(kernel.command_line(pid)[0]).startswith("qemu-system-")


def compared_processes():
    return [pid for pid in kernel.processes() if pid not in IGNORED]


def user_worlds():
    return [pid for pid in compared_processes() if not is_machine(pid)]


def machines():
    return [pid for pid in compared_processes() if is_machine(pid)]


def option(pid, name):
    line = kernel.command_line(pid)
    return line[line.index(name) + 1] if name in line else None


def machine_name(pid):
    return option(pid, "-name").removeprefix("guest=")


def blocks_of(pid):
    """What the memory of a guest consists of, in KB: what it was made with, what was plugged in."""
    made = int(option(pid, "-m").split(",")[0]) * 1024
    return [made, PLUGGED * 1024] if machine_name(pid) == "plugged" else [made]


def memory_of(pid):
    return sum(blocks_of(pid))


def most_of(pid):
    """The memory of a guest when all its room for more is taken."""
    room = option(pid, "-m").partition("maxmem=")[2]
    return int(room.rstrip("M")) * 1024 if room else memory_of(pid)


def cgroup_of(pid):
    return kernel.text(f"/proc/{pid}/cgroup").partition("::")[2]


def own_cgroup(pid):
    """The directory of the scope that holds this machine alone, or None."""
    path = CGROUPS + cgroup_of(pid)
    return path if len(kernel.text(f"{path}/cgroup.procs").split()) == 1 else None


def group_id(path):
    return 0 if path.rstrip("/") == CGROUPS else os.stat(path).st_ino


# Memory of processes, by walking it.


def is_shared_memory(mapping):
    return mapping["name"].startswith(("/dev/zero", "/run/", "/memfd:"))


def hugetlb(mapping):
    return mapping["Private_Hugetlb"] + mapping["Shared_Hugetlb"]


def walked(pid):
    """How much memory of each kind a process has, in KB."""
    maps = kernel.mappings(pid)
    anonymous, file = (sum(m[kind] for m in maps) for kind in ("anon", "file"))
    shm = sum(m["file"] for m in maps if is_shared_memory(m))
    return {
        "rss": anonymous + file,
        "shm": shm,
        "anonymous": anonymous,
        "file": file - shm,
        "hugetlb": sum(hugetlb(m) for m in maps),
        "swap": sum(m["swapped"] for m in maps),
        "locked": sum(m["anon"] + m["file"] for m in maps if "lo" in m["flags"]),
    }


def near(value, pid):
    """A figure that the kernel counts in batches."""
    return Within(value - batched(pid), value + batched(pid))


def find_block(maps, size):
    """The mappings side by side that are so large together, and kept from children."""
    run = []
    for mapping in maps:
        if "dc" not in mapping["flags"] or run and run[-1]["start"] + run[-1]["size"] * 1024 != mapping["start"]:
            run = []
        if "dc" in mapping["flags"]:
            run.append(mapping)
        while sum(m["size"] for m in run) > size:
            run.pop(0)
        if run and sum(m["size"] for m in run) == size:
            return run
    return None


def guest_mappings(pid):
    """The mappings of the guest's memory; the kernel may show two blocks side by side as one."""
    maps = kernel.mappings(pid)
    blocks = [find_block(maps, size) for size in blocks_of(pid)]
    if None in blocks:
        blocks = [find_block(maps, memory_of(pid))]
    if None in blocks:
        raise RuntimeError(f"no guest memory in process {pid}")
    return [mapping for block in blocks for mapping in block]


def guest_memory(pid):
    """How much of the memory of a guest is where, in KB."""
    found = guest_mappings(pid)
    return {
        "resident": sum(m["anon"] + m["file"] + hugetlb(m) for m in found),
        "swapped": sum(m["swapped"] for m in found),
        "referenced": sum(m["Referenced"] for m in found),
        # Linux from 6.8 on tells in smaps; its kpageflags call all anonymous memory merged.
        "merged": sum(m["KSM"] if RELEASE >= (6, 8) else m["merged"] for m in found),
        "huge": sum(m["thp"] + hugetlb(m) for m in found),
    }


def zero_pages(pid):
    return kernel.ksm_of(pid).get("ksm_zero_pages", 0) * kernel.PAGE


def saved(pages):
    """What merging saves of so much merged memory: of the pages that share, one stays."""
    shared, sharing = kernel.ksm("pages_shared"), kernel.ksm("pages_sharing")
    return pages * sharing // (shared + sharing) if shared + sharing else 0


def saved_of(pid):
    return saved(kernel.ksm_of(pid)["ksm_merging_pages"] * kernel.PAGE) + zero_pages(pid)


# Memory as a whole.


def kernel_memory():
    """What the kernel takes for itself, compressed memory and what processors keep free included."""
    said = kernel.meminfo()
    known = sum(said.get(name, 0) for name in
                ("Slab", "PageTables", "SecPageTables", "VmallocUsed", "Percpu", "Bounce"))
    compressed = max(kernel.vmstat().get("nr_zspages", 0) * kernel.PAGE, said["Zswap"])
    return known + compressed + kernel.kept_by_processors()


def kernel_code():
    for line in kernel.text("/proc/iomem").splitlines():
        place, _, what = line.strip().partition(" : ")
        if what == "Kernel code":
            first, last = place.split("-")
            return (int(last, 16) + 1 - int(first, 16)) // 1024
    return 0


def state():
    zones = kernel.zones()
    free, low, high, least = (sum(z[n] for z in zones) for n in ("free", "low", "high", "min"))
    middle = (least + low) / 2
    steps = [(high, "High"), (low, "Clear"), (middle, "Soft"), (least, "Hard")]
    by_free = next((name for bound, name in steps if free >= bound), "Low")
    some, full = kernel.pressure("/proc/pressure/memory")
    by_pressure = "Low" if full >= 50 else "Hard" if full >= 10 else "Soft" if some >= 10 else "High"
    order = ["High", "Clear", "Soft", "Hard", "Low"]
    return max(by_free, by_pressure if free < 2 * high else "High", key=order.index)


def comp_stats():
    said, zones, counted = kernel.meminfo(), kernel.zones(), kernel.vmstat()
    parts = ("free", "dataAndHeap", "knvClientConsumed", "otherConsumed")
    left = said["MemTotal"] // 50 if said["MemTotal"] <= 2 << 20 else said["MemTotal"] // 200
    maps = counted.get("nr_memmap_pages")

    def other(row):
        """Every page is in one of four parts; little is left over, and none is counted twice."""
        rest = said["MemTotal"] - sum(int(row[p]) for p in parts if p != "otherConsumed")
        return Within(rest - left, rest)

    yield "host", {
        "total": sum(z["present"] for z in zones),
        "discarded": said["HardwareCorrupted"],
        "managedByMemMap": said["MemTotal"],
        "kernelCode": kernel_code(),
        "critical": sum(z["min"] for z in zones),
        "dataAndHeap": kernel_memory(),
        "buddyOvhd": None if maps is None else
        (maps + counted["nr_memmap_boot_pages"]) * kernel.PAGE,
        "rsvdLow": sum(z["present"] - z["managed"] for z in zones if z["zone"].startswith("DMA")),
        "managedByMemSched": OfRow(lambda row: said["MemTotal"] - int(row["dataAndHeap"])),
        "minFree": sum(z["high"] for z in zones),
        "knvClientConsumed": said["Buffers"] + said["Cached"] - said["Shmem"],
        "otherConsumed": OfRow(other),
        "free": said["MemFree"],
        "numHigh": 1,
        "memState": state(),
        **zeros("reliableMem", "numClear", "numSoft", "numHard", "numLow"),
    }


def pshare_stats():
    shared, sharing = kernel.ksm("pages_shared"), kernel.ksm("pages_sharing")
    zero = kernel.ksm("ksm_zero_pages")
    if zero is None and not kernel.ksm("use_zero_pages"):
        zero = 0
    unknown = zero is None
    yield "host", {
        "cow": None if unknown else (shared + sharing + zero) * kernel.PAGE,
        "cow1": None if sharing else shared * kernel.PAGE,
        "zero": None if unknown else zero * kernel.PAGE,
        "used": shared * kernel.PAGE,
        "reclaimed": None if unknown else (sharing + zero) * kernel.PAGE,
        **nones("totAdd", "totRemove"),
    }


def pshare_hint_stats():
    for kind in "regular", "lpage", "Total":
        yield kind, zeros("totAdd", "totRemove", "active")


ZONES = {"DMA": "lo", "DMA32": "lo32o", "Normal": "hi", "Movable": "hi-m", "Device": "hi-d"}
ORDERS = [f"{size}{unit}" for unit, sizes in (("KB", [4 << i for i in range(8)]), ("MB", [1 << i for i in range(10)]))
          for size in sizes] + ["1GB"]


def free_by_order():
    """Free buffers of each zone, by pagetypeinfo: those of all kinds together."""
    found = {}
    for line in kernel.text("/proc/pagetypeinfo").splitlines():
        words = line.replace(",", " ").split()
        if len(words) < 10 or words[0] != "Node" or words[4] != "type":
            continue
        counts = found.setdefault((int(words[1]), words[3]), [0] * len(ORDERS))
        for order, count in enumerate(words[6:]):
            counts[order] += int(count.lstrip(">"))
    return found


def buddy_stats():
    for zone in kernel.zones():
        free = free_by_order().get((zone["node"], zone["zone"]))
        if free is None:
            continue
        sizes = [4 << order for order in range(len(ORDERS))]
        # What runs beside the test takes buffers of all sizes.
        slack = [max(2, BESIDE // size) for size in sizes]
        used = (zone["managed"] - zone["free"]) // kernel.PAGE
        yield f"memmap-{zone['node']:02}-{ZONES[zone['zone']]}", {
            "memNode": zone["node"],
            "numaNode": zone["node"],
            "type": "low" if zone["zone"].startswith("DMA") else "high",
            **{f"{o}free": Within(n - s, n + s) for o, n, s in zip(ORDERS, free, slack)},
            **zeros(*(f"{o}used" for o in ORDERS[1:])),
            "4KBused": Within(used - BESIDE // 4, used + BESIDE // 4),
        }


POOL_ZEROS = ("nrSPageAllocs", "nrSPageFrees", "nrReapAttempts", "nrSPagesReaped", "nrDefragAttempts",
              "nrDefragCancelled", "nrDefragReaped", "nrLPagesDefragged", "peakDefragAttempts", "nrCachehit")


def lpool_stats():
    for node in 0, 1:
        none = zeros("nrLPages", "nrFreeSPages", *POOL_ZEROS)
        yield f"pshare-{node}/{node}", none
        directory = f"/sys/devices/system/node/node{node}"
        # The huge pages of the default size stand in the node's meminfo, too.
        said = {words[2].rstrip(":"): int(words[3])
                for words in map(str.split, kernel.text(f"{directory}/meminfo").splitlines())}
        for size in 2048, 1048576:
            pool = f"{directory}/hugepages/hugepages-{size}kB"
            total, free = (int(kernel.text(f"{pool}/{name}")) for name in ("nr_hugepages", "free_hugepages"))
            if size == 2048:
                total, free = said["HugePages_Total"], said["HugePages_Free"]
            yield f"huge-{size}kB/{node}", {
                "nrLPages": total * size // 2048,
                "nrFreeSPages": free * size // kernel.PAGE,
                **zeros(*POOL_ZEROS),
            }


def slab_caches():
    """The slab caches by their directories; the names that share one stand as links."""
    directory = "/sys/kernel/slab"
    for name in os.listdir(directory):
        path = f"{directory}/{name}"
        try:
            yield name, {
                key: int(kernel.text(f"{path}/{key}").split()[0])
                for key in ("slabs", "order", "objects", "total_objects", "slab_size")
            }
        except FileNotFoundError:
            continue


def heap_stats():
    limits = zeros("lowerLimit", "upperLimit", "reserved", "initial", "max", "maxAvail",
                   "pctFreeOfMax", "lowPctFreeOfMax")
    uncounted = nones("numSuccAllocs", "numFailAllocs", "numReqsPerGrowth", "numGrowthOps", "numShrinkOps")
    common = {"dynGrow": 1, **limits, **uncounted,
              "used": OfRow(lambda row: int(row["size"]) - int(row["avail"]))}
    named = {line.split()[0] for line in kernel.text("/proc/slabinfo").splitlines()[2:]}
    for name, cache in slab_caches():
        if name not in named:
            continue  # a further name of a cache
        slab = 4096 << cache["order"]
        size = cache["slabs"] * slab
        available = (cache["total_objects"] - cache["objects"]) * cache["slab_size"]
        wasted = size - cache["total_objects"] * cache["slab_size"]
        # What runs beside the test takes objects of all kinds.
        slack = max(slab, 512 * 1024)
        yield name[:35], {
            **common,
            "numRanges": Within(cache["slabs"] - slack // slab, cache["slabs"] + slack // slab),
            "size": Within(size - slack, size + slack),
            "avail": Within(available - slack, available + slack),
            "dlMallocOvdh": Within(wasted - slack, wasted + slack),
            "avgAllocSize": cache["slab_size"],
            "pctFreeOfCur": OfRow(lambda row: int(row["avail"]) * 100 // max(1, int(row["size"]))),
        }
    vmalloc = kernel.meminfo()["VmallocUsed"] * 1024
    yield "vmalloc", {
        **common,
        "numRanges": 1,
        "size": Within(vmalloc - 512 * 1024, vmalloc + 512 * 1024),
        "avgAllocSize": None,
        **zeros("avail", "dlMallocOvdh", "pctFreeOfCur"),
    }


NVDIMMS = "/sys/bus/nd/devices"


def nvdimm(name, figure, other=None):
    return kernel.text_or(f"{NVDIMMS}/{name}/{figure}", other)


def spaces_of(region):
    number = region.removeprefix("region")
    return sorted(name for name in os.listdir(NVDIMMS) if name.startswith(f"namespace{number}."))


def regions():
    return sorted(name for name in os.listdir(NVDIMMS) if name.startswith("region"))


def pmem_volumes():
    for region in regions():
        sizes = [int(nvdimm(space, "size")) for space in spaces_of(region)]
        size = int(nvdimm(region, "size"))
        # Memory without labels is one namespace, whatever the kernel calls available.
        has_labels = nvdimm(region, "nstype") == "5"
        available = int(nvdimm(region, "available_size")) if has_labels else 0
        yield region, {
            "alloc2MBlocks": sum(sizes) >> 21,
            "avail2MBlocks": available >> 21,
            "resvd2MBlocks": (size - available) >> 21,
            "totalRegions": len(sizes),
            "freeRegions": sizes.count(0),
            "total2MBlocks": size >> 21,
            "isClean": "n" if nvdimm(region, "badblocks", "") else "y",
        }


def pmem_regions():
    for region in regions():
        for space in spaces_of(region):
            size = int(nvdimm(space, "size"))
            disks = os.listdir("/sys/block")
            has_disk = any(os.path.realpath(f"/sys/block/{d}/device").endswith(space) for d in disks)
            flags = [(size, "allocated"), (nvdimm(space, "holder", ""), "locked"),
                     (nvdimm(region, "read_only", "0") != "0", "readOnly"), (has_disk, "blockDev"),
                     (nvdimm(space, "uuid", ""), "persistResv")]
            set_flags = [name for value, name in flags if value]
            yield f"{region}/{space}", {
                "size": size // 1024,
                "reserved": (size + (1 << 21) - 1) >> 21,
                "flags": set(set_flags) or {"(none)"},
            }


# Groups.


def settings(directory):
    """What is set in a control group; None stands for a process that has none of its own."""
    if directory is None or directory.rstrip("/") == CGROUPS:
        return {"min": 0, "max": None}
    return {"min": kernel.limit(f"{directory}/memory.min"), "max": kernel.limit(f"{directory}/memory.max")}


def is_reserved(directory):
    """Whether something is reserved here or above."""
    while directory.rstrip("/") != CGROUPS:
        if kernel.limit(f"{directory}/memory.min") != 0:
            return True
        directory = os.path.dirname(directory)
    return False


def effective_limit(directory):
    """The smallest limit here or above."""
    limits = []
    while directory.rstrip("/") != CGROUPS:
        limits += [kernel.limit(f"{directory}/{file}") for file in ("memory.max", "memory.high")]
        directory = os.path.dirname(directory)
    return min((limit for limit in limits if limit is not None), default=None)


def protection(directory):
    """What is kept of a group's memory, in any case or while there is other memory to take."""
    if directory is None or directory.rstrip("/") == CGROUPS:
        return 0
    return max(kernel.limit(f"{directory}/memory.{name}") for name in ("min", "low"))


def throttle(directory, own):
    """The part of the time that is left to a group whose processes all wait at once, in percent."""
    def file(of):
        return "/proc/pressure/memory" if of.rstrip("/") == CGROUPS else f"{of}/memory.pressure"

    if own is not None:
        return 100 - int(kernel.pressure(file(own))[1] + 0.5)
    # None, of a figure of 8 bits.
    return 100 if kernel.pressure(file(directory))[0] < 0.5 else "255"


def children(directory):
    return [entry.path for entry in os.scandir(directory) if entry.is_dir(follow_symlinks=False)]


def group_row(directory, own, **figures):
    """A row of group-stats for what stands in a control group, with what is set in another."""
    said = settings(own)
    return {
        **zeros("shares", "iMin", "rMinPeak", "bShares", "fShares", "ovhdResv", "allocTgt", "bActive", "mps"),
        "min": said["min"],
        "max": said["max"],
        "minLimit": None,
        "bMin": protection(own),
        "bMax": effective_limit(directory),
        "eMin": None if is_reserved(directory) else 0,
        "eMinPeak": None if is_reserved(directory) else 0,
        "conResv": 0,
        "availResv": said["min"],
        "throttlePct": throttle(directory, own),
        "tag": "",
        **figures,
    }


def process_row(pid, directory, own, **figures):
    walk, said = walked(pid), kernel.status(pid)
    held = walk["rss"] + walk["hugetlb"]
    return group_row(directory, own, **{
        "memSize": int(kernel.text(f"/proc/{pid}/statm").split()[0]) * kernel.PAGE,
        "memSizePeak": said["VmPeak"],
        "consumed": near(held, pid),
        "consumedPeak": None if walk["hugetlb"] else Within(held - batched(pid), said["VmHWM"] + batched(pid)),
        "ovhd": said["VmPTE"],
        "touched": None,
        "sharedSaved": saved_of(pid),
        "nChild": 0,
        "parGid": group_id(directory),
        **figures,
    })


def overhead(pid, own):
    """What QEMU takes beside the guest's memory, its page tables, and those of its guest."""
    walk, guest = walked(pid), guest_memory(pid)
    beside = walk["rss"] + walk["hugetlb"] - guest["resident"] + kernel.status(pid)["VmPTE"]
    tables = kernel.pairs(f"{own}/memory.stat").get("sec_pagetables", 0) // 1024 if own else 0
    return near(beside + tables, pid)


def process_groups(pid):
    directory = CGROUPS + cgroup_of(pid)
    if not is_machine(pid):
        yield str(PROCESS + pid), process_row(
            pid, directory, None, name=kernel.text(f"/proc/{pid}/comm"), flags={"lf", "uw"})
        return
    own = own_cgroup(pid)
    peak = memory_of(pid) if most_of(pid) == memory_of(pid) else None
    memory = {"memSize": memory_of(pid), "memSizePeak": peak, "ovhd": overhead(pid, own)}
    yield str(PROCESS + pid), process_row(
        pid, directory, own, name=machine_name(pid), flags={"vm"}, nChild=1, **memory)
    yield str(MONITOR + pid), process_row(
        pid, directory, own, name="vmm", flags={"lf", "vmm"}, parGid=PROCESS + pid, **memory)


def cgroup_flags(directory, is_leaf):
    path = directory.removeprefix(CGROUPS)
    system = path.startswith(("/system.slice", "/init.scope"))
    wanted = [(path.count("/") == 1, "pre"), (is_leaf, "lf"), (system, "sys"), (not system, "ug"),
              (path.endswith(".scope"), "np"), (path.startswith("/machine.slice/"), "co")]
    return {name for value, name in wanted if value}


def members(directory):
    return [pid for pid in map(int, kernel.text(f"{directory}/cgroup.procs").split())
            if pid in kernel.processes()]


def processes_below(directory):
    here = directory.removeprefix(CGROUPS).rstrip("/")
    return [pid for pid in kernel.processes() if (cgroup_of(pid) + "/").startswith(here + "/")]


def cgroup_row(directory):
    said = kernel.pairs(f"{directory}/memory.stat")
    swap = kernel.limit(f"{directory}/memory.swap.current")
    huge = sum(kernel.limit(entry.path) for entry in os.scandir(directory)
               if entry.name.startswith("hugetlb.") and entry.name.endswith(".current")
               and ".rsvd." not in entry.name)
    current = kernel.limit(f"{directory}/memory.current") + huge
    peak = kernel.limit(f"{directory}/memory.peak")
    swap_peak = kernel.limit(f"{directory}/memory.swap.peak")
    below = sum(kernel.limit(f"{child}/memory.min") for child in children(directory))
    count = len(children(directory)) + len(members(directory))
    name = os.path.basename(directory)
    return group_row(
        directory,
        directory,
        name=name,
        parGid=group_id(os.path.dirname(directory)),
        nChild=count,
        conResv=below,
        availResv=max(0, settings(directory)["min"] - below),
        memSize=current + swap,
        memSizePeak=peak if swap_peak == 0 and not huge else None,
        consumed=current,
        consumedPeak=None if huge else peak,
        ovhd=said["kernel"] // 1024,
        touched=(said["active_anon"] + said["active_file"]) // 1024,
        sharedSaved=sum(saved_of(pid) for pid in processes_below(directory)),
        flags=cgroup_flags(directory, count == 0),
        tag=name.rpartition(".")[2],
    )


def root_row():
    said = kernel.meminfo()
    consumed = said["MemTotal"] - said["MemFree"]
    below = sum(kernel.limit(f"{child}/memory.min") for child in children(CGROUPS))
    count = 1 + len(children(CGROUPS)) + len(members(CGROUPS))
    return group_row(
        CGROUPS,
        CGROUPS,
        name="/",
        parGid=0,
        nChild=Within(count, count + 1),  # tally comes and goes
        conResv=below,
        availResv=said["MemTotal"] - below,
        memSize=consumed + said["SwapTotal"] - said["SwapFree"],
        memSizePeak=None,
        consumed=consumed,
        consumedPeak=None,
        ovhd=kernel_memory(),
        touched=said["Active"],
        sharedSaved=pages_saved(),
        flags={"pre"},
    )


def pages_saved():
    """What merging saves on the host, less what is lost where each process is rounded."""
    saved_here = (kernel.ksm("pages_sharing") + (kernel.ksm("ksm_zero_pages") or 0)) * kernel.PAGE
    return Within(saved_here - len(kernel.processes()), saved_here)


def group_stats():
    yield "0", root_row()
    used = kernel_memory()
    yield str(PROCESS), group_row(
        CGROUPS, None, name="kernel", parGid=0, nChild=0, memSize=used, consumed=used, ovhd=0,
        memSizePeak=None, consumedPeak=None, touched=None, sharedSaved=0, flags={"pre", "lf", "sys", "ke"})
    for directory, _, _ in os.walk(CGROUPS):
        if directory != CGROUPS:
            yield str(group_id(directory)), cgroup_row(directory)
    for pid in compared_processes():
        yield from process_groups(pid)


# Clients.


def client(pid):
    return {"schedGrp": PROCESS + pid, "parSchedGroup": group_id(CGROUPS + cgroup_of(pid)), "worldGrp": pid}


def uw_stats():
    for pid in user_worlds():
        walk = walked(pid)
        close = {key: near(value, pid) for key, value in walk.items()}
        mapped = walk["rss"] + walk["hugetlb"] + zero_pages(pid)
        anonymous = walk["anonymous"] + walk["shm"]
        limit = resource.prlimit(pid, resource.RLIMIT_AS)[0]
        held = near(anonymous, pid)
        yield str(pid), {
            **client(pid),
            "type": "uw",
            "name": kernel.text(f"/proc/{pid}/comm"),
            "memSizeLimit": None if limit == resource.RLIM_INFINITY else limit // 1024,
            "memSize": int(kernel.text(f"/proc/{pid}/statm").split()[0]) * kernel.PAGE,
            "memBStore": held,
            "pageable": held,
            "pageableUnacct": close["file"],
            "swapBStore": close["swap"],
            "swapped": close["swap"],
            "mapped": near(mapped, pid),
            "pinned": walk["locked"] + walk["hugetlb"],
            "shm": close["shm"],
            "consumed": near(mapped - saved_of(pid), pid),
            "useReliableMem": "n",
            **nones("max", "minLimit", "touched", "swappable", "cow"),
            **zeros("min", "shares", "totalResv", "pinnedResv", "prealloced", "allocTgt", "swapTgt",
                    "swapScope"),
        }


def stat_of(own):
    return kernel.pairs(f"{own}/memory.stat") if own else {}


def in_kb(said, name, unit=1):
    return said[name] * unit // 1024 if name in said else None


def swapped_of(pid, own):
    """What is swapped of a guest and not compressed instead; some of that may be of QEMU itself."""
    swapped, all_swapped = guest_memory(pid)["swapped"], walked(pid)["swap"]
    if swapped == 0:
        return 0
    if own is None:
        return None
    plain = max(0, swapped - in_kb(stat_of(own), "zswapped"))
    return Within(plain, plain + all_swapped - swapped)


def touched_of(pid, own, resident):
    said = kernel.status(pid)
    if said["HugetlbPages"]:
        return None
    if said["VmRSS"] + said["VmSwap"] <= 256 * 1024 and said["VmPTE"] <= 512:
        return guest_memory(pid)["referenced"]
    stat = stat_of(own)
    return min((stat["active_anon"] + stat["active_file"]) // 1024, resident) if own else None


def merged_beside(pid, merged):
    """Merged pages that are not the guest's and yet counted: before Linux 6.8 all of the process are."""
    if RELEASE >= (6, 8):
        return 0
    return min(ROMS, max(0, kernel.ksm_of(pid)["ksm_merging_pages"] * kernel.PAGE - merged))


def vm_stats():
    for pid in machines():
        own, guest = own_cgroup(pid), guest_memory(pid)
        stat, set_here = stat_of(own), settings(own)
        merged, zero = guest["merged"], zero_pages(pid)
        mapped = guest["resident"] + zero
        saves = saved(merged) + zero
        other = merged_beside(pid, merged)
        has_balloon = machine_name(pid) == "alone"
        zipped, pool = in_kb(stat, "zswapped"), in_kb(stat, "zswap")
        yield machine_name(pid), {
            **client(pid),
            "b": "y" if has_balloon else "n",
            "memSize": memory_of(pid),
            "memSizeLimit": most_of(pid),
            "min": set_here["min"],
            "max": set_here["max"],
            "ovhd": overhead(pid, own),
            "mapped": mapped,
            "consumed": Within(mapped - saves - other, mapped - saves),
            "shared": Within(merged + zero, merged + zero + other),
            "zero": zero,
            "sharedSaved": Within(saves, saves + other),
            "touched": touched_of(pid, own, guest["resident"]),
            "ballooned": GUEST_BALLOON if has_balloon else 0,
            "balloonTgt": None if has_balloon else 0,
            "swapped": swapped_of(pid, own),
            "zipped": zipped,
            "zipSaved": zipped - pool if own else None,
            "useReliableMem": "n",
            "minLimit": None,
            **zeros("shares", "ovhdResv", "allocTgt", "swapTgt", "vpmemRO", "vpmemRW", "vpmemUC", "swapScope"),
        }


def swap_of(own):
    """What a machine may have of swap and has left: that of the host, or the least limit around it."""
    said = kernel.meminfo()
    total, free = said["SwapTotal"], said["SwapFree"]
    while own and own != CGROUPS:
        limit = kernel.limit(f"{own}/memory.swap.max")
        if limit is not None and limit < total:
            total, free = limit, limit - kernel.limit(f"{own}/memory.swap.current")
        own = os.path.dirname(own)
    return {"totalReg": total, "freeReg": free}


def swap_stats():
    for pid in machines():
        own = own_cgroup(pid)
        stat = stat_of(own)
        read, inside, out = in_kb(stat, "swapcached"), in_kb(stat, "pswpin", 4096), in_kb(stat, "pswpout", 4096)
        yield machine_name(pid), {
            **client(pid),
            **swap_of(own),
            "isSwapping": "n",  # the scene stands still
            "CurSwapper": "knv",
            "swapped": swapped_of(pid, own),
            "swapRead": read,
            "gblSwapRead": read,
            "swapIn": inside,
            "gblSwapIn": inside,
            "swapOut": out,
            "gblSwapOut": out,
            "COWSwapper": None if kernel.ksm_of(pid)["ksm_merging_pages"] else 0,
            **zeros("cacheUsage", "swapoutReady", "swapTgt", "discarded", "vmmSwapOn", "knvSwapOn", "llswapped",
                    "llswapUsed", "cptTgt", "cptRead", "cptWritten", "totalMig", "freeMig"),
        }


def guest_stats():
    for pid in machines():
        tells = machine_name(pid) == "alone"
        yield machine_name(pid), {
            **client(pid),
            "memTotal": SAID_BY_GUEST["total"] if tells else None,
            "memNeeded": SAID_BY_GUEST["total"] - SAID_BY_GUEST["available"] if tells else None,
            "lpageTotal": None,
        }


def zip_stats():
    for pid in machines():
        own = own_cgroup(pid)
        stat = stat_of(own)
        cache = kernel.limit(f"{own}/memory.zswap.max") if own else None
        out, back = in_kb(stat, "zswpout", 4096), in_kb(stat, "zswpin", 4096)
        yield machine_name(pid), {
            **client(pid),
            "totalCache": cache,
            "maxCache": cache,
            "usedCache": in_kb(stat, "zswap"),
            "zipped": out,
            "unZipped": back,
            "zipRejected": None,
            "avgZipTime": 0 if out == 0 else None,
            "avgUnzipTime": 0 if back == 0 else None,
            **zeros("nrFreeHalf", "nrFreeQuarter"),
        }


def lpage_stats():
    for pid in machines():
        own = own_cgroup(pid)
        stat = stat_of(own)
        huge = guest_memory(pid)["huge"] // 2048
        yield machine_name(pid), {
            **client(pid),
            "nrBackings": huge,
            "nrAllocSuccess": stat["thp_fault_alloc"] + stat["thp_collapse_alloc"] if own else None,
            "maxSwapThreshold": int(kernel.text("/sys/kernel/mm/transparent_hugepage/khugepaged/max_ptes_swap")),
            **nones("nrLocked", "nrBroken", "nrFailPinned", "nrFailSwapped", "nrFailPinnedLate", "nrFailNoMem"),
        }


def asyncremap_stats():
    """Linux has no such thing: there is the row of the total alone."""
    yield "host", zeros("added", "prepared", "filtered", "staged", "remapped", "canceled", "cUnprepared",
                        "cPrepared", "cStaged")


class Report:
    """A report: what it should show, what names its rows, and how far its figures may be off."""

    def __init__(self, should, key, arguments, near=None, why=None, skip=lambda row: False):
        self.should, self.key_columns, self.arguments = should, key, arguments
        self.near = near or {}  # tolerance in KB by column; others are exact
        self.why = why or {}  # columns that are not compared, and why
        self.skip = skip

    def key(self, row):
        return "/".join(row[column] for column in self.key_columns) or "host"


def is_of_test(row):
    return int(row["gid"]) & (PROCESS - 1) in IGNORED if int(row["gid"]) > PROCESS else False


def is_total(row):
    return "Total" in (row.get("name"), row.get("schedGrp")) or row.get("worldGrp") == ""


REPORTS = {
    "group-stats": Report(group_stats, ("gid",), ["group-stats"], {
        "memSize": BESIDE, "consumed": BESIDE, "consumedPeak": BESIDE, "memSizePeak": BESIDE, "ovhd": BESIDE,
        "touched": BESIDE}, skip=is_of_test),
    "vm-stats": Report(vm_stats, ("name",), ["vm-stats"], {
        "touched": RUNNING, "mapped": RUNNING, "consumed": RUNNING, "zipped": RUNNING, "zipSaved": RUNNING,
        "swapped": RUNNING}, skip=is_total),
    "uw-stats": Report(uw_stats, ("worldGrp",), ["uw-stats"],
                       skip=lambda row: is_total(row) or int(row["worldGrp"]) in IGNORED),
    "swap-stats": Report(swap_stats, ("name",), ["swap-stats"], {
        "swapped": RUNNING, "freeReg": BESIDE}, skip=is_total),
    "guest-stats": Report(guest_stats, ("name",), ["guest-stats"], skip=is_total),
    "zip-stats": Report(zip_stats, ("name",), ["zip-stats"], skip=is_total),
    "lpage-stats": Report(lpage_stats, ("name",), ["lpage-stats"], skip=is_total),
    "asyncremap-stats": Report(asyncremap_stats, (), ["asyncremap-stats"],
                               why=dict.fromkeys(("name", "grpLeader", "type"), "the total has none")),
    "comp-stats": Report(comp_stats, (), ["comp-stats"], {
        "dataAndHeap": BESIDE, "managedByMemSched": 0, "knvClientConsumed": BESIDE, "otherConsumed": BESIDE,
        "free": BESIDE}),
    "pshare-stats": Report(pshare_stats, (), ["pshare-stats"]),
    "pshareHint-stats": Report(pshare_hint_stats, ("type",), ["pshareHint-stats"]),
    "buddy-stats": Report(buddy_stats, ("name",), ["buddy-stats"], skip=is_total),
    "lpool-stats": Report(lpool_stats, ("name", "nodeID"), ["lpool-stats"], skip=is_total),
    "heap-stats": Report(heap_stats, ("name",), ["heap-stats"], skip=is_total),
    "pmem-stats": Report(pmem_volumes, ("uuid",), ["pmem-stats"]),
    "pmem-stats -l 2": Report(pmem_regions, ("uuid", "regionUuid"), ["pmem-stats", "-l", "2"]),
}
