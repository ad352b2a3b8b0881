// Texts as arguments: absent ones in every way in which a program may have them.
#pragma once

#include <concepts>
#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

namespace kdreport {

// A text that is borrowed for a call, or none: a null pointer, nullptr and nullopt are no text.
class KdReportText {
 public:
  constexpr KdReportText() = default;
  constexpr KdReportText(std::nullptr_t) {}
  constexpr KdReportText(std::nullopt_t) {}
  constexpr KdReportText(const char* text) {
    if (text != nullptr) text_ = text;
  }
  constexpr KdReportText(std::string_view text) : text_(text) {}
  KdReportText(const std::string& text) : text_(text) {}
  constexpr KdReportText(std::optional<std::string_view> text) : text_(text) {}
  KdReportText(const std::optional<std::string>& text) {
    if (text) text_ = *text;
  }

  constexpr std::optional<std::string_view> get() const { return text_; }

 private:
  std::optional<std::string_view> text_;
};

// The same, kept.
class KdReportOwnedText {
 public:
  KdReportOwnedText() = default;
  template <std::convertible_to<KdReportText> Text>
  KdReportOwnedText(const Text& text) : text_(KdReportText(text).get()) {}

  const std::optional<std::string>& get() const { return text_; }

 private:
  std::optional<std::string> text_;
};

}  // namespace kdreport
