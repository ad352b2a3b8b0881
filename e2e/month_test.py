"""Days on a recorded clock: tasking and updates for a month, held against a state machine; network usage."""

import datetime
import plistlib
import subprocess
import unittest

from harness import BIN, EPOCH, JOB, NO_CONTROLLER, TODAY, DeviceTest

OWN = "com.velmora.sysmetrics.tbdaily"
CRASHFERRY = "com.velmora.Crashferry"


class TaskingModel:
    """Preferences by domain, and what a run does to them."""

    def __init__(self):
        self.domains, self.posts, self.submissions = {}, 0, 0

    def domain(self, name):
        return self.domains.setdefault(name, {})

    def run(self, today, build, scheduled):
        job = self.domain(JOB)
        last = job.get("LastOSUpdate")
        if build is not None and (last is None or last["version"] != build):
            last = job["LastOSUpdate"] = {"version": build, "day": today}
        if scheduled is None or "TaskingID" not in scheduled:
            return
        applied = (job.get("TaskingID"), job.get("TaskingOS"))
        if build is None or applied != (scheduled["TaskingID"], build):
            if "TaskingID" in job:
                for item in job.get("TaskingPayload", []):
                    self.domain(item["Domain"]).pop(item["Key"], None)
                for key in ("TaskingID", "TaskingDigest", "TaskingPayload"):
                    job.pop(key, None)
            if "TaskingPayload" in scheduled:
                for item in scheduled["TaskingPayload"]:
                    self.domain(item["Domain"])[item["Key"]] = item["Value"]
                job.update(TaskingID=scheduled["TaskingID"], TaskingDigest=scheduled["TaskingDigest"],
                           TaskingPayload=scheduled["TaskingPayload"])
                job["TaskingOS"] = build
                if build is None:
                    del job["TaskingOS"]
            self.posts += 1
        # A tasking that was applied in this run counts at once.
        if abs(today - (last["day"] if last else 0)) < self.domain("com.velmora.da").get("AggressiveSubmissionDays", 0):
            self.submissions += 1




def tasking(identifier, items, digest="d"):
    scheduled = {"TaskingID": identifier, "TaskingDigest": digest}
    if items is not None:
        scheduled["TaskingPayload"] = [{"Domain": d, "Key": k, "Value": v} for d, k, v in items]
    return scheduled


class Month(DeviceTest):
    def set_day(self, device, day, build):
        device.record("clock", {"now": EPOCH + datetime.timedelta(days=day, hours=3)})
        device.record("answers", {"ProductVersion": "1", **({"ProductBuildVersion": build} if build else {})})

    def test_tasking(self):
        device, model = self.device(), TaskingModel()
        first = tasking("one", [("com.velmora.da", "Group", False), ("org.example.a", "x", [1, {"y": b"z"}])])
        second = tasking("two", [("com.velmora.da", "AggressiveSubmissionDays", 3), ("org.example.b", "x", 2.5)])
        builds = ["A"] * 6 + ["B"] * 9 + [None] * 3 + ["B"] * 4 + ["C"] * 8
        for index, build in enumerate(builds):
            today = TODAY + index - (20 if index in (24, 25) else 0)  # on two days the clock is wrong
            scheduled = (None if index < 2 or index in (20, 21) else first if index < 5 else second if index < 12
                         else tasking("three", None) if index < 15 else second)
            crashferry = model.domains[CRASHFERRY] = {"DiagnosticLogSubmissionEnabled": False}
            if scheduled is not None:
                crashferry["ScheduledTasking"] = scheduled
            device.preferences(CRASHFERRY, crashferry)
            device.write("var/mobile/Library/Logs/Pending/waits.txt", b"to be submitted")
            self.set_day(device, today, build)
            model.run(today, build, scheduled)
            device.run("-f")
            for name, values in model.domains.items():
                self.assertEqual(device.preferences(name), values, (index, name))
            self.assertEqual(device.posts("com.velmora.da.tasking_changed"), model.posts, index)
            outbox = device.path("var/mobile/Library/Logs/Outbox").glob("*")
            self.assertEqual(len(list(outbox)), model.submissions, index)
        self.assertGreater(model.submissions, 4)
        self.assertGreater(model.posts, 5)

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
