#include <gmock/gmock.h>

#include "tools/tallyctl/help/command_tree.h"
#include "tools/tallyctl/help/completion.h"
#include "tools/tallyctl/help/help_text.h"
#include "tools/tallyctl/help/man_page.h"
#include "tools/tallyctl/help/mistyped.h"

namespace tbdaily::testing {
namespace {

using ::testing::HasSubstr;
using ::testing::Not;

struct HelpTest : ::testing::Test {
  HelpTest() : program("Does things", "tool") {
    program.add_option("--root", text, "The root")->type_name("DIR");
    program.add_flag("--json", flag, "As JSON");
    program.set_help_flag("-h,--help", "Print this help");
    CLI::App* draw = program.add_subcommand("draw", "Draw .lines - or 'none'")->group("Pictures");
    draw->add_option("FILE", texts, "What to draw")->required();
    draw->add_option("-o,--output", text, "Where to write a picture that is long enough for two lines")
        ->type_name("FILE")
        ->required();
    CLI::App* colour = program.add_subcommand("colour", "Colours")->group("Pictures");
    colour->add_subcommand("list", "List them")->add_flag("--all", flag, "All of them");
    program.add_subcommand("secret", "Not shown")->group("");
  }

  std::string text;
  std::vector<std::string> texts;
  bool flag = false;
  CLI::App program;
};

TEST_F(HelpTest, IsWrappedAtWordsAndHasTheOptionsOfAllCommands) {
  EXPECT_EQ(helpText(*commandNamed(program, "draw"), 60),
            "Usage: tool draw --output FILE FILE...\n\nDraw .lines - or 'none'.\n\n"
            "Arguments:\n  FILE...  What to draw\n\n"
            "Options:\n  -o, --output FILE  Where to write a picture that is long\n"
            "                     enough for two lines (required)\n\n"
            "Options of all commands:\n  --root DIR  The root\n  --json      As JSON\n  -h, --help  Print "
            "this help\n");
  EXPECT_THAT(helpText(program, 80),
              HasSubstr("\nPictures:\n  draw    Draw .lines - or 'none'\n  colour  Colours\n"));
  EXPECT_THAT(helpText(program, 80), Not(HasSubstr("secret")));
}

TEST_F(HelpTest, NamesTheMostSimilarWord) {
  const auto unknown = [this](std::vector<std::string> words) { return unknownWord(program, words); };
  EXPECT_EQ(unknown({"draw", "x", "--output=y"}), "");
  EXPECT_EQ(unknown({"--root", "darw", "draw", "-x9"}), "there is no option \"-x\"; did you mean \"-o\"?");
  EXPECT_EQ(unknown({"--json", "darw"}), "there is no command \"darw\"; did you mean \"draw\"?");
  EXPECT_EQ(unknown({"colour", "lits"}),
            "there is no command \"colour lits\"; did you mean \"colour list\"?");
  EXPECT_EQ(unknown({"colour", "list", "--al"}), "there is no option \"--al\"; did you mean \"--all\"?");
  EXPECT_EQ(unknown({"colour", "list", "--rot=5"}), "there is no option \"--rot\"; did you mean \"--root\"?");
  EXPECT_EQ(unknown({"wholly-else"}), "there is no command \"wholly-else\"");
  EXPECT_EQ(unknown({"draw", "--", "--x"}), "");
}

TEST_F(HelpTest, ManualPagesEscapeWhatTheFormatterWouldTake) {
  const std::string page = manPage(*commandNamed(program, "draw"), "1.0");
  EXPECT_THAT(page, HasSubstr("\n.SH DESCRIPTION\nDraw .lines \\- or 'none'.\n"));
  EXPECT_THAT(page, HasSubstr("\n.TP\n\\fB\\-o\\fR, \\fB\\-\\-output\\fR \\fIFILE\\fR\n"));
  EXPECT_THAT(manPage(program, "1.0"), HasSubstr("\n.SS Pictures\n.TP\n\\fBdraw\\fR(1)\n"));
}

}  // namespace
}  // namespace tbdaily::testing
