"""What people look at, whole, on screens of 80 and of 200 columns: held against the files of golden/.

After a change that is meant, TBDAILY_GOLDEN=store writes them anew; look at them before they are committed."""

import os
import pathlib
import unittest

from harness import Device, on_screen
from wear_days import wear_rows

GOLDEN = pathlib.Path(__file__).resolve().parent / "golden"
VIEWS = {
    "report": ("report", "weather", "net.", "power"),
    "report-preview": ("report", "--preview", "weather"),
    "report-raw": ("report", "--raw", "weather", "experiment", "battery"),
    "report-identifiability": ("report", "--identifiability", "launches", "radio"),
    "wear": ("wear",),
    "wear-history": ("wear", "--history", "--endurance", "3000"),
    "nand": ("nand", "BandsMinTemp", "wear", "host"),
    "nand-explain": ("nand", "--explain", "Temperature"),
    "usage": ("usage", "show"),
}


class Views(unittest.TestCase):
    def test_each_view_is_the_golden_one(self):
        device = Device(sample=True)
        self.addCleanup(device.close)
        device.run("-f")
        device.tally("record", "import", "-", stdin="".join(wear_rows()))
        for columns in (80, 200):
            for name, words in VIEWS.items():
                shown = on_screen(device, words, columns).replace(str(device.root), "/DEVICE")
                place = GOLDEN / f"{name}.{columns}.txt"
                if os.environ.get("TBDAILY_GOLDEN") == "store":
                    place.write_text(shown)
                self.assertEqual(shown, place.read_text(), place.name)
                widest = max(len(line) for line in shown.splitlines() if "/DEVICE" not in line)
                self.assertLessEqual(widest, columns, place.name)


if __name__ == "__main__":
    unittest.main()
