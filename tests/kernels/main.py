"""The first program of the guest: makes a scene, compares all reports with the kernel, and says so.

On the second serial line stands for each figure: ok or FAIL, report, row, column, what tally shows,
what the kernel said before and after.
"""

import ctypes
import os
import traceback

import figures
import kernel
import reports
import scene


class Sheet:
    """Where the figures are written, and how many there are."""

    def __init__(self, file):
        self.file, self.compared, self.failed = file, 0, 0

    def say(self, line):
        print(line, file=self.file, flush=True)

    def figure(self, is_wrong, *what):
        self.compared += 1
        self.failed += is_wrong
        self.say(("FAIL " if is_wrong else "ok   ") + " | ".join(what))

    def missing(self, *what):
        self.failed += 1
        self.say("FAIL " + " | ".join(what))


def compare_figure(report, column, row, before, after):
    """Whether a figure is wrong, what tally shows, and what the kernel said before and after."""
    ours = row[column]
    if isinstance(before, set):
        is_wrong = set(ours.strip(":").split(":")) != before
        return is_wrong, ours, ":".join(sorted(before)), ":".join(sorted(after))
    is_wrong = figures.differs(ours, row, before, after, report.near.get(column, 0))
    return is_wrong, ours, figures.shown(before, row), figures.shown(after, row)


def look(report):
    """The figures of a report beside the kernel's, by row and column; and what is missing."""
    kernel.forget()
    before = dict(report.should())
    kernel.forget()
    tally, rows = figures.read_report(*report.arguments)
    reports.IGNORED.add(tally)
    after = dict(report.should())
    ours = {report.key(row): row for row in rows if not report.skip(row)}
    missing = [(key, "the row is missing") for key in sorted(before.keys() - ours.keys())]
    missing += [(key, "the row is too much") for key in sorted(ours.keys() - before.keys())]
    found = {}
    for key, row in ours.items():
        if key not in before or key not in after:
            continue
        for column in row:
            if column in before[key]:
                found[key, column] = compare_figure(report, column, row, before[key][column], after[key][column])
            elif column not in report.why and column not in report.key_columns:
                missing.append((key, column, "the column is compared with nothing"))
    return found, missing


# What moves may do so by more than its tolerance; it does not each time that one looks.
LOOKS = 4


def compare_report(sheet, name, report):
    found, missing = look(report)
    for _ in range(LOOKS - 1):
        moved = [which for which, figure in found.items() if figure[0] and which[1] in report.near]
        if not moved:
            break
        for which in moved:
            sheet.say(f"again {name} | " + " | ".join([*which, *found[which][1:]]))
        again, _ = look(report)
        found.update({which: again[which] for which in moved if which in again})
    for what in missing:
        sheet.missing(name, *what)
    for which, (is_wrong, *said) in found.items():
        sheet.figure(is_wrong, name, *which, *said)


def compare_all(sheet):
    for name, report in reports.REPORTS.items():
        try:
            compare_report(sheet, name, report)
        except Exception:  # whatever goes wrong, the other reports are still worth knowing
            sheet.missing(name, traceback.format_exc().replace("\n", " / "))
    for name, report in reports.REPORTS.items():
        for column, why in report.why.items():
            sheet.say(f"not compared: {name} {column}: {why}")
    sheet.say("not compared: the rows of totals: they are tally's sums, of which no kernel knows")
    sheet.say("not compared: the processes of tally and of this test: they do not stand still")


def end():
    os.sync()
    ctypes.CDLL(None).reboot(0x4321FEDC)  # power off


def main():
    os.dup2(os.open("/dev/ttyS0", os.O_RDWR), 0)
    os.dup2(0, 1)
    os.dup2(0, 2)
    with open("/dev/ttyS1", "w", encoding="utf-8") as file:
        sheet = Sheet(file)
        try:
            scene.make()
            reports.IGNORED.add(os.getpid())
            compare_all(sheet)
        except Exception:
            sheet.missing("scene", traceback.format_exc().replace("\n", " / "))
        good = sheet.failed == 0 and sheet.compared > 0
        verdict = "all as the kernel says" if good else f"{sheet.failed} wrong"
        sheet.say(f"summary: {os.uname().release}: {sheet.compared} figures, {verdict}")
    end()


main()
