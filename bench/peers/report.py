#!/usr/bin/env python3
"""The report of one day as a script makes it that somebody writes in an afternoon: rows from SQLite, a property list out.

usage: report.py ROOT OUTPUT
"""

import pathlib
import plistlib
import sqlite3
import sys
from math import ceil, log10

from make_day import YESTERDAY

ROWS = "SELECT name, value FROM keys JOIN scalars ON key_id = id WHERE day BETWEEN ? AND ? ORDER BY name, day"
VALUES = ("SELECT name, value FROM keys JOIN distribution_values ON key_id = id WHERE day BETWEEN ? AND ? "
          "ORDER BY name, day, seq")


def matching(prefixes, key):
    """The options of the first prefix that the key begins with, found by its dots."""
    end = key.find(".")
    while end >= 0:
        if (options := prefixes.get(key[:end + 1])) is not None:
            return options
        end = key.find(".", end + 1)
    return None


def rounded(value, options):
    if interval := options.get("bucket_interval"):
        value = (value + interval // 2) // interval * interval
    if value and "sig_fig" in options:
        dropped = ceil(log10(abs(value))) - options["sig_fig"]
        if dropped >= 1:
            value = (value + 10 ** dropped // 2) // 10 ** dropped * 10 ** dropped
    return value


def statistics(values):
    least = most = mean = values[0]
    squares = 0.0
    for count, value in enumerate(values[1:], 2):
        least, most = min(least, value), max(most, value)
        delta = value - mean
        mean += delta / count
        squares += delta * (value - mean)
    return [least, most, mean, squares, len(values)]


def histogram(values, boundaries):
    buckets = {}
    for value in values:
        bucket = next((i for i, boundary in enumerate(boundaries) if boundary >= value), len(boundaries))
        buckets[bucket] = buckets.get(bucket, 0) + 1
    ends = ["-inf", *map(str, boundaries), "inf"]
    return {f"({ends[i]}, {ends[i + 1]}{')' if i == len(boundaries) else ']'}": buckets[i] for i in sorted(buckets)}


def main():
    root, output = pathlib.Path(sys.argv[1]), pathlib.Path(sys.argv[2])
    whitelist = plistlib.loads((root / "Library/Application Support/Tallybook/Whitelist_Nimbos.plist").read_bytes())
    tables = {name: entries for group in whitelist.values() for name, entries in group.items()}
    database = sqlite3.connect(f"file:{root}/var/mobile/Library/Tallybook/TBDataStore.sqlitedb?mode=ro", uri=True)
    days = (YESTERDAY - 1, YESTERDAY)
    scalars = {key: rounded(value, options) for key, value in database.execute(ROWS, days)
               if (options := matching(tables["ScalarKeyPrefixes"], key)) is not None}
    distributions, histograms, values = {}, {}, {}
    for key, value in database.execute(VALUES, days):
        values.setdefault(key, []).append(value)
    for key, row in values.items():
        options = matching(tables["DistributionKeyPrefixes"], key)
        distributions[key] = statistics(row)
        if "intervals" in options:
            histograms[key] = histogram(row, options["intervals"])
    output.write_bytes(plistlib.dumps({"TBScalars": scalars, "TBDistributions": distributions,
                                       "TBDistributionsHistogram": histograms}, sort_keys=False))


if __name__ == "__main__":
    main()
