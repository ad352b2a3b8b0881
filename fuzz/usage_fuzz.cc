// Usage records against a baseline: keys and names that can be stored, and no more traffic when nothing
// came in between.
#include <cmath>
#include <set>

#include "driver/data_usage.h"
#include "fuzz/plist_input.h"
#include "platform/plist/codec.h"
#include "platform/utf8.h"

using namespace tbdaily;
using fuzz::Input;
using fuzz::require;

namespace {

constexpr std::array<std::string_view, 10> kWords = {"bundleName",   "procName",         "since",
                                                     "wifiInBytes",  "wifiOutBytes",     "wwanInBytes",
                                                     "wwanOutBytes", "org.example.maps", "org.example.chess",
                                                     "sync"};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  Input input(data, size);
  const auto yesterday = static_cast<DayNumber>(input.integer());
  const PlistValue stored = fuzz::plistOfSection(input, kWords);
  const PlistValue records = fuzz::plistOf(input, kWords);
  const PlistValue baseline = PlistValue::dictionary(
      compareUsage(records, stored, yesterday, [](std::string_view key, std::int64_t change) {
        require(key.starts_with("datausage.") && isCarriedText(key), "keys can be stored");
        require(change != 0, "an increment says something");
      }));

  PlistCodec codec;
  const PlistWriteResult written = codec.write(baseline);
  require(written.ok, "a baseline can be stored");
  require(codec.parse(std::as_bytes(std::span(written.bytes))).value == baseline,
          "a baseline reads back equal");
  std::size_t visited = 0;
  for (const auto& [name, entry] : *baseline.asDictionary()) {
    const PlistArray* counters = entry.asArray();
    require(
        counters != nullptr && counters->size() == 1 + kTrafficFields.size() && counters->front().asDate(),
        "an entry is a date and its counters");
    require(std::all_of(counters->begin() + 1, counters->end(),
                        [](const PlistValue& v) { return v.asNumber().has_value(); }),
            "counters are numbers");
    ++visited;
  }

  // One record a name, else the records of one name are compared with each other's.
  const PlistArray* all = records.asArray();
  if (all == nullptr || visited != all->size()) return 0;
  const PlistDictionary again = compareUsage(
      records, baseline, yesterday,
      [](std::string_view, std::int64_t) { require(false, "the same records again are no traffic"); });
  require(PlistValue::dictionary(again) == baseline, "the same records again are the same baseline");
  return 0;
}
