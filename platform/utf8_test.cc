#include "platform/utf8.h"

#include <gtest/gtest.h>

namespace tbdaily {
namespace {

TEST(Utf8, WhatCouldDriveATerminalOrForgeALineBecomesEscapes) {
  const std::string_view text =
      "a\x1b[2J\r\n\t\x7f\u009b\u0085\u202e\u2066\u200f\u061c \u00e4\u2028\U0001F600\xff\x9b\xc2";
  struct Case {
    TextPlace place;
    std::string_view shown;
  };
  for (const Case& c : {
           Case{TextPlace::LogMessage,
                "a\\x1b[2J\\x0d\n\t\\x7f\\x9b\\x85\u202e\u2066\u200f\u061c "
                "\u00e4\u2028\U0001F600\\xff\\x9b\\xc2"},
           Case{TextPlace::Line,
                "a\\x1b[2J\\x0d\\x0a\\x09\\x7f\\x9b\\x85\\u202e\\u2066\\u200f\\u061c "
                "\u00e4\u2028\U0001F600\\xff\\x9b\\xc2"},
           Case{TextPlace::Lines,
                "a\\x1b[2J\\x0d\n\t\\x7f\\x9b\\x85\\u202e\\u2066\\u200f\\u061c "
                "\u00e4\u2028\U0001F600\\xff\\x9b\\xc2"},
       }) {
    EXPECT_EQ(withoutControls(text, c.place), c.shown);
    EXPECT_EQ(withoutControls(c.shown, c.place), c.shown);
  }
  EXPECT_EQ(withoutControls("<a>\x7f\u009b\u202e\n</a>", TextPlace::Xml), "<a>&#x7f;&#x9b;&#x202e;\n</a>");
}

}  // namespace
}  // namespace tbdaily
