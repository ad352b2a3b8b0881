// What `tallyctl record` does to the analytics store.
#pragma once

#include <cstdint>
#include <cstdio>
#include <functional>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "platform/analytics_client.h"
#include "platform/linux/store/analytics_store.h"

namespace tbdaily {

// The day that a record goes to and, for a distribution, the second in it.
struct RecordTime {
  DayNumber day = 0;
  std::int32_t secondsInDay = 0;
};

// Today at this moment, or the first second of another day that was asked for.
RecordTime recordTime(PlistDate now, std::optional<DayNumber> day);

enum class ScalarChange { Set, Add };

// Each answers nothing when it is done, else one line with the reason; the store is then as it was.
std::optional<std::string> recordScalar(AnalyticsStore& store, std::string_view key, DayNumber day,
                                        std::int64_t value, ScalarChange change);
// `values` may hold "not a number", but nothing infinite.
std::optional<std::string> recordDistribution(AnalyticsStore& store, std::string_view key, RecordTime time,
                                              std::span<const double> values);
std::optional<std::string> recordPrune(AnalyticsStore& store, DayNumber beforeDay, Pruning pruning,
                                       PrunedRows& pruned);

// A number as an import and the command line write it: decimal, all of the text, within the range of its
// type. A real may be "nan"; it may not be infinite.
std::optional<std::int64_t> parseRecordInteger(std::string_view text);
std::optional<DayNumber> parseRecordDay(std::string_view text);
std::optional<double> parseRecordReal(std::string_view text);

struct ImportedRows {
  std::uint64_t scalars = 0;
  std::uint64_t distributionValues = 0;
};

// Called with the number of bytes read so far, about once for each 64 KiB.
using ImportProgress = std::function<void(std::uint64_t bytesRead)>;

// Loads the lines `s KEY DAY VALUE` and `d KEY DAY SECONDS VALUE`, tab-separated, in one transaction; empty
// lines are skipped, a line may end in CR LF, the last one in nothing. A line that cannot be taken (they are
// at most 64 KiB long) is named by its number, counted from 1, and nothing is loaded. Memory does not grow
// with the input. `input` is borrowed.
std::optional<std::string> recordImport(AnalyticsStore& store, std::FILE* input,
                                        const ImportProgress& progress, ImportedRows& imported);

}  // namespace tbdaily
