#!/usr/bin/env python3
"""A device root with one large day: scalars under 300 prefixes, distributions, half of them with histograms.

usage: make_day.py ROOT [--values N] [--days N]

200,000 scalars and 2,000 distributions of N values each (1,000), on the sample device's yesterday; with --days the same on
as many days before it too. The store is written as other programs do, and the numbers are the same each time.
"""

import argparse
import datetime
import pathlib
import plistlib
import random
import sqlite3

YESTERDAY = 20780
PREFIXES, SCALARS, DISTRIBUTIONS = 300, 200_000, 2_000
INTERVALS = [10, 20, 50, 100, 200, 500, 1000, 2000, 5000, 10000]
SCHEMA = """
PRAGMA journal_mode = WAL;
PRAGMA user_version = 1;
CREATE TABLE keys (id INTEGER PRIMARY KEY, name TEXT NOT NULL UNIQUE);
CREATE TABLE scalars (key_id INTEGER NOT NULL REFERENCES keys(id), day INTEGER NOT NULL, value INTEGER NOT NULL,
                      PRIMARY KEY (key_id, day)) WITHOUT ROWID;
CREATE TABLE distribution_values (key_id INTEGER NOT NULL REFERENCES keys(id), day INTEGER NOT NULL, seq INTEGER NOT NULL,
                      seconds INTEGER NOT NULL, value REAL, PRIMARY KEY (key_id, day, seq)) WITHOUT ROWID;
"""


def prefix(number):
    return f"com.velmora.subsystem{number:03d}."


def scalar_keys():
    return [f"{prefix(i % PREFIXES)}counter.{i:06d}" for i in range(SCALARS)]


def distribution_keys():
    return [f"com.velmora.{'shape' if i % 2 else 'plain'}.latency.{i:04d}" for i in range(DISTRIBUTIONS)]


def whitelist():
    options = [{}, {"sig_fig": 2}, {"bucket_interval": 100}]
    return {"Subsystems": {"ScalarKeyPrefixes": {prefix(i): options[i % 3] for i in range(PREFIXES)}},
            "Latencies": {"DistributionKeyPrefixes": {"com.velmora.plain.": {},
                                                      "com.velmora.shape.": {"intervals": INTERVALS}}}}


def write_list(root, place, value):
    file = root / place
    file.parent.mkdir(parents=True, exist_ok=True)
    file.write_bytes(plistlib.dumps(value, sort_keys=False))


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("root", type=pathlib.Path)
    parser.add_argument("--values", type=int, default=1000)
    parser.add_argument("--days", type=int, default=1)
    chosen = parser.parse_args()
    write_list(chosen.root, "Library/Application Support/Tallybook/Whitelist_Nimbos.plist", whitelist())
    write_list(chosen.root, "var/mobile/Library/Preferences/com.velmora.Crashferry.plist",
               {"DiagnosticLogSubmissionEnabled": True})
    write_list(chosen.root, "System/Device/usage.plist", {"records": []})
    write_list(chosen.root, "System/Device/clock.plist", {"now": datetime.datetime(2026, 11, 24, 9, 7, 4)})
    store = chosen.root / "var/mobile/Library/Tallybook/TBDataStore.sqlitedb"
    store.parent.mkdir(parents=True, exist_ok=True)
    database = sqlite3.connect(store)
    database.executescript(SCHEMA)
    numbers = random.Random(20780)
    scalars, distributions = scalar_keys(), distribution_keys()
    database.executemany("INSERT INTO keys (id, name) VALUES (?, ?)", enumerate(scalars + distributions, 1))
    for day in range(YESTERDAY - chosen.days + 1, YESTERDAY + 1):
        database.executemany("INSERT INTO scalars VALUES (?, ?, ?)",
                             ((i, day, numbers.randrange(1_000_000)) for i in range(1, SCALARS + 1)))
        database.executemany("INSERT INTO distribution_values VALUES (?, ?, ?, ?, ?)",
                             ((i, day, seq, numbers.randrange(86400), numbers.lognormvariate(5, 1.5))
                              for i in range(SCALARS + 1, SCALARS + DISTRIBUTIONS + 1) for seq in range(chosen.values)))
    database.commit()
    database.execute("PRAGMA wal_checkpoint(TRUNCATE)")
    database.close()


if __name__ == "__main__":
    main()
