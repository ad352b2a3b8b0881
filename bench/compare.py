#!/usr/bin/env python3
"""The job beside what one would use instead, in turn in one run; both sides must come to the same.

usage: compare.py BIN FOLDER [--rounds N]

BIN has the programs of the release preset, FOLDER keeps the devices that are made for it. Processor time (user and system)
of the best of so many rounds, as ratios. Status 1 when a result differs; a goal that is missed is marked.
"""

import argparse
import os
import pathlib
import plistlib
import shutil
import subprocess
import sys

PEERS = pathlib.Path(__file__).resolve().parent / "peers"
SPOOL = "var/mobile/Library/Logs/Pending"
STORE = "var/mobile/Library/Tallybook/TBDataStore.sqlitedb"
MEBIBYTE = 1 << 20


def device(folder, name, *options):
    root = folder / name
    if not root.exists():
        part = folder / (name + ".part")
        shutil.rmtree(part, ignore_errors=True)
        subprocess.run([sys.executable, PEERS / "make_day.py", part, *options], check=True)
        part.rename(root)
    return root


def measured(*command, stdin=None, **environment):
    """(seconds of processor time, peak of memory in bytes)"""
    with open(stdin or os.devnull, "rb") as source:
        process = subprocess.Popen([str(word) for word in command], stdin=source, stdout=subprocess.DEVNULL,
                                   stderr=subprocess.DEVNULL, env=dict(os.environ, **environment))
        _, status, usage = os.wait4(process.pid, 0)
    process.returncode = os.waitstatus_to_exitcode(status)
    if process.returncode != 0:
        sys.exit(f"{command[0]} ended with status {process.returncode}")
    return usage.ru_utime + usage.ru_stime, usage.ru_maxrss * 1024


def best(rounds, *subjects):
    """Of each subject its shortest time and its largest peak; in turn, so that all meet the same machine."""
    results = [(float("inf"), 0)] * len(subjects)
    for _ in range(rounds):
        for i, subject in enumerate(subjects):
            seconds, peak = subject()
            results[i] = min(results[i][0], seconds), max(results[i][1], peak)
    return results


class Table:
    def __init__(self):
        print("| work | beside it | measured | goal | |\n|---|---|---|---|---|")

    @staticmethod
    def row(work, peer, measure, goal, holds):
        print(f"| {work} | {peer} | {measure} | {goal} | {'' if holds else 'missed'} |", flush=True)


def job(binary, root):
    def run():
        shutil.rmtree(root / SPOOL, ignore_errors=True)
        return measured(binary / "tbdaily", "-f", TBDAILY_ROOT=str(root), TBDAILY_LIVE="0")
    return run


def report_of(root):
    (place,) = (root / SPOOL).glob("*.193")
    return plistlib.loads(place.read_bytes()), place.stat().st_size


def differs(root, script_output):
    report, script = report_of(root)[0], plistlib.loads(script_output.read_bytes())
    wrong = [table for table, entries in script.items()
             if {key: report[table].get(key) for key in entries} != entries
             or (table != "TBScalars" and len(report[table]) != len(entries))]
    if wrong:
        print(f"compare: the reports differ in {', '.join(wrong)}", file=sys.stderr)
    return bool(wrong)


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("binary", type=pathlib.Path)
    parser.add_argument("folder", type=pathlib.Path)
    parser.add_argument("--rounds", type=int, default=5)
    chosen = parser.parse_args()
    chosen.folder.mkdir(parents=True, exist_ok=True)
    day, large = device(chosen.folder, "day"), device(chosen.folder, "large", "--values", "10000")
    output = chosen.folder / "report.plist"
    table = Table()

    (own, peak), (shell, _) = best(chosen.rounds, job(chosen.binary, day),
                                   lambda: measured("sqlite3", day / STORE, stdin=PEERS / "report.sql"))
    table.row("`tbdaily -f`, 200,000 scalars, 2,000 distributions of 1,000 values", "`sqlite3` shell, the same rows",
              f"{own / shell:.2f} times ({own:.2f} s, {shell:.2f} s)", "at most 1.0", own <= shell)
    # Before this process grows: a child's peak counts from what its parent holds when it begins.
    (_, large_peak), = best(1, job(chosen.binary, large))
    (script, _), = best(1, lambda: measured(sys.executable, PEERS / "report.py", day, output))
    failed = differs(day, output)
    table.row("the same", "a script in Python", f"{script / own:.1f} times as fast ({script:.1f} s)", "at least 10",
              script >= 10 * own)
    size = report_of(day)[1]
    table.row("peak of memory of the same", f"the report, {size / MEBIBYTE:.1f} MiB", f"{peak / MEBIBYTE:.1f} MiB",
              "2.5 times and 8 MiB", peak <= 2.5 * size + 8 * MEBIBYTE)
    table.row("peak with ten times the values", "the peak above", f"{large_peak / peak:.3f} times", "within 5 %",
              abs(large_peak / peak - 1) <= 0.05)
    return 1 if failed else 0


if __name__ == "__main__":
    sys.exit(main())
