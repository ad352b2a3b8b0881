"""The day's work with a fault at some of its calls, in each way that something goes wrong: scripts/faults in short."""

import subprocess
import unittest

import fault_runs
from harness import BIN

# Every so many points of a mode.
SAMPLES = {"memory": 120}
USUAL_SAMPLE = 8


class Faults(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.day = fault_runs.Day()
        cls.addClassCleanup(cls.day.close)

    def test_sampled_points(self):
        for mode in fault_runs.MODES:
            with self.subTest(mode):
                if fault_runs.MODES[mode].shim not in self.day.shims:
                    self.skipTest("the program does not start with the shim preloaded")
                tally = fault_runs.sweep(self.day, mode, SAMPLES.get(mode, USUAL_SAMPLE))
                self.assertEqual(tally.violations, [])
                self.assertGreater(tally.met, 10, "the shim does not reach the program")

    def test_a_preview_has_nothing_to_leave_behind(self):
        if "calls" not in self.day.shims:
            self.skipTest("the program does not start with the shim preloaded")
        device = self.day.copy()
        self.addCleanup(device.close)
        mark, temporary = device.base / "mark", device.base / "temporary"
        temporary.mkdir()
        environment = self.day.environment(device, self.day.shims["calls"], FAULT_MODE="kill", FAULT_AT="1",
                                           FAULT_MARK=str(mark), TMPDIR=str(temporary))
        subprocess.run([BIN / "tallyctl", "report", "--preview"], env=environment, check=True, capture_output=True)
        self.assertFalse(mark.exists(), "the preview changes files")


if __name__ == "__main__":
    unittest.main()
