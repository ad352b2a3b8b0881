"""tallyctl report: which report is shown, what of it, and what its keys went through."""

import math
import unittest

from harness import YESTERDAY, DeviceTest


class Report(DeviceTest):
    def test_a_report_is_chosen_by_day_and_its_keys_by_words(self):
        device = self.device(value=True)
        device.allow(ScalarKeys={"k": {}, "Net.Cell": {}}, DistributionKeys={"net.delay": {"intervals": [1, 5, 10]}})
        device.record_scalar("Net.Cell", 7)
        device.tally("record", "distribution", "net.delay", "0.5", "12", "--day", str(YESTERDAY))
        device.record_scalar("k", 1, day=YESTERDAY - 3)
        device.run("-f")
        job = device.start()
        device.tally("send", "run", str(YESTERDAY - 3))
        device.wait_for(lambda: len(device.pending()) == 2)
        job.kill()  # it would wait for more
        job.wait(timeout=60)
        both = {device.tally_json("report", "--day", day)["TBScalars"]["k"] for day in ("yesterday", str(YESTERDAY - 3))}
        self.assertEqual(both, {3, 1})
        self.assertIn("no report of 2026-11-01", device.tally("report", "--day", "2026-11-01", status=1))
        for words in (("net",), ("--day", "yesterday", "NET."), (str(device.pending()[0]), "net")):
            shown = device.tally_json("report", *words, *(() if "--day" in words or len(words) > 1 else ("--day", "yesterday")))
            self.assertEqual((shown["TBScalars"], list(shown["TBDistributions"])), ({"Net.Cell": 7}, ["net.delay"]), words)
        self.assertIn("nothing.like.it", device.tally("report", "nothing.like.it", status=1))
        text = device.tally("report", str(device.pending()[0]))
        self.assertIn(f"file              {device.pending()[0]}\n", text)
        # One key's figures stand together, and what lies between two buckets is drawn.
        self.assertRegex(text, r"\n  net\.delay +2 .*\n +\(-inf, 1\] +1  #+\n +\(1, 10\] +0\n +\(10, inf\) +1  #+\n")

    def test_a_preview_says_what_else_would_leave(self):
        device = self.device(sample=True)
        device.write("var/mobile/Library/Logs/Structured/176/2026-11-20.jsonl", b"{}\n")
        text = device.tally("report", "--preview", "power")
        self.assertTrue(text.startswith("Preview of the daily report of 2026-11-23"))
        for line in ("Submission is on", "StorageStatus, a log of type 165", "Structured/176/2026-11-20.jsonl"):
            self.assertIn(line, text)
        device.run("-f")
        written = {place.name for place in device.pending("")}
        text = device.tally("report", "--preview", "power")
        self.assertNotIn("a log of type 165", text)  # not within seven days
        for name in written:
            if not name.endswith(".meta.plist"):
                self.assertIn("Pending/" + name, text)
        device.tally("consent", "off")
        self.assertIn("Submission is off", device.tally("report", "--preview", "power"))

    def test_what_was_recorded_stands_beside_what_is_reported(self):
        device = self.device(sample=True)
        device.run("-f")
        report, rows = device.tally_json("report"), device.tally_json("report", "--raw")["keys"]
        reported = {row["key"]: row for row in rows if row["reason"] is None}
        self.assertEqual({row["key"]: row["reported"] for row in reported.values() if row["kind"] == "scalar"}, report["TBScalars"])
        stored = dict(device.store().execute("SELECT name, value FROM scalars JOIN keys ON id = key_id WHERE day = ?", (YESTERDAY,)))
        for row in rows:
            if row["kind"] == "scalar" and row["recorded"] is not None:
                self.assertEqual(row["recorded"], stored[row["key"]], row)
        self.assertEqual(reported["app.launches.org.example.weather"]["rule"], "bucket_interval 5")
        kept = {row["key"]: row["reason"] for row in rows if row["reason"]}
        self.assertEqual((kept["internal.assertions"], kept["experiment.newKeyboard.uses"]),
                         ("the whitelist does not have it", "the group Experiments is switched off"))
        self.assertEqual(set(stored), {row["key"] for row in rows if row["kind"] == "scalar" and row["recorded"] is not None})
        device.allow(ScalarKeys={"k": {}})
        self.assertIn("another whitelist", device.tally("report", "--raw", status=1))

    def test_how_much_a_report_tells_is_bounded(self):
        device = self.device()
        device.allow(ScalarKeys={"free": {}, "tenth": {"bucket_interval": 10**18}, "one": {"sig_fig": 1}},
                     DistributionKeys={"few": {}, "many": {}})
        for key in ("free", "tenth", "one"):
            device.record_scalar(key, 7)
        for key, values in (("few", "1 2 3 4"), ("many", "1 2 3 4 5")):
            device.tally("record", "distribution", key, *values.split(), "--day", str(YESTERDAY))
        answer = device.tally_json("report", "--preview", "--identifiability")
        keys = {entry["key"]: entry for entry in answer["keys"]}
        self.assertEqual({key: entry["values"] for key, entry in keys.items()},
                         {"free": None, "tenth": 19, "one": 343, "few": None, "many": None})
        self.assertAlmostEqual(keys["one"]["bits"], math.log2(343))
        self.assertEqual([key for key, entry in keys.items() if entry["followsValues"]], ["few"])
        root = device.tally_json("report", "--preview")
        self.assertEqual(set(answer["outside"]),
                         set(root) - {"TBScalars", "TBDistributions", "TBDistributionsHistogram", "TBMetadata"} | set(root["TBMetadata"]))


if __name__ == "__main__":
    unittest.main()
