"""Makes a host of the guest: control groups with limits, swap, and what takes memory in all ways."""

import json
import os
import socket
import subprocess

import kernel

CGROUPS = "/sys/fs/cgroup"
HERE = os.path.dirname(os.path.abspath(__file__))
MB = 1 << 20

# The control groups, what is set in them, and in which way memory is held there: (way, MB).
GROUPS = {
    "system.slice": {"memory.min": 48 * MB},
    "system.slice/locked.service": {"memory.min": 32 * MB, "hold": [("locked", 20), ("locked", 20)]},
    "system.slice/shared.service": {"memory.max": 512 * MB, "hold": [("shared", 12)]},
    "user.slice": {},
    "user.slice/same.scope": {"hold": [("same", 16), ("same", 16), ("same", 8), ("zero", 8)]},
    "user.slice/zipped.scope": {"memory.swap.max": 256 * MB, "hold": [("distinct", 24)]},
    "user.slice/swapped.scope": {"memory.zswap.max": 0, "hold": [("distinct", 24)]},
    "user.slice/high.scope": {"memory.high": 64 * MB, "memory.low": 16 * MB, "hold": [("distinct", 4)]},
    "user.slice/huge.scope": {"hold": [("huge-2M", 8), ("huge-1G", 1024)]},
    "machine.slice": {"memory.max": 2048 * MB},
    "machine.slice/alone.scope": {
        "memory.min": 32 * MB,
        "memory.max": 600 * MB,
        "memory.swap.max": 128 * MB,
        "memory.zswap.max": 64 * MB,
    },
    "machine.slice/huge.scope": {},
    "machine.slice/large.scope": {},
    "machine.slice/pair.scope": {},
    "machine.slice/plugged.scope": {},
}

# Of the pages that are the same, in processes (16, 16 and 8 MB) and in a machine (16 MB), so many go at
# least.
SHARING = (24 + 15) * 256

# What is taken from a control group's memory and put where its settings say.
RECLAIMED = {
    "user.slice/zipped.scope": 16,
    "user.slice/swapped.scope": 16,
    "machine.slice/alone.scope": 24,
}

# The machines: control group, name, memory in MB and room for more, what else QEMU is told.
MACHINES = [
    ("alone", "alone", 96, ["-kernel", f"{HERE}/guest.elf", "-device", "virtio-balloon-pci,id=balloon0",
                            "-qmp", "unix:/run/alone.qmp,server=on,wait=off"]),
    ("plugged", "plugged", "24,slots=1,maxmem=256M", ["-S", "-mem-prealloc",
                                                      "-qmp", "unix:/run/plugged.qmp,server=on,wait=off"]),
    ("huge", "huge", 16, ["-S", "-mem-path", "/run/hugepages", "-mem-prealloc"]),
    ("large", "large", 320, ["-S", "-mem-prealloc", "-machine", "mem-merge=off"]),
    ("pair", "first", 24, ["-S", "-mem-prealloc"]),
    ("pair", "second", 24, ["-S", "-mem-prealloc", "-machine", "dump-guest-core=on"]),
]


def mount(kind, at, options=None):
    os.makedirs(at, exist_ok=True)
    command = ["/bin/busybox", "mount", "-t", kind, kind, at]
    subprocess.run(command + (["-o", options] if options else []), check=True)


def in_group(group, command, **more):
    """Starts a command as a process of a control group."""

    def enter():
        kernel.write(f"{CGROUPS}/{group}/cgroup.procs", os.getpid())

    return subprocess.Popen(command, preexec_fn=enter, **more)


def make_groups():
    mount("cgroup2", CGROUPS)
    for path, settings in GROUPS.items():
        above = os.path.dirname(f"{CGROUPS}/{path}")
        kernel.write(f"{above}/cgroup.subtree_control", "+memory +hugetlb")
        os.mkdir(f"{CGROUPS}/{path}")
        for name, value in settings.items():
            if name.startswith("memory."):
                kernel.write(f"{CGROUPS}/{path}/{name}", value)


def make_swap():
    """A compressed disk in memory, taken first, a disk, and the cache before both."""
    kernel.write("/sys/block/zram0/disksize", "128M")
    for disk in "/dev/zram0", "/dev/vdb":  # the first has the higher priority
        subprocess.run(["/bin/busybox", "mkswap", disk], check=True, stdout=subprocess.DEVNULL)
        subprocess.run(["/bin/busybox", "swapon", disk], check=True)


def make_huge_pages():
    for node, count in (0, 20), (1, 12):
        directory = f"/sys/devices/system/node/node{node}/hugepages/hugepages-2048kB"
        kernel.write(f"{directory}/nr_hugepages", count)
    mount("hugetlbfs", "/run/hugepages", "pagesize=2M")


def make_namespace():
    """The module that can have labels gets some, and a namespace in half of it."""
    for command in (["disable-region", "all"], ["init-labels", "-f", "nmem0"], ["enable-region", "all"],
                    ["create-namespace", "-m", "raw", "-s", "64M"]):
        subprocess.run(["/usr/bin/ndctl", *command], check=True, stdout=subprocess.DEVNULL)


def make_holders():
    with open("/run/locked", "wb") as file:
        file.truncate(20 * MB)
    started = []
    for path, settings in GROUPS.items():
        for way, megabytes in settings.get("hold", []):
            command = ["/usr/bin/python3", f"{HERE}/holder.py", way, str(megabytes), "/run/locked"]
            process = in_group(path, command, stdout=subprocess.PIPE, text=True)
            started.append((way, process))
    for way, process in started:
        if process.stdout.readline() != "ready\n":
            raise RuntimeError(f"no memory held: {way}")


MACHINE_OF = {}  # by process


def start_machines():
    for machine in MACHINES:
        scope, name, memory, options = machine
        command = ["/usr/bin/qemu-system-x86_64", "-name", f"guest={name}", "-accel", "tcg,tb-size=16"]
        command += ["-nodefaults", "-display", "none", "-m", str(memory), *options]
        process = in_group(f"machine.slice/{scope}.scope", command, stdin=subprocess.DEVNULL)
        MACHINE_OF[process.pid] = machine


# What the machine that has room for it gets of memory later, in MB.
PLUGGED = 32


def ask(machine, command, **arguments):
    """Asks the monitor of a machine, and hangs up: it serves one at a time."""
    with socket.socket(socket.AF_UNIX) as monitor:
        monitor.connect(f"/run/{machine}.qmp")
        with monitor.makefile("rw") as lines:
            lines.readline()
            for question in {"execute": "qmp_capabilities"}, {"execute": command, "arguments": arguments}:
                lines.write(json.dumps(question) + "\n")
                lines.flush()
                answer = json.loads(lines.readline())
                while "event" in answer:
                    answer = json.loads(lines.readline())
    return answer["return"]


def is_filled(pid, megabytes):
    said = kernel.status(pid)
    return said["VmRSS"] + said["HugetlbPages"] > megabytes * 1024


def settle_machines():
    """Waits until each has the memory it will have, and the balloon is as large as it is to be."""
    balloon = {"path": "/machine/peripheral/balloon0"}
    for name in "alone", "plugged":
        kernel.wait_for("monitor", lambda n=name: os.path.exists(f"/run/{n}.qmp"))
    ask("alone", "qom-set", property="guest-stats-polling-interval", value=5, **balloon)
    for pid, (_, name, megabytes, options) in MACHINE_OF.items():
        filled = int(str(megabytes).split(",")[0]) if "-mem-prealloc" in options else 40
        kernel.wait_for(f"memory of {name}", lambda p=pid, f=filled: is_filled(p, f))
    ask("alone", "balloon", value=72 * MB)
    kernel.wait_for("balloon", lambda: ask("alone", "query-balloon")["actual"] == 72 * MB)
    kernel.wait_for("guest", lambda: ask("alone", "qom-get", property="guest-stats", **balloon)["last-update"])
    more = {"qom-type": "memory-backend-ram", "id": "more", "size": PLUGGED * MB, "prealloc": True}
    ask("plugged", "object-add", **more)
    ask("plugged", "device_add", driver="pc-dimm", memdev="more")


def settle_sharing():
    """Merges what can be merged, then leaves it as it is."""
    ksm = "/sys/kernel/mm/ksm"
    kernel.write(f"{ksm}/use_zero_pages", 1 if kernel.version() >= (6, 6) else 0)
    if os.path.exists(f"{ksm}/smart_scan"):
        kernel.write(f"{ksm}/smart_scan", 0)
    kernel.write(f"{ksm}/sleep_millisecs", 5)
    kernel.write(f"{ksm}/pages_to_scan", 5000)
    kernel.write(f"{ksm}/run", 1)
    kernel.wait_for("samepage merging", lambda: kernel.ksm("pages_sharing") >= SHARING, 600)
    scanned = kernel.ksm("full_scans")
    kernel.wait_for("another scan", lambda: kernel.ksm("full_scans") >= scanned + 2, 600)
    kernel.write(f"{ksm}/run", 0)


def reclaim():
    for group, megabytes in RECLAIMED.items():
        try:
            kernel.write(f"{CGROUPS}/{group}/memory.reclaim", megabytes * MB)
        except BlockingIOError:
            pass  # less than that was reclaimed: the figures tell how much


def make():
    steps = [make_groups, make_swap, make_huge_pages, make_namespace, start_machines, make_holders,
             settle_machines, settle_sharing, reclaim]
    for step in steps:
        print("scene:", step.__name__, flush=True)
        step()
