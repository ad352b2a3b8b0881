"""tallyctl status, consent, group and spool: what is wrong is one line, and what they change is nothing else."""

import datetime
import json
import os
import plistlib
import subprocess
import unittest

from harness import BIN, NOW, YESTERDAY, DeviceTest

WHITELIST = "Library/Application Support/Tallybook/Whitelist_Nimbos.plist"
STORE = "var/mobile/Library/Tallybook/TBDataStore.sqlitedb"
CONSENT = "com.velmora.Crashferry"
GROUPS = "com.velmora.da"


class Status(DeviceTest):
    def status(self, device, status):
        answer = json.loads(self.tally(device, status, "--json", "status").stdout)
        self.assertEqual(answer["ok"], status == 0)
        self.assertEqual(answer["ok"], not answer["attention"])
        self.assertEqual(answer["root"], str(device.root))
        return answer

    def tally(self, device, status, *words, **environment):
        done = subprocess.run([BIN / "tallyctl", *words], env=dict(device.env, **environment), capture_output=True, text=True)
        self.assertEqual(done.returncode, status, (words, done))
        return done

    def test_a_well_device(self):
        device = self.device(value=True)
        before = device.snapshot()
        answer = self.status(device, 0)
        self.assertEqual(device.snapshot(), before)
        self.assertEqual((answer["lastDay"], answer["consent"], answer["whitelist"]["problems"]), (None, True, []))
        self.assertEqual((answer["store"]["usable"], answer["store"]["firstDay"], answer["store"]["lastDay"]),
                         (True, "2026-11-23", "2026-11-23"))
        self.assertIn("writes a report of 1 scalars", answer["nextRun"])
        device.run("-d")
        answer = self.status(device, 0)
        self.assertEqual((answer["lastDay"], answer["spool"]["pending"]["logs"]), ("2026-11-23", 1))
        self.assertEqual(answer["spool"]["pending"]["oldest"], "2026-11-24T09:07:04Z")
        self.assertIn("2026-11-23 was processed", answer["nextRun"])
        self.assertIn("This device is well.", self.tally(device, 0, "status").stdout)
        device.tally("consent", "off")
        device.record("clock", {"now": NOW + datetime.timedelta(days=1)})
        self.assertIn("submission is off", self.status(device, 0)["nextRun"])

    def test_each_way_to_no_report_is_a_line_that_says_what_to_do(self):
        empty = self.device()
        self.assertFalse(self.status(empty, 0)["store"]["usable"])  # nothing was processed yet: nothing is missing
        for spoil, wanted in (
                (lambda d: d.path(WHITELIST).unlink(), "there is no whitelist"),
                (lambda d: d.path(WHITELIST).write_bytes(b"<plist>"), "whitelist check tries it"),
                (lambda d: d.whitelist({"G": {"ScalarKeys": {"k": {"sigfig": 2}}}}), "whitelist check names them"),
                (lambda d: d.path(STORE).unlink(), "is gone"),
                (lambda d: d.path(STORE).write_bytes(b"SQLite format 3\0" + b"x" * 5000), "store cannot be used"),
                (lambda d: d.preferences(CONSENT, {}) and d.write(f"var/mobile/Library/Preferences/{CONSENT}.plist", b"<"), CONSENT),
                (lambda d: d.record("clock", {"now": NOW + datetime.timedelta(days=9)}), "9 days before yesterday"),
                (lambda d: d.record("clock", {"now": NOW - datetime.timedelta(days=9)}), "check the clock"),
                (lambda d: d.record("answers", {"MultiUser": True}), "group container"),
                (lambda d: (d.path("var/mobile/Library/Logs/Outbox").rmdir(),
                            d.write("var/mobile/Library/Logs/Outbox", b"x")), "log spool cannot be read")):
            device = self.device(value=True)
            device.run("-d")
            device.path("var/mobile/Library/Logs/Outbox").mkdir(exist_ok=True)
            spoil(device)
            attention = self.status(device, 1)["attention"]
            self.assertTrue(any(wanted in line for line in attention), (wanted, attention))
            shown = self.tally(device, 1, "status").stdout
            for line in attention:
                self.assertIn(line, shown)

    def test_consent_and_groups_change_their_one_value(self):
        device = self.device(value=True)
        device.whitelist({"Second": {}, "First": {"ScalarKeys": {"k": {}}}})
        device.preferences(CONSENT, {"ScheduledTasking": {"TaskingID": "t"}, "DiagnosticLogSubmissionEnabled": True})
        device.preferences(GROUPS, {"AggressiveSubmissionDays": 3})
        self.assertEqual(device.tally_json("consent", "show"), {"consent": True})
        self.assertEqual(device.tally_json("consent", "off"), {"consent": False})
        self.assertEqual(device.preferences(CONSENT),
                         {"ScheduledTasking": {"TaskingID": "t"}, "DiagnosticLogSubmissionEnabled": False})
        self.assertIn("off", device.tally("consent", "show"))
        self.assertEqual(device.tally_json("group", "off", "First"), [{"group": "Second", "on": True}, {"group": "First", "on": False}])
        self.assertEqual(device.preferences(GROUPS), {"AggressiveSubmissionDays": 3, "First": False})
        self.assertEqual(device.tally_json("group", "on", "First")[1], {"group": "First", "on": True})
        self.assertIn('did you mean "First"?', device.tally("group", "on", "Frist", status=1))
        place = device.path(f"var/mobile/Library/Preferences/{CONSENT}.plist")
        place.unlink()
        place.mkdir()
        self.assertIn(CONSENT, device.tally("consent", "show", status=1))

    def test_pruning_takes_whole_logs_the_oldest_first(self):
        device = self.device()
        logs = device.path("var/mobile/Library/Logs")
        for age, place in ((1, "Pending/new.193"), (9, "Withheld/old.193"), (5, "Outbox/2026-11-19-000000-0/middle.193")):
            (logs / place).parent.mkdir(parents=True)
            (logs / place).write_bytes(b"x" * 1000)
            (logs / (place + ".meta.plist")).write_bytes(plistlib.dumps({"created": NOW - datetime.timedelta(days=age)}))
        (logs / "Pending/.tmp-x").write_bytes(b"x" * 9000)
        spool = device.tally_json("spool", "show")
        self.assertEqual([spool[part]["logs"] for part in ("pending", "withheld", "outbox")], [1, 1, 1])
        self.assertEqual(spool["outbox"]["oldest"], "2026-11-19T09:07:04Z")
        for words in ((), ("--max-size", "1Q"), ("--keep-days", "x")):
            device.tally("spool", "prune", *words, status=2)
        before = device.snapshot()
        self.assertEqual(device.tally_json("spool", "prune", "--keep-days", "5", "--dry-run")["removed"], ["Withheld/old.193"])
        self.assertEqual(device.snapshot(), before)
        self.assertEqual(device.tally_json("spool", "prune", "--max-size", "2K")["removed"],
                         ["Withheld/old.193", "Outbox/2026-11-19-000000-0/middle.193"])
        left = sorted(str(file.relative_to(logs)) for file in logs.rglob("*") if file.is_file() and file.name[0] != ".")
        self.assertEqual(left, ["Pending/new.193", "Pending/new.193.meta.plist"])
        self.assertEqual(list((logs / "Outbox").iterdir()), [])

    def test_failures_name_the_root_and_unknown_words_the_most_similar(self):
        device = self.device()
        self.assertIn(f"(device root {device.root})", device.tally("nand", status=1))
        for words, said in ((("metrics", "lsit"), 'did you mean "metrics list"?'), (("statsu",), 'did you mean "status"?'),
                            (("metrics", "list", "--dirver", "x"), 'did you mean "--driver"?')):
            self.assertIn(said, device.tally(*words, status=2))
        for words in (("help", "metrics", "list"), ("metrics", "list", "--help")):
            shown = self.tally(device, 0, *words).stdout
            self.assertIn("--root DIR", shown)
            self.assertIn("--driver DRIVER", shown)
            self.assertLessEqual(max(map(len, shown.splitlines())), 80)
        self.assertIn("What may be reported", device.tally("--help"))

    def test_the_root_of_the_machine_is_that_of_its_defaults(self):
        if os.geteuid() != 0 or os.path.exists("/etc/default/tbdaily"):
            self.skipTest("needs a mount of its own over /etc/default")
        device = self.device(value=True)
        defaults = device.base / "default"
        defaults.mkdir()
        (defaults / "tbdaily").write_text(f"# the device\nTBDAILY_ROOT=\"{device.root}\"\n")
        environment = {name: value for name, value in device.env.items() if name != "TBDAILY_ROOT"}
        command = 'mount --bind "$1" /etc/default && shift && exec "$@"'
        done = subprocess.run(["unshare", "--mount", "sh", "-c", command, "sh", defaults, BIN / "tallyctl", "--json", "status"],
                              env=environment, capture_output=True, text=True)
        if "unshare" in done.stderr:
            self.skipTest("no mount of its own here")
        self.assertEqual(json.loads(done.stdout)["root"], str(device.root))


if __name__ == "__main__":
    unittest.main()
