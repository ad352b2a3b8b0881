"""Days on a recorded clock: tasking, updates and network usage, and what each day leaves behind."""

import datetime
import plistlib
import subprocess
import unittest

from harness import BIN, EPOCH, JOB, NO_CONTROLLER, TODAY, DeviceTest

OWN = "com.velmora.sysmetrics.tbdaily"
CRASHFERRY = "com.velmora.Crashferry"


def tasking(identifier, items, digest="d"):
    scheduled = {"TaskingID": identifier, "TaskingDigest": digest}
    if items is not None:
        scheduled["TaskingPayload"] = [{"Domain": d, "Key": k, "Value": v} for d, k, v in items]
    return scheduled


class Days(DeviceTest):
    def set_day(self, device, day, build):
        device.record("clock", {"now": EPOCH + datetime.timedelta(days=day, hours=3)})
        device.record("answers", {"ProductVersion": "1", **({"ProductBuildVersion": build} if build else {})})

    def test_tasking(self):
        device = self.device()
        items = [("com.velmora.da", "AggressiveSubmissionDays", 2), ("org.example.a", "x", [1, {"y": b"z"}])]
        one, other = tasking("one", items), tasking("two", [("org.example.b", "x", 2.5)])
        applied = {"com.velmora.da": {"AggressiveSubmissionDays": 2}, "org.example.a": {"x": [1, {"y": b"z"}]}}
        # Day, build, what is scheduled: preferences, tasking and its build, day of the update, posts and submissions so far.
        for day, build, scheduled, preferences, known, updated, posts, submissions in (
                (0, "A", None, {}, (None, None), 0, 0, 0),
                (1, "A", one, applied, ("one", "A"), 0, 1, 1),
                (2, "A", one, applied, ("one", "A"), 0, 1, 1),  # the two days are over
                (3, "B", one, applied, ("one", "B"), 3, 2, 2),  # again, for the new build
                (2, "B", None, applied, ("one", "B"), 3, 2, 2),  # nothing is scheduled
                (2, "B", one, applied, ("one", "B"), 3, 2, 3),  # the clock was set back
                (4, None, one, applied, ("one", None), 3, 3, 4),  # no build is known: applied each time
                (5, None, other, {"org.example.b": {"x": 2.5}}, ("two", None), 3, 4, 4),
                (6, "B", other, {"org.example.b": {"x": 2.5}}, ("two", "B"), 3, 5, 4),
                (7, "B", tasking("three", None), {}, (None, "B"), 3, 6, 4)):
            with self.subTest(day=day, build=build):
                device.preferences(CRASHFERRY, {"DiagnosticLogSubmissionEnabled": False,
                                                **({"ScheduledTasking": scheduled} if scheduled else {})})
                device.write("var/mobile/Library/Logs/Pending/waits.txt", b"to be submitted")
                self.set_day(device, TODAY + day, build)
                device.run("-f")
                for domain in applied.keys() | {"org.example.b"}:
                    self.assertEqual(device.preferences(domain), preferences.get(domain, {}), domain)
                job = device.preferences(JOB)
                self.assertEqual((job.get("TaskingID"), job.get("TaskingOS")), known)
                self.assertEqual(job["LastOSUpdate"]["day"], TODAY + updated)
                self.assertEqual(device.posts("com.velmora.da.tasking_changed"), posts)
                outbox = device.path("var/mobile/Library/Logs/Outbox").glob("*")
                self.assertEqual(len(list(outbox)), submissions)

    def test_large_tasking(self):
        device = self.device()
        items = [("../escape", "k", 1)] + [("ok.domain", f"key{i}", i) for i in range(100000)]
        for scheduled, kept in ((tasking("big", items), 100000), (tasking("small", []), 0)):
            device.preferences(CRASHFERRY, {"ScheduledTasking": scheduled})
            device.run("-f")
            self.assertEqual(len(device.preferences("ok.domain")), kept)
        self.assertEqual(list(device.base.rglob("escape*")), [])

    def test_usage(self):
        device = self.device()
        began = EPOCH + datetime.timedelta(days=TODAY, hours=1)
        app = {"bundleName": "org.example.app", "since": began}
        daemon = {"procName": "d", "since": began - datetime.timedelta(days=3)}
        later = dict(app, since=began + datetime.timedelta(days=3))
        keys = {}
        for index, (records, changes) in enumerate((
                ([dict(app, wifiInBytes=5000, wwanOutBytes=1023), dict(daemon, wifiOutBytes=5000)],
                 {"wifiInKB.org.example.app": 4, "olddata.com.velmora.d": 1}),
                ([dict(daemon, wifiOutBytes=7048), dict(app, wifiInBytes=4999, wwanOutBytes=3071)],
                 {"baddata.org.example.app": 1, "wwanOutKB.org.example.app": 2, "wifiOutKB.com.velmora.d": 2}),
                ([dict(app, wifiInBytes=9095, wwanOutBytes=3071)], {"wifiInKB.org.example.app": 8}),
                ([dict(later, wifiInBytes=1024), dict(daemon, wifiOutBytes=9000)],  # one anew, one that was forgotten
                 {"wifiInKB.org.example.app": 9, "olddata.com.velmora.d": 2}))):
            known = device.preferences(OWN).get("netUsageBaseline", {})
            self.set_day(device, TODAY + index, "A")
            device.record("usage", {"records": records, "delay": 0.01})
            self.assertEqual(device.tally_json("usage", "show")["baseline"].keys(), known.keys())
            device.run("-f")
            keys.update(changes)
            self.assertEqual({k: v for k, v in device.scalars().items() if "datausage" in k},
                             {"datausage." + k: v for k, v in keys.items()}, index)
            self.assertEqual(device.preferences(OWN)["netUsageBaseline"], {
                record.get("bundleName", "d"): [record["since"], *(record.get(f, 0) for f in (
                    "wifiInBytes", "wifiOutBytes", "wwanInBytes", "wwanOutBytes"))] for record in records})

    def test_a_pending_reply_does_not_hold_the_job_up(self):
        device = self.device()
        device.record("usage", {"records": [], "delay": 3600})
        job = subprocess.Popen([BIN / "tbdaily", "-f"], env=device.env, stderr=subprocess.PIPE)
        errors = job.communicate(timeout=60)[1].decode()
        self.assertEqual((job.returncode, set(errors.splitlines())), (0, {NO_CONTROLLER}))
        self.assertIn("Netwatch timed out, no datausage available", device.log())
        self.assertEqual(device.preferences(OWN), {})

    def test_tool(self):
        device = self.device()
        place = device.base / "tasking.plist"
        for malformed, reason in (({}, "TaskingID"), ({"TaskingID": "x", "Tasking": 1}, "no entry"),
                                  (tasking("x", [("../x", "k", 1)]), "item 1")):
            place.write_bytes(plistlib.dumps(malformed))
            self.assertIn(reason, device.tally("tasking", "schedule", str(place), status=1))
        self.assertEqual(device.preferences(CRASHFERRY), {})
        scheduled = tasking("x", [("com.velmora.da", "AggressiveSubmissionDays", 3)])
        place.write_bytes(plistlib.dumps(scheduled))
        device.tally("tasking", "schedule", str(place))
        self.set_day(device, TODAY, "A")
        device.run("-f")
        self.set_day(device, TODAY + 1, "A")
        self.assertEqual(device.tally_json("tasking", "show"), {
            "scheduled": scheduled,
            "applied": {"id": "x", "os": "A", "digest": "d", "payload": scheduled["TaskingPayload"]},
            "lastOSUpdate": {"version": "A", "day": TODAY}, "aggressiveDays": 3, "aggressiveDaysLeft": 2})
        device.tally("tasking", "clear")
        self.assertIsNone(device.tally_json("tasking", "show")["scheduled"])
