#include "tools/tallyctl/page/histogram.h"

#include <algorithm>
#include <cmath>
#include <string>
#include <vector>

#include "tools/tallyctl/page/chart_scale.h"
#include "tools/tallyctl/page/figures.h"
#include "tools/tallyctl/page/frame.h"
#include "tools/tallyctl/terminal.h"

namespace tbdaily {

namespace {

// In the drawing's own units. Labels have room for the size that they take on a narrow screen.
constexpr double kWidth = 460, kHeight = 200;
constexpr double kLeft = 44, kRight = 436, kTop = 10, kBottom = 170;
constexpr double kWidestSlot = 84;
constexpr double kLabelHeight = 13, kDigitWidth = 9.5, kLabelGap = 12;
constexpr std::size_t kLongTable = 12;  // buckets from which on the table scrolls

std::string edgeText(double bound) {
  if (std::isinf(bound)) return bound < 0 ? "-\u221e" : "\u221e";
  return sixDigits(bound);
}

double heightOf(const ChartScale& scale, double value) {
  return scale.share(value) * (kBottom - kTop);
}

void writeScale(HtmlWriter& page, const ChartScale& scale, double right) {
  for (int i = 0; i <= scale.steps; ++i) {
    const double y = kBottom - heightOf(scale, scale.at(i));
    page.markup("<path class=\"grid\" d=\"M").coordinate(kLeft).markup(" ").coordinate(y).markup("H");
    page.coordinate(right)
        .markup("\"/><text text-anchor=\"end\" x=\"")
        .coordinate(kLeft - 6)
        .markup("\" y=\"");
    page.coordinate(y + kLabelHeight / 3).markup("\">").text(scaleText(scale.at(i), "")).markup("</text>\n");
  }
}

// The bounds under the edges of the bars: every one, or as many as have room.
void writeEdges(HtmlWriter& page, std::span<const HistogramBucket> buckets, double slot) {
  std::vector<std::string> edges = {edgeText(buckets.front().lower)};
  for (const HistogramBucket& bucket : buckets) edges.push_back(edgeText(bucket.upper));
  std::size_t longest = 0;
  for (const std::string& edge : edges) longest = std::max(longest, edge.size());
  const double room = static_cast<double>(longest) * kDigitWidth + kLabelGap;
  const auto every = std::max<std::size_t>(1, static_cast<std::size_t>(std::ceil(room / slot)));
  for (std::size_t i = 0; i < edges.size(); i += every) {
    const double x = kLeft + slot * static_cast<double>(i);
    const bool isCut = x + static_cast<double>(edges[i].size()) * kDigitWidth / 2 > kWidth;
    page.markup("<text text-anchor=\"").markup(isCut ? Markup("end") : Markup("middle")).markup("\" x=\"");
    page.coordinate(isCut ? kWidth : x).markup("\" y=\"").coordinate(kBottom + 21).markup("\">");
    page.text(edges[i]).markup("</text>\n");
  }
}

void writeBars(HtmlWriter& page, std::span<const HistogramBucket> buckets, const ChartScale& scale,
               double slot) {
  const double margin = std::min(1.5, slot / 10);
  for (std::size_t i = 0; i < buckets.size(); ++i) {
    if (buckets[i].count <= 0) continue;
    // The smallest count still shows.
    const double height = std::max(heightOf(scale, static_cast<double>(buckets[i].count)), 1.5);
    page.markup("<rect class=\"bar\" x=\"").coordinate(kLeft + slot * static_cast<double>(i) + margin);
    page.markup("\" y=\"").coordinate(kBottom - height).markup("\" width=\"").coordinate(slot - 2 * margin);
    page.markup("\" height=\"").coordinate(height).markup("\"><title>");
    page.text(buckets[i].label() + ": " + groupedDigits(buckets[i].count)).markup("</title></rect>\n");
  }
}

}  // namespace

void writeHistogramDrawing(HtmlWriter& page, std::string_view key, std::span<const HistogramBucket> buckets) {
  if (buckets.empty()) return;
  std::int64_t largest = 0;
  for (const HistogramBucket& bucket : buckets) largest = std::max(largest, bucket.count);
  const ChartScale scale = chartScale(0, static_cast<double>(largest), true);
  const auto slots = static_cast<double>(buckets.size());
  const double slot = std::min((kRight - kLeft) / slots, kWidestSlot);
  const double right = kLeft + slot * slots;
  page.markup("<svg role=\"img\" viewBox=\"0 0 ").coordinate(kWidth).markup(" ").coordinate(kHeight);
  page.markup("\" aria-label=\"Histogram of ").text(key).markup("\">\n");
  writeScale(page, scale, right);
  writeBars(page, buckets, scale, slot);
  page.markup("<path class=\"axis\" d=\"M").coordinate(kLeft).markup(" ").coordinate(kBottom).markup("H");
  page.coordinate(right).markup("\"/>\n");
  writeEdges(page, buckets, slot);
  page.markup("</svg>\n");
}

void writeHistogramTable(HtmlWriter& page, std::string_view key, std::span<const HistogramBucket> buckets) {
  const bool isLong = buckets.size() > kLongTable;
  if (isLong) beginScroll(page, Scroll::Tall, "Buckets of " + std::string(key));
  page.markup("<table><caption>Above the lower bound, up to the upper</caption>\n")
      .markup("<thead><tr><th scope=\"col\" class=\"n\">Lower</th><th scope=\"col\" class=\"n\">Upper</th>")
      .markup("<th scope=\"col\" class=\"n\">Count</th></tr></thead>\n<tbody>\n");
  for (const HistogramBucket& bucket : buckets) {
    if (bucket.count == 0) continue;
    page.markup("<tr><td class=\"n\">");
    writeFigure(page, bucket.lower);
    page.markup("</td><td class=\"n\">");
    writeFigure(page, bucket.upper);
    page.markup("</td><td class=\"n\">");
    writeFigure(page, bucket.count);
    page.markup("</td></tr>\n");
  }
  page.markup("</tbody></table>\n");
  if (isLong) endScroll(page);
}

}  // namespace tbdaily
