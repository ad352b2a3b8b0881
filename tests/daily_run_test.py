"""A day's run on a device root: modes, the report value by value, what it leaves behind."""

import datetime
import plistlib
import unittest

import model
from harness import EPOCH, NOW, TODAY, YESTERDAY, Device

JOB = "com.velmora.tallyd.tbdaily"


class DailyRun(unittest.TestCase):
    def device(self, **options):
        device = Device(**options)
        self.addCleanup(device.close)
        return device

    def texts(self, device):
        return [message for _, message in device.messages()]

    def test_modes(self):
        device = self.device(sample=True)
        device.run("-d", "whatever")
        self.assertEqual(device.preferences(JOB)["LastCrashLogSerializationDateInDaysSince1970"], YESTERDAY)
        device.run("-d")
        self.assertEqual(self.texts(device)[-2:], ["Day unchanged since last run", "tbdaily ended"])
        before = device.preferences(JOB)
        device.run("-f")
        device.run("-t")
        self.assertEqual(device.preferences(JOB), before)
        self.assertIn(f"daily tasks for day {TODAY}", self.texts(device))
        device.run("-D")
        self.assertEqual(self.texts(device)[-3:], ["tbdaily started", "Unknown arg: -D", "tbdaily ended"])
        self.assertEqual([r["TBStartDate"] for r in device.reports()],
                         [EPOCH + datetime.timedelta(days=d) for d in (YESTERDAY, YESTERDAY, TODAY)])

    def test_sample_report_value_by_value(self):
        device = self.device(sample=True)
        device.run("-f")
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
        rest = {k: v for k, v in report.items() if k not in ("TBScalars", "TBDistributions", "TBDistributionsHistogram")}
        self.assertEqual(rest, {
            "TBCrashLogVersion": 1, "TBStartDate": EPOCH + datetime.timedelta(days=YESTERDAY), "TBLogCreationDate": NOW,
            "TBMetadata": {"TBUserInterfaceLanguage": "de", "TBPreferredUserInterfaceLanguage": "de-AT",
                           "TBUserSetRegionFormat": "AT"},
            "TBTasking": [], "TBTaskID": "(no tasking id)", "TBTaskDigest": "(no tasking digest)",
            "TBWhitelistDigest": whitelist.digest})
        self.assertEqual(device.preferences("com.velmora.tallyd")["DatabaseCorruptionCount"], 0)
        (meta,) = device.pending(".193.meta.plist")
        self.assertEqual(plistlib.loads(meta.read_bytes()), {
            "type": "193", "name": "log-tallyd", "created": NOW, "options": {"previous_os_version": "<unknown>"}})
        self.assertEqual(meta.name, "log-tallyd-2026-11-24-090704-0.193.meta.plist")

    def test_preview_shows_the_next_report_and_changes_nothing(self):
        device = self.device(sample=True)
        device.run("-t")  # nothing to report yet: leaves traces of a run
        device.tally("record", "scalar", "net.new", "12345", "--day", str(YESTERDAY))
        before = device.snapshot()
        preview = device.tally_json("report", "--preview")
        self.assertEqual(device.snapshot(), before)
        device.run("-f")
        newest = device.tally_json("report", str(device.pending()[-1]))
        self.assertEqual(preview, newest)
        self.assertEqual(preview["TBScalars"]["net.new"], 12300)
        self.assertIn("day 5", device.tally("report", "--preview", "--day", "5", status=1))

    def test_files_and_folders_are_private(self):
        device = self.device(sample=True)
        device.run("-d")
        for place in device.path("var").rglob("*"):
            self.assertEqual(place.stat().st_mode & 0o777, 0o700 if place.is_dir() else 0o600, place)

    def test_privacy_of_the_log(self):
        device = self.device(sample=True)
        device.run("-f", TBDAILY_LOG_PRIVATE="")
        self.assertIn(("default", "keyGroup <private> is disabled by tasking"), device.messages())
        result = device.run("-x", TBDAILY_LOG="stderr", JOURNAL_STREAM="8:1")
        self.assertRegex(result.stderr.splitlines()[0], r"^<5>2026-11-24T09:07:04\.000000Z tbdaily\[\d+\] default: tbdaily started$")

    def test_internal_devices_report_everything(self):
        device = self.device(sample=True)
        answers = plistlib.loads(device.path("System/Device/answers.plist").read_bytes())
        device.record("answers", dict(answers, InternalBuild=True))
        device.run("-f", TBDAILY_LOG_DEBUG="1")
        (report,) = device.reports()
        for key in ("internal.assertions", "experiment.newKeyboard.uses", "location.fixes"):
            self.assertIn(key, report["TBScalars"])
        self.assertIn("display.brightness", report["TBDistributions"])
        self.assertIn("passing @{} for location.fixes as device is Velmora Internal", self.texts(device))

    def test_submission_switched_off(self):
        device = self.device(sample=True)
        device.preferences("com.velmora.Crashferry", {"DiagnosticLogSubmissionEnabled": 1})  # a number is no yes
        device.run("-d")
        self.assertEqual(device.reports(), [])
        self.assertEqual(device.preferences(JOB)["LastCrashLogSerializationDateInDaysSince1970"], YESTERDAY)
        self.assertNotIn("LastOSVersion", device.preferences(JOB))

    def test_os_updates_and_numbers_of_logs(self):
        device = self.device(sample=True)
        for version in ("1", "1", "2"):
            device.record("answers", {"ProductVersion": version})
            device.run("-f")
        metas = [plistlib.loads(p.read_bytes()) for p in device.pending(".193.meta.plist")]
        self.assertEqual([m.get("options") for m in metas],
                         [{"previous_os_version": "<unknown>"}, None, {"previous_os_version": "1"}])
        self.assertEqual([p.name[-6:] for p in device.pending()], ["-0.193", "-1.193", "-2.193"])

    def test_multi_user_device(self):
        device = self.device()
        device.record("answers", {"MultiUser": True, "GroupContainers": {"systemgroup.com.velmora.sysmetrics": "/group"}})
        device.allow(ScalarKeys={"k": {}})
        device.tally("record", "scalar", "k", "3", "--day", str(YESTERDAY))
        self.assertTrue(device.path("group/Library/Tallybook/TBDataStore.sqlitedb").exists())
        device.run("-f")
        self.assertEqual(device.reports()[0]["TBScalars"], {"k": 3})
        device.record("answers", {"MultiUser": True})
        device.run("-f")
        self.assertEqual(len(device.reports()), 1)

    def test_live_sources_answer_where_no_recording_does(self):
        device = self.device(live=True)
        device.path("System/Device/clock.plist").unlink()
        device.allow(ScalarKeys={"k": {}, "com.velmora.usage.cur_boot_session_cpu_uptime": {}, "com.velmora.kernel.swapusage": {},
                                 "com.velmora.kernel.memorystatus_thaw_count": {}})
        device.tally("record", "scalar", "k", "3")
        device.run("-t")
        scalars = device.reports()[0]["TBScalars"]
        with open("/proc/uptime") as uptime:
            minutes = float(uptime.read().split()[0]) / 60
        with open("/proc/meminfo") as memory:
            swap = next(int(line.split()[1]) for line in memory if line.startswith("SwapTotal")) * 1024
        self.assertEqual(scalars["com.velmora.kernel.memorystatus_thaw_count"], -1)
        self.assertLessEqual(scalars["com.velmora.usage.cur_boot_session_cpu_uptime"], minutes + 2)
        self.assertEqual(scalars["com.velmora.kernel.swapusage"], swap)


if __name__ == "__main__":
    unittest.main()
