#include "tools/tallyctl/metrics/hub_advance.h"

#include <algorithm>
#include <array>
#include <bit>
#include <optional>
#include <vector>

#include "drivermetrics/kd_report.h"
#include "tools/tallyctl/metrics/hub_legends.h"
#include "tools/tallyctl/noise.h"

namespace tbdaily {

using namespace kdreport;

namespace {

// Stamps count the ticks of a clock of this rate.
constexpr std::uint64_t kTicksPerSecond = 24'000'000;

// How many stretches of time a state channel is moved in at most: more transitions than that are entered
// together.
constexpr std::uint64_t kMostStretches = 64;

// Quantities that are measured rather than counted.
constexpr std::array<std::uint8_t, 7> kMeasuredQuantities = {
    kKdReportPower,      kKdReportCurrent,   kKdReportVoltage,    kKdReportCapacitance,
    kKdReportInductance, kKdReportFrequency, kKdReportTemperature};

constexpr std::size_t kStateWords = state_word::kResidency + 1;

struct Element {
  std::uint64_t stamp = 0;
  std::array<std::uint64_t, kElementWords> words{};
  std::size_t wordCount = 0;  // how many are recorded
};

void grow(std::uint64_t& value, std::uint64_t by) {
  if (value != static_cast<std::uint64_t>(kKdReportInvalid)) value += by;
}

std::uint64_t latestStamp(const std::vector<Element>& elements) {
  std::uint64_t latest = 0;
  for (const Element& element : elements) latest = std::max(latest, element.stamp);
  return latest;
}

// One channel on its way from its latest stamp to so many seconds later.
class ChannelMotion {
 public:
  ChannelMotion(std::int64_t driver, std::int64_t channel, ChannelMeaning meaning, std::uint64_t seconds,
                std::vector<Element>& elements)
      : meaning_(std::move(meaning)),
        seconds_(seconds),
        elements_(elements),
        start_(latestStamp(elements)),
        noise_(static_cast<std::uint64_t>(driver) * 31 + static_cast<std::uint64_t>(channel) * 7 + start_) {}

  // Whether values of this format can be moved, and were.
  bool run(std::uint8_t format) {
    switch (format) {
      case kKdReportSimple:
        elements_[0].wordCount = std::max<std::size_t>(elements_[0].wordCount, 1);
        elements_[0].words[0] = moved(elements_[0].words[0]);
        elements_[0].stamp = stampAfter(1, 1);
        return true;
      case kKdReportState:
        moveStates();
        return true;
      case kKdReportHistogram:
        return moveBuckets();
      case kKdReportArray:
        moveArray();
        return true;
      default:
        return false;
    }
  }

 private:
  std::uint64_t stampAfter(std::uint64_t part, std::uint64_t parts) const {
    return start_ + kTicksPerSecond * seconds_ / parts * part;
  }

  std::uint64_t moved(std::uint64_t value) {
    const auto quantity = meaning_.quantity();
    const bool isMeasured = quantity && std::ranges::count(kMeasuredQuantities, *quantity) != 0;
    if (value == static_cast<std::uint64_t>(kKdReportInvalid)) return value;
    if (isMeasured) return nearby(value);
    if (const auto most = meaning_.unitsIn(seconds_)) return value + *most / 100 * noise_.below(100) + 1;
    // What is large became so since the device started; small counts move now and then.
    constexpr unsigned kPaceShift = 18;
    const std::uint64_t pace = static_cast<std::int64_t>(value) > 0 ? value >> kPaceShift : 0;
    return value + 1 + noise_.below(seconds_ / 64 + 2) + pace * seconds_;
  }

  // Another value that has all but the lowest bits in common, so that a measure never runs away.
  std::uint64_t nearby(std::uint64_t value) {
    const std::uint64_t magnitude = static_cast<std::int64_t>(value) < 0 ? 0 - value : value;
    const std::uint64_t band = std::max<std::uint64_t>(std::bit_floor(magnitude) / 32, 2);
    const std::uint64_t next = (value & ~(band - 1)) | noise_.below(band);
    return next != value ? next : value ^ 1U;
  }

  void moveArray() {
    for (Element& element : elements_) {
      for (std::size_t i = 0; i < element.wordCount; ++i) element.words[i] = moved(element.words[i]);
      element.stamp = stampAfter(1, 1);
    }
  }

  // Stays in a state for one stretch of time after the other and changes after some of them.
  void moveStates() {
    const std::uint64_t total = meaning_.unitsIn(seconds_).value_or(seconds_);
    const std::uint64_t stretches = std::min(seconds_, kMostStretches);
    const auto latest = std::ranges::max_element(elements_, {}, &Element::stamp);
    auto current = static_cast<std::size_t>(latest - elements_.begin());
    for (Element& state : elements_) state.wordCount = std::max(state.wordCount, kStateWords);
    for (std::uint64_t i = 0; i < stretches; ++i) {
      const std::uint64_t now = stampAfter(i + 1, stretches);
      grow(elements_[current].words[state_word::kResidency], total / stretches + (i < total % stretches));
      elements_[current].stamp = now;
      if (elements_.size() == 1 || noise_.below(4) != 0) continue;
      --elements_[current].stamp;  // left just before the other one is entered
      current = (current + 1 + noise_.below(elements_.size() - 1)) % elements_.size();
      grow(elements_[current].words[state_word::kTransitions], seconds_ / stretches);
      elements_[current].stamp = now;
    }
  }

  bool moveBuckets() {
    const std::vector<std::int64_t> bounds = meaning_.bucketBounds(elements_.size());
    bool isHit = false;
    for (std::size_t i = 0; i < bounds.size(); ++i) {
      std::uint64_t hits = noise_.below(4) * seconds_;
      if (i + 1 == bounds.size() && !isHit) hits = std::max(hits, seconds_);
      if (hits == 0) continue;
      isHit = true;
      hitBucket(elements_[i], i == 0 ? 0 : bounds[i - 1], bounds[i], hits);
    }
    return isHit;
  }

  // So many values from the lower bound to just below the upper one.
  void hitBucket(Element& bucket, std::int64_t lower, std::int64_t upper, std::uint64_t hits) {
    const auto width = static_cast<std::uint64_t>(upper - lower);
    const auto start = static_cast<std::uint64_t>(lower);
    std::uint64_t low = start + noise_.below(width), high = start + noise_.below(width);
    if (low > high) std::swap(low, high);
    if (hits == 1) high = low;
    const std::uint64_t sum = hits == 1 ? low : low + high + (low + (high - low) / 2) * (hits - 2);

    auto& words = bucket.words;
    const bool isFirst = words[histogram_word::kHits] == 0;
    words[histogram_word::kMinimum] = isFirst ? low : std::min(words[histogram_word::kMinimum], low);
    words[histogram_word::kMaximum] = isFirst ? high : std::max(words[histogram_word::kMaximum], high);
    if (isFirst) words[histogram_word::kSum] = 0;
    grow(words[histogram_word::kSum], sum);
    grow(words[histogram_word::kHits], hits);
    bucket.wordCount = words.size();
    bucket.stamp = stampAfter(1, 1);
  }

  const ChannelMeaning meaning_;
  const std::uint64_t seconds_;
  std::vector<Element>& elements_;
  const std::uint64_t start_;
  Noise noise_;
};

std::optional<Element> parseElement(const PlistValue& value) {
  const PlistDictionary* dictionary = value.asDictionary();
  if (dictionary == nullptr) return std::nullopt;
  const auto stamp = dictionary->get("stamp").asInteger();
  const PlistValue words = dictionary->get("words");
  if (!stamp || words.asArray() == nullptr || words.asArray()->size() > kElementWords) return std::nullopt;
  Element element{static_cast<std::uint64_t>(*stamp), {}, 0};
  for (const PlistValue& word : *words.asArray()) {
    if (!word.asInteger()) return std::nullopt;
    element.words[element.wordCount++] = static_cast<std::uint64_t>(*word.asInteger());
  }
  return element;
}

// Empty when any of them is malformed.
std::vector<Element> parseElements(const PlistValue& recorded) {
  std::vector<Element> elements;
  if (recorded.asArray() == nullptr) return elements;
  elements.reserve(recorded.asArray()->size());
  for (const PlistValue& value : *recorded.asArray()) {
    const auto element = parseElement(value);
    if (!element) return {};
    elements.push_back(*element);
  }
  return elements;
}

PlistValue withValues(const PlistValue& recorded, const Element& element) {
  const auto number = [](std::uint64_t n) { return PlistValue::int64(static_cast<std::int64_t>(n)); };
  PlistArray words;
  for (std::size_t i = 0; i < element.wordCount; ++i) words.push_back(number(element.words[i]));
  PlistDictionary dictionary = *recorded.asDictionary();
  dictionary.set("stamp", number(element.stamp));
  dictionary.set("words", PlistValue::array(std::move(words)));
  return PlistValue::dictionary(std::move(dictionary));
}

// The channel after so many seconds; nothing when it does not move.
std::optional<PlistValue> advancedChannel(const PlistValue& value, const HubLegends& legends,
                                          std::uint64_t seconds) {
  const PlistDictionary* channel = value.asDictionary();
  if (channel == nullptr) return std::nullopt;
  const auto driver = channel->get("driver").asInteger(), identifier = channel->get("channel").asInteger();
  const auto type = channel->get("type").asInteger();
  const PlistValue recorded = channel->get("elements");
  std::vector<Element> elements = parseElements(recorded);
  if (!driver || !identifier || !type || elements.empty()) return std::nullopt;
  ChannelMotion motion(*driver, *identifier, legends.meaningOf(*driver, *identifier), seconds, elements);
  if (!motion.run(ChannelType{static_cast<std::uint64_t>(*type)}.format())) return std::nullopt;

  PlistArray advanced;
  advanced.reserve(elements.size());
  for (std::size_t i = 0; i < elements.size(); ++i)
    advanced.push_back(withValues((*recorded.asArray())[i], elements[i]));
  PlistDictionary result = *channel;
  result.set("elements", PlistValue::array(std::move(advanced)));
  return PlistValue::dictionary(std::move(result));
}

}  // namespace

AdvancedHub advancedHub(const PlistValue& hubRoot, const PlistValue& registryRoot, std::uint64_t seconds) {
  AdvancedHub hub{hubRoot, 0};
  const PlistDictionary* root = hubRoot.asDictionary();
  const PlistValue recorded = root != nullptr ? root->get("channels") : PlistValue();
  if (recorded.asArray() == nullptr || seconds == 0) return hub;
  const HubLegends legends(registryRoot);
  PlistArray channels = *recorded.asArray();
  for (PlistValue& channel : channels) {
    if (auto advanced = advancedChannel(channel, legends, seconds)) {
      channel = *std::move(advanced);
      ++hub.channels;
    }
  }
  PlistDictionary result = *root;
  result.set("channels", PlistValue::array(std::move(channels)));
  hub.root = PlistValue::dictionary(std::move(result));
  return hub;
}

}  // namespace tbdaily
