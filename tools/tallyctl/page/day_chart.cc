#include "tools/tallyctl/page/day_chart.h"

#include <algorithm>
#include <cstdint>
#include <optional>
#include <string>

#include "tools/tallyctl/day_argument.h"
#include "tools/tallyctl/page/chart_scale.h"
#include "tools/tallyctl/page/figures.h"

namespace tbdaily {

namespace {

// In the drawing's own units. Labels have room for the size that they take on a narrow screen.
constexpr double kWidth = 720, kHeight = 390;
constexpr double kLeft = 92, kRight = 704, kTop = 16, kBottom = 344;
constexpr double kDotRadius = 3.5;
constexpr std::size_t kMostDots = 31;  // of a line on which each point has one
constexpr std::int64_t kMostDayLabels = 3;
constexpr Markup kLineClasses[] = {"first", "second"};

struct Place {
  ChartScale scale;
  DayNumber first, last;

  double x(DayNumber day) const {
    if (first == last) return (kLeft + kRight) / 2;
    return kLeft +
           (kRight - kLeft) * (static_cast<double>(day) - first) / (static_cast<double>(last) - first);
  }
  double y(double value) const { return kBottom - (kBottom - kTop) * scale.share(value); }
};

ChartScale scaleOf(const DayChart& chart) {
  std::optional<double> smallest, largest;
  for (const DayLine& line : chart.lines) {
    for (const DayPoint& point : line.points) {
      smallest = std::min(smallest.value_or(point.value), point.value);
      largest = std::max(largest.value_or(point.value), point.value);
    }
  }
  const double least = chart.fromZero ? 0 : smallest.value_or(0);
  return chartScale(least, largest.value_or(0), chart.isWhole);
}

void writeScale(HtmlWriter& page, const Place& place, std::string_view unit) {
  for (int i = 0; i <= place.scale.steps; ++i) {
    const double y = place.y(place.scale.at(i));
    page.markup("<path class=\"grid\" d=\"M").coordinate(kLeft).markup(" ").coordinate(y).markup("H");
    page.coordinate(kRight)
        .markup("\"/><text text-anchor=\"end\" x=\"")
        .coordinate(kLeft - 8)
        .markup("\" y=\"");
    page.coordinate(y + 6).markup("\">").text(scaleText(place.scale.at(i), unit)).markup("</text>\n");
  }
}

void writeDays(HtmlWriter& page, const Place& place) {
  page.markup("<path class=\"axis\" d=\"M").coordinate(kLeft).markup(" ").coordinate(kBottom).markup("H");
  page.coordinate(kRight).markup("\"/>\n");
  const std::int64_t range = std::int64_t{place.last} - place.first;
  const std::int64_t labels = std::min(range + 1, kMostDayLabels);
  for (std::int64_t i = 0; i < labels; ++i) {
    const auto day = static_cast<DayNumber>(place.first + (labels > 1 ? range * i / (labels - 1) : 0));
    const double x = place.x(day);
    page.markup("<path class=\"axis\" d=\"M").coordinate(x).markup(" ").coordinate(kBottom).markup("v6\"/>");
    page.markup("<text text-anchor=\"");
    page.markup(labels == 1 || (i > 0 && i + 1 < labels) ? Markup("middle")
                : i == 0                                 ? Markup("start")
                                                         : Markup("end"));
    page.markup("\" x=\"")
        .coordinate(i == 0 && labels > 1 ? x - 40 : x)
        .markup("\" y=\"")
        .coordinate(kBottom + 30);
    page.markup("\">").text(dayText(day)).markup("</text>\n");
  }
}

void writeMarks(HtmlWriter& page, const Place& place, const std::vector<DayNumber>& marks) {
  for (const DayNumber day : marks) {
    page.markup("<path class=\"mark\" d=\"M")
        .coordinate(place.x(day))
        .markup(" ")
        .coordinate(kTop)
        .markup("V");
    page.coordinate(kBottom).markup("\"/>\n");
  }
}

void writeLine(HtmlWriter& page, const Place& place, const std::vector<DayPoint>& points, Markup which) {
  page.markup("<path class=\"line ").markup(which).markup("\" d=\"");
  for (const DayPoint& point : points) {
    page.markup(point.isJoined ? Markup("L") : Markup("M")).coordinate(place.x(point.day)).markup(" ");
    page.coordinate(place.y(point.value));
  }
  page.markup("\"/>\n");
  for (std::size_t i = 0; i < points.size(); ++i) {
    // A point that no line touches would not show.
    const bool isAlone = !points[i].isJoined && (i + 1 == points.size() || !points[i + 1].isJoined);
    if (!isAlone && points.size() > kMostDots) continue;
    page.markup("<circle class=\"dot ").markup(which).markup("\" cx=\"").coordinate(place.x(points[i].day));
    page.markup("\" cy=\"").coordinate(place.y(points[i].value)).markup("\" r=\"").coordinate(kDotRadius);
    page.markup("\"/>\n");
  }
}

void writeLegend(HtmlWriter& page, const std::vector<DayLine>& lines) {
  page.markup("<ul class=\"legend\">\n");
  for (std::size_t i = 0; i < lines.size(); ++i) {
    page.markup("<li><svg viewBox=\"0 0 32 12\" aria-hidden=\"true\"><path class=\"line ")
        .markup(kLineClasses[i]);
    page.markup("\" d=\"M2 6H30\"/></svg>").markup(lines[i].name).markup("</li>\n");
  }
  page.markup("</ul>\n");
}

}  // namespace

void writeDayChart(HtmlWriter& page, const DayChart& chart, DayNumber first, DayNumber last) {
  const Place place = {scaleOf(chart), first, last};
  if (chart.lines.size() > 1) writeLegend(page, chart.lines);
  page.markup("<svg class=\"days\" role=\"img\" viewBox=\"0 0 ")
      .coordinate(kWidth)
      .markup(" ")
      .coordinate(kHeight);
  page.markup("\" aria-label=\"").markup(chart.name).text(", " + dayText(first) + " to " + dayText(last));
  page.markup("\">\n");
  writeScale(page, place, chart.unit);
  writeDays(page, place);
  writeMarks(page, place, chart.marks);
  for (std::size_t i = 0; i < chart.lines.size(); ++i)
    writeLine(page, place, chart.lines[i].points, kLineClasses[i]);
  page.markup("</svg>\n");
}

}  // namespace tbdaily
