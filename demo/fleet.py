"""A fleet in small: devices of different age and use do their days' work, their reports are exported into a cluster of two ClickHouse
servers, and what it answers stands beside what the devices' own values come to, in exact fractions. Then a server is stopped.

Usage: fleet.py FOLDER DEVICES DAYS   (the folder is emptied; the devices stay in it)"""

import datetime
import math
import os
import pathlib
import plistlib
import shutil
import sqlite3
import subprocess
import sys
import textwrap
from concurrent.futures import ThreadPoolExecutor
from fractions import Fraction

import fleet_model
from fleet_engines import ClickHouseCluster, EngineError
from model import Whitelist, rounded

BIN = pathlib.Path(os.environ["TBDAILY_BIN"])
EPOCH = datetime.date(1970, 1, 1)
DISTRIBUTION, SCALAR = "net.latency.wifi", "net.wifi.bytesIn"
SHIFT = 120  # of the fixed point in which values are summed: none of them needs more
TOLERANCE = 1e-9
STORE = "var/mobile/Library/Tallybook/TBDataStore.sqlitedb"
WHITELIST = "Library/Application Support/Tallybook/Whitelist_Nimbos.plist"


def make_device(root, seed, days):
    """A device that has done the work of these days."""
    environment = dict(os.environ, TBDAILY_ROOT=str(root), TBDAILY_LIVE="0", TBDAILY_LOG="stderr")
    subprocess.run([BIN / "tallyctl", "init", "--seed", str(seed), "--days", str(len(days))], env=dict(environment, TBDAILY_LIVE="1"),
                   check=True, stdout=subprocess.DEVNULL)
    clock = root / "System/Device/clock.plist"
    for day in days:  # each is reported on the morning after
        morning = datetime.datetime.combine(day + datetime.timedelta(1), datetime.time(0, 17))
        clock.write_bytes(plistlib.dumps({"now": morning, "ticks": 10**13, "numerator": 1, "denominator": 1}))
        subprocess.run([BIN / "tbdaily", "-d"], env=environment, check=True, stderr=subprocess.DEVNULL)
    clock.unlink()


def exact_state(values):
    """(count, mean, squared deviations) of doubles, without rounding."""
    total = squares = 0
    for value in values:
        mantissa, exponent = math.frexp(value)
        fixed = int(mantissa * 2**53) << (exponent + SHIFT - 53)
        total += fixed
        squares += fixed * fixed
    count = len(values)
    return count, Fraction(total, count << SHIFT), Fraction(squares * count - total * total, count << 2 * SHIFT)


def recorded(root, table, column, key, days):
    """The values of each day on which the key was recorded."""
    numbers = [(day - EPOCH).days for day in days]
    with sqlite3.connect(f"file:{root / STORE}?mode=ro", uri=True) as store:
        rows = store.execute(f"SELECT day, {column} FROM {table} JOIN keys ON id = key_id WHERE name = ? AND day BETWEEN ? AND ?",
                             (key, numbers[0], numbers[-1]))
        found = {}
        for day, value in rows:
            found.setdefault(day, []).append(value)
    return found.values()


def exact_answers(roots, days):
    """What the queries have to say, from the devices' stores and their whitelist."""
    data = (roots[0] / WHITELIST).read_bytes()
    whitelist = Whitelist(data)
    rules, boundaries = whitelist.options("Scalar", SCALAR), whitelist.options("Distribution", DISTRIBUTION)["intervals"]
    scalars, distributions, values, sums, counts, votes = [], [], [], [], {}, []
    for root in roots:
        reported = [rounded(value, rules) for day in recorded(root, "scalars", "value", SCALAR, days) for value in day]
        sums += reported
        scalars.append([(1, Fraction(value), 0) for value in reported])
        reports = list(recorded(root, "distribution_values", "value", DISTRIBUTION, days))
        distributions.append([exact_state(report) for report in reports])
        values += [bound for report in reports for bound in (min(report), max(report))]
        vote = {}
        for report in reports:
            for value in report:
                index = next((i for i, boundary in enumerate(boundaries) if boundary >= value), len(boundaries))
                vote[index] = vote.get(index, 0) + 1
        for index, count in vote.items():
            counts[index] = counts.get(index, 0) + count
        votes.append(vote)
    bounds = [-math.inf, *map(float, boundaries), math.inf]
    histogram = [{"lower": bounds[i], "upper": bounds[i + 1], "count": count,
                  "share": sum(Fraction(vote.get(i, 0), sum(vote.values())) for vote in votes) / len(votes)}
                 for i, count in sorted(counts.items())]
    distribution = fleet_model.answer(distributions, min(values), max(values))
    distribution |= {"count": sum(counts.values()), "left_out": 0}
    return {"scalar": [fleet_model.answer(scalars, min(sums), max(sums))], "distribution": [distribution], "histogram": histogram}


def compare(title, answer, exact):
    """Prints each figure beside the exact one; whether all agree."""
    print(f"\n{title}")
    agrees = len(answer) == len(exact) > 0
    for row, wanted in zip(answer, exact):
        for name, figure in wanted.items():
            found, figure = float(row[name]), float(figure)
            is_same = found == figure or abs(found - figure) <= TOLERANCE * abs(figure)
            agrees = agrees and is_same
            print(f"  {name:<14} {found:>24.15g} {figure:>24.15g}{'' if is_same else '  differs'}")
    return agrees


def main(folder, devices, count):
    days = [datetime.date.today() - datetime.timedelta(count - i) for i in range(count)]
    shutil.rmtree(folder, ignore_errors=True)
    roots = [folder / "devices" / f"device-{seed:03}" for seed in range(1, devices + 1)]
    print(f"{devices} devices do the work of {count} days ...", flush=True)
    with ThreadPoolExecutor(os.cpu_count()) as pool:
        list(pool.map(lambda seed, root: make_device(root, seed, days), range(1, devices + 1), roots))
    files = folder / "files"
    names = sorted(folder.glob("devices/*/var/mobile/Library/Logs/Pending/log-tallyd-*.193"))
    files.write_text("".join(f"{name}\n" for name in names))
    print(f"{len(names)} reports wait; a cluster of two servers takes their rows ...", flush=True)
    with ClickHouseCluster() as cluster:
        cluster.make_tables()
        for table in ("reports", "scalars", "distributions", "histograms"):
            rows = folder / f"{table}.tsv"
            subprocess.run([BIN / "tallyctl", "export", "--table", table, "--files-from", files, "-o", rows], check=True)
            cluster.load(table, rows)
        exact = exact_answers(roots, days)
        span = {"first": days[0], "last": days[-1], "devices": 5}
        print(f"\n{'':<16} {'the cluster says':>24} {'exactly':>24}")
        agrees = [compare(f"{query} of {key}", cluster.ask(query, key=key, **span), exact[query])
                  for query, key in (("scalar", SCALAR), ("distribution", DISTRIBUTION), ("histogram", DISTRIBUTION))]
        print("\nOne of the two servers is stopped; the same question again:")
        cluster.stop_server(1)
        try:
            rows = cluster.ask("distribution", key=DISTRIBUTION, **span)
            agrees.append(False)
            print(f"  it was answered from half: {rows}")
        except EngineError as error:
            print(textwrap.fill(" ".join(str(error).split()), 100, initial_indent="  ", subsequent_indent="  "))
    if not all(agrees):
        print("\nThe cluster and the exact figures differ.", file=sys.stderr)
        return 1
    print(f"\nAll figures agree within {TOLERANCE}. The devices stay in {folder}/devices: tallyctl --root DEVICE report")
    return 0


if __name__ == "__main__":
    sys.exit(main(pathlib.Path(sys.argv[1]).resolve(), int(sys.argv[2]), int(sys.argv[3])))
