"""tallyctl metrics on a device made by hand, against a model."""

import fcntl
import json
import os
import pathlib
import plistlib
import re
import select
import signal
import struct
import subprocess
import termios
import unittest

from harness import BIN, Device, open_terminal
from metrics_model import (CHANNELS, DISK, FAN, FOUND_OUT, HUB, NS, SECONDS, described, display, model, type_of)


class Metrics(unittest.TestCase):
    def setUp(self):
        self.device = Device()
        self.addCleanup(self.device.close)
        self.registry()
        self.hub(0)

    def registry(self, rows=CHANNELS, hubs=({},)):
        def legend_group(row):
            config = row[9] and struct.pack("<IIIi", row[9][0], 0, 0, len(row[9]))
            entry = {"KdReportGroupName": row[1], "KdReportSubGroupName": row[2],
                     "KdReportChannels": [[row[4], type_of(*row[5:8])] + [row[3]] * (row[3] is not None)],
                     "KdReportChannelInfo": present({"KdReportChannelUnit": row[8], "KdReportChannelConfig": config})}
            return present(entry)

        def present(entries):
            return {key: value for key, value in entries.items() if value is not None}
        # Channels without a group come last in the legend and first in the walk.
        ordered = sorted(rows, key=lambda row: row[1] is None)
        entries = [{"id": driver[1], "name": driver[0], "class": "Driver",
                    "properties": {"KdReportLegendPublic": True,
                                   "KdReportLegend": [legend_group(row) for row in ordered if row[0] == driver]}}
                   for driver in (FAN, DISK)]
        entries += [{"id": 3, "name": "hub", "class": "KdReportHub", "client": {"kind": "hub", **hub}} for hub in hubs]
        registry = plistlib.dumps({"entries": entries}, fmt=plistlib.FMT_BINARY)
        self.device.write("System/Device/registry.plist", registry)

    def hub(self, moment):
        place = self.device.record("next", {"channels": [
            {"driver": row[0][1], "channel": row[4], "type": type_of(*(row[5:8] if row[5] else FOUND_OUT)),
             "elements": [{"stamp": e[0], "words": list(e[1:])} for e in HUB[row[0:5:4]][moment]]}
            for row in CHANNELS if row[0:5:4] in HUB]})
        os.replace(place, self.device.path("System/Device/hub.plist"))

    def metrics(self, *arguments, **options):
        return self.device.tally("metrics", *arguments, **options)

    def start(self, *arguments):
        process = subprocess.Popen([BIN / "tallyctl", "metrics", *arguments], env=self.device.env, text=True,
                                   stdout=subprocess.PIPE, stderr=subprocess.PIPE)
        self.addCleanup(lambda: (process.kill(), process.communicate()))
        return process

    def wait_until_between_samples(self, process):
        place = pathlib.Path(f"/proc/{process.pid}")
        self.device.wait_for(lambda: "driver-metrics-hub" in (place / "maps").read_text()
                             and (place / "stat").read_text().split(") ")[1][0] == "S")

    def test_list_and_sample(self):
        self.assertEqual(json.loads(self.metrics("list", "--json")), [described(row, False) for row in CHANNELS])
        answer = json.loads(self.metrics("sample", "--json"))
        self.assertEqual(answer, model(0))
        self.assertEqual(list(answer[0]), list(model(0)[0]))  # the order of the keys
        text = self.metrics("list") + self.metrics("sample")
        for words in ((str(NS), str(SECONDS)), ("ns", "s"), (hex(NS), "s")):
            self.assertEqual(self.metrics("scale", "1500", *words), "1.5e-06\n")
        self.assertEqual(self.metrics("scale", "3", "MiB", "B"), "3145728\n")
        self.metrics("scale", "3", "parsecs", "B", status=2)
        for wanted in (r"\n    Rails\n +0xff +simple +ns +1 +element +categories 0x8001\n",
                       r"\ndisk\\x1b\[2J <id x <id 0x7f{15}>\n", r"\n +0xff +250 +ns\n",
                       r"\n +OFF +3 +3000000000 +ns +3\.00 s +75\.0% +<- current\n", r"\n +0 +10 +3 +1 +9 +12 +#+\n",
                       r"\n +\[0\] +1 +2 +- +4 +5 +0 +0 +0\n"):
            self.assertRegex(text, wanted)
        self.assertNotIn("\x1b", text)

    def test_delta(self):
        self.assertIn("because of fan <id 0x100000100>/Queue/Rails/format nine: unknown",
                      self.metrics("delta", "--interval", "0.01", status=1))
        rows = [row for row in CHANNELS if row[5] != 9]
        self.registry(rows)
        process = self.start("delta", "--interval", "2", "--json")
        self.wait_until_between_samples(process)
        self.hub(1)
        output, errors = process.communicate(timeout=60)
        self.assertEqual((process.returncode, errors), (0, ""))
        self.assertEqual(json.loads(output), model("delta", rows))
        process = self.start("delta", "--interval", "86400")
        self.wait_until_between_samples(process)
        process.send_signal(signal.SIGINT)
        self.assertRegex(process.communicate(timeout=60)[1], r"\A[^\n]*interrupted[^\n]*\n\Z")
        self.assertEqual(process.returncode, 1)

    def test_watch(self):
        plain = ("speeds=1,2,-,4,5,0,0,0  reads=9223372036854775807",
                 "speeds=2,-,7,4,4611686018427387904,0,0,0  reads=-9223372036854775807")
        for arguments, read, expected in (
                (["--json"], json.loads, [model(0), model(1)]),
                (["--unit", "0"], str, [f"2026-11-24T09:07:04.000Z  {line}\n" for line in plain])):
            self.hub(0)
            process = self.start("watch", "--interval", "0.7", "--count", "2", *arguments)
            self.assertEqual(read(process.stdout.readline()), expected[0])
            self.hub(1)
            self.assertEqual(read(process.stdout.readline()), expected[1])
            self.assertEqual((*process.communicate(timeout=60), process.returncode), ("", "", 0))
        for end in (lambda process: process.send_signal(signal.SIGTERM), lambda process: process.stdout.close()):
            process = self.start("watch", "--interval", "80000", "--describe", "--format", "simple")
            process.stdout.readline()
            end(process)
            self.assertEqual((process.wait(timeout=60), process.stderr.read()), (0, ""))

    def test_delta_for_people_has_what_changed(self):
        rows = [row for row in CHANNELS if row[5] != 9]
        self.registry(rows)
        process = self.start("delta", "--interval", "2")
        self.wait_until_between_samples(process)
        self.hub(1)
        output, errors = process.communicate(timeout=60)
        self.assertEqual((process.returncode, errors), (0, ""))
        for channel in model("delta", rows):
            if channel["format"] == 1 and channel["name"]:
                self.assertEqual(f" {channel['name']} " in output, bool(channel["value"]), (channel, output))
        self.assertRegex(output, r"\n\d+ of \d+ channels changed within 2\.\d* s\n\Z")

    def test_watch_on_a_screen(self):
        master, slave = open_terminal()
        self.addCleanup(os.close, master)
        watch = subprocess.Popen([BIN / "tallyctl", "metrics", "watch", "--interval", "0.1"], stdin=slave, stdout=slave,
                                 stderr=subprocess.PIPE, env=dict(self.device.env, TERM="xterm", LC_ALL="C.UTF-8"))
        self.addCleanup(lambda: (watch.kill(), watch.communicate()))
        os.close(slave)

        def sees(pattern, keys=b""):
            os.write(master, keys)
            shown = b""
            for height in range(20, 320):
                while select.select([master], [], [], 0.1)[0]:
                    shown += os.read(master, 65536)
                    if re.search(pattern, shown):
                        return shown
                # All of the screen is drawn anew in a window of another size.
                fcntl.ioctl(master, termios.TIOCSWINSZ, struct.pack("HHHH", height, 120, 0, 0))
                watch.send_signal(signal.SIGWINCH)
            return self.fail((pattern, shown[-4000:]))

        sees(rb"\x1b\[\?1049h")  # the alternate screen
        self.assertNotIn(b"\x1b[2J <id", sees(rb"disk\\x1b\[2J <id"))
        sees(rb"reads.*9223372036854775807 +9\.22 E")
        sees(rb"1-2 of 2", b"/READS\r")
        sees(rb"PAUSED", b" ")
        self.hub(1)
        sees(rb"reads.*-9223372036854775807", b" ")
        os.write(master, b"q")
        self.assertEqual(watch.wait(timeout=60), 0)
        self.assertIn(b"\x1b[?1049l", os.read(master, 65536))
        self.assertEqual(watch.stderr.read(), b"")

    def test_filters(self):
        for driver in (DISK[0], display(DISK), str(DISK[1]), hex(DISK[1])):
            self.check_names(["reads", "found out"], "--driver", driver)
        for words, wanted in (("--group Power --subgroup Rails", [0xFF, "not in the hub"]), ("--group power", []),
                              ("--subgroup Rails --format histogram", ["wait", "unbounded"]),
                              ("--format unknown", ["found out"]), ("--unit ns", ["COU", 0xFF, "wait"]),
                              ("--category 0x70012", ["COU", "not in the hub", "format nine", "reads"]),
                              (f"--unit {NS:#x} --category 256", ["wait"]),
                              ("--unit= --category 256", ["reads"])):
            self.check_names(wanted, *words.split())
        self.metrics("list", "--category", "x", status=2)

    def check_names(self, wanted, *filters):
        channels = json.loads(self.metrics("list", "--json", *filters))
        self.assertEqual([c["name"] or c["channelID"] for c in channels], wanted, filters)

    def test_daily_run_sets_simple_channels_of_its_category(self):
        self.device.run("-f")
        keys = {key: value for key, value in self.device.scalars().items() if "kdreport" in key}
        self.assertEqual(keys, {"com.velmora.kdreport." + c["name"]: c["value"] for c in model(0)
                                if c["format"] == 1 and c["categories"] & 0x100 and c["name"]})
        self.assertEqual(len(keys), 1)

    def test_failures_and_nothing(self):
        for status, reason in (("openStatus", "Could not open KdReportHub"),
                               ("configureStatus", "ConfigureInterests failed"), ("updateStatus", "sampled")):
            self.registry(hubs=({status: -536870206},))
            failure = self.metrics("watch", "--interval", "1", status=1)
            self.assertRegex(failure, reason + r".*\(0xe00002c2\) \(device root .*\)\n")
        self.registry(hubs=())
        self.assertIn("no metrics hub", self.metrics("sample", status=1))
        for rows, said in ((CHANNELS, "no channels match\n"), ([], "no driver publishes channels\n")):
            self.registry(rows, hubs=())
            for words in ("list", "sample", "delta --interval 9999", "watch --interval 9999"):
                arguments = [*words.split(), "--group", "none"]
                outputs = [self.metrics(*arguments, *more) for more in ([], ["--json"], ["--describe"])]
                self.assertEqual(outputs, [said, "[]\n", ""])


if __name__ == "__main__":
    unittest.main()
