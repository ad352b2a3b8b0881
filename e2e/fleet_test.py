"""The queries of fleet/ in the engines themselves, over what the real tallyctl exports, against exact fractions."""

import contextlib
import datetime
import itertools
import math
import os
import pathlib
import plistlib
import random
import shutil
import subprocess
import sys
import tempfile
import unittest
import uuid

import fleet_model
from fleet_engines import FLEET, ClickHouseCluster, DuckDB, EngineError, PostgreSQL, filled, said_by
from fleet_model import Report

TALLYCTL = pathlib.Path(os.environ["TBDAILY_BIN"]) / "tallyctl"
TABLES = ("reports", "scalars", "distributions", "histograms")
ODD = "a\tb'c\\d\"e`{{first}}\nü$$--\\."  # a key, and a device
MOST = 2 ** 63 - 1
EVER = {"first": "0001-01-01", "last": "9999-12-31"}
INF, NAN = math.inf, math.nan
# The columns of each query, its parameter, and what it is asked about.
QUESTIONS = {
    "scalar": ("devices reports mean stddev minimum maximum device_mean device_stddev", "key", ("plain.used", ODD, "far", "near")),
    "distribution": ("devices reports count mean stddev minimum maximum device_mean device_stddev left_out", "key",
                     ("offset", ODD, "constant", "large", "small", "poisoned")),
    "histogram": ("whitelist_digest lower upper count share", "key", ("offset", ODD)),
    "quantiles": ("whitelist_digest quantile estimate", "key", ("offset", ODD)),
    "keys": ("kind key devices reports", "prefix", ("", "plain.", ODD[:5])),
    "drift": ("kind week devices devices_before device_mean device_mean_before change", "key", ("plain.used", "offset", ODD, "poisoned")),
}


def made_reports():
    """Some dozen devices' reports: each device has its own level, as devices do."""
    draw = random.Random(16)
    reports = []
    for number in range(14):
        device = ODD if number == 3 else "" if number == 4 else f"d{number:02}"
        for offset in draw.sample(range(30), 5):
            day = str(datetime.date(2026, 11, 24) - datetime.timedelta(offset))
            level = draw.randrange(3, 9) + number
            at, n = 1e9 + level + draw.random(), draw.randrange(1, 40)
            scalars = {"plain.used": level, ODD: -level, "far": draw.choice([MOST, -MOST - 1, MOST - level]), "near": MOST - level}
            distributions = {
                "offset": [at - 1, at + 1, at, n * draw.random(), n],
                ODD: [-1.0, 1.0, draw.random() - 0.25, 2.0, 8],
                "constant": [0.1, 0.1, 0.1, 0.0, n],
                "large": [-1e99, 1e99, draw.choice([1e99, -9e98]), 1e98, MOST - n],
                "small": [1e-300, 4e-200, draw.choice([1e-200, 3e-200, 1e-300]), draw.choice([1e-300, 0.0]), n],
                "poisoned": draw.choice([[0.0, 1.0, 0.5, 1e280, n], [NAN, NAN, NAN, NAN, n], [-INF, INF, 0.0, INF, n],
                                         [0.0, 2.0, level / 9, 0.25, n], [0.0, 0.0, 0.0, 0.0, 0]]),
            }
            widths = [(-INF, 0.0), (0.0, 0.1), (0.1, 2.5), (2.5, INF)] if number % 3 else [(0.0, 1.0), (1.0, 1e3)]
            histograms = {"offset": {bounds: draw.randrange(1, 9) for bounds in draw.sample(widths, 2)}, "empty": {},
                          ODD: {bounds: MOST - level for bounds in widths if number % 2}}
            reports.append(Report(str(uuid.UUID(int=draw.getrandbits(128))), device, day, f"{number % 3 and 1:032x}", scalars, distributions,
                                  histograms))
    for number, day in enumerate(("0001-01-01", "1970-01-01", "2199-12-31", "9999-12-31")):  # clocks that went astray
        reports.append(Report(f"no UUID but a text that is longer than one: {ODD}{number}", "d01", day, "0" * 32, {"plain.used": number}))
    reports[0].scalars["alone"] = 1
    return reports


def number_text(value):
    return "inf" if value == INF else "-inf" if value == -INF else repr(value)


def written(base, report, device, name):
    """A report's file, below a device's root or without one."""
    folder = base / device / "var/mobile/Library/Logs/Pending" if device else base
    folder.mkdir(parents=True, exist_ok=True)
    file = folder / f"log-tallyd-{name}.193"
    labels = {key: {f"({number_text(low)}, {number_text(high)}]": count for (low, high), count in entries.items()}
              for key, entries in report.histograms.items()}
    start = datetime.datetime.fromisoformat(report.day)
    text = plistlib.dumps({"TBCrashLogVersion": 1, "TBStartDate": start, "TBWhitelistDigest": report.digest, "TBTaskID": ODD, "TBMetadata": {},
                           "TBScalars": report.scalars, "TBDistributions": report.distributions, "TBDistributionsHistogram": labels})
    file.write_bytes(text)
    file.with_name(file.name + ".meta.plist").write_bytes(plistlib.dumps({"id": report.identifier}))
    return file


class Engines(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        stack = contextlib.ExitStack()
        cls.addClassCleanup(stack.close)
        cls.base = pathlib.Path(tempfile.mkdtemp(prefix="tbdaily-fleet-"))
        stack.callback(shutil.rmtree, cls.base, ignore_errors=True)
        cls.reports = made_reports()
        files = [written(cls.base, report, report.device, f"{number:03}") for number, report in enumerate(cls.reports)]
        # Copies: in the folder of a device whose name comes later, in none, and of a report without a device in the folder of one.
        copies = [written(cls.base, report, device, f"copy{number}")
                  for number, (report, device) in enumerate(((cls.reports[5], "z"), (cls.reports[6], ""), (cls.reports[22], "d04")))]
        cls.reports[22].device = "d04"
        loads = copies, files, files[3:30] + copies + files[40:50]
        cls.engines = [stack.enter_context(engine()) for engine in (ClickHouseCluster, PostgreSQL)]
        if pathlib.Path(os.environ.get("NODE_PATH", ""), "@duckdb/node-api").exists():
            cls.engines.append(stack.enter_context(DuckDB()))
        for engine in cls.engines:
            engine.make_tables()
            engine.make_tables()
        for number, (table, names) in enumerate((table, names) for table in TABLES for names in loads):
            for form in ("tsv", "ndjson"):
                rows = cls.base / f"{number} {ODD.splitlines()[0]}.{form}"
                said_by([TALLYCTL, "export", "--table", table, "--format", form, "-o", rows, *names])
                for engine in cls.engines:
                    if engine.form == form:
                        engine.load(table, rows)

    def agrees(self, engine, query, subject, devices=1, first="0001-01-01", last="9999-12-31"):
        """The engine's rows are those of the model: counts and texts exactly, what is measured within 1e-9 of it."""
        columns, parameter, _ = QUESTIONS[query]
        reports = [report for report in self.reports if first <= report.day <= last]
        expected = getattr(fleet_model, query)(reports, subject, devices)
        rows = engine.ask(query, first=first, last=last, devices=devices, **{parameter: subject})
        said = f"{engine.name} {query} {subject} {first} {last} {devices}\n{rows}\n{expected}"
        self.assertEqual(len(rows), len(expected), said)
        for row, wanted in zip(rows, expected):
            self.assertEqual(list(row), columns.split(), said)
            for column, value in wanted.items():
                if isinstance(value, (int, str)):
                    self.assertEqual(row[column], str(value), f"{column} {said}")
                elif column in ("lower", "upper"):
                    self.assertEqual(float(row[column]), value, f"{column} {said}")
                else:
                    size = abs(wanted["device_mean"]) if column == "change" else abs(value)  # of what it is the difference of
                    self.assertLessEqual(abs(float(row[column]) - value), 1e-9 * size, f"{column} {said}")
        return expected

    def everywhere(self, *queries, whole=EVER, part={"first": "2026-11-03", "last": "2026-11-16"}):
        """Each subject of a query over all days and over a part of them; whether each has rows where all are asked for."""
        for engine, query in itertools.product(self.engines, queries):
            for subject in QUESTIONS[query][2]:
                with self.subTest(engine=engine.name, query=query, subject=subject):
                    self.assertTrue(self.agrees(engine, query, subject, **whole))
                    self.agrees(engine, query, subject, devices=2, **part)
                    self.assertFalse(self.agrees(engine, query, subject, devices=99, **whole))
                    self.assertFalse(self.agrees(engine, query, subject + "none", devices=0, **whole))

    def test_scalars(self):
        self.everywhere("scalar")
        for engine in self.engines:
            self.assertFalse(self.agrees(engine, "scalar", "alone", devices=2))

    def test_distributions(self):
        self.everywhere("distribution")

    def test_histograms_and_quantiles(self):
        self.everywhere("histogram", "quantiles")
        for engine in self.engines:
            self.assertFalse(self.agrees(engine, "histogram", "empty"))

    def test_keys_and_drift(self):
        self.everywhere("keys", "drift")

    def test_weeks_answer_as_their_days_did(self):  # by its name the last one: the days are gone after it
        mondays = [datetime.date(2026, 10, 26) + datetime.timedelta(7 * number) for number in range(5)]
        for engine in self.engines:
            for monday in mondays + mondays[1:3]:
                engine.roll(monday)
            with self.assertRaisesRegex(EngineError, "no Monday"):
                engine.roll("2026-11-17")
            engine.drop_days(TABLES)
            with self.assertRaisesRegex(EngineError, "days are gone"):
                engine.roll(mondays[2])
            engine.weeks = True
            # Devices whose buckets fit into 32 bits, which ClickHouse asks for: a row a week.
            rolled = engine.rows("SELECT count(DISTINCT report_id) AS n FROM weeks.reports WHERE device IN ('d00', 'd02', 'd06', 'd08')")
            self.assertEqual(rolled, [{"n": str(len({(r.device, datetime.date.fromisoformat(r.day).isocalendar()[:2]) for r in self.reports
                                                     if r.device in ("d00", "d02", "d06", "d08")}))}])
        self.everywhere(*QUESTIONS, whole={"first": "2026-10-26", "last": "2026-11-29"}, part={"first": "2026-11-02", "last": "2026-11-15"})

    def test_server_that_is_missing_is_named_in_place_of_half_an_answer(self):
        cluster = self.engines[0]
        for server in cluster.servers:
            self.assertGreater(int(cluster.said("SELECT uniqExact(report_id) FROM scalars_local", server)), 20)
        cluster.stop_server(1)
        try:
            for query in ("scalar", "distribution", "histogram", "quantiles", "drift", "keys"):
                sql = filled(cluster.name, query, **{"prefix" if query == "keys" else "key": "plain.used"}, devices=1, **EVER)
                for words in ([], ["--skip_unavailable_shards=1"]):  # whatever somebody set
                    with self.assertRaisesRegex(EngineError, f"127.0.0.1:{cluster.ports[1][0]}"):
                        cluster.said(sql, words=words)
        finally:
            self.assertTrue(cluster.start_server(1))
        self.agrees(cluster, "scalar", "plain.used")

    def test_any_text_is_a_value(self):
        texts = [ODD, "'; DROP TABLE scalars; --", "\\", "\\'", '"', "", "{{y}}", "\r\n\b\f\v\x01\x7f", ":key :'key' ?1 {x:String}", "ñ漢🙂"]
        for engine in self.engines:
            (self.base / engine.name).mkdir(exist_ok=True)
            file = self.base / engine.name / "text.sql"
            mark = "`" if engine.name == "clickhouse" else '"'
            name = f"{mark}{{{{y}}}}{mark}"
            file.write_text(f"SELECT {name} AS z, 1 AS one FROM (SELECT {{{{x}}}} AS {name}) AS t")
            for text in texts:
                sql = said_by([FLEET / "fill", file, f"x={text}", f"y={text or 'empty'}"])
                self.assertEqual(engine.rows(sql), [{"z": text, "one": "1"}])


class Filling(unittest.TestCase):
    def test_what_is_not_filled_exactly_is_refused_in_one_line(self):
        scalar, load = FLEET / "duckdb/scalar.sql", FLEET / "postgresql/load.sql"
        given = ["key=k", "first=f", "last=l", "devices=1"]
        outside = pathlib.Path(tempfile.mkdtemp()) / "x.sql"
        self.addCleanup(shutil.rmtree, outside.parent)
        outside.write_text("SELECT 1")
        for words, reason in ((["fleet/none"], "none"), ([FLEET / "duckdb/none.sql"], "read"), ([outside], "engine"),
                              ([scalar, *given[1:]], "key has no value"), ([scalar, *given, "more=1"], "more is no parameter"),
                              ([scalar, *given, "key=again"], "twice"), ([scalar, *given[1:], "key"], "NAME=VALUE"),
                              ([scalar, *given[1:], b"key=\xff"], "UTF-8"), ([load, "table="], "empty"), ([], "no file")):
            done = subprocess.run([FLEET / "fill", *words], capture_output=True, text=True)
            self.assertEqual((done.returncode, done.stdout, len(done.stderr.splitlines())), (2, "", 1), done.stderr)
            self.assertIn(reason, done.stderr)


if __name__ == "__main__":
    unittest.main(argv=[sys.argv[0], "-v", *sys.argv[1:]])
