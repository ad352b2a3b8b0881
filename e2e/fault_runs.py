"""The day's work with a fault at its n-th call, and what must hold after it.

A `Day` is a sample device with a few things more, and what a run without faults makes of it. `Day.case(mode, n)` copies
that device, has the job meet the fault, looks at what it left, has a run without faults follow, and looks again.
"""

import collections
import contextlib
import itertools
import json
import multiprocessing
import os
import pathlib
import plistlib
import re
import shutil
import sqlite3
import subprocess
import tempfile
import time
from xml.etree import ElementTree

from fault_storage import Storage
from harness import BIN, JOB, TODAY, Device

KILLED = 77
SECONDS = 60  # after which a run counts as hanging
OWN = "com.velmora.sysmetrics.tbdaily"
DAY_KEY = "LastCrashLogSerializationDateInDaysSince1970"
TASKING_VALUES = "com.velmora.da"
UNWRITTEN = "TaskingUnwritten"  # settings that wait for the next run
SPOOL = "var/mobile/Library/Logs"
META = ".meta.plist"
BATCH = 32  # runs that are under way before the first one's outcome counts

Mode = collections.namedtuple("Mode", "name shim fault")
# The process ends; power: what was not forced to storage is lost; torn: names reach storage by themselves, contents
# only when they are forced.
ENDING = ("killed", "power", "torn")
MODES = {mode.name: mode for mode in (
    Mode("killed", "calls", "kill"), Mode("error", "calls", "error"), Mode("full", "calls", "full"),
    Mode("short", "calls", "short"), Mode("unreadable", "calls", "unreadable"), Mode("power", "calls", "kill"),
    Mode("torn", "calls", "kill"), Mode("memory", "memory", None))}
SHIMS = {"calls": os.environ.get("TBDAILY_FAULT_SHIM"), "memory": os.environ.get("TBDAILY_FAULT_MEMORY_SHIM")}

Outcome = collections.namedtuple("Outcome", "met runs violation")
if os.access("/dev/shm", os.W_OK):
    tempfile.tempdir = "/dev/shm"


class Violation(Exception):
    pass


def require(condition, *what):
    if not condition:
        raise Violation(" ".join(str(part) for part in what))


# ---- What a device holds

def preferences(device):
    """{domain: {key: its value as text}}; the dates keep fractions that plistlib does not read."""
    domains = {}
    for place in device.path("var/mobile/Library/Preferences").glob("*.plist"):
        try:
            entries = list(ElementTree.fromstring(place.read_bytes())[0])
        except (ElementTree.ParseError, IndexError) as failure:
            raise Violation(f"{place.name} does not parse: {failure}")
        texts = [re.sub(r"\s+", " ", ElementTree.tostring(entry, encoding="unicode")).strip() for entry in entries[1::2]]
        domains[place.name[:-len(".plist")]] = dict(zip((key.text for key in entries[::2]), texts))
    return domains


@contextlib.contextmanager
def opened_store(device):
    """A copy: an onlooker must not recover the device's own."""
    with tempfile.TemporaryDirectory(prefix="tbdaily-store-") as folder:
        copy = pathlib.Path(folder, "store")
        shutil.copyfile(device.store_path, copy)
        log = device.store_path.with_name(device.store_path.name + "-wal")
        if log.exists():
            shutil.copyfile(log, copy.with_name("store-wal"))
        connection = sqlite3.connect(f"file:{copy}", uri=True)
        try:
            yield connection
        finally:
            connection.close()


def today_scalars(connection):
    return dict(connection.execute("SELECT name, value FROM scalars JOIN keys ON id = key_id WHERE day = ?", (TODAY,)))


def usage_of(scalars):
    return {key: value for key, value in scalars.items() if key.startswith("datausage.")}


def logs(device):
    """{path: bytes} of all logs that wait, were withheld or were handed over, with what describes them."""
    folders = [device.path(SPOOL, "Pending"), device.path(SPOOL, "Withheld"), *device.path(SPOOL, "Outbox").glob("*")]
    return {str(place): place.read_bytes() for folder in folders for place in folder.glob("*")}


def reports(found):
    """{the log's id: bytes}"""
    return {plistlib.loads(found[path + META])["id"]: contents for path, contents in found.items()
            if path.endswith(".193") and path + META in found}


def report_of(contents):
    report = plistlib.loads(contents)
    del report["TBLogCreationDate"]
    return {**report.pop("TBScalars"), **report}


def structured_lines(device, found):
    lines = collections.Counter()
    places = {str(place): place.read_bytes() for place in device.path(SPOOL, "Structured").rglob("*.jsonl")}
    for name, contents in {**places, **found}.items():
        if not name.endswith(".jsonl"):
            continue
        require(contents[-1:] in (b"", b"\n"), name, "ends in half a line")
        for line in contents.splitlines():
            json.loads(line)
            lines[line] += 1
    return lines


State = collections.namedtuple("State", "preferences logs lines scalars")


class Day:
    """The sample device before its day, and after it."""

    def __init__(self):
        self.sample = Device(sample=True)
        self._add_earlier_days()
        self.shims = {name: place for name, place in SHIMS.items() if place and self._starts_with(place)}
        self.before = self.state(self.copy())
        first = self.copy()
        states, self.reports = [self.before], []
        for flag in ("-d", "-f"):
            first.run(flag)
            states.append(self.state(first))
            self.reports.append(self._new_report(*states[-2:]))
        # What a run reports that follows one which came to the withdrawal of the tasking and no further.
        between = self.copy()
        between.preferences(JOB, {})
        between.run("-f")
        self.reports.append(self._new_report(self.before, self.state(between)))
        for device in (first, between):
            device.close()
        self.after = states[1]
        self.usage = usage_of(self.after.scalars)
        self.values = self._allowed_values(states)

    def close(self):
        self.sample.close()

    def _add_earlier_days(self):
        device = self.sample
        device.write(f"{SPOOL}/Structured/176/2026-11-22.jsonl",
                     b'{"time": "2026-11-22T09:07:04.000Z", "data": {"id": 1}}\n')
        device.write(f"{SPOOL}/Carewell/session.log", b"session\n")
        device.write(f"{SPOOL}/Carewell/session.log.1", b"the one before\n")
        old = {"TaskingID": "earlier", "TaskingOS": "4N117",
               "TaskingPayload": [{"Domain": TASKING_VALUES, "Key": "Withdrawn", "Value": True}]}
        device.preferences(JOB, old)
        device.preferences(TASKING_VALUES, {"Experiments": False, "Withdrawn": True, "AggressiveSubmissionDays": 2})
        name = f"{SPOOL}/Pending/log-tallyd-2026-11-22-090704-0.193"
        device.write(name, {"TBScalars": {}})
        device.write(name + ".meta.plist", {"type": "193", "name": "log-tallyd", "id": "an earlier one"})

    def _starts_with(self, shim):
        """Not under a sanitizer, which wants to be first."""
        try:
            probe = subprocess.run([BIN / "tbdaily", "-x"], env=self.environment(self.sample, shim), capture_output=True,
                                   timeout=SECONDS)
        except subprocess.TimeoutExpired:
            return False
        finally:
            shutil.rmtree(self.sample.path("var/log"), ignore_errors=True)
        return probe.returncode == 0

    @staticmethod
    def environment(device, shim, **more):
        return dict(device.env, LD_PRELOAD=shim, ASAN_OPTIONS=device.env["ASAN_OPTIONS"] + ":verify_asan_link_order=0",
                    **more)

    def copy(self):
        def link_or_copy(source, place):  # the job only reads what is under System/
            (os.link if "/System/" in source else shutil.copy2)(source, place)
        device = Device.__new__(Device)
        device.base = pathlib.Path(tempfile.mkdtemp(prefix="tbdaily-e2e-"))
        device.root = device.base / "root"
        device.env = dict(self.sample.env, TBDAILY_ROOT=str(device.root))
        shutil.copytree(self.sample.root, device.root, copy_function=link_or_copy)
        return device

    def state(self, device):
        found = logs(device)
        with opened_store(device) as store:
            require(store.execute("PRAGMA integrity_check").fetchall() == [("ok",)], "the store is damaged")
            require(store.execute("PRAGMA user_version").fetchone() == (1,), "the store's version is another one")
            store.execute("ATTACH ? AS earlier", (f"file:{self.sample.store_path}?mode=ro&immutable=1",))
            for table in ("keys", "scalars", "distribution_values"):
                lost = store.execute(f"SELECT COUNT(*) FROM (SELECT * FROM earlier.{table} EXCEPT SELECT * FROM {table})")
                require(lost.fetchone() == (0,), "rows of the table", table, "are lost")
            scalars = today_scalars(store)
        return State(preferences(device), found, structured_lines(device, found), scalars)

    @staticmethod
    def _new_report(before, after, whence="the run"):
        earlier, found = reports(before.logs), reports(after.logs)
        new = [contents for name, contents in found.items() if name not in earlier]
        require(len(new) == 1, whence, "made", len(new), "reports")
        return report_of(new[0])

    def _allowed_values(self, states):
        """{domain: {key: the values that a run may leave}}; None is none."""
        values = collections.defaultdict(lambda: collections.defaultdict(set))
        every = [state.preferences for state in states]
        for domain, key in {(d, k) for each in every for d in each for k in each[d]}:
            values[domain][key] = {each.get(domain, {}).get(key) for each in every}
            if key.startswith("Tasking"):
                values[domain][key].add(None)  # between the withdrawal of a tasking and the next one
        # Where a recording cannot be read, the host answers as one without it.
        values[JOB]["LastOSVersion"].add("<string />")
        values[OWN]["SSLastLoggedAt"].add("<date>1970-01-01T00:00:00Z</date>")
        return values

    # ---- One case

    def points(self, mode, every_request=False):
        """The numbers of the calls that may go wrong: all, until a run meets none; memory: those of a way of its own."""
        if mode != "memory" or every_request:
            return itertools.count(1)
        device = self.copy()
        try:
            sites = device.base / "sites"
            environment = self.environment(device, self.shims["memory"], FAULT_SITES=str(sites))
            subprocess.run([BIN / "tbdaily", "-d"], env=environment, capture_output=True, timeout=SECONDS, check=True)
            return [int(line) for line in sites.read_text().split()]
        finally:
            device.close()

    def case(self, mode, at):
        device = self.copy()
        try:
            return self._case(device, MODES[mode], at)
        finally:
            device.close()

    def _case(self, device, mode, at):
        mark, journal = device.base / "mark", device.base / "journal"
        environment = self.environment(device, self.shims[mode.shim], FAULT_AT=str(at), FAULT_MARK=str(mark))
        if mode.fault:
            environment["FAULT_MODE"] = mode.fault
        if mode.name in ("power", "torn"):
            journal.mkdir()
            environment["FAULT_JOURNAL"] = str(journal)
            storage = Storage(device.root, self.sample.root)
        try:
            result = subprocess.run([BIN / "tbdaily", "-d"], env=environment, capture_output=True, text=True,
                                    errors="replace", timeout=SECONDS)
        except subprocess.TimeoutExpired:
            return Outcome(True, 1, "the run hangs")
        if not mark.exists():
            return Outcome(False, 1, None)
        place = mark.read_text().split("\n")[0].replace(str(device.root), "")
        try:
            expected = KILLED if mode.name in ENDING else 0
            require(result.returncode == expected, "exit status", result.returncode, result.stderr)
            if mode.name in ("power", "torn"):
                storage.cut_power(journal, names_survive=mode.name == "torn")
            state = self.state(device)
            self._check_fault(device, mode, state, result)
            device.run("-f" if DAY_KEY in state.preferences.get(JOB, {}) else "-d")
            self._check_follower(device, mode, state)
            return Outcome(True, 2, None)
        except (Violation, AssertionError, OSError, ValueError, sqlite3.Error, subprocess.TimeoutExpired) as failure:
            return Outcome(True, 2, f"{failure} [{place}] {result.stderr.strip()}")

    def _check_fault(self, device, mode, state, result):
        self._check_preferences(state)
        self._check_logs(state, may_be_cut=mode.name in ENDING)
        self._check_usage(mode, state)
        if mode.name in ENDING:
            if DAY_KEY in state.preferences.get(JOB, {}):
                self._check_complete(state)
            return
        log = device.log()
        if "daily tasks for day" not in log:
            return
        require("the run ended early" not in result.stderr, "an exception left its step:", result.stderr)
        if mode.name == "memory" and "tasking could not be finished" not in log:
            require(state.preferences[JOB].get("TaskingID") == self.after.preferences[JOB]["TaskingID"] or result.stderr,
                    "no tasking, and no word of it")

    def _check_preferences(self, state):
        for domain, values in self.before.preferences.items():
            require(domain in state.preferences, "the preferences", domain, "are gone")
        for domain, allowed in self.values.items():
            for key, values in allowed.items():
                value = state.preferences.get(domain, {}).get(key)
                require(value in values, domain, key, "is neither old nor new:", value)
        odd = {(d, k) for d in state.preferences for k in state.preferences[d]
               if k not in self.values.get(d, {}) and k != UNWRITTEN}
        require(not odd, "nobody set", odd)

    def _check_logs(self, state, may_be_cut):
        earlier, found = reports(self.before.logs), reports(state.logs)
        require(all(found.get(name) == contents for name, contents in earlier.items()), "an earlier report is gone")
        require(all(line in state.lines for line in self.before.lines), "earlier structured data is gone")
        for path, contents in state.logs.items():
            name = os.path.basename(path)
            if name.startswith(".tmp-") or name.endswith(".jsonl"):
                continue
            if name.endswith(META):
                plistlib.loads(contents)
                require(may_be_cut or path[:-len(META)] in state.logs, name, "has no log")
                continue
            require(path + META in state.logs, name, "is not described")
            require(contents, name, "is empty")
            if name.endswith(".193"):
                plistlib.loads(contents)

    def _check_usage(self, mode, state):
        """Increments are never behind the baseline that follows from them."""
        usage = usage_of(state.scalars)
        require(usage in ({}, self.usage) or mode.name == "unreadable", "a part of the usage was stored")
        if "netUsageBaseline" in state.preferences.get(OWN, {}):
            require(usage == self.usage, "the usage is lost: there is a baseline, and no increments")

    def _check_complete(self, state):
        self._new_report(self.before, state, "the day counts as done, and")
        require(state.preferences == self.after.preferences, "the day counts as done, its preferences are not")
        missing = {key: value for key, value in self.after.scalars.items() if state.scalars.get(key) != value}
        require(not missing, "the day counts as done, its figures are not stored:", missing)
        require(state.lines == self.after.lines, "the day counts as done, its structured data is not stored")

    def _check_follower(self, device, mode, state):
        final = self.state(device)
        self._check_preferences(final)
        self._check_logs(final, may_be_cut=False)
        report = self._new_report(state, final, "the next run")
        odd = [(key, report.get(key)) for key in {**report, **self.reports[0]}
               if all(report.get(key) != expected.get(key) for expected in self.reports)]
        require(not odd, "the next report says", odd)
        require(UNWRITTEN not in final.preferences[JOB], "the next run did not make up", final.preferences[JOB].get(UNWRITTEN))
        free = {(JOB, DAY_KEY)}
        if mode.name == "unreadable":  # a tasking whose record could not be read is not withdrawn
            free.add((TASKING_VALUES, "Withdrawn"))
        for domain, key in {(d, k) for d in self.values for k in self.values[d]} - free:
            value = final.preferences.get(domain, {}).get(key)
            require(value == self.after.preferences.get(domain, {}).get(key), "after the next run", domain, key, "is", value)
        left = [place for place in device.root.rglob("*") if ".tmp-" in place.name or ".damaged-" in place.name]
        require(not left, "left behind:", left)
        # Counted twice where the cut fell between the increments and the baseline, else once.
        once = "netUsageBaseline" in state.preferences.get(OWN, {}) or not usage_of(state.scalars)
        usage = usage_of(final.scalars)
        expected = self.usage if once else {key: 2 * value for key, value in self.usage.items()}
        require(usage == expected, "usage was", "not counted once" if once else "not counted twice after a cut")
        missing = {key: value for key, value in self.after.scalars.items()
                   if key not in self.usage and final.scalars.get(key) != value}
        require(not missing, "figures of the next run are missing:", missing)


# ---- Many cases

def taken(points, sample):
    return itertools.islice(points, 0, None, sample)


_day = None  # of the worker processes, which are forked


def _case(argument):
    return _day.case(*argument)


class Tally:
    def __init__(self, mode):
        self.mode, self.met, self.runs, self.violations, self.seconds = mode, 0, 0, [], 0.0

    def row(self):
        return f"| {self.mode} | {self.met} | {self.runs} | {len(self.violations)} | {self.seconds:.0f} |"


TABLE_HEAD = "| mode | points | runs | violations | seconds |\n|---|---|---|---|---|"


def sweep(day, mode, sample=1, at=None, every_request=False, processes=None):
    """Every `sample`-th point of a mode, or the one that is named."""
    global _day
    _day = day
    tally, start = Tally(mode), time.monotonic()
    points = iter([at]) if at else taken(day.points(mode, every_request), sample)
    with multiprocessing.get_context("fork").Pool(processes or os.cpu_count()) as pool:
        while batch := list(itertools.islice(points, 1 if at else BATCH)):
            outcomes = pool.map(_case, [(mode, n) for n in batch], chunksize=1)
            for n, outcome in zip(batch, outcomes):
                tally.runs += outcome.runs
                tally.met += outcome.met
                if outcome.violation:
                    tally.violations.append((n, outcome.violation))
            if mode != "memory" and not all(outcome.met for outcome in outcomes):
                break
            if mode == "memory" and not any(outcome.met for outcome in outcomes):
                break
    tally.seconds = time.monotonic() - start
    return tally
