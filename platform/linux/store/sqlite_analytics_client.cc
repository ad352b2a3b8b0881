#include "platform/linux/store/sqlite_analytics_client.h"

#include <string>
#include <utility>

#include "platform/linux/base/host_notes.h"

namespace tbdaily {

namespace {

void noteLostWrite(const AnalyticsStore& store, std::string_view key, const StoreResult& result) {
  if (result.systemError != 0) return noteWriteFailure(store.file(), result.systemError);
  const bool concernsOnlyThisWrite =
      result.fault == StoreFault::Locked || result.fault == StoreFault::UnusableKey;
  if (!concernsOnlyThisWrite) return noteOnce(result.error);
  // The key may be hostile: no control character of it reaches a terminal.
  std::string line = "\"";
  for (const char c : key.substr(0, kLongestAnalyticsKey)) line += c >= ' ' && c < '\x7F' ? c : '?';
  noteOnce(line.append("\" was not written: ").append(result.error));
}

// Ends a load that was not committed, by an exception too: the store would take no other one.
class OpenLoad {
 public:
  explicit OpenLoad(AnalyticsStore& store) : store_(store) {}
  ~OpenLoad() { store_.rollbackLoad(); }
  OpenLoad(const OpenLoad&) = delete;
  OpenLoad& operator=(const OpenLoad&) = delete;

 private:
  AnalyticsStore& store_;
};

}  // namespace

SqliteAnalyticsClient::SqliteAnalyticsClient(AnalyticsStoreLocator locate, Kernel& kernel)
    : locate_(std::move(locate)), kernel_(kernel) {}

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
  writeOne(&AnalyticsStore::setScalar, {key, value});
}
void SqliteAnalyticsClient::addValueForScalarKey(std::string_view key, std::int64_t increment) {
  writeOne(&AnalyticsStore::addScalar, {key, increment});
}
void SqliteAnalyticsClient::setValuesForScalarKeys(std::span<const ScalarFigure> values) {
  writeAll(&AnalyticsStore::setScalar, values, AfterFailure::KeepTheRest);
}
bool SqliteAnalyticsClient::addValuesForScalarKeys(std::span<const ScalarFigure> increments) {
  return writeAll(&AnalyticsStore::addScalar, increments, AfterFailure::KeepNone);
}

void SqliteAnalyticsClient::writeOne(Write write, const ScalarFigure& figure) {
  AnalyticsStore* target = store();
  if (target == nullptr) return;
  const StoreResult result = (target->*write)(figure.key, currentDayNumber(), figure.number);
  if (!result.ok()) noteLostWrite(*target, figure.key, result);
}

bool SqliteAnalyticsClient::writeAll(Write write, std::span<const ScalarFigure> figures,
                                     AfterFailure afterFailure) {
  AnalyticsStore* target = store();
  if (target == nullptr || figures.empty()) return true;
  const DayNumber today = currentDayNumber();
  if (const StoreResult begun = target->beginLoad(); !begun.ok()) {
    noteLostWrite(*target, figures.front().key, begun);
    return false;
  }
  const OpenLoad load(*target);
  bool isWhole = true;
  for (const auto& [key, number] : figures) {
    const StoreResult result = (target->*write)(key, today, number);
    if (result.ok()) continue;
    noteLostWrite(*target, key, result);
    if (result.fault != StoreFault::UnusableKey) isWhole = false;
  }
  if (!isWhole && afterFailure == AfterFailure::KeepNone) return false;
  const StoreResult committed = target->commitLoad();
  if (!committed.ok()) noteLostWrite(*target, figures.front().key, committed);
  return isWhole && committed.ok();
}

AnalyticsStore* SqliteAnalyticsClient::store() {
  const std::lock_guard lock(mutex_);
  if (!store_) {
    std::optional<StorePlace> place = locate_();
    if (!place) return nullptr;
    store_.emplace(std::move(*place));
  }
  return &*store_;
}

}  // namespace tbdaily
