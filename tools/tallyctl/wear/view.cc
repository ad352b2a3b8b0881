#include "tools/tallyctl/wear/view.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <string>

#include "platform/number_text.h"
#include "tools/tallyctl/day_argument.h"
#include "tools/tallyctl/metrics/figures.h"

namespace tbdaily {

namespace {

using enum Table::Align;

std::string figure(double value) {
  return realText(static_cast<float>(value));
}

std::string bytes(const DriveHealth::Figure& count) {
  return humanBytes(static_cast<double>(*count));
}

Style styleOf(const std::vector<HealthFinding>& findings) {
  if (findings.empty()) return Style::Good;
  return findings.front().urgency == Urgency::Act ? Style::Bad : Style::Heading;
}

void addTraffic(Table& table, const char* name, const DriveHealth::Figure& written,
                const DriveHealth::Figure& read) {
  if (!written && !read) return;
  std::string text;
  if (written) text += bytes(written) + " written";
  if (read) text += (text.empty() ? "" : ", ") + bytes(read) + " read";
  table.add({name, text});
}

void addErases(Table& table, const char* name, const DriveHealth::Figure& least,
               const DriveHealth::Figure& most) {
  if (!most) return;
  table.add({name, (least ? std::to_string(*least) + " to " : "at most ") + std::to_string(*most) +
                       (least ? " (least and most worn block)" : "")});
}

std::string warningText(std::int64_t bits) {
  return bits == 0 ? "none" : "bits " + std::to_string(bits) + ", see above";
}

std::string spareText(const DriveHealth& health) {
  std::string text;
  const auto add = [&text](const DriveHealth::Figure& count, const std::string& what) {
    if (count) text += (text.empty() ? "" : ", ") + std::to_string(*count) + what;
  };
  add(health.spare, " %");
  if (health.spareThreshold) text += " (it warns below " + std::to_string(*health.spareThreshold) + " %)";
  add(health.freeBlocks, " free blocks");
  add(health.grownBadBlocks, " went bad in use");
  return text;
}

void addLife(Terminal& out, Table& table, const char* name, const DriveHealth::Figure& used) {
  constexpr double kAll = 100;
  constexpr std::size_t kWidth = 40;
  if (!used) return;
  const std::string percent = std::to_string(*used) + " %";
  table.add({name, percent + std::string(percent.size() < 6 ? 6 - percent.size() : 1, ' ') +
                       out.bar(static_cast<double>(*used), kAll, kWidth)});
}

void printDrive(Terminal& out, const DriveHealth& health, const WearMoment& wear) {
  const auto& controller = wear.controller;
  out.line(out.styled(health.name, Style::Heading));
  Table table({Left, Left});
  addTraffic(table, "host traffic", health.hostWritten, health.hostRead);
  addTraffic(table, "flash traffic", health.flashWritten, health.flashRead);
  if (const auto amplification = health.writeAmplification())
    table.add({"write amplification", withDigits(*amplification, 2) + " over its life"});
  if (controller) {
    table.add({"  by erased bands", figure(controller->amplification.user) + " user, " +
                                        figure(controller->amplification.system) + " system"});
    table.add({"  threshold", figure(wear.threshold) + (controller->isAbove
                                                            ? ", user above: a run writes the NAND log"
                                                            : ", user not above: a run writes no NAND log")});
  }
  addLife(out, table, "life used", health.percentUsed);
  addLife(out, table, "  intermediate", health.slcPercentUsed);
  addErases(table, "erases", health.leastErases, health.mostErases);
  addErases(table, "  intermediate", health.intermediateLeastErases, health.intermediateMostErases);
  if (health.powerOnSeconds)
    table.add({"power-on time", humanTime(static_cast<double>(*health.powerOnSeconds))});
  if (health.uncleanShutdowns) table.add({"unclean shutdowns", std::to_string(*health.uncleanShutdowns)});
  if (health.lostReads) table.add({"lost reads", std::to_string(*health.lostReads)});
  if (health.warnings) table.add({"warnings", warningText(*health.warnings)});
  if (const std::string spare = spareText(health); !spare.empty()) table.add({"spare", spare});
  if (health.temperature) table.add({"temperature", std::to_string(*health.temperature) + " C"});
  if (controller)
    table.add({"content", controller->recommendsContentDeletion
                              ? "the controller recommends that some be deleted"
                              : "the controller recommends no deletion"});
  table.print(out);
}

// ---- Days

// One line of the chart.
struct Series {
  const char* name;
  std::vector<std::optional<double>> values;  // a column each
  bool fromZero;
  std::string summary;
};

using DayFigure = std::optional<double> (*)(const WearDay& day);

// The days in so many columns, of each column's days the mean; empty where no day has the figure.
std::vector<std::optional<double>> columnsOf(const WearHistory& history, std::size_t columns,
                                             DayFigure figureOf) {
  const std::int64_t first = history.days.front().day;
  const auto days = static_cast<std::size_t>(history.days.back().day - first + 1);
  columns = std::min(columns, days);
  std::vector<double> sums(columns, 0);
  std::vector<int> counts(columns, 0);
  for (const WearDay& day : history.days) {
    const auto value = figureOf(day);
    if (!value) continue;
    const std::size_t column = static_cast<std::size_t>(day.day - first) * columns / days;
    sums[column] += *value;
    ++counts[column];
  }
  std::vector<std::optional<double>> values(columns);
  for (std::size_t i = 0; i < columns; ++i) {
    if (counts[i] != 0) values[i] = sums[i] / counts[i];
  }
  return values;
}

// What was written in a day of the interval, in bytes.
std::optional<double> perDay(const std::optional<std::int64_t>& sectors, const WearDay& day) {
  if (!sectors) return std::nullopt;
  return static_cast<double>(*sectors) * kWearSectorBytes / static_cast<double>(day.daysMissing + 1);
}

std::string growth(const std::optional<double>& sectorsPerDay) {
  return sectorsPerDay ? humanBytes(*sectorsPerDay * kWearSectorBytes) + " a day" : "";
}

void printChart(Terminal& out, const WearHistory& history, const std::optional<WearPace>& pace) {
  constexpr std::size_t kNames = 22, kSummary = 24;
  const std::size_t columns =
      std::clamp<std::size_t>(out.width() > kNames + kSummary ? out.width() - kNames - kSummary : 0, 16, 120);
  std::array<Series, 4> chart{{
      {"host writes", columnsOf(history, columns, [](const WearDay& d) { return perDay(d.hostWritten, d); }),
       true, ""},
      {"flash writes",
       columnsOf(history, columns, [](const WearDay& d) { return perDay(d.flashWritten, d); }), true, ""},
      {"write amplification",
       columnsOf(history, columns, [](const WearDay& d) { return d.writeAmplification; }), true, ""},
      {"most worn block",
       columnsOf(history, columns,
                 [](const WearDay& d) {
                   return d.hottestCycle ? std::optional(static_cast<double>(*d.hottestCycle)) : std::nullopt;
                 }),
       false, ""},
  }};
  if (pace) {
    chart[0].summary = growth(pace->hostPerDay);
    chart[1].summary = growth(pace->flashPerDay);
    if (pace->hostPerDay.value_or(0) > 0 && pace->flashPerDay)
      chart[2].summary = withDigits(*pace->flashPerDay / *pace->hostPerDay, 2);
    chart[3].summary = "+" + withDigits(pace->cyclesPerDay, 2) + " erases a day";
  }
  Table table({Left, Left, Left});
  for (const Series& series : chart) {
    double lowest = 0, highest = 0;
    bool any = false;
    for (const auto& value : series.values) {
      if (!value) continue;
      highest = any ? std::max(highest, *value) : *value;
      lowest = series.fromZero ? 0 : any ? std::min(lowest, *value) : *value;
      any = true;
    }
    if (any) table.add({series.name, out.sparkline(series.values, lowest, highest), series.summary});
  }
  table.print(out);
}

std::string noteOf(const WearDay& day) {
  std::string note;
  if (day.daysMissing > 0)
    note = std::to_string(day.daysMissing) + (day.daysMissing == 1 ? " day" : " days") + " missing before";
  if (day.wentBack)
    note += (note.empty() ? "" : "; ") + std::string("counters went back: another drive, or reset");
  return note;
}

void printDays(Terminal& out, const WearHistory& history) {
  Table table({Left, Right, Right, Right, Right, Left});
  table.add({"day", "host", "flash", "write amp.", "erases", ""});
  const auto amount = [](const std::optional<std::int64_t>& sectors) {
    return sectors ? humanBytes(static_cast<double>(*sectors) * kWearSectorBytes) : std::string("-");
  };
  for (const WearDay& day : history.days)
    table.add({dayText(day.day), amount(day.hostWritten), amount(day.flashWritten),
               day.writeAmplification ? withDigits(*day.writeAmplification, 2) : "-",
               day.hottestCycle ? std::to_string(*day.hottestCycle) : "-", noteOf(day)});
  table.print(out);
}

}  // namespace

void printWear(Terminal& out, const WearMoment& wear) {
  out.line(out.styled(std::string(healthVerdict(wear.findings)), styleOf(wear.findings)));
  for (const HealthFinding& finding : wear.findings) {
    const std::string text = "  " + finding.text;
    out.line(finding.urgency == Urgency::Act ? out.styled(text, Style::Bad) : ShownText(text));
  }
  for (const DriveHealth& drive : wear.drives) {
    out.line();
    printDrive(out, drive, wear);
  }
}

void printRawWear(Terminal& out, const WearMoment& wear) {
  for (const DriveHealth& drive : wear.drives) {
    out.line(out.styled(drive.name, Style::Heading));
    Table table({Left, Right});
    for (const auto& [name, value] : drive.raw) table.add({name, std::to_string(value)});
    if (wear.controller) {
      table.add({"userWriteAmplification", figure(wear.controller->amplification.user)});
      table.add({"systemWriteAmplification", figure(wear.controller->amplification.system)});
      table.add({"threshold", figure(wear.threshold)});
    }
    table.print(out);
  }
}

std::string paceSentence(const WearPace& pace, std::int64_t endurance) {
  const std::string erases = std::to_string(endurance) + " erases";
  if (pace.hottestCycle >= endurance) return "Most worn block: " + erases + " already";
  const auto day = pace.dayOfCycles(endurance);
  return "Most worn block: " + (day ? erases + " on " + dayText(*day) : "never " + erases) +
         ", at the pace of the last " + std::to_string(pace.days) + (pace.days == 1 ? " day" : " days");
}

void printWearHistory(Terminal& out, const WearHistory& history, const std::optional<WearPace>& pace,
                      std::optional<std::int64_t> endurance) {
  const auto count = std::to_string(history.days.size());
  out.line(out.styled("Wear from " + dayText(history.days.front().day) + " to " +
                          dayText(history.days.back().day) + " (" + count +
                          (count == "1" ? " day" : " days") + " recorded)",
                      Style::Heading));
  printChart(out, history, pace);
  if (pace && endurance) out.line("  " + paceSentence(*pace, *endurance));
  out.line();
  printDays(out, history);
}

}  // namespace tbdaily
