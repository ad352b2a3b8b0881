"""tallyctl as its users meet it: what it prints, what it refuses, and with which status."""

import base64
import datetime
import json
import os
import plistlib
import subprocess
import unittest

from harness import BIN, JOB, TODAY, YESTERDAY, DeviceTest

VALUE = {"text": "ä<&>\"", "int": -2 ** 63, "big": 2 ** 63 - 1, "real": 2.5, "inf": float("inf"), "yes": True,
         "date": datetime.datetime(2026, 2, 28, 23, 59, 59), "data": bytes(range(256)), "list": [1, [], {}]}

HOSTILE = "n\x1b[31m\x9b2J\x7f\u202e\r\n<0>forged"
CONTROLS = {chr(c) for c in (*range(32), *range(0x7f, 0xa0), 0x202e)} - {"\n", "\t"}


class Companion(DeviceTest):
    def test_help_and_wrong_usage(self):
        device = self.device()
        for words in ("", "record", "record scalar", "send", "report", "whitelist check", "plist", "init", "wait"):
            self.assertIn("--help", device.tally(*words.split(), "--help"))
        for words in ("", "nonsense", "record scalar k", "record scalar k 1.5", "record scalar k 9223372036854775808",
                      "record distribution k inf", "record scalar k 1 --day 2147483648", "send run x",
                      "report --day x", "report --raw --identifiability", "init --profile x", "wait ../x"):
            device.tally(*words.split(), status=2)
        self.assertIn('no command "nonsense"', device.tally("nonsense", status=2))
        missing = str(device.base / "missing")
        self.assertIn("make a device there", device.tally("record", "scalar", "k", "1", "--root", missing, status=1))
        environment = {k: v for k, v in device.env.items() if k != "TBDAILY_ROOT"}
        result = subprocess.run([BIN / "tallyctl", "init"], env=environment, capture_output=True)
        self.assertEqual(result.returncode, 2)

    def test_init_refuses_to_overwrite(self):
        device = self.device(sample=True)
        before = device.snapshot()
        self.assertIn("already there", device.tally("init", status=1))
        self.assertEqual(device.snapshot(), before)

    def test_records(self):
        device = self.device()
        device.tally("record", "scalar", "k", "5")
        device.tally("record", "scalar", "k", str(-2 ** 63), "--add")
        device.tally("record", "distribution", "d", "1.5", "-2", "nan", "--day", str(YESTERDAY))
        imported = json.loads(device.tally("--json", "record", "import", stdin="s\told\t-5\t1\nd\td\t5\t86399\t7"))
        self.assertEqual(imported, {"scalars": 1, "distributionValues": 1})
        self.assertIn("line 2", device.tally("record", "import", "-", stdin="s\tgood\t1\t1\ns\tk\n", status=1))
        rows = device.store().execute("SELECT name, day, value FROM scalars JOIN keys ON id = key_id ORDER BY name")
        self.assertEqual(list(rows), [("k", TODAY, 5 - 2 ** 63), ("old", -5, 1)])
        rows = device.store().execute("SELECT day, seq, value FROM distribution_values")
        self.assertEqual(list(rows), [(5, 0, 7.0), (YESTERDAY, 0, 1.5), (YESTERDAY, 1, -2.0), (YESTERDAY, 2, None)])
        for before in (str(TODAY), "20261124", "today", "2026-11-23"):
            device.tally("record", "prune", "--before", before, status=2 if len(before) == 8 else 1)
        self.assertEqual(device.store().execute("SELECT count(*) FROM scalars").fetchone(), (2,))
        gone = {"before": "2026-11-24", "scalars": 1, "distributionValues": 4, "keys": 2}
        self.assertEqual(device.tally_json("record", "prune", "--before", "today", "--dry-run"), {**gone, "dryRun": True})
        self.assertEqual(device.tally_json("record", "prune", "--before", str(TODAY), "--force"), {**gone, "dryRun": False})

    def test_property_lists(self):
        device = self.device()
        as_json = dict(VALUE, inf=None, date="2026-02-28T23:59:59Z", data=base64.b64encode(VALUE["data"]).decode())
        place = device.write("value.plist", plistlib.dumps(VALUE, fmt=plistlib.FMT_BINARY, sort_keys=False))
        self.assertEqual(plistlib.loads(device.tally("plist", str(place)).encode()), VALUE)
        read = json.loads(device.tally("plist", str(place), "--json"))
        self.assertEqual(list(read.items()), list(as_json.items()))
        device.write("value.plist", b"<plist><dict>")
        self.assertRegex(device.tally("plist", str(place), status=1), r"line 1, column \d+")
        self.assertIn("no such file", device.tally("plist", str(device.base / "none"), status=1))

    def test_whitelist_check(self):
        device = self.device()
        device.whitelist({
            "A": {"ScalarKeys": {"k": {"sig_fig": 2}}, "Note": 1,
                  "ScalarKeyPrefixes": {"net.": {}, "net.wifi.": {}, "": {}}},
            "B": {"ScalarKeys": {"k": {"bucket_interval": 0}},
                  "DistributionKeys": {"d": {"intervals": [2, 1], "odd": 1}}},
            "Off": {"ScalarKeys": {"off": {}}}, "Broken": 3})
        device.preferences("com.velmora.da", {"Off": False})
        answer = device.tally_json("whitelist", "check", "k", "net.wifi.x", "off", status=1)
        keys = {(k["key"], k["kind"]): k for k in answer["keys"]}
        self.assertEqual(keys["k", "scalar"], {"key": "k", "kind": "scalar", "allowed": True, "by": "exact",
                                               "entry": "k", "group": "B", "options": {"bucket_interval": 0}})
        self.assertEqual(keys["net.wifi.x", "scalar"]["entry"], "net.")
        self.assertEqual((keys["off", "distribution"]["allowed"], answer["internal"]), (False, False))
        self.assertIn("keyGroup Off is disabled by tasking", device.tally("whitelist", "check", status=1))
        for oddity in ("Broken is no dictionary", "A has the entry \"Note\"", "empty prefix",
                       "net.wifi. is never reached", "replaces the options that group A", "every value becomes 0",
                       "do not ascend", "\"odd\""):
            self.assertTrue(any(oddity in problem for problem in answer["problems"]), oddity)
        device.record("answers", {"InternalBuild": True})
        self.assertEqual(device.tally_json("whitelist", "check", "zz", status=1)["keys"][0]["by"], "internal")
        self.assertIn("reported by the prefix net. of A", device.tally("whitelist", "check", "net.x", status=1))
        device.whitelist({"G": {"ScalarKeys": {"k": {}}, "ScalarKeyPrefixes": {"": {}}}})
        device.tally("whitelist", "check")
        device.tally("whitelist", "check", "--strict", status=1)
        device.whitelist(b"")
        self.assertIn("Couldn't parse", device.tally("whitelist", "check", status=1))

    def test_report_text_is_plain_when_piped(self):
        device = self.device(sample=True)
        self.assertIn("no report yet", device.tally("report", status=1))
        device.run("-f")
        text = device.tally("report")
        self.assertTrue(text.isascii())
        self.assertNotIn("\x1b", text)
        self.assertIn("std. dev.", text)
        self.assertRegex(text, r"\n      \(90, inf\) +\d+  #+\n")
        self.assertIn("no daily report", device.tally("report", "-", stdin="<plist><string/></plist>", status=1))

    def test_a_report_is_written_as_a_page_whole_or_not_at_all(self):
        device = self.device(sample=True)
        device.run("-f")
        page = device.base / "report.html"
        page.write_text("before")
        with open(page) as before:
            device.tally("report", "--html", str(page))
            self.assertEqual(before.read(), "before", "replaced, not rewritten")
        report = device.pending()[0]
        self.assertEqual(device.tally("report", str(report), "--html", "-"), page.read_text())
        kept = device.snapshot()
        self.assertIn("Preview of the daily report", device.tally("report", "--preview", "--html", "-"))
        self.assertEqual(device.snapshot(), kept)
        self.assertIn("no such file", device.tally("report", "--html", str(device.base / "none/page"), status=1))
        self.assertIn("no daily report", device.tally("report", "-", "--html", str(page), stdin="<plist><string/></plist>", status=1))
        self.assertEqual(sorted(place.name for place in device.base.iterdir()), ["report.html", "root"])
        for words in ("--json report --html x", "report --html x --raw", "report --html x --identifiability"):
            device.tally(*words.split(), status=2)

    def test_what_cannot_be_read_is_no_answer(self):
        preferences, spool = "var/mobile/Library/Preferences/", "var/mobile/Library/Logs/"
        device = self.device(sample=True)
        for place, reason, commands in (
                (preferences + "com.velmora.Crashferry.plist", "not a regular file", ("tasking show",)),
                (preferences + JOB + ".plist", "not a regular file", ("tasking show",)),
                (preferences + "com.velmora.sysmetrics.tbdaily.plist", "not a regular file", ("usage show",)),
                (preferences + "com.velmora.da.plist", "not a regular file", ("whitelist check", "report --preview")),
                ("System/Device/usage.plist", "not a regular file", ("usage show",)),
                ("System/Device/registry.plist", "not a regular file", (
                    "metrics list", "metrics sample", "nand", "wear", "stats", "snapshots", "buffer stats -o x")),
                ("System/Device/hub.plist", "not a regular file", ("metrics sample", "metrics watch --interval 1")),
                ("Library/Application Support/Tallybook/Whitelist_Nimbos.plist", "not a regular file",
                 ("whitelist check", "report --preview")),
                (spool + "Pending", "not a directory", ("report",)),
                (spool + "Withheld", "not a directory", ("report",))):
            there = device.path(place)
            aside = device.base / "aside"
            if there.exists():
                there.rename(aside)
            for words in commands:
                for json_flag in ((), ("--json",)):
                    with self.subTest(place=place, words=words, json=json_flag):
                        there.parent.mkdir(parents=True, exist_ok=True)
                        os.mkfifo(there)
                        said = device.tally(*json_flag, *words.split(), status=1)
                        self.assertIn(str(there), said)
                        self.assertIn(reason, said)
                        self.assertEqual(len(said.splitlines()), 1)
                        there.unlink()
            if aside.exists():
                aside.rename(there)
        missing = str(device.base / "missing")
        for words in ("tasking show", "usage show", "report", "metrics list", "whitelist check", "nand", "stats", "snapshots"):
            for json_flag in ((), ("--json",)):
                self.assertIn(missing, device.tally("--root", missing, *json_flag, *words.split(), status=1))

    def test_what_is_something_else_is_no_answer(self):
        device = self.device()
        answers = str(device.record("answers", {"InternalBuild": True}))
        for json_flag in ((), ("--json",)):
            self.assertIn("cannot be had", device.tally(*json_flag, "nand", status=1))
            self.assertIn("no statistics buffer", device.tally(*json_flag, "stats", "/etc/passwd", status=1))
            self.assertIn("no daily report", device.tally(*json_flag, "report", answers, status=1))

    def test_files_are_regular_and_of_a_limited_size(self):
        device = self.device(sample=True)
        fifo, sparse = str(device.base / "fifo"), str(device.base / "sparse")
        os.mkfifo(fifo)
        with open(sparse, "wb") as file:
            file.truncate(2 ** 42)
        words = ("stats", "snapshots --records", "plist", "report", "tasking schedule", "send app-info", "record import")
        for command in words:
            for place, reason in ((fifo, "not a regular file"), ("/dev/zero", "not a regular file"),
                                  (str(device.base), "not a regular file"), (sparse, "larger than|longer than")):
                with self.subTest(command=command, place=place):
                    self.assertRegex(device.tally(*command.split(), place, status=1), reason)
        newest = device.path("var/mobile/Library/Logs/Pending/log-tallyd-2026-11-24-090704.193")
        newest.parent.mkdir(parents=True, exist_ok=True)
        self.assertIn("nobody reads it", device.tally("buffer", "stats", "-o", fifo, status=1))
        for place, reason in ((fifo, "not a regular file"), (sparse, "larger than 256 MiB")):
            os.rename(place, newest)
            self.assertIn(f"{newest}: it is {reason}", device.tally("report", status=1))
            newest.unlink()
        for command in words[:1] + words[2:]:
            with open("/dev/zero", "rb") as zeros, self.subTest(command=command):
                result = subprocess.run([BIN / "tallyctl", *command.split(), "-"], env=device.env, stdin=zeros,
                                        capture_output=True, timeout=60)
                self.assertEqual(result.returncode, 1)
                self.assertRegex(result.stderr, b"larger than|longer than")

    def test_nothing_from_outside_drives_the_terminal_or_forges_a_line(self):
        device = self.device(sample=True)

        def write(place, value):
            return str(device.write(place, plistlib.dumps(value, fmt=plistlib.FMT_BINARY)))

        report = write("r", {"TBCrashLogVersion": 1, "TBStartDate": datetime.datetime(2026, 11, 23), "TBTaskID": HOSTILE,
                             "TBMetadata": {HOSTILE: HOSTILE}, "TBScalars": {HOSTILE: 1},
                             "TBDistributionsHistogram": {HOSTILE: {HOSTILE: 1}}})
        value = write("v", {HOSTILE.replace("\x1b", ""): [HOSTILE.replace("\x1b", "")]})
        device.write("Library/Application Support/Tallybook/Whitelist_Nimbos.plist", plistlib.dumps(
            {HOSTILE: {"ScalarKeys": {HOSTILE: {}}, HOSTILE: 1}}, fmt=plistlib.FMT_BINARY))
        write("var/mobile/Library/Preferences/com.velmora.tallyd.tbdaily.plist", {
            "TaskingID": HOSTILE, "TaskingOS": HOSTILE, "TaskingDigest": HOSTILE,
            "TaskingPayload": [{"Domain": "d", "Key": HOSTILE, "Value": HOSTILE}]})
        registry = plistlib.loads(device.path("System/Device/registry.plist").read_bytes())
        publishing = [e for e in registry["entries"] if "KdReportLegend" in e.get("properties", {})]
        publishing[0]["name"] = HOSTILE
        for group in publishing[1]["properties"]["KdReportLegend"]:
            group["KdReportGroupName"] = HOSTILE
            for channel in group["KdReportChannels"]:
                channel[2:] = [HOSTILE]
        publishing[2] |= {"name": HOSTILE, "properties": {"KdReportLegendPublic": True, "KdReportLegend": 1}}
        write("System/Device/registry.plist", registry)
        write("var/mobile/Library/Preferences/com.velmora.sysmetrics.tbdaily.plist", {
            "netUsageBaseline": {HOSTILE: [datetime.datetime(2026, 11, 23), 1, 2, 3, 4]}})
        write("var/mobile/Library/Preferences/com.velmora.Crashferry.plist", {"ScheduledTasking": {"TaskingID": HOSTILE}})
        for words, status in (
                (("report", report), 0), (("plist", value), 0), (("whitelist", "check", HOSTILE), 0),
                (("tasking", "show"), 0), (("usage", "show"), 0), (("metrics", "list"), 0), (("metrics", "sample"), 0),
                (("metrics", "watch", "--interval", "1", "--count", "1"), 0), (("metrics", "list", "--describe"), 0),
                (("metrics", "list", "--driver", HOSTILE), 0), (("stats", HOSTILE), 1), ((HOSTILE,), 2),
                (("record", "scalar", "k", HOSTILE), 2), (("metrics", "list", "--" + HOSTILE), 2),
                (("nand", "--explain", HOSTILE), 1), (("wait", HOSTILE), 2), (("record", "import", HOSTILE), 1)):
            for json_flag in ((),) if "--describe" in words else ((), ("--json",)):
                with self.subTest(words=words, json=json_flag):
                    result = subprocess.run([BIN / "tallyctl", *json_flag, *words], env=device.env, timeout=60,
                                            capture_output=True)
                    self.assertEqual(result.returncode, status, result.stderr)
                    text = (result.stdout + result.stderr).decode()
                    self.assertEqual([c for c in text if c in CONTROLS], [])
                    self.assertIn("forged", text)
                    if "--describe" not in words:  # of whose lines nobody knows which are the library's
                        self.assertNotRegex(text, "(?m)^<0>forged")
        self.assertEqual(plistlib.loads(device.tally("plist", value).encode()),
                         {HOSTILE.replace("\x1b", ""): [HOSTILE.replace("\x1b", "")]})
        self.assertIn(r"n\x1b[31m\x9b2J\x7f\u202e\x0d\x0a<0>forged", device.tally("report", report))

    def test_app_records_and_waiting(self):
        device = self.device()
        short = '[{"bundle": "b", "version": "1", "kestrelID": 1, "arch": 2, "uuid": "short"}]'
        for records, reason in (("{}", "no array"), ("[1]", "app record 1 is no dictionary"), (short, '"uuid"')):
            self.assertIn(reason, device.tally("send", "app-info", "-", stdin=records, status=1))
        self.assertIn("no job is listening", device.tally("send", "logging-status", status=1))
        self.assertIn("in time", device.tally("wait", "some.name", "--timeout", "0.2", status=1))


if __name__ == "__main__":
    unittest.main()
