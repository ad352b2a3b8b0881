"""What people look at, whole, on screens of 80 and of 200 columns: held against the files of golden/.

After a change that is meant, TBDAILY_GOLDEN=store writes them anew; look at them before they are committed."""

import os
import pathlib
import unittest

from harness import TODAY, Device, on_screen

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


def wear_rows():
    """40 days, three of them missing, of another drive at first; the run adds the sample device's figures for today."""
    host, flash, cycles = 9_000_000_000, 20_000_000_000, 2_400
    for day in range(TODAY - 40, TODAY):
        if day == TODAY - 30:
            host, flash, cycles = 1_990_000_000, 5_010_000_000, 600
        written = 2_000_000 + 1_500_000 * (day * 7 % 5)
        host, flash, cycles = host + written, flash + written * (18 + day % 9) // 10, cycles + (day % 3 == 0)
        if day in (TODAY - 22, TODAY - 21, TODAY - 20):
            continue
        for name, value in (("NumLogicalWrites", host), ("NumPhysicalWrites", flash), ("HottestCycle", cycles)):
            yield f"s\tcom.velmora.NANDInfo.{name}\t{day}\t{value}\n"


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
