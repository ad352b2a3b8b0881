#!/usr/bin/env python3
"""A device root with one large day: scalars under 300 prefixes, distributions, half of them with histograms.

usage: make_day.py ROOT [--scalars N] [--distributions N] [--values N] [--days N] [--older-values N] [--records N]
                        [--settings N]

So many scalars (200,000) and distributions (2,000) of so many values each (1,000) on the sample device's yesterday; with
--days the same keys on as many days in all, the older ones with --older-values of each distribution; with --records and
--settings a reply of network usage and a tasking of that many items. The store is written as other programs do, and the
numbers are the same each time.
"""

import argparse
import datetime
import pathlib
import plistlib
import random
import sqlite3

YESTERDAY = 20780
NOW = datetime.datetime(2026, 11, 24, 9, 7, 4)
PREFIXES = 300
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


def whitelist():
    options = [{}, {"sig_fig": 2}, {"bucket_interval": 100}]
    return {"Subsystems": {"ScalarKeyPrefixes": {prefix(i): options[i % 3] for i in range(PREFIXES)}},
            "Latencies": {"DistributionKeyPrefixes": {"com.velmora.plain.": {},
                                                      "com.velmora.shape.": {"intervals": INTERVALS}}}}


def write_list(root, place, value):
    file = root / place
    file.parent.mkdir(parents=True, exist_ok=True)
    file.write_bytes(plistlib.dumps(value, sort_keys=False))


def usage_records(count, numbers):
    return [{"bundleName": f"org.example.app{i:06d}", "since": NOW - datetime.timedelta(hours=30),
             "wifiInBytes": numbers.randrange(1 << 30), "wifiOutBytes": numbers.randrange(1 << 20),
             "wwanInBytes": numbers.randrange(1 << 30), "wwanOutBytes": numbers.randrange(1 << 20)}
            for i in range(count)]


def tasking(settings):
    if settings == 0:
        return {}
    items = [{"Domain": f"org.example.domain{i % 50:02d}", "Key": f"Setting{i:06d}", "Value": i} for i in range(settings)]
    return {"ScheduledTasking": {"TaskingID": "benchmark", "TaskingDigest": "0", "TaskingPayload": items}}


def write_store(root, chosen, numbers):
    store = root / "var/mobile/Library/Tallybook/TBDataStore.sqlitedb"
    store.parent.mkdir(parents=True, exist_ok=True)
    database = sqlite3.connect(store)
    database.executescript(SCHEMA)
    scalars = [f"{prefix(i % PREFIXES)}counter.{i:06d}" for i in range(chosen.scalars)]
    distributions = [f"com.velmora.{'shape' if i % 2 else 'plain'}.latency.{i:04d}" for i in range(chosen.distributions)]
    days = range(YESTERDAY - chosen.days + 1, YESTERDAY + 1)
    database.executemany("INSERT INTO keys (id, name) VALUES (?, ?)", enumerate(scalars + distributions, 1))
    database.executemany("INSERT INTO scalars VALUES (?, ?, ?)",
                         ((i, day, numbers.randrange(1_000_000))
                          for i in range(1, len(scalars) + 1) for day in days))
    database.executemany("INSERT INTO distribution_values VALUES (?, ?, ?, ?, ?)",
                         ((len(scalars) + i, day, seq, numbers.randrange(86400), numbers.lognormvariate(5, 1.5))
                          for i in range(1, len(distributions) + 1) for day in days
                          for seq in range(chosen.values if day == YESTERDAY else chosen.older_values)))
    database.commit()
    database.execute("PRAGMA wal_checkpoint(TRUNCATE)")
    database.close()


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("root", type=pathlib.Path)
    for option, default in {"scalars": 200_000, "distributions": 2_000, "values": 1_000, "days": 1, "older-values": 100,
                            "records": 0, "settings": 0}.items():
        parser.add_argument("--" + option, type=int, default=default)
    chosen = parser.parse_args()
    numbers = random.Random(YESTERDAY)
    write_list(chosen.root, "Library/Application Support/Tallybook/Whitelist_Nimbos.plist", whitelist())
    write_list(chosen.root, "var/mobile/Library/Preferences/com.velmora.Crashferry.plist",
               {"DiagnosticLogSubmissionEnabled": True, **tasking(chosen.settings)})
    write_list(chosen.root, "System/Device/usage.plist", {"records": usage_records(chosen.records, numbers)})
    write_list(chosen.root, "System/Device/clock.plist", {"now": NOW})
    write_store(chosen.root, chosen, numbers)


if __name__ == "__main__":
    main()
