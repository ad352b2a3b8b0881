#include "tools/tallyctl/metrics/channel_text.h"

#include <array>
#include <cmath>
#include <cstdio>
#include <map>

#include "platform/calendar.h"

namespace tbdaily {

using namespace kdreport;

namespace {

std::string hexadecimal(std::int64_t value) {
  if (value == kKdReportInvalid) return "-";
  std::array<char, 24> buffer;
  std::snprintf(buffer.data(), buffer.size(), "%#llx", static_cast<unsigned long long>(value));
  return buffer.data();
}

}  // namespace

std::string numberText(std::int64_t value) {
  return value != kKdReportInvalid ? std::to_string(value) : "-";
}

std::string percentage(double share) {
  if (std::isnan(share)) return "-";
  std::array<char, 32> buffer;
  std::snprintf(buffer.data(), buffer.size(), "%.1f%%", share * 100);
  return buffer.data();
}

std::string nameOf(const ChannelValues& channel) {
  return channel.name ? *channel.name : hexadecimal(channel.channelID);
}

std::string stateName(const StateValues& state) {
  return state.name ? *state.name : hexadecimal(state.id);
}

std::vector<std::string> pathOf(const ChannelValues& channel) {
  std::vector<std::string> path{channel.driver ? *channel.driver : "(no driver)"};
  if (channel.group) path.push_back(*channel.group);
  if (channel.group && channel.subGroup) path.push_back(*channel.subGroup);
  return path;
}

std::string wholeName(const ChannelValues& channel) {
  std::string whole;
  for (const std::string& step : pathOf(channel)) whole.append(step).append("/");
  return whole + nameOf(channel);
}

std::string withUnit(const std::string& value, const ChannelValues& channel) {
  return channel.unitLabel.value_or("").empty() ? value : value + " " + *channel.unitLabel;
}

std::int64_t allHits(const ChannelValues& channel) {
  std::uint64_t hits = 0;
  for (const BucketValues& bucket : channel.buckets) {
    if (bucket.hits == kKdReportInvalid) return kKdReportInvalid;
    hits += static_cast<std::uint64_t>(bucket.hits);
  }
  return static_cast<std::int64_t>(hits);
}

std::string shortValue(const ChannelValues& channel) {
  switch (channel.format) {
    case kKdReportSimple:
      return withUnit(numberText(channel.value), channel);
    case kKdReportState:
      return channel.currentState < channel.states.size() ? stateName(channel.states[channel.currentState])
                                                          : "-";
    case kKdReportHistogram: {
      const std::int64_t hits = allHits(channel);
      return hits != kKdReportInvalid ? numberText(hits) + " hits" : "-";
    }
    case kKdReportArray: {
      std::string text;
      for (const std::int64_t value : channel.array)
        text.append(text.empty() ? "" : ",").append(numberText(value));
      return withUnit(text.empty() ? "-" : text, channel);
    }
    default:
      return "-";
  }
}

std::string valuesLine(PlistDate time, const std::vector<ChannelValues>& channels) {
  std::map<std::string, std::size_t> uses;
  for (const ChannelValues& channel : channels) ++uses[nameOf(channel)];
  std::string line = stampText(time, 3);
  for (const ChannelValues& channel : channels) {
    const std::string name = nameOf(channel);
    line.append("  ").append(uses[name] > 1 ? wholeName(channel) : name);
    line.append("=").append(shortValue(channel));
  }
  return line;
}

}  // namespace tbdaily
