#include "tools/tallyctl/metrics/view.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdio>
#include <map>

#include "platform/calendar.h"

namespace tbdaily {

using namespace kdreport;

namespace {

// With one digit behind the point.
std::string percentage(double share) {
  if (std::isnan(share)) return "-";
  std::array<char, 32> buffer;
  std::snprintf(buffer.data(), buffer.size(), "%.1f%%", share * 100);
  return buffer.data();
}

std::string number(std::int64_t value) {
  return value != kKdReportInvalid ? std::to_string(value) : "-";
}

std::string hexadecimal(std::int64_t value) {
  if (value == kKdReportInvalid) return "-";
  std::array<char, 24> buffer;
  std::snprintf(buffer.data(), buffer.size(), "%#llx", static_cast<unsigned long long>(value));
  return buffer.data();
}

std::string nameOf(const ChannelValues& channel) {
  return channel.name ? *channel.name : hexadecimal(channel.channelID);
}

std::string unitOf(const ChannelValues& channel) {
  return channel.unitLabel ? *channel.unitLabel : "";
}

std::string withUnit(const std::string& value, const ChannelValues& channel) {
  return channel.unitLabel.value_or("").empty() ? value : value + " " + unitOf(channel);
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

std::string indent(std::size_t depth) {
  return std::string(depth * 2, ' ');
}

// Prints the headings of channels as they come, those that the channel before does not share.
class Headings {
 public:
  explicit Headings(Terminal& out) : out_(out) {}

  bool isNew(const ChannelValues& channel) const { return pathOf(channel) != path_; }
  void enter(const ChannelValues& channel) {
    std::vector<std::string> path = pathOf(channel);
    const auto shared = std::mismatch(path.begin(), path.end(), path_.begin(), path_.end()).first;
    for (auto i = static_cast<std::size_t>(shared - path.begin()); i < path.size(); ++i)
      out_.line(indent(i) + out_.styled(path[i], i == 0 ? Style::Heading : Style::Plain));
    path_ = std::move(path);
  }
  // Of what stands below them; a table adds the first level itself.
  std::string belowInTable() const { return indent(path_.size() - 1); }
  std::string below() const { return indent(path_.size()); }

 private:
  Terminal& out_;
  std::vector<std::string> path_;
};

using enum Table::Align;

std::string unitWords(const ChannelValues& channel) {
  if (!channel.unitLabel) return "no unit";
  return channel.unitLabel->empty() ? "count" : unitOf(channel);
}

std::vector<ShownText> descriptionRow(const ChannelValues& channel) {
  std::array<char, 32> categories;
  std::snprintf(categories.data(), categories.size(), "categories 0x%04x", unsigned{channel.categories});
  return {nameOf(channel),
          formatName(channel.format),
          unitWords(channel),
          std::to_string(channel.elementCount),
          channel.elementCount == 1 ? "element" : "elements",
          categories.data()};
}

std::string residencyText(const ChannelValues& channel, std::int64_t residency) {
  if (const auto seconds = residencySeconds(channel, residency)) return sixDigits(*seconds) + " s";
  return withUnit(number(residency), channel);
}

void printStates(Terminal& out, const ChannelValues& channel, const std::string& indentation) {
  Table table({Left, Right, Right, Right, Left});
  table.add({indentation + "state", "entries", "time", "share"});
  for (std::size_t i = 0; i < channel.states.size(); ++i) {
    const StateValues& state = channel.states[i];
    table.add({indentation + stateName(state), number(state.entries), residencyText(channel, state.residency),
               percentage(state.dutyCycle), i == channel.currentState ? "<- current" : ""});
  }
  table.print(out);
}

void printBuckets(Terminal& out, const ChannelValues& channel, const std::string& indentation) {
  std::int64_t mostHits = 0;
  for (const BucketValues& bucket : channel.buckets) mostHits = std::max(mostHits, bucket.hits);
  const std::size_t barWidth = std::clamp<std::size_t>(out.width() / 4, 10, 40);
  Table table({Right, Right, Right, Right, Right, Right, Left});
  table.add({indentation + "from", "up to", "hits", "minimum", "maximum", "sum"});
  for (const BucketValues& bucket : channel.buckets) {
    table.add({indentation + number(bucket.lower), number(bucket.upper), number(bucket.hits),
               number(bucket.minimum), number(bucket.maximum), number(bucket.sum),
               out.bar(static_cast<double>(bucket.hits), static_cast<double>(mostHits), barWidth)});
  }
  table.print(out);
}

constexpr std::size_t kValuesPerRow = 8;

void printArray(Terminal& out, const ChannelValues& channel, const std::string& indentation) {
  std::vector<Table::Align> columns(1 + kValuesPerRow, Right);
  columns[0] = Left;
  Table table(std::move(columns));
  for (std::size_t i = 0; i < channel.array.size(); i += kValuesPerRow) {
    std::vector<ShownText> row{indentation + "[" + std::to_string(i) + "]"};
    for (std::size_t k = i; k < std::min(i + kValuesPerRow, channel.array.size()); ++k)
      row.emplace_back(number(channel.array[k]));
    table.add(std::move(row));
  }
  table.print(out);
}

std::string facts(const ChannelValues& channel) {
  std::string text;
  if (!unitOf(channel).empty()) text += ", in " + unitOf(channel);
  if (channel.format == kKdReportHistogram)
    text += ", minimum " + number(channel.minimum) + ", maximum " + number(channel.maximum);
  return text;
}

// Channels that take more than one row.
void printLargeChannel(Terminal& out, const ChannelValues& channel, const Headings& headings) {
  out.line(headings.below() + nameOf(channel) + facts(channel));
  const std::string indentation = headings.below();
  if (channel.format == kKdReportState) printStates(out, channel, indentation);
  if (channel.format == kKdReportHistogram) printBuckets(out, channel, indentation);
  if (channel.format == kKdReportArray) printArray(out, channel, indentation);
}

bool isLarge(const ChannelValues& channel) {
  return channel.format >= kKdReportState && channel.format <= kKdReportArray;
}

std::vector<ShownText> valueRow(const ChannelValues& channel) {
  if (channel.format != kKdReportSimple) return {nameOf(channel), "-", formatName(channel.format)};
  return {nameOf(channel), number(channel.value), unitOf(channel)};
}

// A tree whose leaves are rows of one table under each heading, unless they take more room.
template <typename Row, typename IsLarge>
void printTree(Terminal& out, const std::vector<ChannelValues>& channels,
               const std::vector<Table::Align>& columns, Row row, IsLarge takesMoreRoom) {
  Headings headings(out);
  for (std::size_t i = 0; i < channels.size();) {
    headings.enter(channels[i]);
    Table table(columns);
    for (; i < channels.size() && !headings.isNew(channels[i]) && !takesMoreRoom(channels[i]); ++i) {
      std::vector<ShownText> cells = row(channels[i]);
      cells[0] = headings.belowInTable() + cells[0];
      table.add(std::move(cells));
    }
    table.print(out);
    for (; i < channels.size() && !headings.isNew(channels[i]) && takesMoreRoom(channels[i]); ++i)
      printLargeChannel(out, channels[i], headings);
  }
}

std::string sumOfHits(const ChannelValues& channel) {
  std::uint64_t hits = 0;
  for (const BucketValues& bucket : channel.buckets) {
    if (bucket.hits == kKdReportInvalid) return "-";
    hits += static_cast<std::uint64_t>(bucket.hits);
  }
  return number(static_cast<std::int64_t>(hits)) + " hits";
}

std::string shortValue(const ChannelValues& channel) {
  switch (channel.format) {
    case kKdReportSimple:
      return withUnit(number(channel.value), channel);
    case kKdReportState:
      return channel.currentState < channel.states.size() ? stateName(channel.states[channel.currentState])
                                                          : "-";
    case kKdReportHistogram:
      return sumOfHits(channel);
    case kKdReportArray: {
      std::string text;
      for (const std::int64_t value : channel.array)
        text.append(text.empty() ? "" : ",").append(number(value));
      return withUnit(text.empty() ? "-" : text, channel);
    }
    default:
      return "-";
  }
}

}  // namespace

void printChannelTree(Terminal& out, const std::vector<ChannelValues>& channels) {
  printTree(out, channels, {Left, Left, Left, Right, Left, Left}, descriptionRow,
            [](const ChannelValues&) { return false; });
}

void printValueTree(Terminal& out, const std::vector<ChannelValues>& channels) {
  printTree(out, channels, {Left, Right, Left}, valueRow, isLarge);
}

std::string wholeName(const ChannelValues& channel) {
  std::string whole;
  for (const std::string& step : pathOf(channel)) whole.append(step).append("/");
  return whole + nameOf(channel);
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
