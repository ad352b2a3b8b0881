"""The drivers of the machine that runs the tests, against readings of its own before and after."""

import datetime
import json
import os
import pathlib
import struct
import subprocess
import time
import unittest

from harness import BIN, NOW, Device

SECTOR = 512
PAGE = os.sysconf("SC_PAGESIZE")


def figures(file):
    """The lines "name number ..." of a file of /proc."""
    words = (line.split() for line in pathlib.Path(file).read_text().splitlines())
    return {line[0].rstrip(":"): [int(word) for word in line[1:] if word.isdigit()] for line in words if line}


def independent():
    """{channel: value} of this moment, of counters that only grow."""
    found = {}
    memory = figures("/proc/vmstat")
    for name, line, factor in (("swappedIn", "pswpin", PAGE), ("swappedOut", "pswpout", PAGE), ("majorFaults", "pgmajfault", 1)):
        found["memory." + name] = memory[line][0] * factor
    for disk in sorted(pathlib.Path("/sys/block").glob("*/device")):
        stat = [int(word) for word in (disk.parent / "stat").read_text().split()]
        for name, value in (("readBytes", stat[2] * SECTOR), ("writtenBytes", stat[6] * SECTOR), ("reads", stat[0])):
            found[f"disk.{disk.parent.name}.{name}"] = value
            found["disk." + name] = found.get("disk." + name, 0) + value
    for card in pathlib.Path("/sys/class/net").glob("*"):  # a machine within another may have no /sys
        if card.name != "lo" and (card / "statistics").exists():
            found[f"net.{card.name}.receivedBytes"] = int((card / "statistics/rx_bytes").read_text())
    return found


class LiveDrivers(unittest.TestCase):
    def setUp(self):
        self.device = Device()
        self.addCleanup(self.device.close)
        self.device.env["TBDAILY_LIVE"] = "1"

    def sample(self, *arguments):
        channels = self.device.tally_json("metrics", *(arguments or ("sample",)))
        values = {}
        for channel in channels:
            name = channel["name"]
            self.assertNotIn(name, values)
            values[name] = channel["value"] if "value" in channel else sum(state["residency"] for state in channel["states"])
        return values

    def test_values_lie_between_independent_readings(self):
        before, values, after = independent(), self.sample(), independent()
        self.assertTrue(before)
        for name, least in before.items():
            self.assertLessEqual(least, values[name], name)
            self.assertLessEqual(values[name], after[name], name)

    def test_states_add_up_to_the_time_that_passed(self):
        begin = time.monotonic()
        times = self.sample("delta", "--interval", "2", "--driver", "cpu", "--group", "time")
        most = time.monotonic() - begin
        self.assertTrue(times)
        for name, microseconds in times.items():
            self.assertGreaterEqual(microseconds / 1e6, 2 * 0.95, name)
            self.assertLessEqual(microseconds / 1e6, most * 1.05, name)

    def test_what_is_of_the_daily_category_is_in_the_next_report(self):
        self.device.allow(ScalarKeyPrefixes={"com.velmora.kdreport.": {}})
        self.device.run("-f")
        self.device.record("clock", {"now": NOW + datetime.timedelta(days=1)})
        self.device.run("-f")
        keys = [key for report in self.device.reports() for key in report["TBScalars"] if "kdreport" in key]
        self.assertTrue(any("majorFaults" in key for key in keys), keys)
        self.assertFalse([key for key in keys if ".busyTime" in key and "nvme" not in key], keys)

    def test_each_channel_has_a_sentence(self):
        for name in self.sample():
            self.assertRegex(self.device.tally("metrics", "--explain", name), r"^[A-Z].*\.$", name)
        self.device.tally("metrics", "--explain", "moon", status=1)
        self.device.tally("metrics", status=2)

    def test_a_captured_machine_is_replayed_as_it_was(self):
        elsewhere = self.device.base / "elsewhere"
        before = independent()
        self.device.tally("capture", "--to", str(elsewhere))
        after = independent()
        self.assertFalse(self.device.path("System/Device/registry.plist").exists())
        listed = self.device.tally("metrics", "list")
        self.device.env.update(TBDAILY_ROOT=str(elsewhere), TBDAILY_LIVE="0")
        self.assertEqual(self.device.tally("metrics", "list"), listed)
        values = self.sample()
        for name, least in before.items():
            self.assertTrue(least <= values[name] <= after[name], name)
        self.assertEqual(self.sample(), values)
        self.device.env["TBDAILY_LIVE"] = "1"
        self.assertIn("replay", self.device.tally("capture", "--to", str(elsewhere), "--replace"))

    def test_capture_asks_the_live_host_and_says_what_it_cannot(self):
        self.device.record("clock", {"now": NOW, "ticks": 5})
        recorded = self.device.path("System/Device/clock.plist").read_bytes()
        for words, status in ((["--only", "moon"], 2), ([], 2), (["--only", "clock", "--to", "x"], 2),
                              (["--only", "locale,clock"], 1)):
            self.device.tally("capture", *words, status=status)
        self.assertFalse(self.device.path("System/Device/locale.plist").exists())
        self.assertEqual(self.device.path("System/Device/clock.plist").read_bytes(), recorded)
        files = self.device.tally_json("capture", "--only", "clock,registry", "--replace")["files"]
        self.assertEqual(files, ["registry.plist", "hub.plist", "clock.plist"])
        self.assertNotEqual(self.device.path("System/Device/clock.plist").read_bytes(), recorded)
        self.device.env["TBDAILY_LIVE"] = "0"
        self.device.tally("capture", "--only", "kernel", status=1)

    def test_wear_goes_by_the_health_pages_of_drives_without_a_controller(self):
        device = self.device
        bad, good = bytearray(512), bytearray(512)
        bad[0], bad[3], bad[4], bad[5], good[3] = 4, 8, 10, 83, 100
        struct.pack_into("<Q", bad, 48, 60_000_000)
        device.record("nvme", {"controllers": {"nvme0": bytes(bad), "nvme1": bytes(good)}})
        checked = subprocess.run([BIN / "tallyctl", "--json", "wear", "--check"], env=device.env, capture_output=True, text=True)
        self.assertEqual((checked.returncode, checked.stderr), (12, ""))
        wear = json.loads(checked.stdout)
        self.assertEqual((wear["verdict"], wear["userWriteAmplification"]), ("act now", None))
        self.assertEqual([(drive["name"], drive["hostWrittenBytes"]) for drive in wear["drives"]],
                         [("nvme0", 60_000_000 * 512_000), ("nvme1", 0)])
        self.assertEqual([finding["urgent"] for finding in wear["findings"]], [True, True, False])
        device.record("nvme", {"controllers": {"nvme1": bytes(good)}})
        self.assertEqual(device.tally("wear", "--check").splitlines()[0], "healthy")

    def test_a_recording_or_live_sources_switched_off_hide_them(self):
        self.assertTrue(self.sample())
        self.device.record("registry", {"entries": []})
        self.assertFalse(self.sample())
        self.device.path("System/Device/registry.plist").unlink()
        self.device.env["TBDAILY_LIVE"] = "0"
        self.device.tally("metrics", "sample", status=1)


if __name__ == "__main__":
    unittest.main()
