"""The installed package: a program outside of this tree finds it, links it and samples channels."""

import json
import os
import pathlib
import subprocess
import tempfile
import unittest

BUILD = pathlib.Path(os.environ["TBDAILY_BUILD"])
EXAMPLE = pathlib.Path(__file__).resolve().parent.parent / "examples" / "sample_channels"


def run(*command, **options):
    done = subprocess.run([str(part) for part in command], capture_output=True, text=True, **options)
    assert done.returncode == 0, f"{command}: {done.stdout}{done.stderr}"
    return done.stdout


class InstalledPackage(unittest.TestCase):
    def test_example_builds_against_it_and_reads_what_the_companion_reads(self):
        with tempfile.TemporaryDirectory() as name:
            folder = pathlib.Path(name)
            prefix, device = folder / "prefix", folder / "device"
            run("cmake", "--install", BUILD, "--prefix", prefix)
            run("cmake", "-S", EXAMPLE, "-B", folder / "example", f"-DCMAKE_PREFIX_PATH={prefix}")
            run("cmake", "--build", folder / "example")
            device.mkdir()
            tallyctl = [prefix / "bin" / "tallyctl", "--root", device]
            run(*tallyctl, "init")
            printed = run(folder / "example" / "sample_channels", env={**os.environ, "TBDAILY_ROOT": str(device)})
            channels = json.loads(run(*tallyctl, "metrics", "sample", "--format", "simple", "--json"))
            self.assertGreater(len(channels), 5)
            expected = [f'{c["driver"]} {c["name"] or "?"} = {c["value"]} {c["unitLabel"] or ""}' for c in channels]
            self.assertCountEqual(printed.splitlines(), expected)


if __name__ == "__main__":
    unittest.main()
