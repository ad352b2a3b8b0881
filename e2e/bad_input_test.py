"""Whitelists, stores, recordings and arguments that are not as they should be: none stops a run."""

import os
import plistlib
import sqlite3
import stat
import subprocess
import unittest

from harness import BIN, NO_CONTROLLER, YESTERDAY, DeviceTest


class BadInput(DeviceTest):
    def test_whitelists_that_cannot_be_used(self):
        good = {"G": {"ScalarKeys": {"k": {}}}}
        for name, data in {"empty": b"", "truncated": plistlib.dumps(good)[:-20], "an array": plistlib.dumps([]),
                           "truncated binary": plistlib.dumps(good, fmt=plistlib.FMT_BINARY)[:-1]}.items():
            with self.subTest(name):
                device = self.device(value=True)
                device.whitelist(data)
                device.run("-d")
                (error,) = device.texts("error")
                self.assertTrue(error.startswith("Couldn't parse the contents of the config file. Error: "))
                self.assertEqual(device.reports(), [])
                self.assertEqual(device.last_day(), YESTERDAY)  # the day counts as done all the same

    def test_whitelists_that_are_merely_hostile(self):
        device = self.device(value=True)
        keys = {f"com.velmora.key{i}.": {} for i in range(500000)}
        for groups in ({"G": {"ScalarKeys": keys, "ScalarKeyPrefixes": {**keys, "k": {}}}},
                       {"../../../etc/passwd": {"ScalarKeys": {"k": {}}}, "": {}, "a" * 5000: {}}):
            device.whitelist(groups)
            device.run("-f")
            self.assertEqual(device.reports()[-1]["TBScalars"], {"k": 3})
        self.assertEqual(len(device.reports()), 2)

    def test_a_store_that_cannot_be_used_stays_as_it_is(self):
        device = self.device(value=True)
        damaged = device.store_path.read_bytes()[:5000]
        device.store_path.write_bytes(damaged)
        result = device.run("-f")
        device.tally("record", "scalar", "k", "1", status=1)
        self.assertEqual(device.reports(), [])
        self.assertEqual({place: place.read_bytes() for place in device.store_path.parent.iterdir()},
                         {device.store_path: damaged})
        self.assertEqual(sum("TBDataStore" in line for line in result.stderr.splitlines()), 1, result.stderr)

    def test_a_store_that_somebody_keeps_locked_is_waited_for_once(self):
        device = self.device(sample=True)
        with sqlite3.connect(device.store_path) as holder:
            holder.execute("BEGIN EXCLUSIVE")
            result = device.run("-f")  # thousands of keys; more than one wait would be a timeout
        self.assertIn("is kept locked by another program", result.stderr)
        self.assertIn("tbdaily ended", device.log())

    def test_a_pipe_at_the_store_s_journal_holds_nobody_up(self):
        for name in ("-wal", "-shm", "-journal"):
            device = self.device(value=True)
            os.mkfifo(f"{device.store_path}{name}")
            device.run("-f")
            self.assertIn("tbdaily ended", device.log())

    def test_a_process_that_was_given_nothing_and_a_umask_that_takes_everything(self):
        device = self.device(value=True)
        device.write("System/Device/apps.plist", b"rubbish")  # named on standard error, which is nobody's file here
        subprocess.run(["sh", "-c", 'umask 0777; exec "$0" -d 0<&- 1>&- 2>&-', BIN / "tbdaily"], env=device.env, check=True,
                       timeout=120)
        self.assertEqual(device.reports()[0]["TBScalars"], {"k": 3})
        made = [place for place in device.path("var").rglob("*") if not place.is_socket()]
        for place in made:
            self.assertNotIn(b"apps.plist", b"" if place.is_dir() else place.read_bytes(), place)
        for place in [*device.path("var/mobile/Library/Logs").rglob("*"), *device.path("var/log").rglob("*")]:
            self.assertEqual(stat.S_IMODE(place.stat().st_mode), 0o700 if place.is_dir() else 0o600, place)

    def test_recordings_that_cannot_be_parsed(self):
        device = self.device(value=True)
        for name in ("answers", "kernel", "apps", "locale", "registry", "hub"):
            device.write(f"System/Device/{name}.plist", b"\x00rubbish")
        result = device.run("-f")
        for name in ("answers", "locale"):
            self.assertEqual(result.stderr.count(f"{name}.plist is ignored"), 1)
        self.assertEqual(device.reports()[0]["TBMetadata"], {
            "TBUserInterfaceLanguage": "<unknown>", "TBPreferredUserInterfaceLanguage": "<unknown>"})

    def test_roots_that_cannot_be_used(self):
        device = self.device(value=True)
        result = device.run("-d", TBDAILY_ROOT=str(device.store_path), TBDAILY_LIVE="1")
        (line,) = [line for line in result.stderr.splitlines() if line != NO_CONTROLLER]
        self.assertIn(str(device.store_path), line)

    def test_arguments_of_every_kind(self):
        device = self.device(value=True)
        for argument in ("", "%s%n%d", "x" * 100000, "\udcff", "-d\n"):
            device.run(argument.encode("utf-8", "surrogateescape"))
        self.assertIn("Unknown arg: %s%n%d", device.log())
        self.assertIn("Unknown arg: -d\n\t\n", device.log())
        self.assertNotIn("daily tasks", device.log())


if __name__ == "__main__":
    unittest.main()
