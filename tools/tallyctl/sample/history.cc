#include "tools/tallyctl/sample/history.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdint>
#include <vector>

#include "platform/usage_service.h"

namespace tbdaily {

namespace {

constexpr std::array<const char*, 24> kUserApps = {
    "maps",       "chess",   "recipes", "podcasts", "translate", "weather", "banking", "tickets",
    "fitness",    "sketch",  "radio",   "notes",    "scanner",   "garden",  "sudoku",  "messages",
    "camera-pro", "library", "trains",  "parcel",   "budget",    "guitar",  "stars",   "diary"};
constexpr std::array<const char*, 16> kSystemApps = {
    "phone",    "mail",       "calendar", "clock", "settings", "photos", "browser",   "store",
    "contacts", "calculator", "files",    "music", "wallet",   "health", "reminders", "voice"};

enum class Shape { Bell, Decay, Percent };

constexpr VariationFactor kAge = &SampleVariation::age, kUse = &SampleVariation::use,
                          kLatency = &SampleVariation::latency;

struct SampleDistribution {
  const char* key;
  int count;
  Shape shape;
  double middle, spread;
  VariationFactor countFactor = nullptr, middleFactor = nullptr;
};

constexpr SampleDistribution kDistributions[] = {
    {"power.batteryLevel", 1440, Shape::Percent, 62, 30},
    {"power.batteryTemperature", 1440, Shape::Bell, 29, 4},
    {"power.drainRate", 288, Shape::Decay, 3.5, 0, nullptr, kUse},
    {"power.chargeCurrent", 288, Shape::Bell, 1450, 200},
    {"net.latency.cell", 2600, Shape::Decay, 68, 0, kUse, kLatency},
    {"net.latency.wifi", 5200, Shape::Decay, 19, 0, kUse, kLatency},
    {"net.latency.dns", 4100, Shape::Decay, 11, 0, kUse, kLatency},
    {"net.wifi.lossShare", 960, Shape::Decay, 0.06, 0},
    {"display.brightness", 720, Shape::Percent, 45, 25},
    {"internal.schedulerDelay", 3000, Shape::Decay, 2, 0},
};

struct SampleScalar {
  const char* key;
  double low, high;
  VariationFactor factor = nullptr;
};

constexpr SampleScalar kScalars[] = {
    {"power.screenOnMinutes", 90, 380, kUse}, {"power.chargeCycles", 120, 900, kAge},
    {"power.temperatureDelta", -14, 14},      {"power.unplugCount", 1, 9},
    {"net.wifi.bytesIn", 2e7, 4e9, kUse},     {"net.wifi.bytesOut", 1e6, 3e8, kUse},
    {"net.wifi.associations", 2, 60, kUse},   {"net.cell.bytesIn", 1e6, 6e8, kUse},
    {"net.cell.bytesOut", 1e5, 8e7, kUse},    {"net.cell.handovers", 3, 400, kUse},
    {"net.dns.queries", 800, 9000, kUse},     {"net.vpn.sessions", 0, 4},
    {"experiment.newKeyboard.uses", 0, 900},  {"experiment.newKeyboard.errors", 0, 7},
    {"internal.assertions", 0, 30},           {"internal.watchdogResets", 0, 2},
    {"location.fixes", 10, 2000, kUse},       {"contacts.lookups", 5, 300},
};

double draw(Noise& noise, const SampleDistribution& d) {
  switch (d.shape) {
    case Shape::Bell:
      return noise.around(d.middle, d.spread);
    case Shape::Percent:
      return std::clamp(noise.around(d.middle, d.spread), 0.0, 100.0);
    case Shape::Decay:
      return -d.middle * std::log(1 - noise.unit());
  }
  return 0;
}

// To three decimals, as a sensor would give them.
double measured(double value) {
  return std::round(value * 1000) / 1000;
}

class SampleWriter {
 public:
  SampleWriter(AnalyticsStore& store, DayNumber day, const SampleVariation& variation)
      : store_(store), day_(day), variation_(variation), noise_(variation.noiseOf(day)) {}

  void scalar(const std::string& key, double low, double high, VariationFactor factor = nullptr) {
    const double value = varied(noise_.between(low, high), factor, variation_);
    keep(store_.setScalar(key, day_, static_cast<std::int64_t>(std::llround(value))));
  }
  void distribution(const std::string& key, SampleDistribution d) {
    d.count = std::max(1, static_cast<int>(varied(d.count, d.countFactor, variation_)));
    d.middle = varied(d.middle, d.middleFactor, variation_);
    for (int i = 0; i < d.count && result_.ok(); ++i) {
      const auto second = static_cast<std::int32_t>(kSecondsPerDay * i / d.count);
      const double value = measured(draw(noise_, d));
      keep(store_.appendDistributionValues(key, day_, second, std::span(&value, 1)));
    }
  }
  void everything() {
    for (const SampleScalar& s : kScalars) scalar(s.key, s.low, s.high, s.factor);
    for (const SampleDistribution& d : kDistributions) distribution(d.key, d);
    for (const SampleApp& app : sampleApps()) {
      scalar("app.launches." + app.identifier, 0, 60, kUse);
      scalar("app.foregroundSeconds." + app.identifier, 0, 5400, kUse);
      scalar("app.notifications." + app.identifier, 0, 40);
      scalar("app.energy." + app.identifier, 1, 900);
      scalar("app.writes." + app.identifier, 0, 1e8);
      if (!app.isUserApp) continue;
      const auto launches = static_cast<int>(noise_.between(1, 60));
      distribution("app.launchTime." + app.identifier,
                   {"", launches, Shape::Decay, noise_.between(20, 180), 0, kUse, nullptr});
    }
  }
  const StoreResult& result() const { return result_; }

 private:
  void keep(StoreResult result) {
    if (result_.ok()) result_ = std::move(result);
  }

  AnalyticsStore& store_;
  DayNumber day_;
  const SampleVariation& variation_;
  Noise noise_;
  StoreResult result_;
};

}  // namespace

std::vector<SampleApp> sampleApps() {
  std::vector<SampleApp> apps;
  apps.reserve(kUserApps.size() + kSystemApps.size());
  for (const char* name : kUserApps) apps.push_back({std::string("org.example.") + name, true});
  for (const char* name : kSystemApps) apps.push_back({std::string("com.velmora.") + name, false});
  return apps;
}

PlistArray sampleUsageRecords(DayNumber day, const SampleVariation& variation) {
  constexpr std::array<const char*, 8> kDaemons = {"mailsyncd", "updated", "pushd", "timesyncd",
                                                   "mapsd",     "cloudd",  "dnsd",  "backupd"};
  constexpr DayNumber kDaysSinceBoot = 3;
  Noise noise = variation.noiseOf(std::int64_t{day} + 1);
  PlistArray records;
  const auto add = [&](const char* nameKey, const std::string& name, double scale, DayNumber since) {
    const auto bytes = [&](double low, double high) {
      return PlistValue::int64(std::llround(noise.between(low, high) * scale * variation.use));
    };
    records.push_back(PlistValue::dictionary(
        {{nameKey, PlistValue::string(name)},
         {std::string(kUsageSinceTimeKey),
          PlistValue(PlistDate{dateOf(since).secondsSinceReference + measured(noise.between(0, 86399))})},
         {"wifiInBytes", bytes(1e5, 4e8)},
         {"wifiOutBytes", bytes(1e4, 3e7)},
         {"wwanInBytes", bytes(0, 9e7)},
         {"wwanOutBytes", bytes(0, 6e6)}}));
  };
  // Apps restart now and then, none of them today; daemons have counted since the device was started.
  for (const SampleApp& app : sampleApps()) {
    if (app.isUserApp)
      add("bundleName", app.identifier, 1, day - 1 - static_cast<DayNumber>(noise.between(0, 2)));
  }
  for (const char* daemon : kDaemons) add("procName", daemon, 0.2, day - kDaysSinceBoot);
  return records;
}

std::optional<std::string> addSampleHistory(AnalyticsStore& store, DayNumber first, DayNumber last,
                                            const SampleVariation& variation) {
  if (const StoreResult begun = store.beginLoad(); !begun.ok()) return begun.error;
  for (DayNumber day = first; day <= last; ++day) {
    SampleWriter writer(store, day, variation);
    writer.everything();
    if (!writer.result().ok()) {
      store.rollbackLoad();
      return writer.result().error;
    }
  }
  const StoreResult committed = store.commitLoad();
  return committed.ok() ? std::nullopt : std::optional(committed.error);
}

}  // namespace tbdaily
