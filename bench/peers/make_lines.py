#!/usr/bin/env python3
"""Lines for `tallyctl record import`, and the same rows as the sqlite3 shell's .import takes them for the store's tables.

usage: make_lines.py FOLDER LINES

Half of the lines are scalars of ten days, half are values of distributions, a thousand each. The shell gets the keys'
numbers and the values' places in their rows beforehand, which `record import` finds out by itself.
"""

import pathlib
import random
import sys

DAY = 20780


def main():
    folder, lines = pathlib.Path(sys.argv[1]), int(sys.argv[2])
    folder.mkdir(parents=True, exist_ok=True)
    numbers = random.Random(DAY)
    scalar_keys, distribution_keys = lines // 20, lines // 2000
    with (open(folder / "lines.tsv", "w") as load, open(folder / "keys.tsv", "w") as keys,
          open(folder / "scalars.tsv", "w") as scalars, open(folder / "values.tsv", "w") as values):
        for number in range(1, scalar_keys + 1):
            key = f"com.velmora.subsystem{number % 300:03d}.counter.{number:06d}"
            keys.write(f"{number}\t{key}\n")
            for day in range(DAY - 9, DAY + 1):
                value = numbers.randrange(1_000_000)
                load.write(f"s\t{key}\t{day}\t{value}\n")
                scalars.write(f"{number}\t{day}\t{value}\n")
        for number in range(scalar_keys + 1, scalar_keys + distribution_keys + 1):
            key = f"com.velmora.latency.{number:06d}"
            keys.write(f"{number}\t{key}\n")
            for place in range(1000):
                seconds, value = numbers.randrange(86400), numbers.lognormvariate(5, 1.5)
                load.write(f"d\t{key}\t{DAY}\t{seconds}\t{value}\n")
                values.write(f"{number}\t{DAY}\t{place}\t{seconds}\t{value}\n")


if __name__ == "__main__":
    main()
