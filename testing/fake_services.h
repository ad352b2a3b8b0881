// Fakes of the small service families: each is scripted through its public members and records what was asked
// of it.
#pragma once

#include <algorithm>
#include <cstring>
#include <deque>
#include <functional>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "platform/analytics_client.h"
#include "platform/app_registry.h"
#include "platform/device_answers.h"
#include "platform/dynamic_loader.h"
#include "platform/file_system.h"
#include "platform/kernel.h"
#include "platform/locale_settings.h"
#include "platform/message_digest.h"
#include "platform/notifications.h"
#include "platform/preferences_store.h"
#include "platform/run_lock.h"
#include "platform/service_listener.h"
#include "platform/system_log.h"

namespace tbdaily::testing {

template <typename Value>
using ByName = std::map<std::string, Value, std::less<>>;

template <typename Value>
std::optional<Value> found(const ByName<Value>& map, std::string_view name) {
  const auto entry = map.find(name);
  return entry != map.end() ? std::optional(entry->second) : std::nullopt;
}

class FakePreferences : public PreferencesStore {
 public:
  PlistValue getValue(std::string_view key, std::string_view domain) override {
    return found(domains, domain).value_or(PlistDictionary()).get(key);
  }
  void setValue(std::string_view key, const PlistValue& value, std::string_view domain) override {
    domains[std::string(domain)].set(key, value);
    writes.push_back((value ? "set " : "remove ") + std::string(domain) + "/" + std::string(key));
  }
  void synchronize(std::string_view domain) override {
    writes.push_back("synchronize " + std::string(domain));
  }

  std::vector<std::string> applyChanges(std::span<const PreferenceChange> changes) override {
    std::set<std::string> unwritten;
    for (const PreferenceChange& change : changes) {
      if (unwritable == change.domain) {
        unwritten.emplace(change.domain);
      } else {
        setValue(change.key, change.value, change.domain);
      }
    }
    return {unwritten.begin(), unwritten.end()};
  }

  ByName<PlistDictionary> domains;
  std::optional<std::string> unwritable;  // a domain that takes no changes for now
  std::vector<std::string> writes;
};

class FakeDeviceAnswers : public DeviceAnswers {
 public:
  bool booleanAnswer(std::string_view question) override {
    return answers.get(question).asBoolean().value_or(false);
  }
  PlistValue copyAnswer(std::string_view question) override { return answers.get(question); }
  std::optional<std::string> currentOSBuildVersion() override { return build; }
  std::optional<bool> multiUserMode() override { return multiUser; }
  SystemGroupContainer systemGroupContainerPath(std::string_view identifier) override {
    const auto path = found(containers, identifier);
    return {path, path ? 0U : 2U};
  }

  PlistDictionary answers;
  std::optional<std::string> build;
  std::optional<bool> multiUser;
  ByName<std::string> containers;
};

class FakeKernel : public Kernel {
 public:
  int sysctlByName(std::string_view name, std::span<std::byte> buffer, std::size_t& length) override {
    asked.emplace_back(name);
    const auto value = found(sysctls, name);
    if (!value) return 2;                                            // ENOENT
    if (value->size() > std::min(length, buffer.size())) return 12;  // ENOMEM
    std::copy(value->begin(), value->end(), buffer.begin());
    length = value->size();
    return 0;
  }
  std::uint64_t tickCount() override { return ticks; }
  std::optional<Timebase> timebase() override { return ratio; }
  PlistDate currentTime() override { return now; }
  std::string processName() override { return "tbdaily"; }
  std::int32_t processIdentifier() override { return 412; }

  ByName<PlistData> sysctls;
  std::uint64_t ticks = 0;
  std::optional<Timebase> ratio;
  PlistDate now = PlistDate::fromUnixSeconds(0);
  std::vector<std::string> asked;
};

class FakeFileSystem : public FileSystem {
 public:
  std::optional<FileStatus> status(std::string_view path) override {
    if (const auto size = found(sizes, path)) return FileStatus{*size};
    const auto file = found(files, path);
    return file ? std::optional(FileStatus{static_cast<std::int64_t>(file->size())}) : std::nullopt;
  }
  std::optional<std::vector<std::byte>> readFile(std::string_view path) override {
    return found(files, path);
  }

  bool makeDurable() override { return canBeMadeDurable; }

  bool canBeMadeDurable = true;
  ByName<std::vector<std::byte>> files;
  ByName<std::int64_t> sizes;  // of files whose contents do not matter
};

class FakeRunLock : public RunLock {
 public:
  std::unique_ptr<HeldRunLock> acquire(std::chrono::seconds) override {
    return isFree ? std::make_unique<Held>(*this) : nullptr;
  }

  bool isFree = true;
  bool isHeld = false;

 private:
  struct Held : HeldRunLock {
    explicit Held(FakeRunLock& lock) : fake(lock) { fake.isHeld = true; }
    ~Held() override { fake.isHeld = false; }
    FakeRunLock& fake;
  };
};

class FakeDynamicLoader : public DynamicLoader {
 public:
  LibraryHandle open(std::string_view path) override {
    ++opens;
    return path == library ? this : nullptr;
  }
  void* symbol(LibraryHandle handle, const std::string& name) override {
    return handle == this ? found(symbols, name).value_or(nullptr) : nullptr;
  }

  std::string library;  // the only path that opens
  ByName<void*> symbols;
  int opens = 0;
};

// No MD5, but as good as one for whoever only compares: different bytes give different digests.
class FakeMessageDigest : public MessageDigest {
 public:
  Md5Digest md5(std::span<const std::byte> bytes) override {
    Md5Digest digest{};
    const std::size_t hash =
        std::hash<std::string_view>()({reinterpret_cast<const char*>(bytes.data()), bytes.size()});
    std::memcpy(digest.data(), &hash, sizeof hash);
    return digest;
  }
};

class FakeAppRegistry : public AppRegistry {
 public:
  void enumerateBundles(BundleKind, const std::function<void(std::string_view)>& bundle) override {
    ++enumerations;
    for (const std::string& type : bundleTypes) bundle(type);
  }
  std::string_view userApplicationType() const override { return "User"; }

  std::vector<std::string> bundleTypes;
  int enumerations = 0;
};

// It has no best localizations: the choice belongs to the host.
class FakeLocaleSettings : public LocaleSettings {
 public:
  std::vector<std::string> preferredLanguages() override { return preferred; }
  std::vector<std::string> systemLanguages() override { return system; }
  std::vector<std::string> bestLocalizations(std::span<const std::string>,
                                             std::span<const std::string>) override {
    return {};
  }
  std::optional<std::string> countryCode() override { return country; }

  std::vector<std::string> preferred, system;
  std::optional<std::string> country;
};

class FakeNotifications : public Notifications {
 public:
  void post(std::string_view name) override { posts.emplace_back(name); }
  std::vector<std::string> posts;
};

// Keeps "level: message" with private arguments shown.
class FakeSystemLog : public SystemLog {
 public:
  bool isEnabled(LogLevel) override { return true; }
  void write(LogLevel level, std::string_view format, std::span<const LogArgument> arguments) override {
    static constexpr std::array<const char*, 4> kNames = {"default", "info", "debug", "error"};
    lines.push_back(std::string(kNames[static_cast<std::size_t>(level)]) + ": " +
                    formatLogMessage(format, arguments, true));
  }
  void writePlain(std::string_view message) override { lines.emplace_back(message); }

  bool has(std::string_view line) const { return std::find(lines.begin(), lines.end(), line) != lines.end(); }
  std::vector<std::string> lines;
};

// A listener whose events are scripted: each slice delivers the next step that is due, and times out when
// there is none.
class FakeServiceListener : public ServiceListener {
 public:
  ServiceConnection createListener(std::string_view endpointName, DeliveryQueue) override {
    endpoint = endpointName;
    return fails ? 0 : kListener;
  }
  void setDeliveryQueue(ServiceConnection, DeliveryQueue) override {}
  void setEventHandler(ServiceConnection connection, ServiceEventHandler handler) override {
    handlers[connection] = std::move(handler);
  }
  void resume(ServiceConnection connection) override { resumed.push_back(connection); }
  SliceResult runSlice(double seconds) override {
    sliceSeconds.push_back(seconds);
    // What is for a connection that was not resumed yet waits.
    const auto next = std::ranges::find_if(steps, [this](const auto& step) {
      return step.first == 0 || std::ranges::find(resumed, step.first) != resumed.end();
    });
    if (next == steps.end()) return SliceResult::TimedOut;
    const auto [connection, event] = std::move(*next);
    steps.erase(next);
    if (connection == 0) return SliceResult::Finished;
    const ServiceEventHandler handler = handlers[connection];  // it may set another one
    if (handler) handler(event);
    return SliceResult::HandledEvent;
  }

  void addPeer(ServiceConnection peer) {
    steps.push_back({kListener, {ServiceEventKind::NewPeer, peer, {}}});
  }
  void addMessage(ServiceConnection peer, PlistDictionary message) {
    steps.push_back({peer, {ServiceEventKind::Message, 0, PlistValue::dictionary(std::move(message))}});
  }
  void addError(ServiceConnection connection) { steps.push_back({connection, {}}); }
  void addFinishedSlice() { steps.push_back({0, {}}); }

  static constexpr ServiceConnection kListener = 1;
  bool fails = false;
  std::string endpoint;
  std::map<ServiceConnection, ServiceEventHandler> handlers;
  std::vector<ServiceConnection> resumed;
  std::deque<std::pair<ServiceConnection, ServiceEvent>> steps;
  std::vector<double> sliceSeconds;
};

}  // namespace tbdaily::testing
