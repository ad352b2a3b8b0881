"""Storage telemetry on the sample device: from the controller's buffers to keys, records and the NAND log."""

import json
import plistlib
import struct
import unittest

from harness import NOW, TODAY, DeviceTest

PREFIX = "com.velmora.NANDInfo."


def decode_statistics(data):
    """(identifier, values) of every record."""
    words = struct.unpack(f"<{len(data) // 8}Q", data[: len(data) // 8 * 8])
    at, records = 0, []
    while at < len(words):
        count = words[at] >> 32
        records.append((words[at] & 0xFFFFFFFF, words[at + 1: at + 1 + count]))
        at += 1 + count
    return records


class Storage(DeviceTest):
    def structured(self, device, kind):
        place = device.path(f"var/mobile/Library/Logs/Structured/{kind}/{NOW:%Y-%m-%d}.jsonl")
        return [json.loads(line)["data"] for line in place.read_text().splitlines()] if place.exists() else []

    def test_a_day_of_each_profile(self):
        for profile in ("nvme", "stx"):
            with self.subTest(profile):
                device = self.device(profile=profile)
                info = device.tally_json("nand")
                device.run("-f")
                recorded = {k: v for k, v in device.scalars().items() if k.startswith(PREFIX)}
                self.assertEqual(recorded, {k: int(v) for k, v in info.items() if type(v) in (int, float)})
                self.assertGreater(len(recorded), 300)
                self.assertEqual(recorded[PREFIX + "VMFreezer.NumPhysicalWrites"], 3327320065)
                events = self.structured(device, 172)
                self.assertEqual([(e["id"], e["count"], len(e)) for e in events], [(1, 3, 5), (2, 3, 5)])
                records = self.structured(device, 176)
                self.assertEqual(sum("readStage[0]" in r for r in records), 6)  # two channels, three lists
                self.assertEqual([r["Factory Count"] for r in records if "Factory Count" in r], [37])
                reasons = [r["Reason"] for r in records if "Reason" in r]
                self.assertEqual(reasons, [3, 4, 5, 6, 7] if profile == "stx" else [3, 204, 105, 6, 207])
                self.assertEqual(len(device.pending(".165")), 1)
                self.assertIn("UserWamp", device.pending(".165")[0].read_text())
                device.run("-f")
                self.assertEqual(len(device.pending(".165")), 1)

    def test_stats_are_those_of_an_independent_decoder(self):
        device = self.device(sample=True)
        place = device.base / "stats.bin"
        device.tally("buffer", "stats", "-o", str(place))
        records = decode_statistics(place.read_bytes())
        answer = device.tally_json("stats")
        self.assertEqual(answer, device.tally_json("stats", str(place)))
        self.assertTrue(answer["complete"])
        by_id = dict(records)
        for name, identifier in (("hostWrites", 4), ("hostReads", 7), ("bandErases", 20), ("exportVersion", 53)):
            self.assertEqual(answer["fields"][name], by_id[identifier][0])
        self.assertEqual([value for _, value in answer["stats"]], [value for _, values in records for value in values])
        place.write_bytes(place.read_bytes()[:-4] + b"\xff" * 12)
        self.assertFalse(device.tally_json("stats", str(place))["complete"])

    def test_tool(self):
        device = self.device(sample=True)
        wear = device.tally_json("wear")
        self.assertEqual((wear["userWriteAmplification"], wear["threshold"], wear["aboveThreshold"]), (2.5, 2.0, True))
        self.assertFalse(wear["recommendsContentDeletion"])
        device.preferences("com.velmora.NANDInfo", {"userWAmp": 3.5})
        device.run("-f")
        self.assertEqual(device.pending(".165"), [])
        for key in device.tally_json("nand"):
            self.assertTrue(device.tally("nand", "--explain", key).endswith(".\n"), key)
        self.assertIn("no figure", device.tally("nand", "--explain", "nonsense", status=1))
        self.assertIn("Host traffic", device.tally("nand"))

    def test_wear_over_the_days_of_the_store(self):
        device = self.device(sample=True)
        self.assertEqual(device.tally("wear").splitlines()[0], "healthy")
        self.assertEqual(device.tally("wear", "--check"), device.tally("wear"))
        self.assertEqual(device.tally_json("wear", "--history"), [])
        day = TODAY - 20
        rows = [(day, 1000, 3000, 10), (day + 1, 1100, 3250, 10), (day + 5, 1200, 3550, 14), (day + 6, 7, 9, 1), (day + 8, 7, 9, 2)]
        names = ("NumLogicalWrites", "NumPhysicalWrites", "HottestCycle")
        lines = [f"s\tcom.velmora.NANDInfo.{name}\t{row[0]}\t{value}\n" for row in rows for name, value in zip(names, row[1:])]
        # A key that begins like one of them.
        device.tally("record", "import", "-", stdin="".join(lines) + f"s\tcom.velmora.NANDInfo.HottestCycle2\t{day + 2}\t5\n")
        days = device.tally_json("wear", "--history")
        self.assertEqual([tuple(entry[k] for k in ("hostWrites", "flashWrites", "hottestCycle")) for entry in days],
                         [row[1:] for row in rows])
        self.assertEqual([entry["writeAmplification"] for entry in days], [None, 2.5, 3.0, None, None])
        self.assertEqual([entry["wentBack"] for entry in days], [False, False, False, True, False])
        shown = device.tally("wear", "--history", "--endurance", "12")
        for text in ("3 days missing before", "counters went back", "12 erases on 20", "at the pace of the last 2 days"):
            self.assertIn(text, shown)
        self.assertEqual(len(device.tally_json("wear", "--history", "--days", "13")), 1)
        device.tally("wear", "--days", "3", status=2)

    def test_snapshots_from_the_controller_and_from_files(self):
        device = self.device(sample=True)
        records, header = str(device.base / "records"), str(device.base / "header")
        device.tally("buffer", "snapshot", "-o", records)
        device.tally("buffer", "snapshot-header", "-o", header)
        described, fixed = device.tally("snapshots"), device.tally("snapshots", "--fixed")
        self.assertEqual(described, device.tally("snapshots", "--records", records, "--header", header))
        self.assertTrue(described.startswith("- STX Snapshot - \nSnapshots of the sample controller\n"))
        self.assertEqual(fixed, device.tally("snapshots", "--records", records))
        self.assertEqual(fixed.count("\nT="), 12)

    def test_drivers_that_fail(self):
        device = self.device(sample=True)
        registry = plistlib.loads(device.path("System/Device/registry.plist").read_bytes())
        client = registry["entries"][1]["client"]
        buffers = client["buffers"]
        for change in ({"openStatus": 3758097090}, {"buffers": []},
                       {"buffers": [dict(b, sizeStatus=-536870206) for b in buffers]},
                       {"buffers": [dict(b, fill=1) for b in buffers]}, {"buffers": [dict(b, size=0) for b in buffers]},
                       {"buffers": [dict(b, size=0xFFFFFFF0) for b in buffers]},
                       {"buffers": [dict(b, data=b["data"][: len(b["data"]) // 2]) for b in buffers]}):
            registry["entries"][1]["client"] = dict(client, **change)
            device.record("registry", registry)
            device.record("kernel", {"errno": {"kern.next_ecc_event": 16}})  # busy, which is no trouble
            device.run("-f")
        self.assertNotIn("Unexpected errno", device.log())
        device.path("System/Device/registry.plist").unlink()
        self.assertIn("no storage controller", device.tally("buffer", "stats", "-o", "x", status=1))
        self.assertIn("cannot be had", device.tally("nand", status=1))


if __name__ == "__main__":
    unittest.main()
