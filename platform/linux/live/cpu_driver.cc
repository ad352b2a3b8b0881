// Idle states, time and frequencies of the processors.
#include <unistd.h>

#include <array>
#include <charconv>
#include <numeric>

#include "platform/linux/live/live_drivers.h"

namespace tbdaily {

namespace {

constexpr std::string_view kProcessors = "/sys/devices/system/cpu";
constexpr std::string_view kStatistics = "/proc/stat";
constexpr std::array<std::string_view, 8> kTimes{"user",   "nice", "system",  "idle",
                                                 "iowait", "irq",  "softirq", "steal"};

// Clock ticks as microseconds.
LiveWord microseconds(Slot ticks) {
  constexpr std::int64_t kMicroseconds = 1'000'000;
  const std::int64_t perSecond = ::sysconf(_SC_CLK_TCK) > 0 ? ::sysconf(_SC_CLK_TCK) : 100;
  const std::int64_t common = std::gcd(kMicroseconds, perSecond);
  return {{ticks}, kMicroseconds / common, perSecond / common};
}

void addChannelOfStates(LiveDiscovery& discovery, std::string_view group, const std::string& instance,
                        std::string_view ending, std::vector<LiveElement> states) {
  if (states.empty()) return;
  discovery.add({std::string(group), instance, instance + std::string(ending), LiveUnit::Microseconds, true,
                 std::move(states)});
}

void addIdleStates(LiveDiscovery& discovery, const std::string& processor) {
  const std::string folder = pathOf({kProcessors, processor, "cpuidle"});
  StateIdentifiers identifiers;
  std::vector<LiveElement> states;
  for (const std::string& state : discovery.numbered(folder, "state")) {
    const std::optional<std::string> name = discovery.name(pathOf({folder, state, "name"}));
    const auto entries = discovery.number(pathOf({folder, state, "usage"}));
    const auto time = discovery.number(pathOf({folder, state, "time"}));
    if (!name || !entries || !time) continue;
    std::size_t number = 0;
    std::from_chars(state.data() + 5, state.data() + state.size(), number);
    states.push_back({identifiers.next(*name, number), {{*entries}}, {{*time}}});
  }
  addChannelOfStates(discovery, "idle", processor, ".idle", std::move(states));
}

void addTimes(LiveDiscovery& discovery, const std::string& processor) {
  StateIdentifiers identifiers;
  std::vector<LiveElement> states;
  for (std::size_t i = 0; i < kTimes.size(); ++i) {
    const auto ticks = discovery.cell(std::string(kStatistics), {.line = processor, .word = i});
    if (ticks) states.push_back({identifiers.next(kTimes[i], i), {}, microseconds(*ticks)});
  }
  addChannelOfStates(discovery, "time", processor, ".time", std::move(states));
}

// "3400MHz" for 3400000, rounded to the nearest.
std::string megahertz(std::int64_t kilohertz) {
  return std::to_string(kilohertz / 1000 + (kilohertz % 1000 >= 500 ? 1 : 0)) + "MHz";
}

void addFrequencies(LiveDiscovery& discovery, const std::string& policy) {
  const std::string file = pathOf({kProcessors, "cpufreq", policy, "stats/time_in_state"});
  const std::optional<std::string> text = discovery.text(file);
  if (!text) return;
  StateIdentifiers identifiers;
  std::vector<LiveElement> states;
  std::string_view rest = *text;
  for (std::size_t line = 0; !rest.empty(); ++line) {
    const std::string_view whole = takeLine(rest);
    const std::string frequency(whole.substr(0, whole.find(' ')));
    const auto kilohertz = liveNumber(frequency, NumberRange::Counter);
    const auto ticks = kilohertz ? discovery.cell(file, {.line = frequency}) : std::nullopt;
    if (ticks) states.push_back({identifiers.next(megahertz(*kilohertz), line), {}, microseconds(*ticks)});
  }
  addChannelOfStates(discovery, "frequency", policy, ".frequency", std::move(states));
}

// The processors that /proc/stat has a line for, by their numbers.
std::vector<std::string> processorsWithTimes(LiveDiscovery& discovery) {
  std::vector<std::string> processors;
  const std::optional<std::string>& text = discovery.text(std::string(kStatistics));
  std::string_view rest = text ? *text : std::string_view();
  while (!rest.empty()) {
    const std::string_view line = takeLine(rest);
    const std::string_view word = line.substr(0, line.find(' '));
    if (word.starts_with("cpu") && liveNumber(word.substr(3), NumberRange::Counter))
      processors.emplace_back(word);
  }
  sortByNumber(processors);
  return processors;
}

}  // namespace

void discoverProcessors(LiveDiscovery& discovery) {
  for (const std::string& processor : discovery.numbered(kProcessors, "cpu"))
    addIdleStates(discovery, processor);
  for (const std::string& processor : processorsWithTimes(discovery)) addTimes(discovery, processor);
  for (const std::string& policy : discovery.numbered(pathOf({kProcessors, "cpufreq"}), "policy"))
    addFrequencies(discovery, policy);
}

}  // namespace tbdaily
