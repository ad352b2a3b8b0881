#include "tools/tallyctl/report/key_stories.h"

#include <limits>
#include <map>

#include "platform/platform.h"
#include "platform/plist_text.h"
#include "platform/preferences_store.h"
#include "tools/tallyctl/store_copy.h"
#include "tools/tallyctl/whitelist_review.h"

namespace tbdaily {

namespace {

constexpr std::string_view kRules[] = {whitelist_option::kBucketInterval,
                                       whitelist_option::kSignificantFigures, whitelist_option::kIntervals};

// As if nobody had switched a group off.
class AllGroupsOn : public PreferencesStore {
 public:
  explicit AllGroupsOn(PreferencesStore& real) : real_(real) {}
  PlistValue getValue(std::string_view key, std::string_view domain) override {
    return domain == preference_domain::kTaskingValues ? PlistValue() : real_.getValue(key, domain);
  }
  void setValue(std::string_view, const PlistValue&, std::string_view) override {}
  void synchronize(std::string_view) override {}

 private:
  PreferencesStore& real_;
};

struct RecordedKeys {
  std::map<std::string, std::int64_t, std::less<>> scalars;        // to their values
  std::map<std::string, std::int64_t, std::less<>> distributions;  // to how many values they have
};

// A report takes the rows of the day and of the day before, the later ones last.
Outcome<RecordedKeys> recordedKeys(LinuxPlatform& platform, DayNumber day) {
  RecordedKeys recorded;
  const auto opened = openHistoryCopy(platform);
  if (!opened) return Failure{opened.reason()};
  OpenAnalyticsHistory* const history = opened->get();
  const DayNumber previous = day == std::numeric_limits<DayNumber>::min() ? day : day - 1;
  history->enumerateScalars("", previous, day,
                            [&](std::string_view key, DayNumber, std::int64_t value, bool&) {
                              recorded.scalars.insert_or_assign(std::string(key), value);
                            });
  history->enumerateDistributions(
      "", previous, day, [&](std::string_view key, DayNumber, DistributionEnumerator& values, bool&) {
        std::int64_t count = 0;
        values.visitValues([&count](double, std::int32_t) { ++count; });
        recorded.distributions.insert_or_assign(std::string(key), count);
      });
  if (!history->isWhole()) return Failure{kPartOfRows};
  return recorded;
}

class Storyteller {
 public:
  Storyteller(const TBConfig& whitelist, const TBConfig* withAllGroups)
      : whitelist_(whitelist), withAllGroups_(withAllGroups) {}

  void tellReported(const DailyReport& report, const RecordedKeys& recorded) {
    for (const auto& [key, value] : report.scalars()) {
      const auto number = value.asNumber();
      add(key, KeyKind::Scalar, recorded.scalars, number ? std::optional(number->toInt64()) : std::nullopt);
    }
    for (const auto& [key, value] : report.distributions()) {
      const auto statistics = distributionStatistics(value);
      add(key, KeyKind::Distribution, recorded.distributions,
          statistics ? std::optional(statistics->count) : std::nullopt);
    }
  }
  void tellKept(const DailyReport& report, const RecordedKeys& recorded) {
    for (const auto& [key, value] : recorded.scalars) {
      if (!report.scalars().contains(key)) keep(key, KeyKind::Scalar, value);
    }
    for (const auto& [key, count] : recorded.distributions) {
      if (!report.distributions().contains(key)) keep(key, KeyKind::Distribution, count);
    }
  }
  std::vector<KeyStory> take() { return std::move(stories_); }

 private:
  void add(const std::string& key, KeyKind kind,
           const std::map<std::string, std::int64_t, std::less<>>& recorded,
           std::optional<std::int64_t> reported) {
    KeyStory story{key, kind, std::nullopt, reported, {}, {}};
    if (const auto found = recorded.find(key); found != recorded.end()) story.recorded = found->second;
    const auto match = whitelist_.match(kind, key);
    if (match && match->options != nullptr) story.rule = ruleText(*match->options);
    stories_.push_back(std::move(story));
  }
  void keep(const std::string& key, KeyKind kind, std::int64_t recorded) {
    stories_.push_back({key, kind, recorded, std::nullopt, {}, reasonOf(kind, key)});
  }
  std::string reasonOf(KeyKind kind, const std::string& key) const {
    if (const auto entry = whitelist_.unreadableEntry(kind, key))
      return "the rules of " + std::string(entry->group) + "/" + std::string(entry->entry) +
             " cannot be read";
    if (whitelist_.match(kind, key)) return "it was recorded after the report was written";
    const auto match = withAllGroups_ != nullptr ? withAllGroups_->match(kind, key) : std::nullopt;
    if (match) return "the group " + std::string(match->group) + " is switched off";
    return "the whitelist does not have it";
  }

  const TBConfig& whitelist_;
  const TBConfig* withAllGroups_;
  std::vector<KeyStory> stories_;
};

}  // namespace

std::string ruleText(const PlistDictionary& options) {
  std::string text;
  for (const std::string_view rule : kRules) {
    const PlistValue value = options.get(rule);
    if (value.isNone()) continue;
    text.append(text.empty() ? "" : ", ").append(rule);
    const PlistArray* boundaries = value.asArray();
    if (boundaries == nullptr) text.append(" ").append(plistText(value));
    if (boundaries == nullptr) continue;
    for (const PlistValue& boundary : *boundaries)
      text.append(&boundary == &boundaries->front() ? " " : " | ").append(plistText(boundary));
  }
  return text;
}

Outcome<std::unique_ptr<WhitelistReview>> whitelistOf(LinuxPlatform& platform, const DailyReport& report) {
  auto review = reviewWhitelist(platform.services());
  if (!review->config) return Failure{"the whitelist cannot be loaded; tallyctl whitelist check says why"};
  const PlistValue digest = report.root().get("TBWhitelistDigest");
  if (digest.asString() != review->config->configFileDigest())
    return Failure{"the report was made with another whitelist than this device has"};
  return review;
}

Outcome<std::vector<KeyStory>> keyStories(LinuxPlatform& platform, const DailyReport& report) {
  const auto review = whitelistOf(platform, report);
  if (!review) return Failure{review.reason()};
  const auto start = report.start();
  if (!start) return Failure{"the report names no day"};
  const auto recorded = recordedKeys(platform, dayNumberOf(*start));
  if (!recorded) return Failure{recorded.reason()};

  AllGroupsOn preferences(platform.services().preferences);
  CapturedLog log;
  Platform services = platformWith(platform.services(), preferences, log);
  const auto withAllGroups = TBConfig::init(services);
  Storyteller teller(*(*review)->config, withAllGroups.get());
  teller.tellReported(report, *recorded);
  teller.tellKept(report, *recorded);
  return teller.take();
}

}  // namespace tbdaily
