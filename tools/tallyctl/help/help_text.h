// Help on a terminal.
#pragma once

#include <CLI/CLI.hpp>
#include <string>
#include <string_view>

namespace tbdaily {

// The help of a command: its synopsis, what it does, its commands in groups and its options, wrapped at words
// for so many columns.
std::string helpText(const CLI::App& command, std::size_t width);

// The text in lines of at most so many columns, all but the first behind an indentation.
std::string wrappedText(std::string_view text, std::size_t indentation, std::size_t width);

// Has the parser's --help print that.
class HelpFormatter : public CLI::FormatterBase {
 public:
  explicit HelpFormatter(std::size_t width) : width_(width) {}
  std::string make_help(const CLI::App* command, std::string, CLI::AppFormatMode) const override {
    return helpText(*command, width_);
  }

 private:
  const std::size_t width_;
};

}  // namespace tbdaily
