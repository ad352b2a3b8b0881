// A device root and a made-up live host in a folder of their own, for one test.
#pragma once

#include <gtest/gtest.h>
#include <sys/resource.h>

#include <algorithm>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "platform/app_registry.h"
#include "platform/linux/linux_platform.h"
#include "platform/linux/replay/recordings.h"
#include "platform/plist/codec.h"
#include "testing/json_test_support.h"
#include "testing/temporary_folder.h"

namespace tbdaily::testing {

struct TestHost {
  // The name of the root is an odd one, so that whoever quotes paths is put to the test.
  explicit TestHost(bool live = false) : host(folder.path() / "root #1?%20", live, folder.path() / "live") {
    std::filesystem::create_directories(host.root());
  }

  TemporaryFolder folder;
  Host host;
  PlistCodec codec;

  static void putAt(const std::filesystem::path& place, std::string_view contents) {
    std::filesystem::create_directories(place.parent_path());
    std::ofstream(place, std::ios::binary) << contents;
  }
  // An open folder of the device, made where it is missing.
  DeviceFolder openFolder(std::string_view path) const {
    DeviceFolder opened;
    EXPECT_EQ(host.files().makeFolder(path, opened), 0) << path;
    return opened;
  }
  void put(std::string_view path, std::string_view contents) { putAt(host.files().place(path), contents); }
  void putLive(std::string_view path, std::string_view contents) { putAt(host.livePath(path), contents); }
  std::string text(std::string_view path) {
    std::ifstream file(host.files().place(path), std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
  }
  // The names in a folder of the device, in byte order.
  std::vector<std::string> names(std::string_view path) {
    std::vector<std::string> all;
    std::error_code ignored;
    for (const auto& entry : std::filesystem::directory_iterator(host.files().place(path), ignored))
      all.push_back(entry.path().filename());
    std::ranges::sort(all);
    return all;
  }

  PlistValue parse(std::string_view list) { return codec.parse(std::as_bytes(std::span(list))).value; }

  // Replaces one entry of a recording; a none value takes it away.
  void record(std::string_view file, std::string_view key, const PlistValue& value) {
    const std::string place = "/System/Device/" + std::string(file);
    const PlistValue before = parse(text(place));
    PlistDictionary root = before.mutableDictionary();
    root.set(key, value);
    put(place, codec.write(PlistValue::dictionary(std::move(root))).bytes);
  }
  void setClock(double unixSeconds) {
    record(recording::kClock, "now", PlistValue(PlistDate::fromUnixSeconds(unixSeconds)));
  }
};

// Each text with a space behind it.
inline std::string joined(const std::vector<std::string>& texts) {
  std::string all;
  for (const std::string& t : texts) all += t + " ";
  return all;
}

// The types of the applications, in byte order.
inline std::string bundleTypes(Platform& host) {
  std::vector<std::string> types;
  host.appRegistry.enumerateBundles(BundleKind::Application,
                                    [&](std::string_view t) { types.emplace_back(t); });
  std::ranges::sort(types);
  return joined(types);
}

// Lowers a limit of the process for as long as it lives. What then does not fit a file fails, without a
// signal.
class ResourceLimit {
 public:
  ResourceLimit(__rlimit_resource resource, rlim_t most) : resource_(resource) {
    ::getrlimit(resource, &before_);
    const rlimit lowered{most, before_.rlim_max};
    EXPECT_EQ(::setrlimit(resource, &lowered), 0);
  }
  ~ResourceLimit() {
    ::setrlimit(resource_, &before_);
    std::signal(SIGXFSZ, handler_);
  }
  ResourceLimit(const ResourceLimit&) = delete;
  ResourceLimit& operator=(const ResourceLimit&) = delete;

 private:
  __rlimit_resource resource_;
  rlimit before_{};
  void (*handler_)(int) = std::signal(SIGXFSZ, SIG_IGN);
};

// A Linux platform over it.
struct TestPlatform : TestHost {
  explicit TestPlatform(bool live = false) : TestHost(live) {}
  LinuxPlatform linuxPlatform{host};
  Platform& services = linuxPlatform.services();
};

}  // namespace tbdaily::testing
