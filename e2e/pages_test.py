"""What the pages tell to type is typed, on a fresh device; what needs root or a service manager is typed by test-service."""

import pathlib
import re
import shlex
import subprocess
import unittest

from harness import BIN, LOGGING, DeviceTest

TREE = pathlib.Path(__file__).resolve().parent.parent
# Placeholders and times of the pages, and what stands for them here.
INSTEAD = [(r"\[--day DAY\]", "--day yesterday"), (r"\bDAY\b", "yesterday"), (r"\bROOT\b", "{root}"), (r"^sudo ", ""),
           (r"app-info FILE", "app-info {apps}"), (r"\bFILE\b", "{report}"), (r"--interval \d+", "--interval 0.1"),
           (r"--count \d+", "--count 2"), (r"(watch --interval 0.1)$", r"\1 --count 2"), (r"\bhour.jsonl", "{base}/hour.jsonl"),
           (r"\b(report|wear)\.html", r"{base}/\1.html"), (r"-o (\w+\.\w+)", r"-o {base}/\1"),
           (r"--to laptop", "--to {base}/laptop")]


def commands(page):
    """The lines of fenced blocks that begin with the companion."""
    found, inside = [], False
    for line in (TREE / page).read_text().splitlines():
        inside ^= line.startswith("```")
        if inside and re.match(r"(\$ |sudo )?tallyctl ", line):
            found.append(re.sub(r"\s+#.*", "", line).removeprefix("$ "))
    return found


class Pages(DeviceTest):
    def test_each_command_of_the_pages_does_what_it_is_told(self):
        device = self.device(sample=True)
        device.run("-f")
        apps = device.base / "apps.json"
        apps.write_text("[]")
        names = {"root": device.root, "report": device.pending()[0], "apps": apps, "base": device.base}
        names = {name: shlex.quote(str(place)) for name, place in names.items()}
        listed = [line for page in ("README.md", "docs/operations.md", "docs/privacy.md") for line in commands(page)]
        self.assertGreater(len(listed), 20)
        environment = dict(device.env, PATH=f"{BIN}:/usr/bin:/bin", TBDAILY_LIVE="1", root=str(device.root))
        for line in listed:
            typed = line
            for pattern, instead in INSTEAD:
                typed = re.sub(pattern, instead, typed)
            typed = typed.format(**names)
            if LOGGING in typed:
                # Somebody waits before the job is told.
                waiting = subprocess.Popen(["sh", "-c", "exec " + typed], env=environment, stdout=subprocess.PIPE)
                device.wait_until_watching(waiting)
                job = device.start()
                device.tally("send", "logging-status")
                self.assertEqual((waiting.wait(timeout=60), waiting.communicate()[1]), (0, None), line)
                job.wait(timeout=60)
                continue
            job = device.start() if "send " in typed else None
            done = subprocess.run(["sh", "-c", typed], env=environment, capture_output=True, text=True, timeout=120)
            self.assertEqual(done.returncode, 0, (line, done.stderr))
            if job:  # it would wait for more
                job.kill()
                job.wait(timeout=60)

    def test_the_messages_that_are_explained_are_those_of_the_programs(self):
        listed = subprocess.run([TREE / "scripts/sources"], cwd=TREE, capture_output=True, text=True, check=True).stdout.split()
        code = " ".join((TREE / file).read_text() for file in listed if not file.endswith("_test.cc"))
        code = re.sub(r'"\s*"', "", code).replace('\\"', '"')
        explained = 0
        for line in (TREE / "docs/operations.md").read_text().split("\n## Messages\n")[1].split("\n## ")[0].splitlines():
            row = re.match(r"\| (?:\w+ \| )?(.*?) \|", line)
            for message in re.findall(r"`([^`]+)`", row[1] if row else ""):
                # What stands between the placeholders; the longest of it, since the rest may be put together.
                fixed = max(re.split(r"\b[A-Z]{2,}\b|\b[NM]\b|\.\.\.|@\{\}|[\":,()]|requested|\w*\d+", message), key=len).strip()
                explained += 1
                self.assertTrue(fixed in code, message)
        self.assertGreater(explained, 60)


if __name__ == "__main__":
    unittest.main()
