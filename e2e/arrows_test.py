"""scripts/check-arrows: finds nothing in the tree as it is, and each wrong include that is planted in a copy of it."""

import pathlib
import shutil
import subprocess
import tempfile
import unittest

TREE = pathlib.Path(__file__).resolve().parent.parent
FOLDERS = ("platform", "report", "storage", "drivermetrics", "driver", "tools", "testing", "bench", "fuzz")

# A file, an include that it must not have, and what is said of it.
WRONG = [
    ("report/scalar_rounding.cc", '"storage/stats_context.h"', "which report does not list"),
    ("report/tb_report.h", '"driver/environment_probes.h"', "which report does not list"),
    ("drivermetrics/samples.cc", '"platform/linux/host.h"', "which drivermetrics does not list"),
    ("driver/daily_tasks.cc", '"platform/linux/linux_platform.h"', "which driver does not list"),
    ("platform/plist_value.cc", '"platform/plist/codec.h"', "which platform does not list"),
    ("platform/linux/file_io.cc", '"platform/linux/store/store_file.h"', "which platform_linux_base does not list"),
    ("platform/linux/store/store_file.cc", '"platform/linux/replay/recordings.h"', "which platform_store does not list"),
    ("storage/stats_parser.cc", '"storage/storage_test_support.h"', "is for tests"),
    ("storage/stats_parser.cc", "<sqlite3.h>", "no header of the C++ standard library"),
    ("tools/tallyctl/sample/history.cc", '"tools/tallyctl/commands/none.h"', "belongs to no library"),
]


def problems_of(root):
    run = subprocess.run([TREE / "scripts/check-arrows", root], capture_output=True, text=True, check=False)
    return run.returncode, run.stdout


class Arrows(unittest.TestCase):
    def test_the_tree_as_it_is(self):
        self.assertEqual(problems_of(TREE), (0, ""))

    def test_each_wrong_include_is_found(self):
        with tempfile.TemporaryDirectory() as folder:
            root = pathlib.Path(folder)
            for name in FOLDERS:
                shutil.copytree(TREE / name, root / name)
            for path, include, said in WRONG:
                with self.subTest(path=path, include=include):
                    file = root / path
                    before = file.read_text()
                    file.write_text(before + f"#include {include}\n")
                    status, output = problems_of(root)
                    file.write_text(before)
                    self.assertEqual((status, output.count("\n")), (1, 1), output)
                    self.assertTrue(output.startswith(path + ": ") and said in output, output)
