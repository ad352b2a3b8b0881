#!/usr/bin/env python3
"""Makes the seeds of the fuzzers from a sample device: a folder for each fuzzer, with inputs in its own layout.

Usage: fuzz/seeds.py TALLYCTL DEVICE FOLDER
"""

import datetime
import pathlib
import plistlib
import re
import struct
import subprocess
import sys

MOST = 8192  # bytes of an input
LIBRARY = "Library/Application Support/Tallybook/Whitelist_Nimbos.plist"


def section(data):
    data = data[:0xFFFF]
    return struct.pack("<H", len(data)) + data


def small(value, most):
    """A property list with as many entries of its arrays as fit."""
    for count in (1000, 100, 30, 10, 5, 2, 1):
        data = plistlib.dumps(shortened(value, count), fmt=plistlib.FMT_BINARY)
        if len(data) <= most:
            return data
    return b"\0"


def list_of(path):
    """The property list in a file; Python's reader knows whole seconds only."""
    return plistlib.loads(re.sub(rb"\.\d+Z</date>", b"Z</date>", path.read_bytes()))


def shortened(value, count):
    if isinstance(value, dict):
        return {key: shortened(entry, count) for key, entry in list(value.items())[:count]}
    if isinstance(value, list):
        return [shortened(entry, count) for entry in value[:count]]
    return value[: count * 16] if isinstance(value, bytes) else value


class Seeds:
    def __init__(self, tallyctl, device, folder):
        self.tallyctl, self.device, self.folder = tallyctl, device, folder
        self.lists = {path.stem: list_of(path) for path in sorted(device.rglob("*.plist"))}
        self.kcdata = (device / "System/Device/snapshot.kcdata").read_bytes()

    def add(self, fuzzer, name, data):
        place = self.folder / fuzzer / name
        place.parent.mkdir(parents=True, exist_ok=True)
        place.write_bytes(data[:MOST])

    def buffer(self, *words):
        place = self.folder / "buffer"
        subprocess.run([self.tallyctl, "--root", self.device, "buffer", *words, "-o", place],
                       check=True, stdout=subprocess.DEVNULL)
        data = place.read_bytes()
        place.unlink()
        return data

    def codecs(self):
        for path in sorted(self.device.rglob("*.plist")):
            self.add("plist_fuzz", path.name, path.read_bytes())
            json = subprocess.run([self.tallyctl, "plist", "--json", path], check=True, stdout=subprocess.PIPE).stdout
            self.add("json_fuzz", path.stem + ".json", json)
        for name, value in self.lists.items():
            self.add("plist_fuzz", name + ".binary", small(value, MOST))

    def reports(self):
        report = {"TBCrashLogVersion": 1, "TBStartDate": datetime.datetime(2026, 11, 23), "TBLogCreationDate": datetime.datetime(2026, 11, 24),
                  "TBMetadata": {"TBUserSetRegionFormat": "AT"}, "TBTaskID": "t", "TBWhitelistDigest": "d", "TBScalars": {"a\t\"": -5},
                  "TBDistributions": {"k": [1.5, 60.0, 20.25, 1e100, 4]},
                  "TBDistributionsHistogram": {"k": {"(-inf, 2.5]": 3, "(50, inf)": 1}}}
        for form in (plistlib.FMT_XML, plistlib.FMT_BINARY):
            self.add("export_fuzz", form.name, plistlib.dumps(report, fmt=form, sort_keys=False))

    def storage(self):
        stats = self.buffer("stats")
        self.add("stats_fuzz", "stats", struct.pack("<HBH", 8, 0, 64) + stats)
        header, records = self.buffer("snapshot-header"), self.buffer("snapshot")
        for capacity in (0, 300, 4000):
            start = struct.pack("<H", capacity)
            self.add("snapshot_fuzz", f"described-{capacity}", start + section(header) + records)
            self.add("snapshot_fuzz", f"fixed-{capacity}", start + section(b"") + records)
        self.add("kcdata_fuzz", "kcdata", self.kcdata)
        characteristics = small({"chip-id": "Q7A", "manufacturer-id": "4582603A5700", "num-bus": 2}, 1024)
        bands = struct.pack("<II", 2, 1) + bytes(8) + struct.pack("<5I", 1, 2, 3, 0, 0) * 2
        defects = struct.pack("<III", 0, 7, 2) + struct.pack("<8I", 1, 2, 3, 4, 5, 6, 7, 1) * 2
        for options in (16, 17):
            self.add("lists_fuzz", f"lists-{options}", bytes([options]) + section(characteristics) + b"\1"
                     + section(bands) + section(stats[:4000]) + section(defects) + bytes(range(64)))

    def values(self):
        self.add("whitelist_fuzz", "whitelist", bytes(40) + small(list_of(self.device / LIBRARY), 6000))
        usage = self.lists["usage"]["records"]
        self.add("usage_fuzz", "usage", bytes([20]) + section(b"\0") + small(usage, 6000))
        ferry = self.lists["com.velmora.Crashferry"]
        tasking = small(ferry["ScheduledTasking"], 2000)
        self.add("tasking_fuzz", "tasking", b"\0" + section(small({"TaskingID": "a"}, 500)) + section(small(ferry, 2000))
                 + b"\1\0" + struct.pack("<i", 20000) + section(b"\2\3") + b"\0" + tasking)
        # A tasking of one item; the item is about consent.
        self.add("tasking_fuzz", "consent", bytes([1, 0, 0]) + section(b"\0") + b"\0" + struct.pack("<i", 20000)
                 + section(b"\0") + bytes([1, 1, 14, 15, 1, 5, 1]))
        legends = [entry["properties"]["KdReportLegend"] for entry in self.lists["registry"]["entries"]
                   if "KdReportLegend" in entry["properties"]]
        for number, legend in enumerate(legends):
            self.add("collection_fuzz", f"legend-{number}", bytes([0, 0]) + section(small(legend, 4000)))
        channel = {"DriverID": 7, "DriverName": "Fan", "LegendChannel": [16, 0x100000001, "RPM"],
                   "RawElements": bytes(64)}
        collection = {"QueryOpts": 3, "KdReportChannels": [channel],
                      "KdReportDrivers": {"Fan": {"KdReportChannels": [channel] * 2}}}
        self.add("collection_fuzz", "collection", bytes([0, 0]) + small(collection, 4000))

    def channels(self):
        for number in range(6):
            self.add("hub_fuzz", f"hub-{number}", bytes([255]) + bytes((7 * i * (number + 1)) % 251 for i in range(700)))

    def streams(self):
        body = plistlib.dumps({"operation": 1, "day": 20000}, fmt=plistlib.FMT_BINARY)
        peer = bytes([3, 1, 0, 0, 4]) + section(body) + bytes([7]) + section(body) + struct.pack("<I", len(body))
        self.add("endpoint_fuzz", "frames", peer * 3 + bytes((i * 5) % 256 for i in range(60)))
        lines = "s\tcom.velmora.a\t20000\t-5\nd\tk\t3\t86399\t1e2\r\n\nd\tk\t3\t0\tnan\ns\tk\t-1\t9223372036854775807"
        self.add("import_fuzz", "lines", lines.encode())

    def machines(self):
        files = {0: b"cpu  1 2 3 4 5 6 7 8 0 0\ncpu0 1 2 3 4 5 6 7 8 0 0\n", 1: b"pswpin 1\npgmajfault 2\n", 2: b"MemAvailable: 3 kB\n",
                 3: b"some avg10=0.00 total=5\nfull avg10=0.00 total=4\n", 5: b"POLL\n", 6: b"7\n", 7: b"8\n",
                 11: b"3400000 5\n800000 6\n", 13: b"", 14: b"1 0 2 0 3 0 4 0 0 5 0\n", 16: b"99\n", 19: b"soc\n", 20: b"-40000\n"}
        written = b"".join(bytes([place, 1]) + section(text) for place, text in files.items())
        self.add("live_fuzz", "machine", bytes([len(files)]) + written + bytes([len(files)]) + written)

    def days(self):
        def named(name, most):
            return section(small(self.lists[name], most))
        registry = self.lists["registry"]["entries"]
        controller = [entry for entry in registry if entry.get("client", {}).get("kind") == "storage"]
        rest = [entry for entry in registry if entry.get("client", {}).get("kind") != "storage"]
        for name, entries in (("storage", controller), ("metrics", rest)):
            self.add("day_fuzz", name, named("usage", 500) + named("answers", 1000) + named("hub", 1500) + named("kernel", 800)
                     + section(self.kcdata) + small({"entries": entries}, 4000))


def main():
    seeds = Seeds(sys.argv[1], pathlib.Path(sys.argv[2]), pathlib.Path(sys.argv[3]))
    for make in (seeds.codecs, seeds.reports, seeds.storage, seeds.values, seeds.channels, seeds.streams, seeds.days, seeds.machines):
        make()


if __name__ == "__main__":
    main()
