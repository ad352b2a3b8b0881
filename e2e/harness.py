"""A device root of its own for one test, and the real programs that work on it."""

import datetime
import fcntl
import json
import os
import pathlib
import plistlib
import pty
import select
import shutil
import sqlite3
import struct
import subprocess
import tempfile
import termios
import time
import unittest

BIN = pathlib.Path(os.environ["TBDAILY_BIN"])
EPOCH = datetime.datetime(1970, 1, 1)
NOW = datetime.datetime(2026, 11, 24, 9, 7, 4)
TODAY = (NOW - EPOCH).days
YESTERDAY = TODAY - 1
NO_CONTROLLER = "Could not get matching KdKit service for exporting classes"  # said by each run without one
JOB = "com.velmora.tallyd.tbdaily"  # its preferences domain and its endpoint
LOGGING = JOB + ".logging"


def open_terminal():
    """Both ends of a pseudo terminal; a machine that has none (no /dev/pts) cannot run the test."""
    try:
        return pty.openpty()
    except OSError as error:
        raise unittest.SkipTest(f"no pseudo terminal: {error}") from error


def on_screen(device, words, columns, lines=0, **environment):
    """What tallyctl shows on a terminal of that size, without colours unless asked for; it ends with 0."""
    master, slave = open_terminal()
    fcntl.ioctl(slave, termios.TIOCSWINSZ, struct.pack("HHHH", lines, columns, 0, 0))
    shown = subprocess.Popen([BIN / "tallyctl", *words], stdin=slave, stdout=slave,
                             env=device.env | {"TERM": "xterm", "NO_COLOR": "1", "LC_ALL": "C.UTF-8"} | environment)
    os.close(slave)
    text = b""
    try:
        while select.select([master], [], [], 60)[0]:
            text += os.read(master, 65536)
    except OSError:  # nobody writes any more
        os.close(master)
    assert shown.wait(timeout=60) == 0, text
    return text.decode().replace("\r\n", "\n")


class Device:
    """Dependent on its recordings alone; the clock stands at NOW."""

    def __init__(self, sample=False, name="root", profile=None, value=False):
        """`sample` or a `profile`: as `tallyctl init` makes it; `value`: the scalar k, allowed, was 3 yesterday."""
        self.base = pathlib.Path(tempfile.mkdtemp(prefix="tbdaily-e2e-"))
        self.root = self.base / name
        self.root.mkdir(parents=True)
        self.env = dict(os.environ, TBDAILY_ROOT=str(self.root), TBDAILY_LIVE="0", TBDAILY_LOG_PRIVATE="show",
                        ASAN_OPTIONS="detect_leaks=1:exitcode=99",
                        UBSAN_OPTIONS="print_stacktrace=1")
        self.record("clock", {"now": NOW, "ticks": 3600000000000, "numerator": 125, "denominator": 3})
        self.record("usage", {"records": []})  # without one every run waits for a reply that never comes
        if sample or profile:
            self.path("System/Device/usage.plist").unlink()
            self.tally("init", *(["--profile", profile] if profile else []))
        if value:
            self.allow(ScalarKeys={"k": {}})
            self.record_scalar("k", 3)

    def close(self):
        shutil.rmtree(self.base, ignore_errors=True)

    def path(self, *parts):
        return self.root.joinpath(*parts)

    def write(self, relative, data):
        place = self.path(relative)
        place.parent.mkdir(parents=True, exist_ok=True)
        place.write_bytes(data if isinstance(data, bytes) else plistlib.dumps(data, sort_keys=False))
        return place

    def record(self, name, value):
        return self.write(f"System/Device/{name}.plist", value)

    def whitelist(self, value):
        return self.write("Library/Application Support/Tallybook/Whitelist_Nimbos.plist", value)

    def preferences(self, domain, values=None):
        relative = f"var/mobile/Library/Preferences/{domain}.plist"
        if values is not None:
            return self.write(relative, values)
        place = self.path(relative)
        return plistlib.loads(place.read_bytes()) if place.exists() else {}

    def last_day(self):
        return self.preferences(JOB).get("LastCrashLogSerializationDateInDaysSince1970")

    def allow(self, **tables):
        """Submission on, and one whitelist group with these tables."""
        self.preferences("com.velmora.Crashferry", {"DiagnosticLogSubmissionEnabled": True})
        self.whitelist({"G": tables})

    def record_scalar(self, key, value, day=YESTERDAY):
        self.tally("record", "scalar", key, str(value), "--day", str(day))

    @property
    def store_path(self):
        return self.path("var/mobile/Library/Tallybook/TBDataStore.sqlitedb")

    def store(self):
        return sqlite3.connect(f"file:{self.store_path}?mode=ro", uri=True)

    def scalars(self):
        """Every scalar of the store, summed over its days."""
        rows = "SELECT name, SUM(value) FROM scalars JOIN keys ON id = key_id GROUP BY name"
        return dict(self.store().execute(rows))

    def run(self, *arguments, **options):
        """The job; it must end with status 0 whatever happens."""
        result = subprocess.run([BIN / "tbdaily", *arguments], env=dict(self.env, **options), capture_output=True,
                                text=True, timeout=120)
        assert result.returncode == 0, (result.returncode, result.stderr)
        assert "runtime error" not in result.stderr and "Sanitizer" not in result.stderr, result.stderr
        return result

    def start(self):
        """The job in listener mode, once its endpoint is there."""
        job = subprocess.Popen([BIN / "tbdaily"], env=self.env, stderr=subprocess.PIPE, text=True)
        self.wait_for(lambda: "tbdaily started" in self.log() and self.socket_path.exists())
        return job

    @staticmethod
    def wait_for(condition, seconds=60):
        deadline = time.monotonic() + seconds
        while not condition():
            assert time.monotonic() < deadline, "waited in vain"
            time.sleep(0.02)

    def wait_until_watching(self, process):
        """Until `tallyctl wait` sees every post from now on."""
        files = pathlib.Path(f"/proc/{process.pid}/fd")
        self.wait_for(lambda: any("inotify" in os.readlink(file) for file in files.iterdir()))

    @property
    def socket_path(self):
        return self.path("var/run", JOB + ".sock")

    def tally(self, *arguments, status=0, stdin=None):
        result = subprocess.run([BIN / "tallyctl", *arguments], env=self.env, capture_output=True, text=True,
                                input=stdin, timeout=120)
        assert result.returncode == status, (arguments, result.returncode, result.stdout, result.stderr)
        if status != 0:
            assert len(result.stderr.splitlines()) == 1, result.stderr
        return result.stdout if status == 0 else result.stdout + result.stderr

    def tally_json(self, *arguments, status=0):
        return json.JSONDecoder().raw_decode(self.tally("--json", *arguments, status=status))[0]

    def log(self):
        place = self.path("var/log/tbdaily.log")
        return place.read_text(errors="replace") if place.exists() else ""

    def texts(self, *levels):
        """The messages of the log, or those of some levels."""
        lines = [line.split("] ", 1)[1].split(": ", 1) for line in self.log().splitlines() if "] " in line]
        return [message for level, message in lines if not levels or level in levels]

    def posts(self, name):
        """How often a notification was posted."""
        place = self.path("var/run/notifications", name)
        return int(place.read_text()) if place.exists() else 0

    def pending(self, suffix=".193"):
        return sorted(self.path("var/mobile/Library/Logs/Pending").glob("*" + suffix))

    def reports(self):
        return [plistlib.loads(place.read_bytes()) for place in self.pending()]

    def snapshot(self):
        """Every file of the root with its bytes."""
        return {str(p.relative_to(self.root)): p.read_bytes() for p in self.root.rglob("*") if p.is_file()}


class DeviceTest(unittest.TestCase):
    def device(self, **options):
        device = Device(**options)
        self.addCleanup(device.close)
        return device
