#include "tools/tallyctl/page/wear_page.h"

#include <algorithm>
#include <functional>
#include <string_view>
#include <vector>

#include "tools/tallyctl/day_argument.h"
#include "tools/tallyctl/page/day_chart.h"
#include "tools/tallyctl/page/figures.h"
#include "tools/tallyctl/page/frame.h"
#include "tools/tallyctl/terminal.h"

namespace tbdaily {

namespace {

// What was written over the days that are shown.
struct Totals {
  double hostBytes = 0, flashBytes = 0;
  double hostCompared = 0, flashCompared = 0;  // of the intervals that have both, in sectors
  std::int64_t daysMissing = 0;
  std::size_t timesBack = 0;
};

Totals totalsOf(const WearHistory& history) {
  Totals totals;
  for (const WearDay& day : history.days) {
    const auto host = static_cast<double>(day.hostWritten.value_or(0));
    const auto flash = static_cast<double>(day.flashWritten.value_or(0));
    totals.hostBytes += host * kWearSectorBytes;
    totals.flashBytes += flash * kWearSectorBytes;
    if (day.hostWritten && day.flashWritten) {
      totals.hostCompared += host;
      totals.flashCompared += flash;
    }
    totals.daysMissing += day.daysMissing;
    totals.timesBack += day.wentBack ? 1 : 0;
  }
  return totals;
}

// Of one day of the interval that ends with this one.
std::optional<double> bytesPerDay(const WearDay& day, const std::optional<std::int64_t>& sectors) {
  if (!sectors) return std::nullopt;
  return static_cast<double>(*sectors) * kWearSectorBytes / static_cast<double>(day.daysMissing + 1);
}

std::string countOf(std::int64_t number, std::string_view one, std::string_view many) {
  return groupedDigits(number) + " " + std::string(number == 1 ? one : many);
}

using ValueOfDay = std::function<std::optional<double>(const WearDay&)>;

// Joined where the days follow each other and both have the value.
DayLine lineOf(Markup name, const WearHistory& history, const ValueOfDay& valueOf) {
  DayLine line{name, {}};
  bool isJoined = false;
  for (const WearDay& day : history.days) {
    const auto value = valueOf(day);
    if (value) line.points.push_back({day.day, *value, isJoined && day.daysMissing == 0 && !day.wentBack});
    isJoined = value.has_value();
  }
  return line;
}

class WearPage {
 public:
  WearPage(const WearHistory& history, const WearPageSubject& subject)
      : history_(history), subject_(subject), totals_(totalsOf(history)) {
    for (const WearDay& day : history.days) {
      if (day.wentBack) daysBack_.push_back(day.day);
    }
  }

  std::string write() {
    beginPage(page_, "Wear over days", subject_.device);
    writeVerdict();
    page_.markup("</header>\n<main id=\"figures\">\n");
    if (!history_.days.empty()) {
      writeSummary();
      writeWrites();
      writeAmplification();
      writeErases();
    }
    endPage(page_);
    return page_.take();
  }

 private:
  std::string verdict() const {
    if (history_.days.empty()) return "No day was recorded on which the controller's counters could be read.";
    if (!subject_.pace) return "How fast the drive wears shows from the second day with these counters on.";
    const WearPace& pace = *subject_.pace;
    const std::string erased = "The most worn block was erased " +
                               countOf(pace.hottestCycle, "time", "times") + " until " +
                               dayText(pace.lastDay);
    if (!subject_.enduranceCycles)
      return erased + ", " + sixDigits(pace.cyclesPerDay) + " a day over the last " +
             countOf(pace.days, "day", "days") + ".";
    const std::string made = countOf(*subject_.enduranceCycles, "time", "times");
    if (pace.hottestCycle >= *subject_.enduranceCycles)
      return erased + ": the " + made + " that it is made for are reached.";
    const auto day = pace.dayOfCycles(*subject_.enduranceCycles);
    return erased +
           (day ? "; at this pace the " + made + " that it is made for are reached on " + dayText(*day) + "."
                : "; at this pace the " + made + " that it is made for are not reached.");
  }

  void writeVerdict() {
    page_.markup("<p class=\"verdict\">").text(verdict()).markup("</p>\n");
    if (history_.days.empty()) return;
    page_.markup("<dl class=\"facts\">\n");
    const auto recorded = static_cast<std::int64_t>(history_.days.size());
    writeFact(page_, "Days shown",
              first() == last() ? dayText(first()) : dayText(first()) + " to " + dayText(last()));
    writeFact(page_, "With a record",
              groupedDigits(recorded) + " of " + groupedDigits(recorded + totals_.daysMissing));
    if (!daysBack_.empty()) {
      std::string days;
      for (const DayNumber day : daysBack_) days += (days.empty() ? "" : ", ") + dayText(day);
      writeFact(page_, "Counters went back", days + ": another drive, or one that was reset");
    }
    page_.markup("</dl>\n");
  }

  void beginTile(Markup term) { page_.markup("<div><dt>").markup(term).markup("</dt><dd>"); }
  void endTile(std::string_view about) {
    page_.markup("</dd>");
    if (!about.empty()) page_.markup("<dd>").text(about).markup("</dd>");
    page_.markup("</div>\n");
  }

  void writeBytesTile(Markup term, double bytes, const std::optional<double>& sectorsPerDay) {
    beginTile(term);
    writeFigureAs(page_, bytes, driveSizeText(bytes));
    endTile(sectorsPerDay && *sectorsPerDay >= 0
                ? driveSizeText(*sectorsPerDay * kWearSectorBytes) + " a day lately"
                : std::string());
  }

  void writeSummary() {
    const auto& pace = subject_.pace;
    page_.markup("<h2>Summary</h2>\n<dl class=\"tiles\">\n");
    writeBytesTile("Written by the host", totals_.hostBytes, pace ? pace->hostPerDay : std::nullopt);
    writeBytesTile("Written to the flash", totals_.flashBytes, pace ? pace->flashPerDay : std::nullopt);
    if (totals_.hostCompared > 0) {
      const double amplification = totals_.flashCompared / totals_.hostCompared;
      beginTile("Write amplification");
      writeFigureAs(page_, amplification, twoDecimals(amplification));
      endTile("flash over host");
    }
    if (pace) {
      beginTile("Most worn block");
      writeFigure(page_, pace->hottestCycle);
      endTile("erases, " + sixDigits(pace->cyclesPerDay) + " a day");
    }
    if (pace && subject_.enduranceCycles) {
      const double share =
          static_cast<double>(pace->hottestCycle) / static_cast<double>(*subject_.enduranceCycles);
      beginTile("Of its endurance");
      writeFigureAs(page_, share * 100, twoDecimals(share * 100) + " %");
      endTile("of " + countOf(*subject_.enduranceCycles, "erase", "erases"));
    }
    page_.markup("</dl>\n");
  }

  // A chart with its table beside it. `writeCells` writes what stands behind the day; a day on which the
  // counters went back has one cell over all `columns`.
  void writeSection(const DayChart& chart, Markup note, Markup head, Markup columns, bool isComparison,
                    const std::function<void(const WearDay&)>& writeCells) {
    page_.markup("<h2>").markup(chart.name).markup("</h2>\n<p class=\"note\">").markup(note).markup("</p>\n");
    page_.markup("<div class=\"card\"><div class=\"pair wide\">\n<figure>");
    writeDayChart(page_, chart, first(), last());
    page_.markup("</figure>\n");
    beginScroll(page_, Scroll::Tall, std::string(chart.name.bytes()) + ", day by day");
    page_
        .markup(
            "<table><caption>Day by day, the last one first</caption>\n<thead><tr><th scope=\"col\">Day</th>")
        .markup(head);
    page_.markup("</tr></thead>\n<tbody>\n");
    for (std::size_t i = history_.days.size(); i-- > 0;) {
      const WearDay& day = history_.days[i];
      page_.markup("<tr><th scope=\"row\" class=\"day\">").text(dayText(day.day)).markup("</th>");
      if (day.wentBack && isComparison) {
        page_.markup("<td class=\"n back\" colspan=\"").markup(columns).markup("\">counters went back</td>");
      } else {
        writeCells(day);
      }
      page_.markup("</tr>\n");
      if (day.daysMissing > 0) writeMissing(day, columns);
    }
    page_.markup("</tbody></table>\n");
    endScroll(page_);
    page_.markup("</div></div>\n");
  }

  void writeMissing(const WearDay& day, Markup columns) {
    page_.markup("<tr><th scope=\"row\" class=\"gone\">").text(countOf(day.daysMissing, "day", "days"));
    page_.markup("</th><td class=\"n gone\" colspan=\"").markup(columns).markup("\">no record</td></tr>\n");
  }

  template <typename Figure>
  void writeCell(const std::optional<Figure>& figure, const std::function<void(const Figure&)>& write) {
    page_.markup("<td class=\"n\">");
    figure ? write(*figure) : static_cast<void>(page_.markup("-"));
    page_.markup("</td>");
  }

  void writeBytesCell(const std::optional<double>& bytes) {
    writeCell<double>(bytes, [this](double figure) { writeFigureAs(page_, figure, driveSizeText(figure)); });
  }

  void writeWrites() {
    const ValueOfDay host = [](const WearDay& day) { return bytesPerDay(day, day.hostWritten); };
    const ValueOfDay flash = [](const WearDay& day) { return bytesPerDay(day, day.flashWritten); };
    DayChart chart{"Written per day", "B"};
    chart.lines = {lineOf("by the host", history_, host), lineOf("to the flash", history_, flash)};
    chart.marks = daysBack_;
    writeSection(chart,
                 "What was written over days without a record is spread over them. Dotted upright lines "
                 "mark days on which the counters went back.",
                 "<th scope=\"col\" class=\"n\">Host</th><th scope=\"col\" class=\"n\">Flash</th>", "2", true,
                 [&](const WearDay& day) {
                   writeBytesCell(host(day));
                   writeBytesCell(flash(day));
                 });
  }

  void writeAmplification() {
    const ValueOfDay amplification = [](const WearDay& day) { return day.writeAmplification; };
    DayChart chart{"Write amplification", ""};
    chart.lines = {lineOf("write amplification", history_, amplification)};
    chart.marks = daysBack_;
    writeSection(
        chart, "What was written to the flash for each byte that the host wrote, since the record before.",
        "<th scope=\"col\" class=\"n\">Amplification</th>", "1", true, [&](const WearDay& day) {
          writeCell<double>(day.writeAmplification,
                            [this](double figure) { writeFigureAs(page_, figure, twoDecimals(figure)); });
        });
  }

  void writeErases() {
    const ValueOfDay erases = [](const WearDay& day) {
      return day.hottestCycle ? std::optional(static_cast<double>(*day.hottestCycle)) : std::nullopt;
    };
    DayChart chart{"Erases of the most worn block", ""};
    chart.isWhole = true;
    chart.fromZero = false;
    chart.lines = {lineOf("erases", history_, erases)};
    chart.marks = daysBack_;
    writeSection(chart, "Since the drive was new. The scale need not begin at 0.",
                 "<th scope=\"col\" class=\"n\">Erases</th>", "1", false, [this](const WearDay& day) {
                   writeCell<std::int64_t>(day.hottestCycle,
                                           [this](std::int64_t figure) { writeFigure(page_, figure); });
                 });
  }

  DayNumber first() const { return history_.days.front().day; }
  DayNumber last() const { return history_.days.back().day; }

  const WearHistory& history_;
  const WearPageSubject& subject_;
  const Totals totals_;
  std::vector<DayNumber> daysBack_;
  HtmlWriter page_;
};

}  // namespace

std::string wearPage(const WearHistory& history, const WearPageSubject& subject) {
  return WearPage(history, subject).write();
}

}  // namespace tbdaily
