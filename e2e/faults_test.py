"""The day's work with a fault at some of its calls, in each way that something goes wrong: scripts/faults in short."""

import unittest

import fault_runs

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


if __name__ == "__main__":
    unittest.main()
