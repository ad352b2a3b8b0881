// Whitelists: every look-up answers as a plain search through the file does, values are coarsened as far as
// the options say, and a report carries nothing that is not listed.
#include "fuzz/plist_input.h"
#include "report/internal_device.h"
#include "report/scalar_rounding.h"
#include "report/tb_report.h"
#include "testing/fake_platform.h"

using namespace tbdaily;
using fuzz::Input;
using fuzz::require;

namespace {

constexpr std::array<std::string_view, 19> kWords = {"Daily",
                                                     "InternalTesting",
                                                     "ScalarKeys",
                                                     "DistributionKeys",
                                                     "ScalarKeyPrefixes",
                                                     "DistributionKeyPrefixes",
                                                     "bucket_interval",
                                                     "sig_fig",
                                                     "intervals",
                                                     "com.velmora.a",
                                                     "com.velmora.",
                                                     "com.velmora.ab",
                                                     "com",
                                                     "c",
                                                     "",
                                                     "b",
                                                     "com.velmora.databaseSize",
                                                     "com.velmora.cpuUptime",
                                                     "Network"};
constexpr DayNumber kDay = 20000;

bool areNumbers(const PlistValue& value) {
  return value.asArray() != nullptr &&
         std::ranges::all_of(*value.asArray(), [](const PlistValue& v) { return v.asNumber().has_value(); });
}

bool rulesAreReadable(const PlistValue& options) {
  const auto isAbsentOrNumber = [&options](std::string_view option) {
    return options.get(option).isNone() || options.get(option).asNumber().has_value();
  };
  return options.asDictionary() != nullptr && isAbsentOrNumber("bucket_interval") &&
         isAbsentOrNumber("sig_fig") &&
         (options.get("intervals").isNone() || areNumbers(options.get("intervals")));
}

// One table as it stands in the file: the entries of all groups that count, the later one in the place of
// the earlier.
PlistDictionary tableOf(const PlistValue& whitelist, const char* name, testing::FakePlatform& fake) {
  PlistDictionary table;
  const bool isInternal = fake.deviceAnswers.booleanAnswer("InternalBuild");
  for (const auto& [group, entries] : *whitelist.asDictionary()) {
    const auto enabled = testing::found(fake.preferences.domains, preference_domain::kTaskingValues)
                             .value_or(PlistDictionary())
                             .get(group)
                             .asBoolean();
    if (!isInternal && (group == "InternalTesting" || enabled == false)) continue;
    const PlistValue keys = entries.get(name);
    if (keys.asDictionary() == nullptr) continue;
    for (const auto& [key, options] : *keys.asDictionary()) {
      const bool isReadable = rulesAreReadable(options);
      table.set(key, isReadable ? options : PlistValue::boolean(false));
    }
  }
  return table;
}

// The options by a plain search: none when the key may not be reported.
PlistValue plainSearch(const PlistDictionary& exact, const PlistDictionary& prefixes, std::string_view key,
                       bool isInternal) {
  const PlistValue* found = exact.find(key);
  for (auto entry = prefixes.begin(); found == nullptr && entry != prefixes.end(); ++entry) {
    if (!entry->first.empty() && key.starts_with(entry->first)) found = &entry->second;
  }
  if (found == nullptr) return isInternal ? PlistValue::dictionary({}) : PlistValue();
  return found->asDictionary() != nullptr ? *found : PlistValue();
}

void roundsAsFarAsSaid(std::int64_t value, std::uint64_t interval, std::uint64_t figures) {
  constexpr std::int64_t kSafe = std::int64_t{1} << 61;
  const std::int64_t rounded = roundedToInterval(value, interval);
  if (interval > 0 && interval < kSafe && value > -kSafe && value < kSafe) {
    require(rounded % static_cast<std::int64_t>(interval) == 0, "a multiple of the interval");
    require(std::abs(rounded - value) <= static_cast<std::int64_t>(interval / 2 + interval % 2),
            "the nearest multiple");
  }
  if (value == 0) return;
  const std::int64_t kept = roundedToSignificantFigures(value, figures);
  require(kept == 0 || (kept < 0) == (value < 0), "the sign stays");
}

void checkReport(testing::FakePlatform& fake, const TBConfig& config) {
  TBReport report(fake.platform, {[] { return 1; }, [] { return 0; }});
  report.writeLogForYesterdayWithAppInfo(kDay, {});
  for (const auto& log : fake.logSubmission.logs) {
    const PlistValue root = fake.plistOf(log);
    require(root.asDictionary() != nullptr, "a report reads back");
    for (const auto& [table, kind] : {std::pair("TBScalars", KeyKind::Scalar),
                                      {"TBDistributions", KeyKind::Distribution},
                                      {"TBDistributionsHistogram", KeyKind::Distribution}}) {
      const PlistValue entries = root.get(table);
      require(entries.asDictionary() != nullptr, "a report has all tables");
      for (const auto& [key, value] : *entries.asDictionary())
        require(config.match(kind, key).has_value(), "a report carries nothing that is not listed");
    }
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  Input input(data, size);
  testing::FakePlatform fake;
  gInternalDeviceAnswer.once.reset();
  const bool isInternal = input.below(4) == 0;
  fake.deviceAnswers.answers.set("InternalBuild", PlistValue::boolean(isInternal));
  fake.preferences.domains[std::string(preference_domain::kTaskingValues)].set(
      "Network", PlistValue::boolean(input.flag()));
  roundsAsFarAsSaid(input.integer(), static_cast<std::uint64_t>(input.integer()),
                    static_cast<std::uint64_t>(input.integer()));
  std::vector<std::string> keys;
  for (std::size_t count = 1 + input.below(8); count > 0; --count) {
    std::string key = input.wordOrText(kWords);
    key += input.text();
    if (input.flag()) {
      fake.analyticsHistory.addScalar(key, kDay, input.integer());
    } else {
      fake.analyticsHistory.addDistribution(key, kDay,
                                            {input.number<double>(), static_cast<double>(input.integer())});
    }
    keys.push_back(std::move(key));
  }
  const auto list = fuzz::plistOf(input, kWords);
  if (list.asDictionary() == nullptr) return 0;
  // As a file would have it.
  const PlistWriteResult written = fake.propertyListCodec.write(list, PlistForm::Carried);
  require(written.ok, "a dictionary can be written");
  const PlistValue whitelist = fake.propertyListCodec.parse(std::as_bytes(std::span(written.bytes))).value;
  fake.putPlist(kWhitelistPath, whitelist.mutableDictionary());

  const std::unique_ptr<TBConfig> config = TBConfig::init(fake.platform);
  require(config != nullptr, "a whitelist that is a dictionary loads");
  const PlistDictionary exact[] = {tableOf(whitelist, "ScalarKeys", fake),
                                   tableOf(whitelist, "DistributionKeys", fake)};
  const PlistDictionary prefixes[] = {tableOf(whitelist, "ScalarKeyPrefixes", fake),
                                      tableOf(whitelist, "DistributionKeyPrefixes", fake)};
  for (const std::string& key : keys) {
    for (const bool isScalar : {true, false}) {
      const PlistDictionary* found =
          isScalar ? config->configOptionsForScalarKey(key) : config->configOptionsForDistributionKey(key);
      const PlistValue expected =
          plainSearch(exact[isScalar ? 0 : 1], prefixes[isScalar ? 0 : 1], key, isInternal);
      require((found != nullptr) == !expected.isNone(), "a key is allowed as the file says");
      require(found == nullptr || PlistValue::dictionary(*found) == expected,
              "with the options that the file says");
    }
  }
  checkReport(fake, *config);
  return 0;
}
