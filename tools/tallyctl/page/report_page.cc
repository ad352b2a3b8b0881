#include "tools/tallyctl/page/report_page.h"

#include <algorithm>
#include <array>
#include <limits>
#include <string_view>
#include <vector>

#include "platform/calendar.h"
#include "platform/plist_text.h"
#include "tools/tallyctl/nand_glossary.h"
#include "tools/tallyctl/page/figures.h"
#include "tools/tallyctl/page/frame.h"
#include "tools/tallyctl/page/histogram.h"
#include "tools/tallyctl/report/view.h"

namespace tbdaily {

namespace {

// So many rows, and so many distributions, stand openly; more of them in parts.
constexpr std::size_t kRowsInPart = 500;
constexpr std::size_t kDistributionsInPart = 50;

// In the order of ReportStanding.
constexpr std::array<std::string_view, 3> kStandings = {"tbdaily: what this device reports of one day",
                                                        "Submission is on: this would leave the device now",
                                                        "Submission is off: no report would be written"};

std::string text(const PlistValue& value) {
  return value.isNone() ? "-" : plistText(value);
}

std::string dayOf(const DailyReport& report) {
  const auto start = report.start();
  if (!start || !isRepresentable(*start)) return "an unknown day";
  const std::string date = dateText(*start, DateFraction::Drop);
  return date.substr(0, date.find('T'));
}

std::int64_t sizeOf(const PlistArray* list) {
  return list != nullptr ? static_cast<std::int64_t>(list->size()) : 0;
}

class ReportPage {
 public:
  explicit ReportPage(const DailyReport& report) : report_(report) {
    const PlistDictionary &statistics = report.distributions(), &histograms = report.histograms();
    for (const auto& [key, value] : statistics) distributions_.push_back(key);
    for (const auto& [key, value] : histograms) {
      if (!statistics.contains(key)) distributions_.push_back(key);
    }
    if (const PlistValue* apps = report.root().find("TBActivatedAppInfo")) apps_ = apps->asArray();
    if (const PlistValue* items = report.root().find("TBTasking")) tasking_ = items->asArray();
  }

  std::string write(ReportStanding standing, const std::vector<std::string>& words) {
    writeHead(standing, words);
    writeContents();
    page_.markup("<main id=\"figures\">\n");
    writeSummary();
    writeScalars();
    writeDistributions();
    writeMetadata();
    writeApps();
    writeTasking();
    endPage(page_);
    return page_.take();
  }

 private:
  void writeHead(ReportStanding standing, const std::vector<std::string>& words) {
    const bool isPreview = standing != ReportStanding::Written;
    beginPage(page_, (isPreview ? "Preview of the daily report of " : "Daily report of ") + dayOf(report_),
              kStandings[static_cast<std::size_t>(standing)]);
    const PlistDictionary& root = report_.root();
    const auto created = report_.created();
    page_.markup("<dl class=\"facts\">\n");
    if (const auto start = report_.start(); start && isRepresentable(*start))
      writeFact(page_, "Day", dayOf(report_) + " (day " + std::to_string(dayNumberOf(*start)) + ")");
    writeFact(page_, isPreview ? Markup("Made") : Markup("Written"),
              created && isRepresentable(*created) ? dateText(*created, DateFraction::Drop) : "-");
    writeFact(page_, "Whitelist digest", text(root.get("TBWhitelistDigest")));
    writeFact(page_, "Tasking", text(root.get("TBTaskID")));
    writeFact(page_, "Tasking digest", text(root.get("TBTaskDigest")));
    writeFact(page_, "Version of the report", text(root.get("TBCrashLogVersion")));
    if (!words.empty()) writeFact(page_, "Only keys with", listed(words));
    page_.markup("</dl>\n</header>\n");
  }

  void writeContents() {
    page_.markup("<nav aria-label=\"Contents\"><ul>\n<li><a href=\"#scalars\">Scalars</a></li>\n")
        .markup("<li><a href=\"#distributions\">Distributions</a></li>\n")
        .markup("<li><a href=\"#metadata\">Metadata</a></li>\n");
    if (apps_ != nullptr) page_.markup("<li><a href=\"#apps\">Activated apps</a></li>\n");
    page_.markup("<li><a href=\"#tasking\">Tasking</a></li>\n</ul></nav>\n");
  }

  void writeTile(Markup term, std::int64_t figure) {
    page_.markup("<div><dt>").markup(term).markup("</dt><dd>");
    writeFigure(page_, figure);
    page_.markup("</dd></div>\n");
  }

  void writeSummary() {
    std::int64_t values = 0;
    for (const auto& [key, value] : report_.distributions()) {
      const auto statistics = distributionStatistics(value);
      if (statistics && __builtin_add_overflow(values, std::max<std::int64_t>(statistics->count, 0), &values))
        values = std::numeric_limits<std::int64_t>::max();
    }
    page_.markup("<h2>Summary</h2>\n<dl class=\"tiles\">\n");
    writeTile("Scalars", static_cast<std::int64_t>(report_.scalars().size()));
    writeTile("Distributions", static_cast<std::int64_t>(distributions_.size()));
    writeTile("Values in them", values);
    writeTile("Histograms", static_cast<std::int64_t>(report_.histograms().size()));
    if (apps_ != nullptr) writeTile("Activated apps", sizeOf(apps_));
    writeTile("Tasking items", sizeOf(tasking_));
    page_.markup("</dl>\n");
  }

  void writeHeading(Markup id, Markup heading, std::size_t count) {
    page_.markup("<h2 id=\"").markup(id).markup("\">").markup(heading).markup(" <span class=\"count\">");
    page_.text(groupedDigits(static_cast<std::int64_t>(count))).markup("</span></h2>\n");
  }

  void writeScalar(std::string_view key, const PlistValue& value) {
    page_.markup("<tr><th scope=\"row\" class=\"key\">").text(key).markup("</th>");
    const auto number = value.asNumber();
    if (!number) {
      page_.markup("<td class=\"wrap\">").text(text(value)).markup("</td></tr>\n");
      return;
    }
    page_.markup("<td class=\"n\">");
    number->isReal() ? writeFigure(page_, number->toDouble()) : writeFigure(page_, number->toInt64());
    if (const NandGlossaryRow* row = findNandGlossary(key); row != nullptr && !number->isReal()) {
      const std::string figure = humanNandFigure(row->unit, number->toInt64());
      if (!figure.empty()) page_.markup("<small>").text(figure).markup("</small>");
    }
    page_.markup("</td></tr>\n");
  }

  void writeScalars() {
    const PlistDictionary& scalars = report_.scalars();
    writeHeading("scalars", "Scalars", scalars.size());
    if (scalars.empty()) return writeNothing("The report has no scalars.");
    const auto keyOf = [&scalars](std::size_t i) { return std::string_view(scalars.at(i).first); };
    writeInParts(page_, scalars.size(), kRowsInPart, keyOf, [&](std::size_t first, std::size_t behind) {
      page_
          .markup(
              "<div class=\"sheet narrow\"><table><caption>As they leave this device: made as coarse as the "
              "whitelist ")
          .markup(
              "says</caption>\n<thead><tr><th scope=\"col\">Key</th><th scope=\"col\" class=\"n\">Value</th>")
          .markup("</tr></thead>\n<tbody>\n");
      for (std::size_t i = first; i < behind; ++i) writeScalar(scalars.at(i).first, scalars.at(i).second);
      page_.markup("</tbody></table></div>\n");
    });
  }

  template <typename Number>
  void writeStatistic(Markup term, Number figure) {
    page_.markup("<div><dt>").markup(term).markup("</dt><dd>");
    writeFigure(page_, figure);
    page_.markup("</dd></div>\n");
  }

  void writeDistribution(std::string_view key) {
    page_.markup("<article class=\"card\">\n<h3 class=\"key\">").text(key).markup("</h3>\n");
    const PlistValue* value = report_.distributions().find(key);
    if (const auto statistics = value != nullptr ? distributionStatistics(*value) : std::nullopt) {
      page_.markup("<dl class=\"stats\">\n");
      writeStatistic("Count", statistics->count);
      writeStatistic("Minimum", statistics->minimum);
      writeStatistic("Mean", statistics->mean);
      writeStatistic("Maximum", statistics->maximum);
      writeStatistic("Std. deviation", statistics->standardDeviation());
      page_.markup("</dl>\n");
    } else {
      page_.markup("<p class=\"note\">No statistics that can be read.</p>\n");
    }
    if (const std::vector<HistogramBucket> buckets = report_.buckets(key); !buckets.empty()) {
      page_.markup("<div class=\"pair\">\n<figure>");
      writeHistogramDrawing(page_, key, buckets);
      page_.markup("</figure>\n<div>");
      writeHistogramTable(page_, key, buckets);
      page_.markup("</div></div>\n");
    }
    page_.markup("</article>\n");
  }

  void writeDistributions() {
    writeHeading("distributions", "Distributions", distributions_.size());
    if (distributions_.empty()) return writeNothing("The report has no distributions.");
    page_
        .markup(
            "<p class=\"note\">The standard deviation is that of the day's values; the report itself "
            "carries ")
        .markup("the sum of squared deviations. Buckets without a value are left out of the tables.</p>\n");
    const auto keyOf = [this](std::size_t i) { return distributions_[i]; };
    writeInParts(page_, distributions_.size(), kDistributionsInPart, keyOf,
                 [this](std::size_t first, std::size_t behind) {
                   for (std::size_t i = first; i < behind; ++i) writeDistribution(distributions_[i]);
                 });
  }

  void writeMetadata() {
    const PlistDictionary& metadata = report_.metadata();
    writeHeading("metadata", "Metadata", metadata.size());
    if (metadata.empty()) return writeNothing("The report has no metadata.");
    page_
        .markup(
            "<div class=\"sheet narrow\"><table><caption>What the report says of the device's languages and "
            "region")
        .markup(
            "</caption>\n<thead><tr><th scope=\"col\">Name</th><th "
            "scope=\"col\">Value</th></tr></thead>\n<tbody>\n");
    for (const auto& [name, value] : metadata) {
      page_.markup("<tr><th scope=\"row\" class=\"key\">").text(name).markup("</th><td class=\"wrap\">");
      page_.text(text(value)).markup("</td></tr>\n");
    }
    page_.markup("</tbody></table></div>\n");
  }

  void writeNothing(Markup sentence) { page_.markup("<p class=\"note\">").markup(sentence).markup("</p>\n"); }

  void writeApps() {
    if (apps_ == nullptr) return;
    writeHeading("apps", "Activated apps", apps_->size());
    if (apps_->empty()) return writeNothing("The message that began the run named no apps.");
    page_.markup("<div class=\"sheet\">");
    beginScroll(page_, Scroll::Wide, "Activated apps");
    page_
        .markup(
            "<table><caption>Apps as they were sent with the run</caption>\n<thead><tr><th "
            "scope=\"col\">Bundle</th>")
        .markup("<th scope=\"col\">Version</th><th scope=\"col\" class=\"n\">Kestrel ID</th>")
        .markup("<th scope=\"col\" class=\"n\">Arch</th><th scope=\"col\">UUID</th></tr></thead>\n<tbody>\n");
    for (const PlistValue& app : *apps_) {
      page_.markup("<tr><th scope=\"row\" class=\"key\">").text(text(app.get("bundle")));
      page_.markup("</th><td class=\"wrap\">").text(text(app.get("version")));
      for (const std::string_view field : {"kestrelID", "arch"})
        page_.markup("</td><td class=\"n\">").text(text(app.get(field)));
      page_.markup("</td><td class=\"key\">").text(text(app.get("uuid"))).markup("</td></tr>\n");
    }
    page_.markup("</tbody></table>\n");
    endScroll(page_);
    page_.markup("</div>\n");
  }

  // An item without a value takes the preference away.
  void writeTaskingItem(const PlistValue& item) {
    const PlistDictionary* fields = item.asDictionary();
    if (fields == nullptr) {
      page_.markup("<tr><td colspan=\"3\" class=\"wrap\">").text(text(item)).markup("</td></tr>\n");
      return;
    }
    page_.markup("<tr><td class=\"key\">").text(text(item.get("Domain"))).markup("</td><td class=\"key\">");
    page_.text(text(item.get("Key"))).markup("</td>");
    fields->contains("Value")
        ? page_.markup("<td class=\"wrap\">").text(text(item.get("Value"))).markup("</td></tr>\n")
        : page_.markup("<td class=\"gone\">removed</td></tr>\n");
  }

  void writeTasking() {
    writeHeading("tasking", "Tasking", static_cast<std::size_t>(sizeOf(tasking_)));
    if (tasking_ == nullptr || tasking_->empty()) {
      writeNothing("No tasking item was applied.");
      return;
    }
    page_.markup("<div class=\"sheet\">");
    beginScroll(page_, Scroll::Wide, "Tasking items");
    page_
        .markup("<table><caption>Preferences that the applied tasking sets or removes</caption>\n<thead><tr>")
        .markup(
            "<th scope=\"col\">Domain</th><th scope=\"col\">Key</th><th "
            "scope=\"col\">Value</th></tr></thead>\n<tbody>\n");
    for (const PlistValue& item : *tasking_) writeTaskingItem(item);
    page_.markup("</tbody></table>\n");
    endScroll(page_);
    page_.markup("</div>\n");
  }

  const DailyReport& report_;
  std::vector<std::string_view>
      distributions_;  // keys, of statistics and of histograms; borrowed from the report
  const PlistArray* apps_ = nullptr;
  const PlistArray* tasking_ = nullptr;
  HtmlWriter page_;
};

}  // namespace

std::string reportPage(const DailyReport& report, ReportStanding standing,
                       const std::vector<std::string>& words) {
  return ReportPage(report).write(standing, words);
}

}  // namespace tbdaily
