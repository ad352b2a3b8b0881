"""What a store has kept of a drive's counters, as lines for `tallyctl record import`."""

from harness import TODAY


def wear_rows():
    """40 days, three of them missing and one without a counter, of another drive at first; what the sample device records today goes on
    from the last."""
    host, flash, cycles = 9_000_000_000, 20_000_000_000, 2_400
    for day in range(TODAY - 40, TODAY):
        if day == TODAY - 30:
            host, flash, cycles = 1_990_000_000, 5_010_000_000, 600
        written = 2_000_000 + 1_500_000 * (day * 7 % 5)
        host, flash, cycles = host + written, flash + written * (18 + day % 9) // 10, cycles + (day % 3 == 0)
        if day in (TODAY - 22, TODAY - 21, TODAY - 20):
            continue
        for name, value in (("NumLogicalWrites", host), ("NumPhysicalWrites", flash), ("HottestCycle", cycles)):
            if day != TODAY - 12 or name != "NumLogicalWrites":
                yield f"s\tcom.velmora.NANDInfo.{name}\t{day}\t{value}\n"
