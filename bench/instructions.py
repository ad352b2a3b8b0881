#!/usr/bin/env python3
"""Instructions of five fixed cases, as callgrind counts them, held against the stored figures.

usage: instructions.py BIN FOLDER [--store]

Times differ from one moment to the next, instructions hardly do: a count that is more than 3 % off shows a slow-down on
any machine, or a speed-up that should be stored, so that it is kept. Status 1 then. --store writes the figures that were
counted to instructions.json, which belongs to the compiler and the libraries of Debian 12 on x86-64.
"""

import argparse
import json
import os
import pathlib
import re
import subprocess
import sys

from compare import Workshop

STORED = pathlib.Path(__file__).resolve().with_name("instructions.json")
TOLERANCE = 0.03
# The C library picks its string functions by the processor: the plain ones are on all.
ENVIRONMENT = {"PATH": os.environ["PATH"], "TZ": "UTC", "LC_ALL": "C", "TBDAILY_LIVE": "0", "TBDAILY_LOG": "file",
               "GLIBC_TUNABLES": "glibc.cpu.hwcaps=-AVX,-AVX2,-BMI2,-ERMS,-FSRM,-RTM,-MOVBE:"
                                 "glibc.cpu.x86_non_temporal_threshold=0xc0000"}


def cases(shop):
    day = shop.made("counted-day", "make_day.py", "--scalars", 5_000, "--distributions", 50, "--values", 200)
    lines = shop.made("counted-lines", "make_lines.py", 20_000)
    sample = shop.folder / "counted-sample"
    if not sample.exists():
        subprocess.run([shop.program("tallyctl"), "--root", sample, "init"], check=True, stdout=subprocess.DEVNULL)
    loaded = lines / "counted"
    report = shop.folder / "counted-report.plist"
    shop.job(day, "-d")  # once for the day, whatever ran before; what it leaves goes with what earlier runs left
    subprocess.run(["rm", "-rf", loaded, day / "var/mobile/Library/Logs", day / "var/log", day / "var/run"], check=True)
    loaded.mkdir()
    yield "the report of a small day", day, ["tbdaily", "-f"]
    yield "a day already done", day, ["tbdaily", "-d"]
    (log,) = (day / "var/mobile/Library/Logs/Pending").glob("*.193")
    report.write_bytes(log.read_bytes())
    yield "that report read and written", day, ["tallyctl", "plist", report]
    yield "a load of 20,000 lines", loaded, ["tallyctl", "record", "import", lines / "lines.tsv"]
    yield "the controller's figures", sample, ["tallyctl", "nand", "--json"]


def counted(shop, root, command):
    words = ["valgrind", "--tool=callgrind", "--callgrind-out-file=/dev/null", shop.program(command[0]), *command[1:]]
    done = subprocess.run([str(word) for word in words], stdin=subprocess.DEVNULL, stdout=subprocess.DEVNULL,
                          stderr=subprocess.PIPE, env=dict(ENVIRONMENT, TBDAILY_ROOT=str(root)), check=False)
    found = re.search(rb"I\s+refs:\s+([\d,]+)", done.stderr)
    if done.returncode != 0 or not found:
        sys.exit(f"instructions: {command[0]} ended with status {done.returncode}: {done.stderr.decode(errors='replace')}")
    return int(found.group(1).replace(b",", b""))


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("binary", type=pathlib.Path)
    parser.add_argument("folder", type=pathlib.Path)
    parser.add_argument("--store", action="store_true")
    chosen = parser.parse_args()
    shop = Workshop(chosen.binary, chosen.folder, False)
    stored = {} if chosen.store else json.loads(STORED.read_text())
    figures, off = {}, 0
    print("| case | instructions | of the stored figure |\n|---|---|---|", flush=True)
    for case, root, command in cases(shop):
        figures[case] = counted(shop, root, command)
        ratio = figures[case] / stored.get(case, figures[case])
        off += abs(ratio - 1) > TOLERANCE
        print(f"| {case} | {figures[case]:,} | {ratio:.3f}{' off' if abs(ratio - 1) > TOLERANCE else ''} |", flush=True)
    if chosen.store:
        STORED.write_text(json.dumps(figures, indent=2) + "\n")
    if off:
        print("instructions: more than 3 % off; what is meant to stay is stored with bench/instructions.py BIN FOLDER --store",
              file=sys.stderr)
    return 1 if off else 0


if __name__ == "__main__":
    sys.exit(main())
