"""How a figure of a report is held against the kernel's."""

import csv
import os
import subprocess

import kernel

TALLY = "/run/tally/tally"

# How a report shows what has no value, or no limit.
NONE = {"-1", "4294967295", "18446744073709551615", "18446744073709551612"}

# By how much a figure may lie outside what the kernel said before and after, in KB. Others are exact.

# What runs beside the test, tally itself among it, and what processors hold for themselves.
BESIDE = 8192
# Pages that a machine comes to use or leaves while it runs.
RUNNING = 256
# What a machine has in memory that can be merged beside that of its guest: ROMs and tables.
ROMS = 2560


def batched(pid):
    """What the kernel counts in batches, where a page map has each page.

    Since Linux 6.2 each processor keeps some pages of each kind; before, each thread has up to 66
    faults of 16 pages to itself.
    """
    if kernel.version() >= (6, 2):
        return os.cpu_count() * 64 * kernel.PAGE
    return kernel.status(pid)["Threads"] * 66 * 16 * kernel.PAGE


class Within:
    """A figure that the kernel tells by its bounds."""

    def __init__(self, low, high):
        self.low, self.high = low, high

    def __str__(self):
        return f"{self.low}..{self.high}"


class OfRow:
    """A figure that follows from others of its row."""

    def __init__(self, reckon):
        self.reckon = reckon


def read_report(*arguments):
    """The process that made a report, and its rows: dicts by column. What tally complains of fails the report."""
    run = subprocess.Popen([TALLY, "-r", *arguments, "-q"], stdout=subprocess.PIPE, stderr=subprocess.PIPE,
                           text=True)
    output, complaints = run.communicate()
    if run.returncode != 0 or complaints:
        raise RuntimeError(f"exit status {run.returncode}: {complaints.strip()}")
    lines = list(csv.reader(output.splitlines()))
    if not lines:
        raise RuntimeError("no output")
    return run.pid, [dict(zip(lines[0], line)) for line in lines[1:]]


def number_or_text(value):
    return int(value) if value.lstrip("-").isdigit() else value


def differs(ours, row, before, after, tolerance):
    """Whether what a report shows is not what the kernel said."""
    if isinstance(before, OfRow):
        before = after = before.reckon(row)
    if before is None or after is None:
        return ours not in NONE
    if isinstance(before, str) or isinstance(after, str):
        return ours not in (before, after)
    bounds = []
    for said in before, after:
        bounds += [said.low, said.high] if isinstance(said, Within) else [said]
    if ours in NONE or not isinstance(number_or_text(ours), int):
        return True
    return not min(bounds) - tolerance <= int(ours) <= max(bounds) + tolerance


def shown(said, row):
    if isinstance(said, OfRow):
        said = said.reckon(row)
    return "none" if said is None else str(said)
