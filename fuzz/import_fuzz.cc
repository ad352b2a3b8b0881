// Import lines into a store: what a plain reading of the lines says is in it afterwards, or nothing at all.
#include <cmath>
#include <map>
#include <memory>
#include <vector>

#include "fuzz/input.h"
#include "platform/linux/store/sqlite_analytics_history.h"
#include "testing/temporary_folder.h"
#include "tools/tallyctl/record.h"

using namespace tbdaily;
using fuzz::require;

namespace {

using Row = std::pair<std::string, DayNumber>;
struct Rows {
  std::map<Row, std::int64_t> scalars;
  std::map<Row, std::vector<double>> distributions;
};

std::vector<std::string> split(const std::string& text, char separator) {
  std::vector<std::string> parts(1);
  for (const char c : text) c == separator ? void(parts.emplace_back()) : parts.back().push_back(c);
  return parts;
}

// The rows of lines of which each can be taken.
Rows rowsOf(const std::string& text) {
  Rows rows;
  for (std::string& line : split(text, '\n')) {
    if (line.ends_with('\r')) line.pop_back();
    if (line.empty()) continue;
    const std::vector<std::string> fields = split(line, '\t');
    const bool isScalar = fields[0] == "s";
    require(fields.size() == (isScalar ? 4U : 5U), "a line that was taken has all fields");
    const auto day = parseRecordDay(fields[2]);
    require(day.has_value(), "a line that was taken has a day");
    if (isScalar) {
      rows.scalars[{fields[1], *day}] = parseRecordInteger(fields[3]).value();
    } else {
      rows.distributions[{fields[1], *day}].push_back(parseRecordReal(fields[4]).value());
    }
  }
  return rows;
}

bool areEqual(const std::vector<double>& a, const std::vector<double>& b) {
  return std::ranges::equal(a, b,
                            [](double x, double y) { return x == y || (std::isnan(x) && std::isnan(y)); });
}

void holds(OpenAnalyticsHistory& history, Rows expected) {
  constexpr auto kFirst = std::numeric_limits<DayNumber>::min(),
                 kLast = std::numeric_limits<DayNumber>::max();
  history.enumerateScalars(
      "", kFirst, kLast, [&](std::string_view key, DayNumber day, std::int64_t value, bool&) {
        const auto row = expected.scalars.extract({std::string(key), day});
        require(!row.empty() && row.mapped() == value, "a scalar is what its last line says");
      });
  history.enumerateDistributions(
      "", kFirst, kLast, [&](std::string_view key, DayNumber day, DistributionEnumerator& values, bool&) {
        std::vector<double> all;
        std::int32_t seconds = 0;
        for (double value = 0; values.nextValue(value, seconds);) all.push_back(value);
        const auto row = expected.distributions.extract({std::string(key), day});
        require(!row.empty() && areEqual(row.mapped(), all),
                "a distribution has the values of its lines in their order");
      });
  require(history.isWhole() && expected.scalars.empty() && expected.distributions.empty(),
          "no row is missing");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  if (size == 0) return 0;
  const testing::TemporaryFolder folder;
  const DeviceFiles files{folder.path()};
  const StorePlace place = storePlaceOf(files, "/store");
  const std::string text(reinterpret_cast<const char*>(data), size);
  ImportedRows imported;
  bool failed = false;
  {
    AnalyticsStore store(place);
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> input(
        ::fmemopen(const_cast<char*>(text.data()), text.size(), "r"), &std::fclose);
    failed = recordImport(store, input.get(), {}, imported).has_value();
  }
  if (failed)
    require(imported.scalars == 0 && imported.distributionValues == 0, "a failed import counts nothing");
  const auto history = SqliteAnalyticsHistory([&place] { return std::optional(place); }).open();
  if (history != nullptr) holds(*history, failed ? Rows{} : rowsOf(text));
  return 0;
}
