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


def compare_figure(sheet, name, report, key, column, row, before, after):
    ours = row[column]
    if isinstance(before, set):
        ours_set = set(ours.strip(":").split(":"))
        is_wrong, before, after = ours_set != before, ":".join(sorted(before)), ":".join(sorted(after))
    else:
        is_wrong = figures.differs(ours, row, before, after, report.near.get(column, 0))
    sheet.figure(is_wrong, name, key, column, ours, figures.shown(before, row), figures.shown(after, row))


def compare_report(sheet, name, report):
    kernel.forget()
    before = dict(report.should())
    kernel.forget()
    tally, rows = figures.read_report(*report.arguments)
    reports.IGNORED.add(tally)
    after = dict(report.should())
    ours = {report.key(row): row for row in rows if not report.skip(row)}
    for key in sorted(before.keys() - ours.keys()):
        sheet.missing(name, key, "the row is missing")
    for key in sorted(ours.keys() - before.keys()):
        sheet.missing(name, key, "the row is too much")
    for key, row in ours.items():
        if key not in before or key not in after:
            continue
        for column in row:
            if column in before[key]:
                compare_figure(sheet, name, report, key, column, row, before[key][column], after[key][column])
            elif column not in report.why and column not in report.key_columns:
                sheet.missing(name, key, column, "the column is compared with nothing")


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
