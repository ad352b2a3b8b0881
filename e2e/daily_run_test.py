"""A day's run on a device root: the report value by value, what it leaves behind."""

import datetime
import pathlib
import plistlib
import re
import subprocess
import unittest

import model
from harness import BIN, EPOCH, NOW, YESTERDAY, DeviceTest


class DailyRun(DeviceTest):
    def test_sample_report_value_by_value(self):
        device = self.device(sample=True)
        device.run("-d", "whatever")
        self.assertEqual(device.last_day(), YESTERDAY)
        device.run("-d")
        self.assertEqual(device.texts()[-2:], ["Day unchanged since last run", "tbdaily ended"])
        (report,) = device.reports()
        data = device.path("Library/Application Support/Tallybook/Whitelist_Nimbos.plist").read_bytes()
        whitelist = model.Whitelist(data, disabled={"Experiments"})
        scalars, distributions, histograms = model.history_part(device, whitelist, YESTERDAY)
        size = device.store_path.stat().st_size // 1048576
        scalars.update({  # measured at the moment, by the sample's recordings and whitelist options
            "com.velmora.homedeck.numAllInstalledApps": 40,
            "com.velmora.homedeck.numThirdPartyApps": 25,  # 24 by fives
            "com.velmora.sysmetrics.tbkd.database.size": size,
            "com.velmora.sysmetrics.tbkd.database.corruptions": 1,
            "com.velmora.usage.cur_boot_session_cpu_uptime": 2520,  # 2500 by sixties
            "com.velmora.kernel.memorystatus_freeze_count": 37,
            "com.velmora.kernel.memorystatus_freeze_pageouts": 812000,
            "com.velmora.kernel.memorystatus_freeze_budget_pages_remaining": 51200,
            "com.velmora.kernel.memorystatus_thaw_count": 29,
            "com.velmora.kernel.swapusage": 1070000000,
        })
        self.assertGreater(len(scalars), 90)
        self.assertEqual(report["TBScalars"], scalars)
        self.assertEqual(report["TBDistributionsHistogram"], histograms)
        self.assertEqual(report["TBDistributions"].keys(), distributions.keys())
        for key, expected in distributions.items():
            minimum, maximum, mean, deviations, count = report["TBDistributions"][key]
            self.assertEqual([minimum, maximum, count], [expected[0], expected[1], expected[4]], key)
            self.assertAlmostEqual(mean, expected[2], delta=1e-9 * max(1, abs(mean)), msg=key)
            self.assertAlmostEqual(deviations, expected[3], delta=1e-9 * max(1, deviations), msg=key)
        rest = {k: v for k, v in report.items()
                if k not in ("TBScalars", "TBDistributions", "TBDistributionsHistogram")}
        self.assertEqual(rest, {
            "TBCrashLogVersion": 1, "TBStartDate": EPOCH + datetime.timedelta(days=YESTERDAY), "TBLogCreationDate": NOW,
            "TBMetadata": {"TBUserInterfaceLanguage": "de", "TBPreferredUserInterfaceLanguage": "de-AT",
                           "TBUserSetRegionFormat": "AT"},
            "TBTasking": [], "TBTaskID": "(no tasking id)", "TBTaskDigest": "(no tasking digest)",
            "TBWhitelistDigest": whitelist.digest})
        self.assertEqual(device.preferences("com.velmora.tallyd")["DatabaseCorruptionCount"], 0)
        (meta,) = device.pending(".193.meta.plist")
        described = plistlib.loads(meta.read_bytes())
        self.assertRegex(described.pop("id"), r"^[0-9A-F]{8}(-[0-9A-F]{4}){3}-[0-9A-F]{12}$")
        self.assertEqual(described, {
            "type": "193", "name": "log-tallyd", "created": NOW, "options": {"previous_os_version": "<unknown>"}})
        self.assertEqual(meta.name, "log-tallyd-2026-11-24-090704-0.193.meta.plist")
        for place in device.path("var").rglob("*"):
            self.assertEqual(place.stat().st_mode & 0o777, 0o700 if place.is_dir() else 0o600, place)

    def test_preview_shows_the_next_report_and_changes_nothing(self):
        device = self.device(sample=True)
        device.run("-t")  # nothing to report yet: leaves traces of a run
        device.record_scalar("net.new", 12345)
        before = device.snapshot()
        preview = device.tally_json("report", "--preview")
        self.assertEqual(device.snapshot(), before)
        device.run("-f")
        newest = device.tally_json("report", str(device.pending()[-1]))
        self.assertEqual(preview, newest)
        self.assertEqual(preview["TBScalars"]["net.new"], 12300)
        self.assertIn("1970-01-06", device.tally("report", "--preview", "--day", "5", status=1))

    def test_live_sources_answer_where_no_recording_does(self):
        device = self.device(value=True)
        device.env["TBDAILY_LIVE"] = "1"
        device.path("System/Device/clock.plist").unlink()
        uptime_key, swap_key = "com.velmora.usage.cur_boot_session_cpu_uptime", "com.velmora.kernel.swapusage"
        device.allow(ScalarKeys={"k": {}, uptime_key: {}, swap_key: {}})
        device.tally("record", "scalar", "k", "3")  # of today
        device.run("-t")
        scalars = device.reports()[0]["TBScalars"]
        minutes = float(pathlib.Path("/proc/uptime").read_text().split()[0]) / 60
        (swap,) = re.findall(r"SwapTotal: +(\d+)", pathlib.Path("/proc/meminfo").read_text())
        self.assertLessEqual(scalars[uptime_key], minutes + 2)
        self.assertEqual(scalars[swap_key], int(swap) * 1024)


    def test_of_many_runs_at_once_one_does_the_work(self):
        device = self.device(sample=True)
        jobs = [subprocess.Popen([BIN / "tbdaily", "-d"], env=device.env, stderr=subprocess.DEVNULL) for _ in range(5)]
        self.assertEqual([job.wait(timeout=120) for job in jobs], [0] * 5)
        log = device.log()
        self.assertEqual((log.count("daily tasks for day"), log.count("Day unchanged since last run")), (1, 4))
        self.assertEqual(len(device.pending(".193")), 1)

    def test_without_consent_logs_are_withheld_and_stay(self):
        device = self.device(sample=True)
        device.preferences("com.velmora.Crashferry", {})
        device.write("var/mobile/Library/Logs/Structured/172/2026-11-20.jsonl", b"{}\n")
        device.run("-f")
        logs = device.path("var/mobile/Library/Logs")
        withheld = [place.name for place in (logs / "Withheld").iterdir()]
        self.assertIn("structured-172-2026-11-20.jsonl", withheld)
        self.assertFalse((logs / "Pending").exists() or (logs / "Outbox").exists())
        device.preferences("com.velmora.Crashferry", {"DiagnosticLogSubmissionEnabled": True})
        device.run("-f")
        self.assertLessEqual(set(withheld), {place.name for place in (logs / "Withheld").iterdir()})


if __name__ == "__main__":
    unittest.main()
