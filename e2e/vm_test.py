"""What the programs read, record and replay in a virtual machine, against other programs there and against this machine."""

import concurrent.futures
import datetime
import json
import shutil
import sqlite3
import unittest

import vm_machine
from harness import NO_CONTROLLER, NOW, Device

PREFIX = "com.velmora.kdreport."
SECTOR, WRITTEN, READ = 512, 50 << 20, 20 << 20
UNIT, MINUTE, HOUR = 512_000, 60, 3600
# channel: the figure of `nvme smart-log`, the factor
COUNTERS = {
    "readBytes": ("data_units_read", UNIT), "writtenBytes": ("data_units_written", UNIT),
    "readCommands": ("host_read_commands", 1), "writeCommands": ("host_write_commands", 1),
    "busyTime": ("controller_busy_time", MINUTE), "powerOnTime": ("power_on_hours", HOUR),
    "powerCycles": ("power_cycles", 1), "unsafeShutdowns": ("unsafe_shutdowns", 1),
    "mediaErrors": ("media_errors", 1), "errorLogEntries": ("num_err_log_entries", 1)}
# The emulated drive leaves most of these, and half of the counters, at 0; unit tests have pages where they differ.
STATES = {"criticalWarning": "critical_warning", "availableSpare": "avail_spare", "spareThreshold": "spare_thresh",
          "percentUsed": "percent_used"}
# channel: its place in /sys/block/NAME/stat, the factor
DISK = {"reads": (0, 1), "readBytes": (2, SECTOR), "writes": (4, 1), "writtenBytes": (6, SECTOR), "busyTime": (9, 1),
        "discards": (11, 1), "flushes": (15, 1)}
TOTALS = ("reads", "readBytes", "writes", "writtenBytes")
PROCESSOR = ("user", "nice", "system", "idle", "iowait", "irq", "softirq", "steal")
COMPARED = ((0,), (1,), (2,), (3, 4), (5,), (6,), (7,))  # idle and iowait as a sum: the kernel moves time between them
TICK = 10_000  # microseconds
UNREAD = "the health of nvme0, nvme1 cannot be read"


def drivers(channels):
    return {channel["driver"].split(" <")[0] for channel in channels}


def nvme(channels):
    return {channel["name"]: channel["value"] for channel in channels if channel["group"].startswith("nvme")}


def daily(path):
    """The driver metrics of an analytics store."""
    with sqlite3.connect(path) as store:
        rows = store.execute("SELECT name, SUM(value) FROM scalars JOIN keys ON id = key_id GROUP BY name")
        return {name: value for name, value in rows if name.startswith(PREFIX)}


def run_machine(processors):
    """What a machine left that has a device for each of its parts."""
    devices = {name: Device() for name in ("nobody", "days", "replayed", "recorded")}
    try:
        for device in devices.values():
            device.allow(ScalarKeyPrefixes={PREFIX: {}})
        days = devices["days"]
        days.record("clock", {"now": NOW + datetime.timedelta(days=1)}).rename(days.path("tomorrow.plist"))
        days.record("clock", {"now": NOW})
        shutil.rmtree(devices["recorded"].path("System"))
        return vm_machine.run(processors, {name: device.root for name, device in devices.items()})
    finally:
        for device in devices.values():
            device.close()


LEFT = {}  # of the machine with so many processors


def setUpModule():
    counts = OneProcessor.processors, TwoProcessors.processors
    with concurrent.futures.ThreadPoolExecutor() as pool:
        LEFT.update(zip(counts, pool.map(run_machine, counts)))


class Machine:
    """The tests; run for each of the machines below."""

    @property
    def left(self):
        return LEFT[self.processors]

    def result(self, step, suffix="out"):
        return (self.left / "results" / f"{step}.{suffix}").read_text()

    def output(self, step, status=0, notes=()):
        """What a step printed; it must have ended with `status`, and of different lines on standard error one for each note."""
        lines = list(dict.fromkeys(self.result(step, "err").splitlines()))
        self.assertEqual((int(self.result(step, "status")), len(lines)), (status, len(notes)), (step, lines))
        for line, words in zip(lines, notes):
            self.assertIn(words, line)
        return self.result(step)

    def channels(self, step, **expected):
        return json.loads(self.output(step, **expected))

    def device(self, name):
        """A device of the machine, to be looked at here."""
        device = Device()
        self.addCleanup(device.close)
        shutil.rmtree(device.root)
        shutil.copytree(self.left / "devices" / name, device.root)
        return device

    @property
    def drive(self):
        return (self.left / "results/drive").read_text().strip()

    def health(self, reading):
        page = json.loads(self.result(reading, "health"))
        figures = {name: int(page[key]) * factor for name, (key, factor) in COUNTERS.items()}
        figures.update({name: page[key] for name, key in STATES.items()}, temperature=page["temperature"] - 273)
        return {f"{self.drive}.{name}": value for name, value in figures.items()}

    def hold(self, values, step):
        """The measured drive's figures lie between the readings around a step; all are there."""
        before, after = self.health(step + ".before"), self.health(step + ".after")
        self.assertEqual({name for name in values if name.startswith(self.drive + ".")}, set(before))
        for name, least in before.items():
            self.assertTrue(least <= values[name] <= after[name], (step, name, least, values[name], after[name]))
            if name.split(".")[1] in (*STATES, "temperature"):
                self.assertEqual(least, after[name], name)

    def test_the_health_of_a_drive_is_what_another_program_reads(self):
        fresh, used = nvme(self.channels("fresh")), nvme(self.channels("used"))
        self.hold(fresh, "fresh")
        self.hold(used, "used")
        self.assertEqual(len(fresh), 2 * (len(COUNTERS) + len(STATES) + 1))
        self.assertEqual((fresh[self.drive + ".criticalWarning"], fresh[self.drive + ".temperature"]), (4, 50))
        for name, bytes_moved in (("written", WRITTEN), ("read", READ)):
            grown = used[f"{self.drive}.{name}Bytes"] - fresh[f"{self.drive}.{name}Bytes"]
            self.assertTrue(bytes_moved - UNIT <= grown <= bytes_moved + 4 * UNIT, (name, grown))

    def disks(self, reading):
        found = {}
        for line in self.result(reading, "disks").splitlines():
            disk, *stat = line.split()
            for name, (place, factor) in DISK.items():
                found[f"disk.{disk}.{name}"] = int(stat[place]) * factor
                if name in TOTALS:
                    found["disk." + name] = found.get("disk." + name, 0) + int(stat[place]) * factor
        return found

    def test_disks_are_what_the_kernel_counts(self):
        written = f"disk.{self.drive}n1.writtenBytes"
        samples = []
        for step in ("fresh", "used"):
            values = {channel["name"]: channel["value"] for channel in self.channels(step) if channel["name"].startswith("disk.")}
            before, after = self.disks(step + ".before"), self.disks(step + ".after")
            self.assertEqual(set(values), set(before))
            for name, least in before.items():
                self.assertTrue(least <= values[name] <= after[name], (step, name, least, values[name], after[name]))
            samples.append(values)
        self.assertGreaterEqual(samples[1][written] - samples[0][written], WRITTEN)

    def test_each_processor_has_its_times(self):
        before, after = ({words[0]: words[1:] for words in map(str.split, self.result("used." + when, "times").splitlines())}
                         for when in ("before", "after"))
        found = {channel["name"]: channel for channel in self.channels("used") if channel["group"] == "time"}
        self.assertEqual(list(found), [f"cpu{number}.time" for number in range(self.processors)])
        for name, channel in found.items():
            self.assertEqual(tuple(state["name"] for state in channel["states"]), PROCESSOR)
            lines = before[name.split(".")[0]], after[name.split(".")[0]]
            for indices in COMPARED:
                least, most = (sum(int(line[index]) for index in indices) * TICK for line in lines)
                time = sum(channel["states"][index]["residency"] for index in indices)
                self.assertTrue(least <= time <= most, (name, PROCESSOR[indices[0]], least, time, most))

    def test_who_may_not_read_the_drives_has_the_rest(self):
        listed = self.channels("nobody.list", notes=[UNREAD])
        self.assertEqual(drivers(listed), drivers(self.channels("live.list")) - {"nvme"})
        self.output("nobody.day", notes=[UNREAD, NO_CONTROLLER])
        keys = daily(self.device("nobody").store_path)
        self.assertIn(PREFIX + "disk.writtenBytes", keys)
        self.assertFalse([key for key in keys if "nvme" in key])

    def test_without_sys_what_proc_tells_is_left(self):
        listed = self.channels("proc.list", notes=[UNREAD])
        self.assertEqual(drivers(listed), {"cpu", "memory", "pressure"})
        self.output("proc.day", notes=[UNREAD, NO_CONTROLLER])

    def test_the_next_days_report_has_the_health(self):
        self.output("second.day", notes=[NO_CONTROLLER])
        [report] = self.device("days").reports()  # there was nothing to report on the first day
        scalars = {key.removeprefix(PREFIX): value for key, value in report["TBScalars"].items() if key.startswith(PREFIX)}
        self.hold(scalars, "first.day")

    def test_a_captured_machine_is_replayed_here_as_there(self):
        device = self.device("replayed")
        listed, sampled = self.channels("replayed.list"), self.channels("replayed.sample")
        self.assertEqual(listed, self.channels("live.list"))
        self.hold(nvme(sampled), "capture")
        self.output("capture")
        self.assertEqual(device.tally_json("metrics", "list"), listed)
        self.assertEqual(device.tally_json("metrics", "sample"), sampled)
        self.output("replayed.day", notes=[NO_CONTROLLER])
        there = daily(device.store_path)
        shutil.rmtree(device.path("var/mobile/Library/Tallybook"))
        device.run("-f")
        self.assertEqual(daily(device.store_path), there)
        self.assertTrue({f"{PREFIX}{name}" for name in nvme(sampled)} < set(there))

    def test_a_recording_serves_who_may_not_read_the_drives_until_it_is_withdrawn(self):
        self.output("refused", status=1, notes=[UNREAD])
        self.output("record")
        self.hold(nvme(self.channels("recorded.sample")), "record")
        self.output("replace", status=1, notes=[UNREAD])
        self.assertEqual(list((self.left / "devices/recorded/System/Device").iterdir()), [])
        self.assertFalse(nvme(self.channels("replaced.list", notes=[UNREAD])))

    def test_a_drive_that_is_pulled_keeps_its_last_figures(self):
        lines = [json.loads(line) for line in self.output("withdrawn").splitlines()]
        samples = [{channel["name"]: channel.get("value") for channel in channels} for channels in lines]
        self.assertGreaterEqual(len(samples), 3)
        first, *later = samples
        for sample in later:
            self.assertEqual(set(sample), set(first))
            for name, value in first.items():
                if name.startswith((self.drive + ".", f"disk.{self.drive}n1.")):
                    self.assertEqual(sample[name], value, name)
            for total in TOTALS:
                self.assertGreaterEqual(sample["disk." + total], first["disk." + total])


class OneProcessor(Machine, unittest.TestCase):
    processors = 1


class TwoProcessors(Machine, unittest.TestCase):
    processors = 2


if __name__ == "__main__":
    unittest.main()
