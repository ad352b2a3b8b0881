#!/usr/bin/env python3
"""Each subject beside what one would use instead, in turn in one run; both sides must come to the same.

usage: compare.py BIN FOLDER [--moment]

BIN has the programs of the release preset, FOLDER keeps the devices that are made for it. Prints one table: ratios, goals,
and a mark where one is missed. Status 1 when two sides differ. Whole programs are measured by the processor's time (user
and system), the best of several rounds; --moment takes small inputs and few rounds, to see that all of it runs: its ratios
say nothing.
"""

import argparse
import fcntl
import json
import os
import pathlib
import plistlib
import pty
import re
import shutil
import sqlite3
import struct
import subprocess
import sys
import termios
import time

PEERS = pathlib.Path(__file__).resolve().parent / "peers"
SPOOL = "var/mobile/Library/Logs"
STORE = "var/mobile/Library/Tallybook/TBDataStore.sqlitedb"
MEBIBYTE = 1 << 20
NANOSECONDS = {"ns": 1, "us": 1e3, "ms": 1e6, "s": 1e9}


class Differs(Exception):
    """A subject and its peer did not come to the same."""


class Table:
    """Rows of Markdown, printed as they come; the work of each in the order of its number."""

    def __init__(self, moment):
        self.moment, self.differing = moment, 0
        print("| # | work | beside it | measured | goal | |\n|---|---|---|---|---|---|", flush=True)

    def row(self, number, work, peer, measured, goal, holds):
        mark = "ran" if self.moment else "" if holds else "missed"
        print(f"| {number} | {work} | {peer} | {measured} | {goal} | {mark} |", flush=True)

    def differs(self, number, reason):
        self.differing += 1
        print(f"| {number} | | | results differ: {reason} | | differs |", flush=True)


class Workshop:
    """The programs, the folder of the devices, and how long is measured."""

    def __init__(self, binary, folder, moment):
        self.binary, self.folder, self.moment = binary.resolve(), folder.resolve(), moment
        self.folder.mkdir(parents=True, exist_ok=True)

    def rounds(self, usual):
        return 1 if self.moment else usual

    def size(self, usual):
        return usual // 100 if self.moment else usual

    def made(self, name, maker, *options):
        """What a maker of the peers makes under that name; made anew when the maker or its options changed."""
        root = self.folder / (name + ("-moment" if self.moment else ""))
        recipe = self.folder / (root.name + ".recipe")
        words = " ".join([(PEERS / maker).read_text(), *map(str, options)])
        if not root.exists() or not recipe.exists() or recipe.read_text() != words:
            shutil.rmtree(root, ignore_errors=True)
            lines = [sys.executable, PEERS / maker, root, *options]
            subprocess.run(list(map(str, lines)), check=True)
            recipe.write_text(words)
        return root

    def program(self, name):
        return self.binary / name

    def measured(self, *command, stdin=None, cwd=None, **environment):
        """(seconds of the processor, peak of memory in bytes)"""
        with open(stdin or os.devnull, "rb") as source:
            done = subprocess.run([str(word) for word in (self.program("measure"), *command)], stdin=source, cwd=cwd,
                                  capture_output=True, check=False, env=dict(os.environ, **environment))
        if done.returncode != 0:
            sys.exit(f"compare: {command[0]} ended with status {done.returncode}: {done.stderr.decode()}")
        seconds, _, peak = done.stdout.split()
        return float(seconds), int(peak)

    def job(self, root, *options):
        return self.measured(self.program("tbdaily"), *options, TBDAILY_ROOT=str(root), TBDAILY_LIVE="0")

    def large_job(self, root):
        def run():
            shutil.rmtree(root / SPOOL, ignore_errors=True)
            return self.job(root, "-f")
        return run

    def bench(self, program, names, least_time=0.05):
        """Of each benchmark of the program whose name matches the best time in nanoseconds, and under "NAME a byte" the
        time for each byte where bytes are counted."""
        options = (["--benchmark_min_time=0.001"] if self.moment else
                   [f"--benchmark_min_time={least_time}", "--benchmark_repetitions=7", "--benchmark_enable_random_interleaving=true"])
        done = subprocess.run([self.program(program), "--benchmark_format=json", f"--benchmark_filter={names}", *options],
                              stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, check=True)
        best = {}
        for run in json.loads(done.stdout)["benchmarks"]:
            if run.get("run_type") == "aggregate":
                continue
            if run.get("error_occurred"):
                raise Differs(f"{run['name']}: {run['error_message']}")
            name = run["name"].removesuffix("/real_time")
            time = run["real_time"] * NANOSECONDS[run["time_unit"]]
            best[name] = min(best.get(name, time), time)
            if "bytes_per_second" in run:
                best[name + " a byte"] = min(best.get(name + " a byte", 1e9), 1e9 / run["bytes_per_second"])
        return best


def best(rounds, *subjects):
    """Of each subject its shortest time and its largest peak; in turn, so that all meet the same machine."""
    results = [(float("inf"), 0)] * len(subjects)
    for _ in range(rounds):
        for i, subject in enumerate(subjects):
            seconds, peak = subject()
            results[i] = min(results[i][0], seconds), max(results[i][1], peak)
    return results


def report_of(root):
    (place,) = (root / SPOOL / "Pending").glob("*.193")
    return plistlib.loads(place.read_bytes()), place.stat().st_size


def expect_equal_reports(report, script):
    wrong = [table for table, entries in script.items()
             if {key: report[table].get(key) for key in entries} != entries
             or (table != "TBScalars" and len(report[table]) != len(entries))]
    if wrong:
        raise Differs("the reports have other " + ", ".join(wrong))


def expect_shell_figures(report, store):
    """What the shell printed of each distribution, against the report's statistics: minimum, maximum, mean, count."""
    shown = subprocess.run(["sqlite3", store], stdin=open(PEERS / "report.sql"), capture_output=True, text=True, check=True).stdout
    for line in shown.splitlines()[:len(report["TBDistributions"])]:
        key, *figures = line.split("|")
        least, most, mean, _, count = report["TBDistributions"][key]
        if any(abs(own / float(theirs) - 1) > 1e-9 for own, theirs in zip((least, most, mean, count), figures)):
            raise Differs(f"the shell has {line}")


def daily_report(shop, table):
    sizes = ["--scalars", shop.size(200_000), "--distributions", shop.size(2_000)]
    day = shop.made("day", "make_day.py", *sizes)
    (own, peak), (shell, _) = best(shop.rounds(7), shop.large_job(day),
                                   lambda: shop.measured("sqlite3", day / STORE, stdin=PEERS / "report.sql"))
    table.row(1, "`tbdaily -f`: 200,000 scalars, 2,000 distributions of 1,000 values", "`sqlite3` shell, the same rows",
              f"{own / shell:.2f} times ({own:.3f} s, {shell:.3f} s)", "at most 1.0", own <= shell)
    output = shop.folder / "report.plist"
    (script, _), = best(1, lambda: shop.measured(sys.executable, PEERS / "report.py", day, output))
    report, size = report_of(day)
    expect_equal_reports(report, plistlib.loads(output.read_bytes()))
    expect_shell_figures(report, day / STORE)
    table.row(2, "the same", "a script in Python that makes an equal report",
              f"{script / own:.1f} times as fast ({script:.2f} s)", "at least 10", script >= 10 * own)
    table.row(3, "peak of memory of the same", f"the report, {size / MEBIBYTE:.1f} MiB", f"{peak / MEBIBYTE:.1f} MiB",
              f"at most {2.5 * size / MEBIBYTE + 8:.1f} MiB", peak <= 2.5 * size + 8 * MEBIBYTE)
    large = shop.made("large", "make_day.py", *sizes, "--values", 10_000)
    (_, large_peak), = best(1, shop.large_job(large))
    table.row(3, "the same with ten times the values", "the peak above", f"{large_peak / peak:.3f} times", "within 5 %",
              abs(large_peak / peak - 1) <= 0.05)


def many_days(shop, table):
    sizes = ["--scalars", shop.size(20_000), "--distributions", shop.size(200)]
    alone = shop.made("tenth", "make_day.py", *sizes)
    many = shop.made("days", "make_day.py", *sizes, "--days", 90)
    (among, _), (single, _) = best(shop.rounds(15), shop.large_job(many), shop.large_job(alone))
    if report_of(many)[0]["TBScalars"].keys() != report_of(alone)[0]["TBScalars"].keys():
        raise Differs("the reports have other scalars")
    table.row(4, "a tenth of row 1's day in a store of 90 days", "the same day alone",
              f"{among / single:.2f} times ({among:.3f} s, {single:.3f} s)", "at most 1.2", among <= 1.2 * single)


def property_lists(shop, table):
    times = shop.bench("plist_bench", "(readXml|expatAlone|readBinary|checkedPass|dictionaryAlone)/scalars", 0.3)
    xml = times["readXml/scalars"] / times["expatAlone/scalars"]
    table.row(5, "an XML property list of 15 MB", "expat with handlers that count", f"{xml:.2f} times", "at most 1.5", xml <= 1.5)
    binary = times["readBinary/scalars"] / times["checkedPass/scalars"]
    made = times["dictionaryAlone/scalars"] / times["checkedPass/scalars"]
    table.row(6, "the same in binary", "a checked pass that makes no value",
              f"{binary:.1f} times (its dictionary alone {made:.1f})", "at most 2.5", binary <= 2.5)


def spread(times, name, sizes):
    """The slowest over the fastest, for each unit of size."""
    per_unit = [times[f"{name}/{size}"] / size for size in sizes]
    return max(per_unit) / min(per_unit)


def statistics_buffers(shop, table):
    sizes = [1, MEBIBYTE, 64 * MEBIBYTE]
    times = shop.bench("storage_bench", "^(parseAndRelease|sameNodesAllocatedAndFreed)/")
    ratios = [times[f"parseAndRelease/{size}"] / times[f"sameNodesAllocatedAndFreed/{size}"] for size in sizes]
    table.row(7, "a statistics buffer parsed and released: one record set, 1 MiB, 64 MiB", "the same nodes allocated and freed",
              ", ".join(f"{ratio:.2f}" for ratio in ratios) + " times", "at most 1.2", max(ratios) <= 1.2)
    each = [times[f"parseAndRelease/{size} a byte"] for size in sizes]
    flat = max(each) / min(each)
    table.row(7, "the same", "each other, a byte", f"within {flat:.2f}", "within 1.5", flat <= 1.5)


def snapshots(shop, table):
    times = shop.bench("snapshot_bench", "Layout")
    for layout in ("fixedLayout", "describedLayout"):
        faster = times[layout + "ThroughSnprintf"] / times[layout]
        table.row(8, f"snapshot records as text, `{layout}`", "the same pieces through `snprintf`",
                  f"{faster:.1f} times as fast", "at least 5", faster >= 5)


def channels(shop, table):
    sizes = [1_000, 4_000, 16_000, 64_000]
    times = shop.bench("metrics_bench", "BM_(Sampling|Delta|PlainCopyOfTheBuffer)/")
    copies = [times[f"BM_Sampling/{size}"] / times[f"BM_PlainCopyOfTheBuffer/{size}"] for size in sizes]
    table.row(9, "a sampling of 1,000, 4,000, 16,000, 64,000 channels", "a plain copy of the shared buffer",
              ", ".join(f"{ratio:.0f}" for ratio in copies) + " times", "at most 25", max(copies) <= 25)
    for number, name in (9, "BM_Sampling"), (10, "BM_Delta"):
        flat = spread(times, name, sizes)
        each = ", ".join(f"{times[f'{name}/{size}'] / size:.0f}" for size in sizes)
        table.row(number, f"a {name.removeprefix('BM_').lower()} of so many", "each other, a channel",
                  f"within {flat:.2f} ({each} ns)", "within 1.5", flat <= 1.5)


def kernel_chunks(shop, table):
    times = shop.bench("kcdata_bench", "(walk|readMemory)/67108864|walkNested")
    ratio = times["walk/67108864"] / times["readMemory/67108864"]
    table.row(11, "the search of 64 MiB of kcdata", "summing the same memory", f"{ratio:.2f} times", "at most 1.2", ratio <= 1.2)
    deeper = spread(times, "walkNested", [50_000, 100_000])
    table.row(11, "nested 100,000 deep", "50,000 deep, a level", f"within {deeper:.2f}", "within 1.1", deeper <= 1.1)


def prefixes(shop, table):
    sizes = [1_000, 10_000, 100_000, 1_000_000]
    times = shop.bench("report_bench", "(firstMatchingPrefix|hashLookup)/")
    own = [times[f"firstMatchingPrefix/{size}"] for size in sizes]
    peer = [times[f"hashLookup/{size}"] for size in sizes]
    table.row(12, "whitelist look-up among 1,000 to 1,000,000 prefixes", "a hash look-up of the prefix",
              f"within {max(own) / min(own):.2f} ({', '.join(f'{t:.0f}' for t in own)} ns; hash {', '.join(f'{t:.0f}' for t in peer)})",
              "within 2", max(own) <= 2 * min(own))


def system_calls(shop, root):
    done = subprocess.run(["strace", "-f", "-qq", "-c", "-o", "/dev/stdout", shop.program("tbdaily"), "-f"], check=False,
                          stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, env=dict(os.environ, TBDAILY_ROOT=str(root)))
    found = re.search(rb"\s(\d+)(?:\s+\d+)? total", done.stdout)
    if not found:
        sys.exit("compare: strace cannot trace here")
    return int(found.group(1))


def starts(shop, table):
    root = shop.folder / "sample"
    shutil.rmtree(root, ignore_errors=True)
    live = {"TBDAILY_ROOT": str(root)}
    subprocess.run([shop.program("tallyctl"), "init"], check=True, stdout=subprocess.DEVNULL, env=dict(os.environ, **live))
    time.sleep(0.2)  # files that were written a moment ago are read again and again
    first, again = system_calls(shop, root), system_calls(shop, root)
    shop.measured(shop.program("tbdaily"), "-d", **live)  # a forced run leaves the day to do

    def fresh_spool():
        shutil.rmtree(root / SPOOL, ignore_errors=True)
        return shop.measured(shop.program("tbdaily"), "-f", **live)
    (true, _), (done, peak), (full, _), (usage, _) = best(
        shop.rounds(60), lambda: shop.measured("/bin/true"), lambda: shop.measured(shop.program("tbdaily"), "-d", **live),
        fresh_spool, lambda: shop.measured(shop.program("tallyctl"), "--help", **live))
    table.row(13, "`tbdaily -d`, the day already done", "`/bin/true`",
              f"{done / true:.2f} times ({done * 1e3:.2f} ms, {true * 1e3:.2f} ms)", "at most 2.0", done <= 2 * true)
    table.row(13, "its peak of memory", "", f"{peak / MEBIBYTE:.1f} MiB", "at most 8 MiB", peak <= 8 * MEBIBYTE)
    table.row(14, "`tbdaily -f` on the sample device", "row 13's `-d`", f"{full / done:.1f} times ({full * 1e3:.1f} ms)",
              "at most 4", full <= 4 * done)
    table.row(14, "its system calls, on each day but the first", "", f"{again} ({first} on the first)", "at most 800", again <= 800)
    table.row(18, "`tallyctl --help`", "`/bin/true`", f"{usage / true:.2f} times", "at most 4", usage <= 4 * true)


SUMS = "SELECT count(*), sum(key_id), sum(day), sum({}) FROM {}"


def sums_of(store):
    with sqlite3.connect(f"file:{store}?mode=ro", uri=True) as database:
        return [database.execute(SUMS.format(column, rows)).fetchone()
                for rows, column in (("scalars", "value"), ("distribution_values", "seq + seconds"))]


def load(shop, table):
    lines = shop.made("lines", "make_lines.py", shop.size(2_000_000))
    device, shell = lines / "device", lines / "shell.db"

    def own():
        shutil.rmtree(device, ignore_errors=True)
        device.mkdir()
        return shop.measured(shop.program("tallyctl"), "--root", device, "record", "import", lines / "lines.tsv")

    def peer():
        for file in lines.glob("shell.db*"):
            file.unlink()
        return shop.measured("sqlite3", shell, stdin=PEERS / "import.sql", cwd=lines)
    (ours, _), (theirs, _) = best(shop.rounds(3), own, peer)
    if sums_of(device / STORE) != sums_of(shell):
        raise Differs("the stores hold other rows")
    table.row(15, "`record import` of 2,000,000 lines", "`sqlite3` `.import` into the same tables",
              f"{ours / theirs:.2f} times ({ours:.2f} s, {theirs:.2f} s)", "at most 1.0", ours <= theirs)


def preferences(shop, table):
    times = shop.bench("preferences_bench", "")
    ratio = times["setAndSynchronize"] / times["writeRenameAndForce"]
    table.row(16, "a preference set and synchronized", "write, rename and fsync by hand", f"{ratio:.2f} times", "at most 1.3",
              ratio <= 1.3)


def long_messages(shop, table):
    """Each on a fresh copy of its device, less what the same device takes without it."""
    def device(name, option, count):
        root = shop.made(name, "make_day.py", "--scalars", 10, "--distributions", 1, option, count)
        copy = shop.folder / "copy"

        def run():
            shutil.rmtree(copy, ignore_errors=True)
            shutil.copytree(root, copy)
            return shop.job(copy, "-f")
        return run, copy
    count = shop.size(100_000)
    bare, _ = device("bare", "--records", 0)
    for option, what in ("--records", "a usage reply of 100,000 records"), ("--settings", "a tasking of 100,000 items"):
        once, _ = device("once" + option, option, count)
        twice, copy = device("twice" + option, option, 2 * count)
        (none, _), (one, _), (two, _) = best(shop.rounds(5), bare, once, twice)
        if option == "--records":
            records = plistlib.loads((copy / "System/Device/usage.plist").read_bytes())["records"]
            expected = sum(record[field] >= 1024 for record in records for field in record if field.endswith("Bytes"))
            with sqlite3.connect(copy / STORE) as database:
                (stored,) = database.execute("SELECT count(*) FROM keys WHERE name LIKE 'datausage.%'").fetchone()
            if stored != expected:
                raise Differs(f"{stored} figures of usage are stored, not {expected}")
        if option == "--settings":
            folder = copy / "var/mobile/Library/Preferences"
            stored = sum(len(plistlib.loads(file.read_bytes())) for file in folder.glob("org.example.domain*.plist"))
            if stored != 2 * count:
                raise Differs(f"{stored} settings are stored")
        growth = (two - none) / (one - none) / 2
        table.row(17, what, "the same twice as large", f"{growth:.2f} of linear ({one:.2f} s, {two:.2f} s)", "within 10 %",
                  abs(growth - 1) <= 0.1)
        if option == "--records":
            table.row(17, "the reply", "", f"{one:.2f} s", "at most 1 s", one <= 1)


def live_host(shop, table):
    processors = [8, 64, 256]
    times = shop.bench("live_bench", "")
    own = [times[f"sampling/{count}"] for count in processors]
    ratios = ", ".join(f"{time / times[f'readingTheFiles/{count}']:.2f}" for time, count in zip(own, processors))
    table.row(19, "a sampling of a live host with 8, 64, 256 processors", "reading the same files",
              f"{ratios} times ({', '.join(f'{time / 1e6:.2f}' for time in own)} ms)", "8: at most 3 ms", own[0] <= 3e6)
    flat = spread(times, "sampling", processors[1:])
    table.row(19, "a sampling with 64 and 256", "each other, a processor", f"within {flat:.2f}", "within 1.5", flat <= 1.5)
    each = sample_of_a_watch(shop)
    table.row(19, "a second of `tallyctl metrics watch --interval 1` on a screen, this machine", "a second of one core",
              f"{each * 100:.2f} %", "at most 0.5 %", each <= 0.005)


def sample_of_a_watch(shop):
    """Processor seconds that each sample of a watch on a terminal takes."""
    def seconds(samples):
        master, slave = pty.openpty()
        fcntl.ioctl(slave, termios.TIOCSWINSZ, struct.pack("HHHH", 50, 120, 0, 0))
        watch = subprocess.Popen([shop.program("tallyctl"), "metrics", "watch", "--interval", "0.05", "--count", str(samples)],
                                 stdin=slave, stdout=slave, env=dict(os.environ, TERM="xterm", TBDAILY_ROOT=str(shop.folder)))
        os.close(slave)
        try:
            while os.read(master, 65536):
                pass
        except OSError:  # how a terminal says that nobody is there any more
            pass
        os.close(master)
        _, status, used = os.wait4(watch.pid, 0)
        watch.returncode = status
        if status != 0:
            raise Differs("a watch ended with another status than 0")
        return used.ru_utime + used.ru_stime
    samples = shop.size(200)
    return (seconds(samples + 1) - seconds(1)) / samples


def exports(shop, table):
    """Of many reports, each with its description beside it and without one."""
    device = shop.made("tenth", "make_day.py", "--scalars", shop.size(20_000), "--distributions", shop.size(200))
    shop.large_job(device)()
    report, _ = report_of(device)
    (described,) = (device / SPOOL / "Pending").glob("*.193")
    bare = shutil.copy(described, shop.folder / "bare.193")
    names, count = shop.folder / "names", shop.rounds(40)
    export = [shop.program("tallyctl"), "export", "--table", "scalars", "--files-from", names]
    for file, what in (described, "their descriptions beside them"), (bare, "no descriptions, so that their bytes are digested"):
        names.write_text(f"{file}\n" * count)
        (ours, peak), (theirs, _) = best(shop.rounds(7), lambda: shop.measured(*export),
                                         lambda: shop.measured(shop.program("read_lists"), names))
        rows = subprocess.run(list(map(str, export)), capture_output=True, check=True).stdout.count(b"\n") - 1
        if rows != count * len(report["TBScalars"]):
            raise Differs(f"{rows} rows are written")
        table.row(20, f"`export` of the scalars of {count} reports of row 4's day, {what}", "reading the property lists alone",
                  f"{theirs / ours:.2f} times as fast ({ours:.3f} s, {theirs:.3f} s)", "at least 0.8", theirs >= 0.8 * ours)
    names.write_text(f"{bare}\n" * max(count // 10, 1))
    (_, few), = best(1, lambda: shop.measured(*export))
    table.row(20, "its peak of memory", "that of a tenth of the reports", f"{peak / few:.3f} times ({peak / MEBIBYTE:.1f} MiB)",
              "within 5 %", abs(peak / few - 1) <= 0.05)


ROWS = [daily_report, many_days, property_lists, statistics_buffers, snapshots, channels, kernel_chunks, prefixes, starts, load,
        preferences, long_messages, live_host, exports]


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("binary", type=pathlib.Path)
    parser.add_argument("folder", type=pathlib.Path)
    parser.add_argument("--moment", action="store_true")
    parser.add_argument("--only", nargs="*", metavar="ROWS", choices=[rows.__name__ for rows in ROWS], default=[])
    chosen = parser.parse_args()
    shop, table = Workshop(chosen.binary, chosen.folder, chosen.moment), Table(chosen.moment)
    for rows in ROWS:
        if chosen.only and rows.__name__ not in chosen.only:
            continue
        try:
            rows(shop, table)
        except Differs as difference:
            table.differs(rows.__name__, difference)
    return 1 if table.differing else 0


if __name__ == "__main__":
    sys.exit(main())
