#include "tools/tallyctl/metrics/watch_rows.h"

#include <algorithm>

#include "tools/tallyctl/metrics/channel_text.h"
#include "tools/tallyctl/metrics/figures.h"

namespace tbdaily {

using namespace kdreport;

namespace {

constexpr std::size_t kMostShares = 6;
constexpr double kLeastShare = 0.0005;  // less is shown as 0.0 %

char lowered(char c) {
  return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

bool contains(std::string_view text, std::string_view part) {
  return std::search(text.begin(), text.end(), part.begin(), part.end(),
                     [](char left, char right) { return lowered(left) == lowered(right); }) != text.end() ||
         part.empty();
}

bool isSameChannel(const ChannelValues& left, const ChannelValues& right) {
  return left.driverID == right.driverID && left.channelID == right.channelID && left.format == right.format;
}

// The partners of channels that are asked for in their order, which is nearly always that of the sample.
class Partners {
 public:
  explicit Partners(const std::vector<ChannelValues>& channels) : channels_(channels) {}

  const ChannelValues* of(const ChannelValues& channel) {
    const auto isIt = [&channel](const ChannelValues& other) { return isSameChannel(channel, other); };
    if (next_ == channels_.size() || !isIt(channels_[next_])) {
      const auto found = std::ranges::find_if(channels_, isIt);
      if (found == channels_.end()) return nullptr;
      next_ = static_cast<std::size_t>(found - channels_.begin());
    }
    return &channels_[next_++];
  }

 private:
  const std::vector<ChannelValues>& channels_;
  std::size_t next_ = 0;
};

// Later minus earlier, as the library has it; kKdReportInvalid when one of them is missing.
std::int64_t difference(std::int64_t later, std::int64_t earlier) {
  if (later == kKdReportInvalid || earlier == kKdReportInvalid) return kKdReportInvalid;
  return static_cast<std::int64_t>(static_cast<std::uint64_t>(later) - static_cast<std::uint64_t>(earlier));
}

std::string rateOf(std::int64_t change, std::int64_t unit, double seconds) {
  if (change == kKdReportInvalid || seconds <= 0) return {};
  return humanRate(static_cast<double>(change) / seconds, unit);
}

// The share of each state in the time since then.
std::vector<double> sharesSince(const ChannelValues& channel, const ChannelValues* earlier) {
  std::vector<double> shares;
  double total = 0;
  if (earlier != nullptr && earlier->states.size() == channel.states.size()) {
    for (std::size_t i = 0; i < channel.states.size(); ++i) {
      const std::int64_t time = difference(channel.states[i].residency, earlier->states[i].residency);
      shares.push_back(time == kKdReportInvalid ? 0 : static_cast<double>(time));
      total += shares.back();
    }
  }
  if (total > 0) {
    for (double& share : shares) share /= total;
    return shares;
  }
  shares.clear();
  for (const StateValues& state : channel.states) shares.push_back(state.dutyCycle);
  return shares;
}

std::string sharesText(const ChannelValues& channel, const std::vector<double>& shares) {
  std::vector<std::size_t> order;
  for (std::size_t i = 0; i < shares.size(); ++i) {
    if (shares[i] >= kLeastShare) order.push_back(i);
  }
  std::ranges::sort(order, [&shares](std::size_t left, std::size_t right) {
    return shares[left] != shares[right] ? shares[left] > shares[right] : left < right;
  });
  std::string text;
  for (std::size_t i = 0; i < std::min(order.size(), kMostShares); ++i) {
    text.append(text.empty() ? "" : "  ").append(stateName(channel.states[order[i]])).append(" ");
    text.append(percentage(shares[order[i]]));
  }
  return text.append(order.size() > kMostShares ? "  ..." : "");
}

WatchRow rowOf(const ChannelValues& channel, const ChannelValues* earlier, double seconds) {
  WatchRow row;
  row.name = nameOf(channel);
  switch (channel.format) {
    case kKdReportSimple:
      row.figure = shortValue(channel);
      row.human = humanFigure(channel.value, channel.unit);
      if (earlier != nullptr)
        row.rate = rateOf(difference(channel.value, earlier->value), channel.unit, seconds);
      break;
    case kKdReportHistogram:
      row.figure = shortValue(channel);
      if (earlier != nullptr) row.rate = rateOf(difference(allHits(channel), allHits(*earlier)), 0, seconds);
      break;
    case kKdReportState:
      row.shares = sharesText(channel, sharesSince(channel, earlier));
      if (const std::string current = shortValue(channel); current != "-")
        row.shares = "[" + current + "]" + (row.shares.empty() ? "" : "  " + row.shares);
      break;
    default:
      row.shares = shortValue(channel);
  }
  return row;
}

}  // namespace

std::vector<WatchRow> watchRows(const std::vector<ChannelValues>& channels, const EarlierSample& earlier,
                                std::string_view filter) {
  std::vector<WatchRow> rows;
  std::vector<std::string> heading;
  Partners partners(earlier.channels);
  for (const ChannelValues& channel : channels) {
    const ChannelValues* partner = partners.of(channel);
    if (!contains(wholeName(channel), filter)) continue;
    const std::vector<std::string> path = pathOf(channel);
    if (path != heading) {
      WatchRow& row = rows.emplace_back();
      row.isHeading = true;
      for (const std::string& step : path) row.name.append(row.name.empty() ? "" : " / ").append(step);
      heading = path;
    }
    rows.push_back(rowOf(channel, partner, earlier.secondsAgo));
  }
  return rows;
}

}  // namespace tbdaily
