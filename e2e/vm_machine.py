"""A virtual machine with two NVMe drives that boots the programs under test and gives back what they left."""

import os
import pathlib
import shutil
import subprocess
import time

from harness import BIN

HERE = pathlib.Path(__file__).resolve().parent
PLACE = pathlib.Path(os.environ["TBDAILY_VM"])  # holds the kernel; the machine's files are made there
USERS = "root:x:0:0::/:/bin/sh\nnobody:x:65534:65534::/:/bin/sh\n"
DRIVES = {"measured": ",smart_critical_warning=4", "results": ""}
DRIVE_SIZE = 256 << 20
TIME_LIMIT = 120  # seconds; a machine takes some 30
CONSOLE_LINES = 20


def libraries(program):
    words = subprocess.run(["ldd", program], capture_output=True, text=True, check=True).stdout.split()
    return {word for word in words if word.startswith("/")}


def make_initramfs(devices, place):
    """`devices`: {name: folder}, which the machine has as /devices/<name>."""
    tree = place / "initramfs"
    for folder in ("bin", "dev", "proc", "sys", "tmp", "etc", "results", "devices"):
        (tree / folder).mkdir(parents=True)
    (tree / "etc/passwd").write_text(USERS)
    shutil.copy(HERE / "vm_guest.sh", tree / "init")
    (tree / "init").chmod(0o755)
    shutil.copy("/bin/busybox", tree / "bin")
    for program in (BIN / "tbdaily", BIN / "tallyctl", shutil.which("nvme", path="/usr/sbin:/usr/bin")):
        subprocess.run(["strip", "-o", tree / "bin" / pathlib.Path(program).name, program], check=True)
        for library in libraries(program):
            inside = tree / library.lstrip("/")
            inside.parent.mkdir(parents=True, exist_ok=True)
            shutil.copy(library, inside)
    for name, folder in devices.items():
        shutil.copytree(folder, tree / "devices" / name)
    names = "".join(f"{file.relative_to(tree)}\n" for file in sorted(tree.rglob("*")))
    with open(place / "initramfs.cpio", "wb") as archive:
        subprocess.run(["cpio", "-o", "-H", "newc", "-R", "0:0", "--quiet"], cwd=tree, input=names.encode(), stdout=archive,
                       check=True)


def run(processors, devices):
    """The folder with `results` and `devices` as the machine left them."""
    place = PLACE / f"processors-{processors}"
    shutil.rmtree(place, ignore_errors=True)
    place.mkdir(parents=True)
    make_initramfs(devices, place)
    command = ["timeout", "--foreground", str(TIME_LIMIT),
               "qemu-system-x86_64", "-machine", "q35", "-cpu", "max", "-smp", str(processors),
               "-m", "1024", "-nodefaults", "-no-reboot", "-display", "none", "-serial", "stdio",
               "-kernel", PLACE / "vmlinuz", "-initrd", place / "initramfs.cpio", "-append", "console=ttyS0 quiet panic=-1"]
    for drive, settings in DRIVES.items():
        with open(place / drive, "wb") as file:
            file.truncate(DRIVE_SIZE)
        command += ["-drive", f"file={place / drive},format=raw,if=none,id={drive}",
                    "-device", f"nvme,serial={drive},drive={drive}{settings}"]
    console, left = place / "console", place / "left"
    left.mkdir()
    begin = time.monotonic()
    # A machine within another may have /dev/kvm, and no use of it: the emulator then gives up at once.
    for accelerator in (["kvm"] if os.access("/dev/kvm", os.W_OK) else []) + ["tcg"]:
        with open(console, "wb") as output:
            status = subprocess.run([*command, "-accel", accelerator], stdin=subprocess.DEVNULL, stdout=output, stderr=output).returncode
        if status in (0, 124):
            break
    unpacked = subprocess.run(["tar", "-x", "--no-same-owner", "-f", place / "results", "-C", left]).returncode
    if status != 0 or unpacked != 0 or not all((left / "devices" / name).is_dir() for name in devices):  # they come last
        lines = console.read_text(errors="replace").splitlines()[-CONSOLE_LINES:]
        raise AssertionError("\n".join([f"the machine left no results (status {status}; 124: it hung); its last lines:", *lines]))
    print(f"a machine with {processors} processor(s) ran for {time.monotonic() - begin:.0f} s", flush=True)
    return left
