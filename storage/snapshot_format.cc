#include "storage/snapshot_format.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <optional>

namespace tbdaily {

namespace {

constexpr std::string_view kIntegerConversions = "diuoxX";
constexpr std::string_view kTextConversions = "s";

// One stretch of a format: plain text, or a conversion.
struct FormatPiece {
  std::string_view plain;
  char conversion = '\0';  // none: plain text
  bool left = false;
  bool plus = false;
  bool space = false;
  bool alternative = false;
  bool zero = false;
  std::size_t width = 0;
  std::optional<std::size_t> precision;
};

void readFlags(std::string_view& rest, FormatPiece& piece) {
  for (; !rest.empty(); rest.remove_prefix(1)) {
    switch (rest.front()) {
      case '-':
        piece.left = true;
        break;
      case '+':
        piece.plus = true;
        break;
      case ' ':
        piece.space = true;
        break;
      case '#':
        piece.alternative = true;
        break;
      case '0':
        piece.zero = true;
        break;
      default:
        return;
    }
  }
}

// No digits are 0; nothing when the number is too large.
std::optional<std::size_t> readSize(std::string_view& rest) {
  std::size_t size = 0;
  for (; !rest.empty() && rest.front() >= '0' && rest.front() <= '9'; rest.remove_prefix(1)) {
    size = size * 10 + static_cast<std::size_t>(rest.front() - '0');
    if (size > SnapshotText::kWidest) return std::nullopt;
  }
  return size;
}

// A conversion, from behind its percent sign. False when it is none that can be printed.
bool readConversion(std::string_view& rest, std::string_view conversions, FormatPiece& piece) {
  readFlags(rest, piece);
  const auto width = readSize(rest);
  if (!width) return false;
  piece.width = *width;
  if (rest.starts_with('.')) {
    rest.remove_prefix(1);
    piece.precision = readSize(rest);
    if (!piece.precision) return false;
  }
  if (rest.empty() || conversions.find(rest.front()) == conversions.npos) return false;
  piece.conversion = rest.front();
  rest.remove_prefix(1);
  return true;
}

// Takes the next piece from a format that is not empty.
std::optional<FormatPiece> readPiece(std::string_view& rest, std::string_view conversions) {
  FormatPiece piece;
  if (rest.starts_with("%%")) {
    piece.plain = rest.substr(0, 1);
    rest.remove_prefix(2);
  } else if (rest.front() == '%') {
    rest.remove_prefix(1);
    if (!readConversion(rest, conversions, piece)) return std::nullopt;
  } else {
    piece.plain = rest.substr(0, rest.find('%'));
    rest.remove_prefix(piece.plain.size());
  }
  return piece;
}

bool canPrint(std::string_view format, std::string_view conversions, std::size_t arguments) {
  while (!format.empty()) {
    const auto piece = readPiece(format, conversions);
    if (!piece) return false;
    if (piece->conversion != '\0' && arguments-- == 0) return false;
  }
  return true;
}

// `print` appends one conversion; it is called for the first, the second ... in turn.
template <typename Print>
void appendPieces(SnapshotText& out, std::span<const char, kSnapshotFormatSize> raw,
                  std::string_view conversions, std::size_t arguments, const Print& print) {
  const auto end = std::ranges::find(raw, '\0');
  std::string_view format(raw.begin(), end);
  if (end == raw.end() || !canPrint(format, conversions, arguments)) return out.append(format);
  while (!format.empty()) {
    const auto piece = readPiece(format, conversions);
    if (piece->conversion == '\0')
      out.append(piece->plain);
    else
      print(*piece);
  }
}

// Adds the spaces of a width around what `body` appends.
template <typename Body>
void appendPadded(SnapshotText& out, const FormatPiece& piece, std::size_t length, const Body& body) {
  const std::size_t spaces = piece.width > length ? piece.width - length : 0;
  if (!piece.left) out.appendFill(' ', spaces);
  body();
  if (piece.left) out.appendFill(' ', spaces);
}

// What stands before the digits.
std::string_view prefixOf(const FormatPiece& piece, bool isSigned, bool negative, std::uint32_t magnitude) {
  if (isSigned) return negative ? "-" : piece.plus ? "+" : piece.space ? " " : "";
  if (!piece.alternative || magnitude == 0) return "";
  return piece.conversion == 'x' ? "0x" : piece.conversion == 'X' ? "0X" : "";
}

std::size_t leadingZeros(const FormatPiece& piece, std::size_t prefix, std::string_view digits) {
  const std::size_t wanted = piece.precision.value_or(0);
  std::size_t zeros = wanted > digits.size() ? wanted - digits.size() : 0;
  if (piece.alternative && piece.conversion == 'o' && zeros == 0 && !digits.starts_with('0')) zeros = 1;
  const std::size_t fixed = prefix + zeros + digits.size();
  // A precision and left alignment both turn zero filling off.
  if (piece.zero && !piece.left && !piece.precision && piece.width > fixed) zeros += piece.width - fixed;
  return zeros;
}

void appendInteger(SnapshotText& out, const FormatPiece& piece, std::uint32_t value) {
  if (piece.conversion == 'u' && !piece.left && !piece.precision)
    return out.appendNumber(value, piece.width, piece.zero ? '0' : ' ');
  const bool isSigned = piece.conversion == 'd' || piece.conversion == 'i';
  const bool negative = isSigned && value >> 31 != 0;
  const std::uint32_t magnitude = negative ? 0 - value : value;
  std::array<char, 11> storage{};  // the longest: 32 bits in octal
  const int base = piece.conversion == 'o' ? 8 : piece.conversion == 'x' || piece.conversion == 'X' ? 16 : 10;
  char* const end = std::to_chars(storage.begin(), storage.end(), magnitude, base).ptr;
  if (piece.conversion == 'X')
    std::transform(storage.begin(), end, storage.begin(),
                   [](char c) { return c >= 'a' ? static_cast<char>(c - 'a' + 'A') : c; });
  // A value of 0 in a precision of 0 has no digits.
  const std::string_view digits(storage.begin(),
                                magnitude == 0 && piece.precision == 0U ? storage.begin() : end);
  const std::string_view prefix = prefixOf(piece, isSigned, negative, magnitude);
  const std::size_t zeros = leadingZeros(piece, prefix.size(), digits);
  appendPadded(out, piece, prefix.size() + zeros + digits.size(), [&] {
    out.append(prefix);
    out.appendFill('0', zeros);
    out.append(digits);
  });
}

}  // namespace

void appendFormatted(SnapshotText& out, std::span<const char, kSnapshotFormatSize> format,
                     std::span<const std::uint32_t> values) {
  std::size_t next = 0;
  appendPieces(out, format, kIntegerConversions, values.size(),
               [&](const FormatPiece& piece) { appendInteger(out, piece, values[next++]); });
}

void appendFormatted(SnapshotText& out, std::span<const char, kSnapshotFormatSize> format,
                     std::string_view argument) {
  appendPieces(out, format, kTextConversions, 1, [&](const FormatPiece& piece) {
    const std::string_view shown = argument.substr(0, piece.precision.value_or(argument.size()));
    appendPadded(out, piece, shown.size(), [&] { out.append(shown); });
  });
}

}  // namespace tbdaily
