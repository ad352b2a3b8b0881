"""What a fleet costs: bytes a report, rows a second loaded, and the time of the questions, in each engine of fleet/; then a week rolled.

The rows are those of real reports (build/fleet-demo/, which scripts/fleet-demo leaves) with other identifiers, devices and days, so that
their texts and figures are as varied as those; nothing is exported anew.

Usage: fleet_scale.py [REPORTS [ENGINE ...] [TABLE ...]]   (default: 100000, all of clickhouse, postgresql, duckdb, and all tables)"""

import datetime
import os
import pathlib
import random
import subprocess
import sys
import tempfile
import time
import uuid

TREE = pathlib.Path(__file__).resolve().parent.parent
sys.path.insert(0, str(TREE / "e2e"))
import fleet_engines  # noqa: E402
from fleet_engines import ClickHouseCluster, DuckDB, PostgreSQL  # noqa: E402

TABLES = ("reports", "scalars", "distributions", "histograms")
FIRST = datetime.date(2026, 1, 1)
DAYS = 100
KEY, SCALAR = "net.latency.wifi", "net.wifi.bytesIn"
WEEK = datetime.date(2026, 2, 2)  # a Monday whose week is whole
PLACES = {"clickhouse": ("default", "weeks"), "postgresql": ("public", "weeks")}
SIZES = {"clickhouse": "SELECT sum(bytes) AS bytes FROM system.parts WHERE active AND database = '{}'",
         "postgresql": "SELECT sum(pg_total_relation_size(c.oid)) AS bytes FROM pg_class AS c "
                       "JOIN pg_namespace AS n ON n.oid = c.relnamespace WHERE n.nspname = '{}' AND c.relkind = 'r'"}
QUERIES = (("scalar", SCALAR, "scalars"), ("distribution", KEY, "distributions"), ("histogram", KEY, "histograms"),
           ("quantiles", KEY, "histograms"))
ENGINES = {"clickhouse": ClickHouseCluster, "postgresql": PostgreSQL, "duckdb": DuckDB}


def real_rows(table):
    """The header, and the rows of each real report without identifier, device and day."""
    lines = (TREE / "build/fleet-demo" / f"{table}.tsv").read_text().splitlines()
    reports = {}
    for line in lines[1:]:
        identifier, _, _, rest = line.split("\t", 3)
        reports.setdefault(identifier, []).append(rest)
    return lines[0], list(reports.values())


def write_rows(table, count, place):
    """Rows of so many reports, a hundred days of each device; answers how many."""
    header, reports = real_rows(table)
    rows = 0
    draw = random.Random(1)  # identifiers as random as those of real reports, which is most of what a row takes
    with open(place, "w") as out:
        out.write(header + "\n")
        for number in range(count):
            device, day = divmod(number, DAYS)
            begin = f"{uuid.UUID(int=draw.getrandbits(128), version=4)}\tdevice-{device:06}\t{FIRST + datetime.timedelta(day)}\t"
            of_report = reports[number % len(reports)]
            out.writelines(f"{begin}{row}\n" for row in of_report)
            rows += len(of_report)
    return rows


def as_ndjson(source, place):
    """Texts and numbers as the export writes them."""
    numbers = {"value", "count", "minimum", "maximum", "mean", "m2", "finite", "lower", "upper"}
    with open(source) as rows, open(place, "w") as out:
        names = next(rows).rstrip("\n").split("\t")
        for row in rows:
            fields = zip(names, row.rstrip("\n").split("\t"))
            out.write("{" + ",".join(f'"{n}":{v}' if n in numbers and v.lstrip("-") not in ("inf", "nan") else f'"{n}":"{v}"'
                                     for n, v in fields) + "}\n")


def timed(work):
    begin = time.monotonic()
    answer = work()
    return time.monotonic() - begin, answer


def size_of(engine, tables, is_weeks=False):
    """Bytes on the disks; of DuckDB, which is in memory here, those of the days as Parquet files."""
    if engine.name == "duckdb":
        for table in tables:
            engine.ask("parquet", table=table, file=engine.folder / f"{table}.parquet")
        return sum(file.stat().st_size for file in engine.folder.glob("*.parquet"))
    sql = SIZES[engine.name].format(PLACES[engine.name][is_weeks])
    if engine.name == "clickhouse":
        return sum(int(engine.rows(sql, server)[0]["bytes"]) for server in engine.servers)
    return int(engine.rows(sql)[0]["bytes"])


def measure(name, count, folder, rows):
    with ENGINES[name]() as engine:
        engine.make_tables()
        seconds = 0
        for table in rows:
            file = folder / f"{table}.tsv"
            if engine.form == "ndjson":
                file = folder / f"{table}.ndjson"
                as_ndjson(folder / f"{table}.tsv", file)
            took, _ = timed(lambda file=file, table=table: engine.load(table, file))
            seconds += took
            print(f"  {name} {table}: {rows[table] / took:,.0f} rows a second", flush=True)
            if engine.form == "ndjson":
                file.unlink()
        span = {"first": FIRST, "last": FIRST + datetime.timedelta(DAYS - 1), "devices": 5}
        print(f"  {name} bytes a report: {size_of(engine, rows) / count:,.0f}; reports a second: {count / seconds:,.0f}")
        for query, key, table in QUERIES:
            if table not in rows:
                continue
            best = min(timed(lambda query=query, key=key: engine.ask(query, key=key, **span))[0] for _ in range(3))
            print(f"  {name} {query}: {best:.2f} s", flush=True)
        empty = size_of(engine, rows, True) if name in PLACES else 0
        took, _ = timed(lambda: engine.roll(WEEK))
        devices = count // DAYS
        said = f", bytes a device: {(size_of(engine, rows, True) - empty) / devices:,.0f}" if name in PLACES else ""
        print(f"  {name} week of {devices} devices rolled: {took:.1f} s{said}", flush=True)


def main(count, engines, tables):
    with tempfile.TemporaryDirectory(dir=TREE / "build") as place:
        folder = pathlib.Path(place)
        folder.chmod(0o755)
        rows = {table: write_rows(table, count, folder / f"{table}.tsv") for table in tables}
        print(f"{count} reports, rows: {rows}", flush=True)
        for name in engines:
            measure(name, count, folder, rows)


if __name__ == "__main__":
    os.environ.setdefault("NODE_PATH", str(TREE / "build/fleet/node_modules"))
    subprocess.run([TREE / "scripts/setup", "fleet"], check=True)
    fleet_engines.PATIENCE = 3600
    words = sys.argv[2:]
    main(int(sys.argv[1]) if len(sys.argv) > 1 else 100_000, [word for word in words if word in ENGINES] or list(ENGINES),
         [word for word in words if word in TABLES] or list(TABLES))
