#include "tools/tallyctl/page/frame.h"

#include <algorithm>

#include "tools/tallyctl/page/figures.h"
#include "tools/tallyctl/page/page_style.h"

namespace tbdaily {

void beginPage(HtmlWriter& page, std::string_view title, std::string_view over) {
  const std::size_t lastWord = title.rfind(' ') + 1;
  page.markup("<!DOCTYPE html>\n<html lang=\"en\">\n<head>\n<meta charset=\"utf-8\">\n")
      .markup("<meta http-equiv=\"Content-Security-Policy\" content=\"default-src 'none'; ")
      .markup("style-src 'unsafe-inline'; img-src data:\">\n")
      .markup("<meta name=\"viewport\" content=\"width=device-width, initial-scale=1\">\n")
      .markup("<meta name=\"color-scheme\" content=\"light dark\">\n")
      .markup("<link rel=\"icon\" href=\"data:,\">\n<title>")
      .text(title)
      .markup("</title>\n<style>")
      .markup(kPageStyle)
      .markup(
          "</style>\n</head>\n<body>\n<a class=\"skip\" href=\"#figures\">Skip to the "
          "figures</a>\n<header>\n")
      .markup("<p class=\"over\">")
      .text(over)
      .markup("</p>\n<h1>")
      .text(title.substr(0, lastWord))
      .markup("<span class=\"day\">")
      .text(title.substr(lastWord))
      .markup("</span></h1>\n");
}

void endPage(HtmlWriter& page) {
  page.markup(
          "</main>\n<footer>\n<p>Written by tallyctl. Figures that are shortened or grouped carry the whole "
          "one ")
      .markup(
          "in the page's source. This file asks for nothing and runs "
          "nothing.</p>\n</footer>\n</body>\n</html>\n");
}

void beginScroll(HtmlWriter& page, Scroll scroll, std::string_view label) {
  page.markup("<div class=\"scroll");
  if (scroll == Scroll::Tall) page.markup(" tall");
  page.markup("\" role=\"region\" tabindex=\"0\" aria-label=\"").text(label).markup("\">\n");
}

void endScroll(HtmlWriter& page) {
  page.markup("</div>\n");
}

void writeFact(HtmlWriter& page, Markup term, std::string_view text) {
  page.markup("<div><dt>").markup(term).markup("</dt><dd>").text(text).markup("</dd></div>\n");
}

void writeInParts(HtmlWriter& page, std::size_t count, std::size_t most,
                  const std::function<std::string_view(std::size_t item)>& nameOf,
                  const std::function<void(std::size_t first, std::size_t behind)>& write) {
  if (count <= most) return write(0, count);
  const auto number = [](std::size_t i) { return groupedDigits(static_cast<std::int64_t>(i)); };
  for (std::size_t first = 0; first < count; first += most) {
    const std::size_t behind = std::min(count, first + most);
    page.markup("<details");
    if (first == 0) page.markup(" open");
    page.markup(" class=\"sheet\"><summary>")
        .text(number(first + 1) + " to " + number(behind))
        .markup(": <span class=\"key\">")
        .text(nameOf(first))
        .markup("</span> to <span class=\"key\">")
        .text(nameOf(behind - 1))
        .markup("</span></summary>\n");
    write(first, behind);
    page.markup("</details>\n");
  }
}

}  // namespace tbdaily
