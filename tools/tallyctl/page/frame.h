// What stands around the content of a page: one file that needs no other, runs nothing and asks for nothing.
#pragma once

#include <cstddef>
#include <functional>
#include <string>
#include <string_view>

#include "tools/tallyctl/page/html.h"

namespace tbdaily {

// Up to the body's first content; the title is also the page's first heading, in which its last word is kept
// on one line: a day, for example. `over` stands above it, small.
void beginPage(HtmlWriter& page, std::string_view title, std::string_view over);
void endPage(HtmlWriter& page);

// A region of its own in which what is wider or longer than its place can be scrolled, by keys too. The label
// tells it apart from the other ones of the page. A tall one is as high as half a screen at most.
enum class Scroll { Wide, Tall };
void beginScroll(HtmlWriter& page, Scroll scroll, std::string_view label);
void endScroll(HtmlWriter& page);

// One term of a description list.
void writeFact(HtmlWriter& page, Markup term, std::string_view text);

// Calls write(first, behind) for the items from 0 up to `count`, where there are more than `most` in parts
// that open one by one: a browser lays out none that is closed. nameOf(i) tells where a part begins and ends.
void writeInParts(HtmlWriter& page, std::size_t count, std::size_t most,
                  const std::function<std::string_view(std::size_t item)>& nameOf,
                  const std::function<void(std::size_t first, std::size_t behind)>& write);

}  // namespace tbdaily
