"""What each command prints with --json holds its schema, and each schema is that of a command."""

import json
import pathlib
import subprocess
import unittest

import jsonschema

from harness import BIN, LOGGING, Device

SCHEMAS = {file.name.removesuffix(".schema.json"): json.loads(file.read_text())
           for file in (pathlib.Path(__file__).resolve().parent.parent / "packaging/schemas").iterdir()}
TASKING = {"TaskingID": "t", "TaskingDigest": "d", "TaskingPayload": []}
# Of what the sample device answers: words, and the schema where the words are not its name.
COMMANDS = [
    ("record scalar k 3",), ("record distribution d 1 2.5 nan",), ("record import {lines}",), ("record prune --before -9 --dry-run",),
    ("report",), ("report --raw", "report-raw"), ("report --preview --identifiability", "report-identifiability"), ("plist {report}",), ("tasking show",), ("tasking schedule {tasking}",), ("tasking clear",), ("usage show",),
    ("nand",), ("nand --explain HottestCycle", "nand-explain"), ("stats",), ("buffer stats -o {out}",), ("snapshots",), ("wear",), ("wear --history", "wear-history"),
    ("capture --only locale --replace",), ("metrics list",), ("metrics sample",), ("metrics delta --interval 0.01",),
    ("metrics watch --interval 1 --count 1",), ("metrics scale 1 0x0100007600000000 0x0100000000000000",), ("metrics advance",),
    ("metrics --explain disk.busyTime", "metrics-explain"), ("whitelist check cloud.syncErrors none",), ("status",),
    ("consent show",), ("consent off",), ("consent on",), ("group show",), ("group off Power",), ("group on Power",),
    ("spool show",), ("spool prune --keep-days 0",)]


class Schemas(unittest.TestCase):
    def test_each_command_keeps_its_promise(self):
        device = Device(sample=True)
        self.addCleanup(device.close)
        device.env["TBDAILY_LIVE"] = "1"
        device.run("-f")
        (report,) = device.pending()
        files = {"report": report, "out": device.base / "out", "lines": device.base / "lines", "tasking": device.base / "tasking"}
        files["lines"].write_text("s\tk\t20000\t1\n")
        files["tasking"].write_text(json.dumps(TASKING))
        waiting = subprocess.Popen([BIN / "tallyctl", "--json", "wait", LOGGING, "--timeout", "60"], env=device.env,
                                   stdout=subprocess.PIPE, text=True)
        device.wait_until_watching(waiting)
        job = device.start()
        answers = {"send-logging-status": device.tally_json("send", "logging-status"), "send-run": device.tally_json("send", "run", "0"),
                   "send-app-info": json.loads(device.tally("--json", "send", "app-info", "-", stdin="[]"))}
        job.wait(timeout=60)
        answers["wait"] = json.loads(waiting.communicate(timeout=60)[0])
        fresh = Device(name="fresh")
        self.addCleanup(fresh.close)
        fresh.path("System/Device/usage.plist").unlink()
        answers["init"] = fresh.tally_json("init")
        for words, *name in COMMANDS:
            words = [word.format(**files) for word in words.split()]
            words_of_command = [word for word in words if word.isalpha() or "-" in word[1:-1] and word[0] != "-"]
            name = name[0] if name else next(n for n in ("-".join(words_of_command[:2]), words_of_command[0]) if n in SCHEMAS)
            self.assertNotIn(name, answers)
            answers[name] = device.tally_json(*words)
        self.assertEqual(set(answers), set(SCHEMAS))
        for name, answer in answers.items():
            jsonschema.validators.validator_for(SCHEMAS[name]).check_schema(SCHEMAS[name])
            jsonschema.validate(answer, SCHEMAS[name])
        self.assertTrue(answers["metrics-sample"] and answers["stats"]["stats"] and answers["report"]["TBScalars"])
        with self.assertRaises(jsonschema.ValidationError):
            jsonschema.validate({**answers["status"], "ok": "yes"}, SCHEMAS["status"])


if __name__ == "__main__":
    unittest.main()
