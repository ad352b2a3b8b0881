#include "tools/tallyctl/metrics/view.h"

#include <algorithm>
#include <array>
#include <cstdio>

#include "tools/tallyctl/metrics/channel_text.h"
#include "tools/tallyctl/metrics/figures.h"

namespace tbdaily {

using namespace kdreport;

namespace {

std::string indent(std::size_t depth) {
  return std::string(depth * 2, ' ');
}

using enum Table::Align;

// Headings with the rows of several tables between them; each table is aligned over all of its rows.
class Page {
 public:
  enum Kind : std::uint8_t { Numbers, States, Buckets, Arrays, Line };

  explicit Page(std::vector<Table::Align> numbers)
      : tables_{Table(std::move(numbers)), Table({Left, Right, Right, Left, Right, Right, Left}),
                Table({Right, Right, Right, Right, Right, Right, Left}), Table(arrayColumns())} {}

  // The headings of a channel that the one before does not share.
  void enter(const ChannelValues& channel, const Terminal& out) {
    std::vector<std::string> path = pathOf(channel);
    const auto shared = std::mismatch(path.begin(), path.end(), path_.begin(), path_.end()).first;
    for (auto i = static_cast<std::size_t>(shared - path.begin()); i < path.size(); ++i)
      line(indent(i) + out.styled(path[i], i == 0 ? Style::Heading : Style::Plain));
    path_ = std::move(path);
  }
  void line(ShownText text) {
    lines_.push_back(std::move(text));
    order_.push_back(Line);
  }
  // Its first cell is indented below the headings.
  void row(Kind kind, std::vector<ShownText> cells) {
    // A table adds the first level itself, and what has a line of its own above it lies a level deeper.
    cells[0] = indent(path_.size() - (kind == Numbers ? 1 : 0)) + cells[0];
    tables_[kind].add(std::move(cells));
    order_.push_back(kind);
  }
  std::string below() const { return indent(path_.size()); }

  void print(Terminal& out) const {
    std::array<std::vector<ShownText>, 5> lines{tables_[Numbers].lines(), tables_[States].lines(),
                                                tables_[Buckets].lines(), tables_[Arrays].lines(), lines_};
    std::array<std::size_t, 5> next{};
    for (const Kind kind : order_) out.line(lines[kind][next[kind]++]);
  }

  static constexpr std::size_t kValuesPerRow = 8;

 private:
  static std::vector<Table::Align> arrayColumns() {
    std::vector<Table::Align> columns(1 + kValuesPerRow, Right);
    columns[0] = Left;
    return columns;
  }

  std::vector<std::string> path_;
  std::array<Table, 4> tables_;
  std::vector<ShownText> lines_;
  std::vector<Kind> order_;
};

std::string unitOf(const ChannelValues& channel) {
  return channel.unitLabel.value_or("");
}

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

void addStates(Page& page, const ChannelValues& channel) {
  page.row(Page::States, {"state", "entries", "time", "", "", "share"});
  for (std::size_t i = 0; i < channel.states.size(); ++i) {
    const StateValues& state = channel.states[i];
    page.row(Page::States, {stateName(state), numberText(state.entries), numberText(state.residency),
                            unitOf(channel), humanFigure(state.residency, channel.unit),
                            percentage(state.dutyCycle), i == channel.currentState ? "<- current" : ""});
  }
}

void addBuckets(Page& page, const ChannelValues& channel, const Terminal& out) {
  std::int64_t mostHits = 0;
  for (const BucketValues& bucket : channel.buckets) mostHits = std::max(mostHits, bucket.hits);
  const std::size_t barWidth = std::clamp<std::size_t>(out.width() / 4, 10, 40);
  page.row(Page::Buckets, {"from", "up to", "hits", "minimum", "maximum", "sum"});
  for (const BucketValues& bucket : channel.buckets) {
    page.row(Page::Buckets,
             {numberText(bucket.lower), numberText(bucket.upper), numberText(bucket.hits),
              numberText(bucket.minimum), numberText(bucket.maximum), numberText(bucket.sum),
              out.bar(static_cast<double>(bucket.hits), static_cast<double>(mostHits), barWidth)});
  }
}

void addArray(Page& page, const ChannelValues& channel) {
  for (std::size_t i = 0; i < channel.array.size(); i += Page::kValuesPerRow) {
    std::vector<ShownText> row{"[" + std::to_string(i) + "]"};
    for (std::size_t k = i; k < std::min(i + Page::kValuesPerRow, channel.array.size()); ++k)
      row.emplace_back(numberText(channel.array[k]));
    page.row(Page::Arrays, std::move(row));
  }
}

std::string facts(const ChannelValues& channel) {
  std::string text;
  if (!unitOf(channel).empty()) text += ", in " + unitOf(channel);
  if (channel.format == kKdReportHistogram)
    text += ", minimum " + numberText(channel.minimum) + ", maximum " + numberText(channel.maximum);
  return text;
}

// With what a number comes to in a second, where so many lie between two samples; 0 for values of a moment.
void addValues(Page& page, const ChannelValues& channel, double seconds, const Terminal& out) {
  if (channel.format == kKdReportSimple) {
    const bool hasRate = seconds > 0 && channel.value != kKdReportInvalid;
    page.row(Page::Numbers,
             {nameOf(channel), numberText(channel.value), unitOf(channel),
              humanFigure(channel.value, channel.unit),
              hasRate ? humanRate(static_cast<double>(channel.value) / seconds, channel.unit) : ""});
    return;
  }
  if (channel.format < kKdReportSimple || channel.format > kKdReportArray)
    return page.row(Page::Numbers, {nameOf(channel), "-", formatName(channel.format)});
  page.line(page.below() + nameOf(channel) + facts(channel));
  if (channel.format == kKdReportState) addStates(page, channel);
  if (channel.format == kKdReportHistogram) addBuckets(page, channel, out);
  if (channel.format == kKdReportArray) addArray(page, channel);
}

Page valuesPage(const std::vector<ChannelValues>& channels, double seconds, const Terminal& out) {
  Page page({Left, Right, Left, Right, Right});
  for (const ChannelValues& channel : channels) {
    page.enter(channel, out);
    addValues(page, channel, seconds, out);
  }
  return page;
}

// What moved in it; whether anything did.
bool keepWhatMoved(ChannelValues& channel) {
  const auto moved = [](std::int64_t value) { return value != 0 && value != kKdReportInvalid; };
  switch (channel.format) {
    case kKdReportSimple:
      return moved(channel.value);
    case kKdReportState: {
      std::vector<StateValues> states;
      std::uint32_t current = kKdReportNoIndex;
      for (std::size_t i = 0; i < channel.states.size(); ++i) {
        const StateValues& state = channel.states[i];
        if (!moved(state.entries) && !moved(state.residency)) continue;
        if (i == channel.currentState) current = static_cast<std::uint32_t>(states.size());
        states.push_back(state);
      }
      channel.states = std::move(states);
      channel.currentState = current;
      return !channel.states.empty();
    }
    case kKdReportHistogram:
      std::erase_if(channel.buckets, [&](const BucketValues& bucket) { return !moved(bucket.hits); });
      return !channel.buckets.empty();
    default:
      return std::ranges::any_of(channel.array, moved);
  }
}

}  // namespace

void printChannelTree(Terminal& out, const std::vector<ChannelValues>& channels) {
  Page page({Left, Left, Left, Right, Left, Left});
  for (const ChannelValues& channel : channels) {
    page.enter(channel, out);
    page.row(Page::Numbers, descriptionRow(channel));
  }
  page.print(out);
}

void printValueTree(Terminal& out, const std::vector<ChannelValues>& channels) {
  valuesPage(channels, 0, out).print(out);
}

void printChanges(Terminal& out, std::vector<ChannelValues> delta, double seconds) {
  const std::size_t all = delta.size();
  std::erase_if(delta, [](ChannelValues& channel) { return !keepWhatMoved(channel); });
  valuesPage(delta, seconds, out).print(out);
  out.line(std::to_string(delta.size()) + " of " + std::to_string(all) +
           (all == 1 ? " channel" : " channels") + " changed within " + sixDigits(seconds) + " s");
}

}  // namespace tbdaily
