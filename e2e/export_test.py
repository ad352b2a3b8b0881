"""tallyctl export: rows and metrics hold what the reports and the device hold, read here with independent readers."""

import csv
import hashlib
import json
import math
import os
import pathlib
import plistlib
import re
import subprocess
import unittest
import uuid

from harness import BIN, JOB, YESTERDAY, DeviceTest

TREE = pathlib.Path(__file__).resolve().parent.parent
LOGS = "var/mobile/Library/Logs"
COLUMNS = {"reports": "report_id device day created whitelist_digest task_id language preferred_language region",
           "scalars": "report_id device day key value",
           "distributions": "report_id device day key count minimum maximum mean m2 finite",
           "histograms": "report_id device day key lower upper count"}
TEXTS = set(COLUMNS["reports"].split() + ["key"])
INTEGERS = {"value", "count", "finite"}


def expected(table, report, identifier, device):
    """The rows of a report, as lists."""
    lead = [identifier, device, report["TBStartDate"].strftime("%Y-%m-%d")]
    if table == "reports":
        meta = report["TBMetadata"]
        return [lead + [report["TBLogCreationDate"].strftime("%Y-%m-%dT%H:%M:%SZ"), report["TBWhitelistDigest"], report["TBTaskID"],
                        meta.get("TBUserInterfaceLanguage", ""), meta.get("TBPreferredUserInterfaceLanguage", ""),
                        meta.get("TBUserSetRegionFormat", "")]]
    if table == "scalars":
        return [lead + [key, value] for key, value in report["TBScalars"].items()]
    if table == "distributions":
        return [lead + [key, s[4], *s[:4], int(all(abs(x) < 1e100 for x in s[:4]))]
                for key, s in report["TBDistributions"].items()]
    return [lead + [key, *map(float, label[1:-1].split(", ")), count]
            for key, buckets in report["TBDistributionsHistogram"].items() for label, count in buckets.items()]


def samples(text):
    """{(metric, labels): value}; each has its HELP and TYPE, and no metric comes in two places."""
    found, types, families = {}, {}, []
    for line in text.splitlines():
        if line.startswith("# TYPE "):
            _, _, name, types[name] = line.split()
            families.append(name)
        elif not line.startswith("# HELP "):
            name, labels, value = re.fullmatch(r"(\w+)(?:\{(.*)\})? (\S+)", line).groups()
            pairs = re.findall(r'(\w+)="((?:[^"\\]|\\.)*)"', labels or "")
            key = name, tuple((label, json.loads(f'"{text}"')) for label, text in pairs)
            assert key not in found and families[-1] in (name, re.sub("_(bucket|sum|count)$", "", name)), line
            found[key] = float(value)
    assert len(set(families)) == len(families) and set(types.values()) <= {"gauge", "histogram"}
    assert set(families) == set(re.findall(r"# HELP (\w+) \S", text))
    return found


class Rows(DeviceTest):
    def table(self, device, table, *words, form="ndjson", status=0):
        shown = device.tally("export", "--table", table, "--format", form, *words, status=status)
        if form == "ndjson":
            rows = [json.loads(line) for line in shown.splitlines() if line.startswith("{")]
            self.assertTrue(all(list(row) == COLUMNS[table].split() for row in rows))
            return [[value if name in TEXTS | INTEGERS else float(value) for name, value in row.items()] for row in rows]
        names, *rows = csv.reader(shown.splitlines(), delimiter="\t", quoting=csv.QUOTE_NONE)
        self.assertEqual(names, COLUMNS[table].split())
        return [[value if name in TEXTS else float(value) for name, value in zip(names, row, strict=True)] for row in rows]

    def test_every_table_holds_what_the_reports_hold(self):
        device = self.device(sample=True, name="d7")
        device.record_scalar("app.foregroundSeconds.a\tb\\", 5)
        device.tally("record", "distribution", "app.launchTime.odd", "nan", "1e200", "--day", str(YESTERDAY))
        device.run("-f")
        (report,) = device.pending()
        value = plistlib.loads(report.read_bytes())
        identifier = plistlib.loads(report.with_name(report.name + ".meta.plist").read_bytes())["id"]
        for table in COLUMNS:
            rows = expected(table, value, identifier, "d7")
            self.assertTrue(rows)
            self.assertEqual(repr(self.table(device, table)), repr(rows), table)
            for row in rows if table != "reports" else []:
                row[3] = row[3].replace("\\", "\\\\").replace("\t", "\\t")
            as_real = [[x if isinstance(x, str) else float(x) for x in row] for row in rows]
            self.assertEqual(repr(self.table(device, table, form="tsv")), repr(as_real), table)
        self.assertIn("\tapp.foregroundSeconds.a\\tb\\\\\t", device.tally("export", "--table", "scalars"))

    def test_reports_that_may_leave_by_their_identifiers(self):
        device = self.device(value=True, name="d8")
        self.assertEqual(self.table(device, "reports"), [])
        device.run("-f")
        (report,) = device.pending()
        bytes_, described = report.read_bytes(), report.with_name(report.name + ".meta.plist")
        digest = str(uuid.UUID(hashlib.md5(bytes_).hexdigest()))
        known = plistlib.loads(described.read_bytes())["id"]
        handed = device.write(f"{LOGS}/Outbox/2026-11-25-000000-0/log-tallyd-2026-11-24-090704-1.193", bytes_)
        device.write(f"{LOGS}/Withheld/log-tallyd-2026-11-24-090704-2.193", bytes_)
        self.assertEqual([row[:2] for row in self.table(device, "reports")], [[known, "d8"], [digest, "d8"]])
        device.write(f"{LOGS}/Outbox/2026-11-25-000000-0/{handed.name}.meta.plist", {"name": "without"})
        self.assertEqual(self.table(device, "reports", str(handed))[0][:2], [digest, "d8"])
        elsewhere = device.base / "elsewhere.193"
        elsewhere.write_bytes(bytes_)
        names = f"{elsewhere}\n\n{report}"
        shown = device.tally("export", "--table", "reports", "--files-from", "-", stdin=names).splitlines()[1:]
        self.assertEqual([line.split("\t")[:2] for line in shown], [[digest, ""], [known, "d8"]])
        self.assertEqual(self.table(device, "reports", str(report), "--device", "x\ty", form="tsv")[0][1], "x\\ty")
        described.write_bytes(b"<plist>")
        self.assertEqual(self.table(device, "reports", str(report), status=1)[0][0], digest)

    def test_what_is_no_report_is_named_and_the_others_are_given(self):
        device = self.device(value=True)
        device.run("-f")
        report = str(device.pending()[0])
        fifo = device.base / "fifo"
        os.mkfifo(fifo)
        described = str(device.path("System/Device/clock.plist"))
        for bad, reason in ((device.base / "none", "no such file"), (fifo, "not a regular file"), (described, "no daily report"),
                            (device.write("broken", b"<plist><dict>"), "broken"),
                            (device.write("undated", {"TBCrashLogVersion": 1, "TBStartDate": "x"}), "TBStartDate"),
                            (device.write("kinds", {**plistlib.loads(pathlib.Path(report).read_bytes()), "TBScalars": [1]}), "TBScalars")):
            shown = device.tally("export", "--table", "scalars", str(bad), report, status=1).splitlines()
            self.assertEqual(len(shown), 3, shown)
            self.assertTrue(shown[1].endswith("\tk\t3"), shown)
            self.assertIn(str(bad), shown[2])
            self.assertIn(reason, shown[2])
        out = device.base / "rows"
        out.write_text("before")
        device.tally("export", "--table", "scalars", "-o", str(out), "--files-from", str(fifo), status=1)
        self.assertEqual(out.read_text(), "before")
        device.tally("export", "--table", "scalars", "-o", str(out), report)
        self.assertEqual(len(out.read_text().splitlines()), 2)
        self.assertEqual([file.name for file in device.base.glob("rows*")], ["rows"])
        told = subprocess.Popen([BIN / "tallyctl", "export", "--table", "scalars", "-o", out, "--files-from", "-"], env=device.env,
                                stdin=subprocess.PIPE, stderr=subprocess.PIPE, text=True)
        device.wait_for(lambda: len(list(device.base.glob("rows*"))) == 2)
        told.terminate()
        said = told.communicate(timeout=60)[1]
        self.assertEqual((told.returncode, [file.name for file in device.base.glob("rows*")]), (1, ["rows"]))
        self.assertIn("interrupted", said)
        for words in ((), ("--table", "x"), ("--format", "x", "--table", "scalars"), ("--table", "scalars", "--files-from", "x", report),
                      ("--format", "prometheus", report), ("--json", "--table", "scalars")):
            self.assertEqual(len(device.tally("export", *words, status=2).splitlines()), 1)

    def test_memory_does_not_grow_with_the_files(self):
        device = self.device(sample=True)
        device.run("-f")

        def peak(count):
            export = subprocess.Popen([BIN / "tallyctl", "export", "--table", "scalars", "--files-from", "-", "-o", "/dev/null"],
                                      env=device.env, stdin=subprocess.PIPE, text=True)
            export.stdin.write(f"{device.pending()[0]}\n" * count)
            export.stdin.close()
            _, status, used = os.wait4(export.pid, 0)
            export.returncode = status
            self.assertEqual(status, 0)
            return used.ru_maxrss
        few = peak(30)
        if "asan" not in str(BIN):  # which keeps what is freed
            self.assertLess(peak(600), few + 512)


class Metrics(DeviceTest):
    def test_the_textfile_holds_the_newest_report_and_the_state_of_the_device(self):
        device = self.device(sample=True)
        place = device.base / "tbdaily.prom"
        device.tally("export", "--format", "prometheus", "-o", str(place))
        before = samples(place.read_text())
        self.assertEqual(before["tbdaily_pending_logs", ()], 0)
        self.assertTrue(any(name == "tbdaily_nand" for name, _ in before))
        self.assertFalse(any(name in ("tbdaily_scalar", "tbdaily_report_day_timestamp_seconds") for name, _ in before))
        device.run("-d")
        subprocess.run([BIN / "tallyctl", "export", "--format", "prometheus", "-o", place], env=device.env, check=True, umask=0o077)
        self.assertEqual(place.stat().st_mode & 0o777, 0o644)
        found = samples(place.read_text())
        (report,) = device.reports()
        wanted = {("tbdaily_scalar", (("key", key),)): value for key, value in report["TBScalars"].items()}
        for key, (low, high, mean, squares, count) in report["TBDistributions"].items():
            figures = {"minimum": low, "maximum": high, "mean": mean, "stddev": math.sqrt(squares / count), "values": count}
            wanted.update({(f"tbdaily_distribution_{name}", (("key", key),)): value for name, value in figures.items()})
            if key in report["TBDistributionsHistogram"]:
                wanted["tbdaily_distribution_count", (("key", key),)] = count
                wanted["tbdaily_distribution_sum", (("key", key),)] = mean * count
        for key, buckets in report["TBDistributionsHistogram"].items():
            for label in buckets:
                upper = label[1:-1].split(", ")[1]
                below = sum(n for other, n in buckets.items() if float(other[1:-1].split(", ")[1]) <= float(upper))
                wanted["tbdaily_distribution_bucket", (("key", key), ("le", upper.replace("inf", "+Inf")))] = below
        wanted.update({("tbdaily_nand", (("key", key),)): value for key, value in device.tally_json("nand").items()})
        wear = device.tally_json("wear")
        wanted.update({("tbdaily_write_amplification_ratio", (("kind", kind),)): wear[kind + "WriteAmplification"]
                       for kind in ("user", "system")})
        for channel in reversed(device.tally_json("metrics", "sample", "--format", "simple")):
            names = [(label, channel[key] or "") for label, key in (("driver", "driver"), ("group", "group"), ("subgroup", "subgroup"),
                                                                    ("channel", "name"), ("unit", "unitLabel"))]
            if channel["value"] is not None:
                wanted["tbdaily_driver_value", tuple(names)] = channel["value"]
        wanted["tbdaily_pending_logs", ()] = device.tally_json("spool", "show")["pending"]["logs"]
        wanted["tbdaily_last_processed_day_timestamp_seconds", ()] = YESTERDAY * 86400
        wanted["tbdaily_report_day_timestamp_seconds", ()] = YESTERDAY * 86400
        for key, value in wanted.items():
            self.assertEqual(found.get(key), float(value), key)
        self.assertEqual({key for key in set(found) - set(wanted) if key[0] != "tbdaily_distribution_bucket"}, set())
        self.dashboard_asks_for_what_is_there({name for name, _ in found})

    def dashboard_asks_for_what_is_there(self, names):
        dashboard = json.loads((TREE / "packaging/grafana/tbdaily.json").read_text())
        asked = {name for panel in dashboard["panels"] for target in panel["targets"]
                 for name in re.findall(r"\btbdaily_\w+", target["expr"])}
        asked |= {name for variable in dashboard["templating"]["list"] for name in re.findall(r"\btbdaily_\w+", str(variable["query"]))}
        self.assertGreater(len(asked), 8)
        self.assertEqual(asked - names, set())

    def test_what_the_device_lacks_is_left_out_and_what_cannot_be_read_is_said(self):
        device = self.device()
        self.assertEqual(samples(device.tally("export", "--format", "prometheus")), {("tbdaily_pending_logs", ()): 0})
        device.preferences(JOB, {"LastCrashLogSerializationDateInDaysSince1970": YESTERDAY})
        device.write("System/Device/registry.plist", b"<plist>")
        newest = device.write(f"{LOGS}/Pending/log-tallyd-2026-11-24-090704-0.193", {"TBStartDate": 1})
        place = device.base / "tbdaily.prom"
        done = subprocess.run([BIN / "tallyctl", "export", "--format", "prometheus", "-o", place], env=device.env, capture_output=True,
                              text=True)
        self.assertEqual((done.returncode, len(done.stderr.splitlines())), (1, 2), done.stderr)
        self.assertIn(str(newest), done.stderr)
        self.assertIn("registry.plist", done.stderr)
        self.assertEqual(samples(place.read_text()), {("tbdaily_pending_logs", ()): 1,
                                                      ("tbdaily_last_processed_day_timestamp_seconds", ()): YESTERDAY * 86400})


if __name__ == "__main__":
    unittest.main()
