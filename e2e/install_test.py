"""The installed package: programs outside of this tree find it, link it in every way and sample channels."""

import json
import os
import pathlib
import re
import shutil
import subprocess
import tempfile
import unittest

BUILD = pathlib.Path(os.environ["TBDAILY_BUILD"])
TREE = pathlib.Path(__file__).resolve().parent.parent
EXAMPLE = TREE / "examples" / "sample_channels"

# A program with headers of its own in folders that this tree has too, and texts that are absent in every way.
PROJECT = """cmake_minimum_required(VERSION 3.16)
project(user LANGUAGES CXX)
set(CMAKE_CXX_VISIBILITY_PRESET hidden)
include_directories(BEFORE ${CMAKE_SOURCE_DIR})
if(TREE)
  include(FetchContent)
  FetchContent_Declare(kdreport SOURCE_DIR ${TREE})
  FetchContent_MakeAvailable(kdreport)
  add_library(storage INTERFACE)
else()
  find_package(kdreport 0.2 REQUIRED COMPONENTS ${COMPONENTS})
endif()
add_library(plugin SHARED use.cc)
target_link_libraries(plugin PRIVATE kdreport::kdreport)
add_executable(static main.cc use.cc)
target_link_libraries(static PRIVATE kdreport::kdreport)
if(TARGET kdreport::testing)
  add_executable(example example.cc)
  target_link_libraries(example PRIVATE kdreport::testing)
endif()
if(TARGET kdreport::shared)
  add_executable(shared main.cc use.cc)
  target_link_libraries(shared PRIVATE kdreport::shared)
endif()
"""
USE = """#include <kdreport/kd_report.h>
#include <kdreport/version.h>
static_assert(KDREPORT_VERSION >= 100);
__attribute__((visibility("default"))) int useOfTheLibrary() {
  using namespace kdreport;
  std::optional<ReportError> error;
  const char* const none = nullptr;
  if (KdReportSelectChannelsInGroup(nullptr, nullptr, none, &error) != 1 || !error) return 1;
  const auto channels = KdReportCreateAggregate(kKdReportFlat);
  const PlistValue info = KdReportCreateUnitInfo(kKdReportSeconds);
  if (KdReportAddChannelDescription(channels.get(), {.driverName = "D", .channelID = 0x4142, .channelType = {1},
                                                     .channelName = none, .channelInfo = info}) != kKdSuccess)
    return 2;
  KdReportChannel held;
  KdReportIterate(channels.get(), [&held](ChannelRecord& channel) -> std::uint32_t {
    held = KdReportRetainChannel(channel);
    return kKdReportKeep;
  });
  return KdReportChannelGetChannelName(held.get()) == "AB" && KdReportChannelGetUnitLabel(held.get()) == "s" ? 0 : 3;
}
"""
MAIN = "int useOfTheLibrary();\nint main() { return useOfTheLibrary(); }\n"


def run(*command, **options):
    done = subprocess.run([str(part) for part in command], capture_output=True, text=True, **options)
    assert done.returncode == 0, f"{command}: {done.stdout}{done.stderr}"
    return done.stdout


def visible_names(library):
    """The functions that a shared library shows, without parameters."""
    lines = run("nm", "-DC", "--defined-only", library).splitlines()
    return {re.split(r"[(\[]", line.split(maxsplit=2)[2])[0] for line in lines}


class InstalledPackage(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.temporary = tempfile.TemporaryDirectory()
        cls.addClassCleanup(cls.temporary.cleanup)
        cls.folder = pathlib.Path(cls.temporary.name)
        cls.prefix = cls.folder / "prefix"
        run("cmake", "--install", BUILD, "--prefix", cls.prefix)
        for component in ("core", "host", "testing"):
            run("cmake", "--install", BUILD, "--prefix", cls.folder / component, "--component", f"kdreport_{component}")
        cls.user = cls.folder / "user"
        page = (cls.folder / "core/share/doc/kdreport/library.md").read_text()
        example = next(code for code in re.findall(r"```cpp\n(.*?)```", page, re.S) if "int main()" in code)
        for name, text in {"CMakeLists.txt": PROJECT, "use.cc": USE, "main.cc": MAIN, "example.cc": example,
                           "platform/status.h": "#error\n", "drivermetrics/kd_report.h": "#error\n"}.items():
            (cls.user / name).parent.mkdir(parents=True, exist_ok=True)
            (cls.user / name).write_text(text)

    def configured(self, name, *options):
        command = ["cmake", "-S", self.user, "-B", self.folder / f"build-{name}",
                   f"-DCMAKE_PREFIX_PATH={self.folder / 'core'}", *options]
        return subprocess.run([str(part) for part in command], capture_output=True, text=True)

    def test_example_builds_against_it_and_reads_what_the_companion_reads(self):
        device = self.folder / "device"
        run("cmake", "-S", EXAMPLE, "-B", self.folder / "example", f"-DCMAKE_PREFIX_PATH={self.prefix}")
        run("cmake", "--build", self.folder / "example")
        device.mkdir()
        example = [self.folder / "example" / "sample_channels"]
        environment = {**os.environ, "TBDAILY_ROOT": str(device), "TBDAILY_LIVE": "0"}
        without = subprocess.run(example, capture_output=True, text=True, env=environment)
        self.assertEqual(without.returncode, 1)
        self.assertRegex(without.stderr, r"^sample_channels: no drivers here.*tallyctl.*\n$")
        self.assertIn("memory.available", run(*example, env={**environment, "TBDAILY_LIVE": "1"}))
        tallyctl = [self.prefix / "bin" / "tallyctl", "--root", device]
        run(*tallyctl, "init")
        printed = run(*example, env=environment)
        channels = json.loads(run(*tallyctl, "metrics", "sample", "--format", "simple", "--json"))
        self.assertGreater(len(channels), 5)
        expected = [f'{c["driver"]} {c["name"] or "?"} = {c["value"]} {c["unitLabel"] or ""}' for c in channels]
        self.assertCountEqual(printed.splitlines(), expected)

    def test_example_of_a_live_machine_shows_its_idle_states_and_energy(self):
        run("cmake", "-S", EXAMPLE.parent / "idle_and_energy", "-B", self.folder / "idle", f"-DCMAKE_PREFIX_PATH={self.prefix}")
        run("cmake", "--build", self.folder / "idle")
        device = self.folder / "no device"
        device.mkdir()
        environment = {**os.environ, "TBDAILY_ROOT": str(device), "TBDAILY_LIVE": "1"}
        shown = subprocess.run([self.folder / "idle" / "idle_and_energy"], capture_output=True, text=True, env=environment)
        if any(pathlib.Path("/sys/devices/system/cpu").glob("cpu0/cpuidle/state*")):
            self.assertRegex(shown.stdout, r"(?m)^cpu0\.idle:( \S+ \d+ ms)+$")

    def test_project_of_cmake_3_16_links_the_core_alone_static_and_shared_without_expat(self):
        done = self.configured("core", "-DCOMPONENTS=core", "-DCMAKE_DISABLE_FIND_PACKAGE_EXPAT=ON")
        self.assertEqual(done.returncode, 0, done.stderr)
        run("cmake", "--build", self.folder / "build-core")
        for program in ("static", "shared"):
            run(self.folder / "build-core" / program)
        own = {name for name in visible_names(self.folder / "build-core/libplugin.so")
               if name.startswith(("kdreport::", "tbdaily::"))}
        self.assertEqual(own, set())
        for package in (self.prefix / "lib").glob("**/kdreport_*.cmake"):
            for version in re.findall(r"CMAKE_VERSION}? VERSION_LESS \"([\d.]+)\"", package.read_text()):
                self.assertLessEqual(tuple(map(int, version.split("."))), (3, 16), package)
        for component in ("host", "testing", "nothing"):
            refused = self.configured("core", f"-DCOMPONENTS=core;{component}")
            self.assertNotEqual(refused.returncode, 0)
            self.assertIn(f'kdreport has no component "{component}" here', refused.stderr)

    def test_components_complete_each_other_and_the_page_s_example_runs(self):
        for component in ("host", "testing"):
            package = self.folder / f"core-{component}"
            for part in ("core", component):
                shutil.copytree(self.folder / part, package, dirs_exist_ok=True, symlinks=True)
            done = self.configured(component, f"-DCOMPONENTS={component}", f"-DCMAKE_PREFIX_PATH={package}")
            self.assertEqual(done.returncode, 0, done.stderr)
        run("cmake", "--build", self.folder / "build-testing", "--target", "example")
        run(self.folder / "build-testing/example")

    def test_shared_library_shows_what_the_header_declares(self):
        declared = set(re.findall(r"^[^/\n]*\b(KdReport\w+)\(", (TREE / "drivermetrics/kd_report.h").read_text(), re.M))
        shown = visible_names(next(self.prefix.glob("lib*/**/libkdreport.so.0")))
        self.assertEqual({name for name in shown if name.startswith("kdreport::")}, {"kdreport::" + n for n in declared})
        others = {name for name in shown if not name.startswith("kdreport::")}
        self.assertEqual([name for name in others if not re.match(r"tbdaily::(Plist|operator==|saturatingInt64$)", name)], [])
        self.assertEqual(visible_names(next(self.prefix.glob("lib*/**/libkdreport_host.so.0"))),
                         {"kdreport::openHostRegistry"})

    def test_pkg_config_and_other_compilers(self):
        pc = next(self.prefix.glob("lib*/**/kdreport.pc")).parent
        flags = run("pkg-config", "--cflags", "--libs", "kdreport", env={**os.environ, "PKG_CONFIG_PATH": str(pc)}).split()
        compilers = [name for name in ("g++", "clang++-14", "clang++-19") if shutil.which(name)]
        for compiler in compilers:
            for standard, sources in (("c++20", ["example.cc"]), ("c++2b", ["main.cc", "use.cc"])):
                program = self.folder / f"{compiler}-{standard}"
                run(compiler, f"-std={standard}", "-Wall", "-Wextra", "-Werror", *sources, *flags, "-o", program, cwd=self.user)
                run(program, env={**os.environ, "LD_LIBRARY_PATH": str(pc.parent)})

    def test_part_of_another_project_needs_nothing_of_the_programs_and_leaves_nothing_there(self):
        absent = [f"-DCMAKE_DISABLE_FIND_PACKAGE_{name}=ON" for name in ("SQLite3", "CLI11", "nlohmann_json", "GTest")]
        done = self.configured("part", f"-DTREE={TREE}", *absent)
        self.assertEqual(done.returncode, 0, done.stderr)
        build = self.folder / "build-part"
        targets = set(re.findall(r"^\.\.\. (\w+)$", run("cmake", "--build", build, "--target", "help"), re.M))
        self.assertIn("kdreport_host", targets)
        own = {"static", "shared", "plugin", "example", "all", "clean", "depend", "edit_cache", "rebuild_cache"}
        self.assertEqual({t for t in targets - own if not re.match("install|list_install|kdreport|tbdaily_", t)}, set())
        settings = set(re.findall(r"^(\w+):", (build / "CMakeCache.txt").read_text(), re.M))
        theirs = ".*CMAKE_|FETCHCONTENT_|FIND_PACKAGE_|.*EXPAT|PKG_CONFIG_|prefix_result$|TREE$|user_|kdreport|tbdaily_|TBDAILY_"
        self.assertEqual({name for name in settings if not re.match(theirs, name)}, set())
        run("cmake", "--build", build, "--target", "static", "-j2")
        run(build / "static")
        run("cmake", "--install", build, "--prefix", self.folder / "empty")
        self.assertFalse((self.folder / "empty").exists())
        run("cmake", "-S", TREE, "-B", self.folder / "build-library", "-DTBDAILY_PROGRAMS=OFF", "-DTBDAILY_TESTS=OFF", *absent)


if __name__ == "__main__":
    unittest.main()
