#include "platform/linux/store/sqlite_analytics_client.h"

#include <string>
#include <utility>

#include "platform/linux/host_notes.h"

namespace tbdaily {

namespace {

void noteLostWrite(const AnalyticsStore& store, std::string_view key, const StoreResult& result) {
  if (result.systemError != 0) return noteWriteFailure(store.file(), result.systemError);
  const bool concernsOnlyThisWrite = result.fault == StoreFault::Locked || analyticsKeyFault(key).has_value();
  if (!concernsOnlyThisWrite) return noteOnce(result.error);
  // The key may be hostile: no control character of it reaches a terminal.
  std::string line = "\"";
  for (const char c : key.substr(0, kLongestAnalyticsKey)) line += c >= ' ' && c < '\x7F' ? c : '?';
  noteOnce(line.append("\" was not written: ").append(result.error));
}

}  // namespace

SqliteAnalyticsClient::SqliteAnalyticsClient(AnalyticsStoreLocator locate, Kernel& kernel,
                                             std::chrono::milliseconds busyTimeout)
    : locate_(std::move(locate)), kernel_(kernel), busyTimeout_(busyTimeout) {}

DayNumber SqliteAnalyticsClient::currentDayNumber() {
  return dayNumberOf(kernel_.currentTime());
}
DayNumber SqliteAnalyticsClient::dayNumberOfDate(PlistDate date) {
  return dayNumberOf(date);
}
PlistDate SqliteAnalyticsClient::dateOfDayNumber(DayNumber day) {
  return dateOf(day);
}

void SqliteAnalyticsClient::checkpoint() {
  AnalyticsStore* target = store();
  if (target == nullptr) return;
  if (const StoreResult result = target->checkpoint(); !result.ok()) noteOnce(result.error);
}

void SqliteAnalyticsClient::setValueForScalarKey(std::string_view key, std::int64_t value) {
  AnalyticsStore* target = store();
  if (target == nullptr) return;
  const StoreResult result = target->setScalar(key, currentDayNumber(), value);
  if (!result.ok()) noteLostWrite(*target, key, result);
}

void SqliteAnalyticsClient::addValueForScalarKey(std::string_view key, std::int64_t increment) {
  AnalyticsStore* target = store();
  if (target == nullptr) return;
  const StoreResult result = target->addScalar(key, currentDayNumber(), increment);
  if (!result.ok()) noteLostWrite(*target, key, result);
}

void SqliteAnalyticsClient::addValuesForScalarKeys(std::span<const ScalarIncrement> increments) {
  AnalyticsStore* target = store();
  if (target == nullptr || increments.empty()) return;
  const DayNumber today = currentDayNumber();
  if (const StoreResult begun = target->beginLoad(); !begun.ok()) {
    return noteLostWrite(*target, increments.front().key, begun);
  }
  for (const auto& [key, increment] : increments) {
    const StoreResult result = target->addScalar(key, today, increment);
    if (!result.ok()) noteLostWrite(*target, key, result);
  }
  const StoreResult committed = target->commitLoad();
  if (!committed.ok()) noteLostWrite(*target, increments.front().key, committed);
}

AnalyticsStore* SqliteAnalyticsClient::store() {
  const std::lock_guard lock(mutex_);
  if (!store_) {
    const std::optional<std::filesystem::path> file = locate_();
    if (!file) return nullptr;
    store_.emplace(*file, busyTimeout_);
  }
  return &*store_;
}

}  // namespace tbdaily
