#include "tools/tallyctl/record.h"

#include <array>
#include <cerrno>
#include <charconv>
#include <cmath>
#include <cstring>
#include <limits>
#include <system_error>
#include <vector>

#include "platform/linux/base/host_notes.h"

namespace tbdaily {

namespace {

constexpr std::size_t kLongestLine = 65536;
constexpr std::size_t kReadBlock = 65536;
constexpr std::size_t kMostFields = 5;

using Failure = std::optional<std::string>;

Failure failureOf(const StoreResult& result) {
  if (result.ok()) return std::nullopt;
  return result.error;
}

Failure keyFailure(std::string_view key) {
  if (key.empty()) return "the key is empty";
  if (const auto fault = analyticsKeyFault(key)) return std::string(*fault);
  return std::nullopt;
}

template <typename Number>
std::optional<Number> parseWhole(std::string_view text) {
  Number number{};
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
  return number;
}

// The fields of one line; `count` goes one above the most that a line may have when there are more.
struct Fields {
  std::array<std::string_view, kMostFields> field;
  std::size_t count = 0;

  explicit Fields(std::string_view line) {
    while (count < kMostFields) {
      const std::size_t tab = line.find('\t');
      field[count++] = line.substr(0, tab);
      if (tab == std::string_view::npos) return;
      line.remove_prefix(tab + 1);
    }
    ++count;
  }
};

// Gives a stream's lines one by one, out of one buffer.
class LineReader {
 public:
  enum class Outcome { Line, End, TooLong, Failed };

  LineReader(std::FILE* input, const ImportProgress& progress)
      : input_(input), progress_(progress), buffer_(kLongestLine + kReadBlock) {}

  // The line without its end, borrowed until the next call.
  Outcome next(std::string_view& line) {
    while (true) {
      const std::string_view unread(buffer_.data() + begin_, end_ - begin_);
      const std::size_t length = unread.find('\n', searched_);
      if (length != std::string_view::npos || (atEnd_ && !unread.empty())) {
        line = unread.substr(0, length);
        begin_ += length != std::string_view::npos ? length + 1 : unread.size();
        searched_ = 0;
        if (line.ends_with('\r')) line.remove_suffix(1);
        return line.size() > kLongestLine ? Outcome::TooLong : Outcome::Line;
      }
      if (atEnd_) return Outcome::End;
      if (unread.size() > kLongestLine + 1) return Outcome::TooLong;  // a CR may still be one of them
      searched_ = unread.size();
      if (!fill()) return Outcome::Failed;
    }
  }

 private:
  bool fill() {
    std::memmove(buffer_.data(), buffer_.data() + begin_, end_ - begin_);
    end_ -= begin_;
    begin_ = 0;
    const std::size_t count = std::fread(buffer_.data() + end_, 1, buffer_.size() - end_, input_);
    if (std::ferror(input_) != 0) return false;
    atEnd_ = std::feof(input_) != 0;
    end_ += count;
    bytesRead_ += count;
    if (progress_) progress_(bytesRead_);
    return true;
  }

  std::FILE* input_;
  const ImportProgress& progress_;
  std::vector<char> buffer_;
  std::size_t begin_ = 0, end_ = 0;  // of what was read and not yet given
  std::size_t searched_ = 0;         // how much of that is known to hold no line end
  std::uint64_t bytesRead_ = 0;
  bool atEnd_ = false;
};

Failure loadScalar(AnalyticsStore& store, const Fields& fields, ImportedRows& imported) {
  if (fields.count != 4) return "a scalar has 4 fields: s KEY DAY VALUE";
  if (Failure failure = keyFailure(fields.field[1])) return failure;
  const auto day = parseRecordDay(fields.field[2]);
  if (!day) return "the day is not a whole number of 32 bits";
  const auto value = parseRecordInteger(fields.field[3]);
  if (!value) return "the value is not a whole number of 64 bits";
  ++imported.scalars;
  return failureOf(store.setScalar(fields.field[1], *day, *value));
}

Failure loadDistributionValue(AnalyticsStore& store, const Fields& fields, ImportedRows& imported) {
  if (fields.count != 5) return "a distribution value has 5 fields: d KEY DAY SECONDS VALUE";
  if (Failure failure = keyFailure(fields.field[1])) return failure;
  const auto day = parseRecordDay(fields.field[2]);
  if (!day) return "the day is not a whole number of 32 bits";
  const auto seconds = parseWhole<std::int32_t>(fields.field[3]);
  if (!seconds || *seconds < 0 || *seconds >= kSecondsPerDay) return "the seconds are not from 0 to 86399";
  const auto value = parseRecordReal(fields.field[4]);
  if (!value) return "the value is not a finite number or \"nan\"";
  ++imported.distributionValues;
  return failureOf(store.appendDistributionValues(fields.field[1], *day, *seconds, {&*value, 1}));
}

Failure loadLine(AnalyticsStore& store, std::string_view line, ImportedRows& imported) {
  const Fields fields(line);
  if (fields.field[0] == "s") return loadScalar(store, fields, imported);
  if (fields.field[0] == "d") return loadDistributionValue(store, fields, imported);
  return R"(the first field is neither "s" nor "d")";
}

Failure atLine(std::uint64_t number, const std::string& reason) {
  return "line " + std::to_string(number) + ": " + reason;
}

Failure loadLines(AnalyticsStore& store, std::FILE* input, const ImportProgress& progress,
                  ImportedRows& imported) {
  LineReader lines(input, progress);
  std::string_view line;
  for (std::uint64_t number = 1;; ++number) {
    switch (lines.next(line)) {
      case LineReader::Outcome::End:
        return std::nullopt;
      case LineReader::Outcome::Failed:
        return "the input cannot be read: " + errorText(errno);
      case LineReader::Outcome::TooLong:
        return atLine(number, "longer than 64 KiB");
      case LineReader::Outcome::Line:
        if (line.empty()) continue;
        if (Failure failure = loadLine(store, line, imported)) return atLine(number, *failure);
    }
  }
}

}  // namespace

RecordTime recordTime(PlistDate now, std::optional<DayNumber> day) {
  const DayNumber today = dayNumberOf(now);
  if (day.value_or(today) != today) return {*day, 0};
  const double seconds = std::floor(now.secondsSinceReference - dateOf(today).secondsSinceReference);
  const bool isInDay = seconds >= 0 && seconds < static_cast<double>(kSecondsPerDay);
  return {today, isInDay ? static_cast<std::int32_t>(seconds) : 0};
}

Failure recordScalar(AnalyticsStore& store, std::string_view key, DayNumber day, std::int64_t value,
                     ScalarChange change) {
  if (Failure failure = keyFailure(key)) return failure;
  return failureOf(change == ScalarChange::Add ? store.addScalar(key, day, value)
                                               : store.setScalar(key, day, value));
}

Failure recordDistribution(AnalyticsStore& store, std::string_view key, RecordTime time,
                           std::span<const double> values) {
  if (Failure failure = keyFailure(key)) return failure;
  for (const double value : values) {
    if (std::isinf(value)) return "a value is infinite";
  }
  return failureOf(store.appendDistributionValues(key, time.day, time.secondsInDay, values));
}

Failure recordPrune(AnalyticsStore& store, DayNumber beforeDay, Pruning pruning, PrunedRows& pruned) {
  return failureOf(store.prune(beforeDay, pruning, pruned));
}

std::optional<std::int64_t> parseRecordInteger(std::string_view text) {
  return parseWhole<std::int64_t>(text);
}

std::optional<DayNumber> parseRecordDay(std::string_view text) {
  return parseWhole<DayNumber>(text);
}

std::optional<double> parseRecordReal(std::string_view text) {
  const std::optional<double> value = parseWhole<double>(text);
  return value && !std::isinf(*value) ? value : std::nullopt;
}

Failure recordImport(AnalyticsStore& store, std::FILE* input, const ImportProgress& progress,
                     ImportedRows& imported) {
  imported = {};
  if (Failure failure = failureOf(store.beginLoad())) return failure;
  ImportedRows loaded;
  Failure failure = loadLines(store, input, progress, loaded);
  if (failure) {
    store.rollbackLoad();
    return failure;
  }
  failure = failureOf(store.commitLoad());
  if (!failure) imported = loaded;
  return failure;
}

}  // namespace tbdaily
