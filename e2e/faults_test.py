"""A day's run in which the first, second, third ... change of a file goes wrong, until nothing is left to go wrong."""

import concurrent.futures
import os
import plistlib
import shutil
import sqlite3
import subprocess
import unittest
from xml.etree import ElementTree

from harness import BIN, Device

SHIM = os.environ["TBDAILY_FAULT_SHIM"]
KILLED = 77
AT_ONCE = 2 * (os.cpu_count() or 1)


def rows(device):
    with sqlite3.connect(device.store_path) as store:
        assert store.execute("PRAGMA integrity_check").fetchall() == [("ok",)]
        return {table: set(store.execute(f"SELECT * FROM {table}"))
                for table in ("keys", "scalars", "distribution_values")}


def latest_report(device):
    """The newest report as one dictionary, the scalars by their keys."""
    report = plistlib.loads(device.pending()[-1].read_bytes())
    del report["TBLogCreationDate"]
    return {**report.pop("TBScalars"), **report}


class Faults(unittest.TestCase):
    def setUp(self):
        self.sample = Device(sample=True)
        self.addCleanup(self.sample.close)
        # Without its hundreds of figures, each of which is one more write of a kind that the other steps have too.
        self.sample.path("System/Device/registry.plist").unlink()
        self.rows = rows(self.sample)
        probe = self.copy()
        if self.run_with_fault(probe, "error", 1 << 30) != 0:
            self.skipTest("the program does not start with the shim preloaded (a sanitizer that wants to be first)")
        # What a device reports at first, and once more: a counter starts anew after a report, a tasking is applied.
        self.expected = [latest_report(probe)]
        probe.run("-f")
        self.expected.append(latest_report(probe))
        probe.close()

    def copy(self):
        def link_or_copy(source, place):  # the job only reads what is under System/
            (os.link if "/System/" in source else shutil.copy2)(source, place)
        device = Device()
        shutil.rmtree(device.root)
        shutil.copytree(self.sample.root, device.root, copy_function=link_or_copy)
        return device

    def run_with_fault(self, device, mode, at):
        """The exit status; device.mark exists when something went wrong."""
        device.mark = device.base / "mark"
        environment = dict(device.env, LD_PRELOAD=SHIM, FAULT_MODE=mode, FAULT_AT=str(at), FAULT_MARK=str(device.mark))
        environment["ASAN_OPTIONS"] += ":verify_asan_link_order=0"
        result = subprocess.run([BIN / "tbdaily", "-d"], env=environment, capture_output=True, text=True, timeout=120)
        assert "runtime error" not in result.stderr and "Sanitizer:" not in result.stderr, result.stderr
        return result.returncode

    def check_files(self, device):
        for place in device.path("var/mobile/Library/Preferences").glob("*.plist"):
            ElementTree.fromstring(place.read_bytes())  # its dates keep fractions that plistlib does not read
        for place in device.pending():
            plistlib.loads(place.read_bytes())
            plistlib.loads(place.with_name(place.name + ".meta.plist").read_bytes())
        for place in device.path("var/mobile/Library/Logs/Structured").rglob("*.jsonl"):
            assert place.read_bytes()[-1:] in (b"", b"\n"), place

    def case(self, mode, at):
        """Whether anything went wrong at this point."""
        device = self.copy()
        try:
            status = self.run_with_fault(device, mode, at)
            if not device.mark.exists():
                return False
            assert status == (KILLED if mode == "kill" else 0), status
            self.check_files(device)
            before = len(device.pending())
            device.run("-f")
            self.check_files(device)
            assert len(device.pending()) == before + 1, "no report"
            report = latest_report(device)
            odd = [(key, report.get(key)) for key in {**report, **self.expected[0]}
                   if all(report.get(key) != expected.get(key) for expected in self.expected)]
            assert not odd, odd
            names = {place.name for place in device.path("var/mobile/Library/Logs/Pending").iterdir()}
            logs = {name for name in names if name.endswith(".193")}
            assert names == logs | {name + ".meta.plist" for name in logs}, names
            after = rows(device)
            assert all(after[table] >= self.rows[table] for table in after), "rows were lost"
            return True
        except Exception as failure:
            raise AssertionError(f"{mode} at call {at}: {failure!r}") from failure
        finally:
            device.close()

    def test_every_point(self):
        with concurrent.futures.ThreadPoolExecutor(AT_ONCE) as pool:
            for mode in ("error", "full", "kill"):
                at = 1
                while all(pool.map(lambda n: self.case(mode, n), range(at, at + AT_ONCE))):
                    at += AT_ONCE
                self.assertGreater(at, 20, "the shim does not reach the program")
