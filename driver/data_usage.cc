#include "driver/data_usage.h"

#include <chrono>
#include <deque>
#include <memory>
#include <semaphore>
#include <string>
#include <vector>

#include "driver/daily_tasks.h"
#include "driver/step.h"
#include "platform/analytics_client.h"
#include "platform/preferences_store.h"
#include "platform/system_log.h"
#include "platform/usage_service.h"
#include "platform/utf8.h"

namespace tbdaily {

namespace {

constexpr std::int64_t kBytesPerKB = 1024;
constexpr std::string_view kProcessPrefix = "com.velmora.";

// Whose traffic a record counts.
struct RecordName {
  std::string_view prefix;
  std::string_view name;
};

std::optional<RecordName> nameOf(const PlistDictionary& record) {
  const auto text = [&record](std::string_view key) {
    const PlistValue* value = record.find(key);
    return value != nullptr ? value->asString() : std::nullopt;
  };
  const auto bundle = text("bundleName");
  const auto process = text("procName");
  const RecordName name = bundle ? RecordName{"", *bundle} : RecordName{kProcessPrefix, process.value_or("")};
  // A name that cannot be stored would cost the whole baseline.
  if ((!bundle && !process) || !isCarriedText(name.name)) return std::nullopt;
  return name;
}

std::int64_t counterOf(const PlistValue& value) {
  const auto number = value.asNumber();
  return number ? number->toInt64() : 0;
}

// Signed 64-bit, wrapping.
std::int64_t difference(std::int64_t a, std::int64_t b) {
  return static_cast<std::int64_t>(static_cast<std::uint64_t>(a) - static_cast<std::uint64_t>(b));
}

// The stored counters of a name, when they count from the same moment.
const PlistArray* comparableEntry(const PlistDictionary* baseline, std::string_view name, PlistDate since) {
  const PlistValue* entry = baseline != nullptr ? baseline->find(name) : nullptr;
  const PlistArray* counters = entry != nullptr ? entry->asArray() : nullptr;
  return counters != nullptr && !counters->empty() && counters->front().asDate() == since ? counters
                                                                                          : nullptr;
}

class UsageComparison {
 public:
  UsageComparison(const PlistDictionary* baseline, DayNumber yesterday, const AddUsageKey& addKey)
      : stored_(baseline), yesterday_(yesterday), addKey_(addKey) {}

  void visit(const PlistDictionary& record) {
    const auto name = nameOf(record);
    const auto since = record.get(kUsageSinceTimeKey).asDate();
    if (!name || !since) return;
    const PlistArray* stored = comparableEntry(stored_, name->name, *since);
    const bool isRecent = dayNumberOf(*since) >= yesterday_;
    PlistArray entry;
    entry.emplace_back(*since);
    for (std::size_t i = 0; i < kTrafficFields.size(); ++i) {
      PlistValue value = record.get(kTrafficFields[i]);
      const std::int64_t bytes = counterOf(value);
      entry.push_back(value.asNumber() ? std::move(value) : PlistValue::int64(0));
      if (stored != nullptr) {
        const std::int64_t before = i + 1 < stored->size() ? counterOf((*stored)[i + 1]) : 0;
        const std::int64_t delta = difference(bytes, before);
        if (delta >= 1) addDataUsageKey(kTrafficFields[i], *name, delta);
        if (delta < 0) add("datausage.baddata.", *name, 1);
      } else if (isRecent) {
        addDataUsageKey(kTrafficFields[i], *name, bytes);
      }
    }
    if (stored == nullptr && !isRecent) add("datausage.olddata.", *name, 1);
    baseline_.set(name->name, PlistValue::array(std::move(entry)));
  }

  PlistDictionary takeBaseline() { return std::move(baseline_); }

 private:
  // In KB, the rest dropped; less than one adds nothing.
  void addDataUsageKey(std::string_view field, const RecordName& name, std::int64_t bytes) {
    const std::int64_t kilobytes = bytes / kBytesPerKB;
    if (kilobytes == 0) return;
    std::string start("datausage.");
    start.append(field.substr(0, field.find("Bytes"))).append("KB.");
    add(start, name, kilobytes);
  }
  void add(std::string_view start, const RecordName& name, std::int64_t increment) {
    key_.assign(start).append(name.prefix).append(name.name);
    addKey_(key_, increment);
  }

  const PlistDictionary* stored_;
  const DayNumber yesterday_;
  const AddUsageKey& addKey_;
  PlistDictionary baseline_;
  std::string key_;
};

}  // namespace

PlistDictionary compareUsage(const PlistValue& records, const PlistValue& baseline, DayNumber yesterday,
                             const AddUsageKey& addKey) {
  UsageComparison comparison(baseline.asDictionary(), yesterday, addKey);
  if (records.asArray() != nullptr) {
    for (const PlistValue& record : *records.asArray()) {
      if (record.asDictionary() != nullptr) comparison.visit(*record.asDictionary());
    }
  }
  return comparison.takeBaseline();
}

void ProcessDataUsageReply(Platform& platform, const PlistValue& records) {
  const DayNumber yesterday = dayBefore(platform.analyticsClient.currentDayNumber());
  const PlistValue stored = platform.preferences.ownValue(kUsageBaselineKey);
  std::deque<std::string> keys;  // stay where they are while more come
  std::vector<ScalarFigure> increments;
  PlistDictionary baseline =
      compareUsage(records, stored, yesterday, [&](std::string_view key, std::int64_t increment) {
        increments.push_back({keys.emplace_back(key), increment});
      });
  // All of them or none; without them the next reply is compared with the old baseline, so that nothing is
  // lost.
  if (!increments.empty() && !platform.analyticsClient.addValuesForScalarKeys(increments)) return;
  platform.preferences.setOwnValue(kUsageBaselineKey, PlistValue::dictionary(std::move(baseline)));
  platform.preferences.synchronizeOwn();
}

void CollectDataUsage(Platform& platform, std::chrono::milliseconds replyTimeout) {
  // The handler holds its own references, so that a late reply never meets a released object.
  const std::shared_ptr<UsageWorkspace> workspace = platform.usageService.createWorkspace();
  const std::shared_ptr<UsageFeed> feed = workspace != nullptr ? workspace->createFeed() : nullptr;
  const auto processed = std::make_shared<std::counting_semaphore<>>(0);
  if (feed != nullptr) {
    feed->requestUsageToDate(
        {}, UsageNameKind::ProcessName, [&platform, workspace, feed, processed](const PlistValue& records) {
          runStep(platform, "network usage", [&] { ProcessDataUsageReply(platform, records); });
          processed->release();
        });
  }
  if (!processed->try_acquire_for(replyTimeout)) {
    platform.systemLog.message(LogLevel::Default, "Netwatch timed out, no datausage available");
  }
}

}  // namespace tbdaily
