"""The listening job and its peers, tame and hostile.

Each case needs a job that ends after ten quiet seconds, so the cases run at once.
"""

import concurrent.futures
import os
import plistlib
import socket
import struct
import subprocess
import time
import unittest
import uuid

from harness import BIN, LOGGING, TODAY, Device, DeviceTest

APP = {"bundle_id": "org.example.chess", "version": "1.2", "kestrel_id": -7, "arch": 2,
       "uuid": uuid.UUID("00112233-4455-6677-8899-aabbccddeeff").bytes}


def frame(message, binary=False):
    data = message if isinstance(message, bytes) else plistlib.dumps(
        message, fmt=plistlib.FMT_BINARY if binary else plistlib.FMT_XML)
    return struct.pack("<I", len(data)) + data


class Case:
    """A device with a value for yesterday, a listening job, and peers."""

    def __init__(self, name="root"):
        self.device = Device(name=name, value=True)
        self.device.record_scalar("k", 3, 5)
        self.job = self.device.start()

    def peer(self):
        peer = socket.socket(socket.AF_UNIX)
        folder = os.open(self.device.socket_path.parent, os.O_PATH)
        peer.connect(f"/proc/self/fd/{folder}/{self.device.socket_path.name}")
        os.close(folder)
        return peer

    def send(self, data):
        with self.peer() as peer:
            peer.sendall(data)

    def end(self):
        """The job's error output, once it has ended by itself."""
        _, errors = self.job.communicate(timeout=120)
        assert self.job.returncode == 0, (self.job.returncode, errors)
        assert "runtime error" not in errors and "Sanitizer" not in errors, errors
        assert not self.device.socket_path.exists()
        return errors


def app_info_on_request(case):
    waiter = subprocess.Popen([BIN / "tallyctl", "wait", LOGGING, "--timeout", "20"], env=case.device.env,
                              stdout=subprocess.PIPE)
    time.sleep(0.3)
    case.device.tally("send", "app-info", "-", stdin="[]")
    case.device.tally("send", "logging-status")
    assert b"1 posts" in waiter.communicate(timeout=30)[0] and waiter.returncode == 0
    apps = case.device.base / "apps.plist"
    apps.write_bytes(plistlib.dumps([APP]))
    case.device.tally("send", "app-info", str(apps))
    case.device.wait_for(lambda: case.device.reports())
    case.device.tally("send", "logging-status")  # the guard is used up
    case.end()
    assert case.device.posts(LOGGING) == 1 and len(case.device.reports()) == 1, case.device.log()
    assert case.device.reports()[0]["TBActivatedAppInfo"] == [
        {"bundle": "org.example.chess", "version": "1.2", "kestrelID": -7, "arch": 2,
         "uuid": "00112233-4455-6677-8899-AABBCCDDEEFF"}]
    assert "tbdaily got (unsolicited -- so ignoring) AAI:" in case.device.texts(), case.device.log()
    assert "tbdaily got requestedAAI:" in case.device.texts(), case.device.log()


def hostile_frames(case):
    slow = case.peer()
    slow.sendall(frame({"operation": 1, "value": 5})[:7])
    for data in (struct.pack("<I", (16 << 20) + 1), struct.pack("<I", 0), frame([1, 2]), frame(b"rubbish"),
                 frame(b"bplist00" + b"\xff" * 40), frame({"operation": 77})[:-1]):
        case.send(data)
    odd = {"operation": 2, "app_data": ["x", dict(APP, arch="2"), dict(APP, uuid=b"short"), APP]}
    case.send(frame({"operation": 0}) + frame(odd, binary=True))
    case.device.wait_for(lambda: "notified of logging status" in case.device.log())
    slow.sendall(frame({"operation": 1, "value": 5})[7:])  # a whole message in the end, and too late for the guard
    case.device.wait_for(lambda: case.device.reports())
    slow.close()
    errors = case.end()
    assert "longer than 16 MiB" in errors and "no dictionary" in errors and "left in the middle" in errors, errors
    assert len(case.device.reports()[0]["TBActivatedAppInfo"]) == 1
    assert "daily tasks for day 5" not in case.device.texts(), case.device.log()


def a_second_job(case):
    case.device.tally("send", "run", "5")
    second = case.device.run()
    assert "another job is listening" in second.stderr, second.stderr
    # The second one waited its ten seconds beside the first, whose own were over by then.
    case.end()
    assert case.device.texts().count("tbdaily ended") == 2, case.device.log()
    assert case.device.reports()[0]["TBScalars"] == {"k": 3}
    assert case.device.last_day() is None


class Endpoint(DeviceTest):
    def test_cases(self):
        cases = [app_info_on_request, hostile_frames, a_second_job]

        def run(function):
            # A root deeper than a socket address is long must work all the same.
            case = Case(name="/".join(["deep" * 12] * 4) if function is hostile_frames else "root")
            try:
                function(case)
            finally:
                case.job.kill()
                case.device.close()
        with concurrent.futures.ThreadPoolExecutor(len(cases)) as pool:
            futures = {function.__name__: pool.submit(run, function) for function in cases}
            for name, future in futures.items():
                with self.subTest(name):
                    future.result()

    def test_socket_passed_by_the_service_manager(self):
        device = self.device()
        listener = socket.socket(socket.AF_UNIX)
        self.addCleanup(listener.close)
        listener.bind(str(device.base / "passed.sock"))
        listener.listen()

        job = subprocess.Popen(["sh", "-c", f'exec 3<&{listener.fileno()}; LISTEN_PID=$$ exec "{BIN}/tbdaily"'],
                               env=dict(device.env, LISTEN_FDS="1"), pass_fds=(listener.fileno(),),
                               stderr=subprocess.PIPE)
        with socket.socket(socket.AF_UNIX) as peer:
            peer.connect(str(device.base / "passed.sock"))
            peer.sendall(frame({"operation": 1, "value": TODAY}))
        device.wait_for(lambda: f"daily tasks for day {TODAY}" in device.log())
        job.kill()
        job.communicate()
