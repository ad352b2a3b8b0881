"""Whitelists, preferences, stores and recordings that are not as they should be: each has its outcome, and none stops a run."""

import plistlib
import sqlite3
import subprocess
import unittest

from harness import BIN, NO_CONTROLLER, TODAY, YESTERDAY, Device

JOB = "com.velmora.tallyd.tbdaily"
BOMB = (b'<?xml version="1.0"?><!DOCTYPE plist [<!ENTITY a "ha">'
        + b"".join(b'<!ENTITY %c "%s">' % (98 + i, b"&%c;" % (97 + i) * 10) for i in range(9))
        + b']><plist version="1.0"><dict><key>&j;</key><dict/></dict></plist>')


def nested(levels):
    inner = b"<dict/>"
    for _ in range(levels - 1):
        inner = b"<dict><key>k</key>" + inner + b"</dict>"
    return b'<?xml version="1.0"?><plist version="1.0">' + inner + b"</plist>"


class BadInput(unittest.TestCase):
    def device(self):
        device = Device()
        self.addCleanup(device.close)
        device.allow(ScalarKeys={"k": {}})
        device.tally("record", "scalar", "k", "3", "--day", str(YESTERDAY))
        return device

    def errors(self, device):
        return [message for level, message in device.messages() if level == "error"]

    def test_whitelists_that_cannot_be_used(self):
        good = plistlib.dumps({"G": {"ScalarKeys": {"k": {}}}})
        for name, data in {"empty": b"", "truncated": good[:-20], "not UTF-8": good.replace(b"G<", b"\xff<"), "bomb": BOMB,
                           "too deep": nested(513), "an array": plistlib.dumps([]), "truncated binary":
                           plistlib.dumps({"G": {}}, fmt=plistlib.FMT_BINARY)[:-1]}.items():
            with self.subTest(name):
                device = self.device()
                device.whitelist(data)
                device.run("-d")
                self.assertEqual(len(self.errors(device)), 1)
                self.assertTrue(self.errors(device)[0].startswith("Couldn't parse the contents of the config file. Error: "))
                self.assertEqual(device.reports(), [])
                # The day counts as done all the same.
                self.assertEqual(device.preferences(JOB)["LastCrashLogSerializationDateInDaysSince1970"], YESTERDAY)
        device = self.device()
        device.path("Library/Application Support/Tallybook/Whitelist_Nimbos.plist").unlink()
        device.run("-f")
        self.assertEqual(self.errors(device), ["Couldn't load whitelist"])

    def test_whitelists_that_are_merely_odd(self):
        device = self.device()
        device.whitelist(plistlib.dumps({"G": {"ScalarKeys": {"k": {}}}}, fmt=plistlib.FMT_BINARY))
        device.run("-f")
        device.whitelist(nested(512))
        device.run("-f")
        device.whitelist({"A": 1, "B": {"ScalarKeys": {"k": {"sig_fig": "2"}, "j": {}}}})
        device.tally("record", "scalar", "j", "7", "--day", str(YESTERDAY))
        device.run("-f")
        self.assertEqual([r["TBScalars"] for r in device.reports()], [{"k": 3}, {"j": 7}])
        self.assertEqual(len(self.errors(device)), 2)

    def test_a_million_keys(self):
        device = self.device()
        keys = "".join(f"<key>com.velmora.key{i}.</key><dict/>" for i in range(500000))
        device.whitelist(b'<?xml version="1.0"?><plist version="1.0"><dict><key>G</key><dict><key>ScalarKeys</key><dict>'
                         + keys.encode() + b"<key>k</key><dict/></dict><key>ScalarKeyPrefixes</key><dict>" + keys.encode()
                         + b"</dict></dict></dict></plist>")
        device.run("-f")
        self.assertEqual(device.reports()[0]["TBScalars"], {"k": 3})

    def test_damaged_preferences_are_moved_aside(self):
        device = self.device()
        place = device.preferences(JOB, {}) or device.path(f"var/mobile/Library/Preferences/{JOB}.plist")
        for number, data in enumerate((b"<plist>", b"", plistlib.dumps(["no", "dictionary"]))):
            place.write_bytes(data)
            result = device.run("-d")
            self.assertIn("damaged", result.stderr)
            self.assertEqual(place.with_name(place.name + f".damaged-{number}").read_bytes(), data)
            self.assertEqual(device.preferences(JOB)["LastCrashLogSerializationDateInDaysSince1970"], YESTERDAY)

    def test_preferences_of_other_kinds(self):
        for value, runs in ((True, True), ("99999", True), (99999.9, False), (float("nan"), True), (2 ** 62, False)):
            device = self.device()
            device.preferences(JOB, {"LastCrashLogSerializationDateInDaysSince1970": value})
            device.run("-d")
            self.assertEqual(f"daily tasks for day {YESTERDAY}" in device.log(), runs, value)

    def test_group_names_that_are_hostile_keys_and_paths(self):
        device = self.device()
        device.whitelist({"../../../etc/passwd": {"ScalarKeys": {"k": {}}}, "": {}, "a" * 5000: {}})
        device.run("-f")
        self.assertEqual(device.reports()[0]["TBScalars"], {"k": 3})

    def test_stores_that_cannot_be_used_stay_as_they_are(self):
        def rewrite(statement):
            def change(device):
                database = sqlite3.connect(device.store_path)
                database.executescript(statement)
                database.close()
            return change
        damages = {"text": lambda d: d.store_path.write_bytes(b"no database at all" * 100),
                   "truncated": lambda d: d.store_path.write_bytes(d.store_path.read_bytes()[:5000]),
                   "version": rewrite("PRAGMA user_version = 2"), "schema": rewrite("DROP TABLE scalars")}
        for name, damage in damages.items():
            with self.subTest(name):
                device = self.device()
                damage(device)
                before = device.store_path.read_bytes()
                result = device.run("-f")
                self.assertEqual(device.reports(), [])
                self.assertEqual(device.store_path.read_bytes(), before)
                self.assertEqual([p.name for p in device.store_path.parent.iterdir()], [device.store_path.name])
                lines = [line for line in result.stderr.splitlines() if "TBDataStore" in line]
                self.assertEqual(len(lines), 1, result.stderr)
                device.tally("record", "scalar", "k", "1", status=1)
                self.assertEqual(device.store_path.read_bytes(), before)

    def test_a_locked_store_is_waited_for(self):
        device = self.device()
        database = sqlite3.connect(device.store_path, isolation_level=None)
        database.execute("BEGIN EXCLUSIVE")
        device.run("-f")  # readers of a write-ahead log do not wait
        self.assertEqual(device.reports()[0]["TBScalars"], {"k": 3})
        writer = subprocess.Popen([BIN / "tallyctl", "record", "scalar", "k", "5", "--day", str(YESTERDAY)], env=device.env, stdout=subprocess.DEVNULL)
        with self.assertRaises(subprocess.TimeoutExpired):
            writer.wait(timeout=0.5)
        database.execute("COMMIT")
        database.close()
        self.assertEqual(writer.wait(timeout=30), 0)
        device.run("-f")
        self.assertEqual(device.reports()[1]["TBScalars"], {"k": 5})

    def test_recordings_that_cannot_be_parsed(self):
        device = self.device()
        for name in ("answers", "kernel", "apps", "locale"):
            device.write(f"System/Device/{name}.plist", b"\x00rubbish")
        result = device.run("-f")
        for name in ("answers", "locale"):
            self.assertEqual(result.stderr.count(f"{name}.plist is ignored"), 1)
        self.assertEqual(device.reports()[0]["TBMetadata"], {
            "TBUserInterfaceLanguage": "<unknown>", "TBPreferredUserInterfaceLanguage": "<unknown>"})

    def test_roots_that_cannot_be_used(self):
        device = self.device()
        for root in (device.base / "missing", device.store_path):
            result = device.run("-d", TBDAILY_ROOT=str(root), TBDAILY_LIVE="1")
            lines = [line for line in result.stderr.splitlines() if line != NO_CONTROLLER]
            self.assertEqual(len(lines), 1, result.stderr)
            self.assertIn(str(root), lines[0])
        self.assertFalse((device.base / "missing").exists())

    def test_arguments_of_every_kind(self):
        device = self.device()
        for argument in ("", "%s%n%d", "x" * 100000, "\udcff", "-d\n"):
            device.run(argument.encode("utf-8", "surrogateescape"))
        self.assertIn("Unknown arg: %s%n%d", device.log())
        self.assertIn("Unknown arg: -d\n\t\n", device.log())
        self.assertNotIn("daily tasks", device.log())

    def test_odd_rows(self):
        device = self.device()
        database = sqlite3.connect(device.store_path)
        database.execute("INSERT INTO keys VALUES (50, ?)", ("bad\x01key",))
        database.execute("INSERT INTO keys VALUES (51, ?)", ("nan",))
        database.execute("INSERT INTO scalars VALUES (50, ?, 1)", (YESTERDAY,))
        database.execute("INSERT INTO scalars VALUES (51, ?, 'text')", (YESTERDAY,))
        database.execute("INSERT INTO distribution_values VALUES (51, ?, 0, 0, 1.5), (51, ?, 1, 0, NULL)", (YESTERDAY,) * 2)
        database.commit()
        database.close()
        device.allow(ScalarKeyPrefixes={"bad": {}, "k": {}}, DistributionKeys={"nan": {"intervals": [1]}})
        device.run("-f")
        (report,) = device.reports()
        self.assertEqual(report["TBScalars"], {"k": 3})
        self.assertEqual(report["TBDistributionsHistogram"], {"nan": {"(1, inf)": 2}})
        self.assertEqual(report["TBDistributions"]["nan"][0], 1.5)
        self.assertNotEqual(report["TBDistributions"]["nan"][2], report["TBDistributions"]["nan"][2])

    def test_days_far_away(self):
        device = self.device()
        for day in (-2 ** 31, 2 ** 31 - 1):
            device.tally("record", "scalar", "k", "9", "--day", str(day))
        self.assertEqual(device.tally_json("report", "--preview", "--day", str(2 ** 31 - 1))["TBScalars"], {"k": 9})
        self.assertEqual(device.tally_json("report", "--preview", "--day", str(-2 ** 31))["TBScalars"], {"k": 9})
        self.assertNotIn(str(TODAY), device.tally("report", "--preview", "--day", str(2 ** 31 - 1)))


if __name__ == "__main__":
    unittest.main()
