#include "storage/snapshot_format.h"

#include <algorithm>
#include <charconv>

namespace tbdaily {

namespace {

using Conversion = SnapshotFormat::Conversion;

void readFlags(std::string_view& rest, Conversion& conversion) {
  for (; !rest.empty(); rest.remove_prefix(1)) {
    switch (rest.front()) {
      case '-':
        conversion.left = true;
        break;
      case '+':
        conversion.plus = true;
        break;
      case ' ':
        conversion.space = true;
        break;
      case '#':
        conversion.alternative = true;
        break;
      case '0':
        conversion.zero = true;
        break;
      default:
        return;
    }
  }
}

// No digits are 0; nothing when the number is too large.
std::optional<std::uint8_t> readSize(std::string_view& rest) {
  std::size_t size = 0;
  for (; !rest.empty() && rest.front() >= '0' && rest.front() <= '9'; rest.remove_prefix(1)) {
    size = size * 10 + static_cast<std::size_t>(rest.front() - '0');
    if (size > SnapshotText::kWidest) return std::nullopt;
  }
  return static_cast<std::uint8_t>(size);
}

// A conversion, from behind its percent sign. False when it is none of the types.
bool readConversion(std::string_view& rest, std::string_view types, Conversion& conversion) {
  readFlags(rest, conversion);
  const auto width = readSize(rest);
  if (!width) return false;
  conversion.width = *width;
  if (rest.starts_with('.')) {
    rest.remove_prefix(1);
    conversion.precision = readSize(rest);
    if (!conversion.precision) return false;
  }
  if (rest.empty() || types.find(rest.front()) == types.npos) return false;
  conversion.type = rest.front();
  conversion.isUsual = conversion.type == 'u' && !conversion.left && !conversion.precision;
  rest.remove_prefix(1);
  return true;
}

// Adds the spaces of a width around what `body` appends.
template <typename Body>
void appendPadded(SnapshotText& out, const Conversion& conversion, std::size_t length, const Body& body) {
  const std::size_t spaces = conversion.width > length ? conversion.width - length : 0;
  if (!conversion.left) out.appendFill(' ', spaces);
  body();
  if (conversion.left) out.appendFill(' ', spaces);
}

bool isHexadecimal(const Conversion& conversion) {
  return conversion.type == 'x' || conversion.type == 'X';
}

// What stands before the digits.
std::string_view prefixOf(const Conversion& conversion, bool isSigned, bool negative,
                          std::uint32_t magnitude) {
  if (isSigned) return negative ? "-" : conversion.plus ? "+" : conversion.space ? " " : "";
  if (!conversion.alternative || !isHexadecimal(conversion) || magnitude == 0) return "";
  return conversion.type == 'x' ? "0x" : "0X";
}

std::size_t leadingZeros(const Conversion& conversion, std::size_t prefix, std::string_view digits) {
  const std::size_t wanted = conversion.precision.value_or(0);
  std::size_t zeros = wanted > digits.size() ? wanted - digits.size() : 0;
  if (conversion.alternative && conversion.type == 'o' && zeros == 0 && !digits.starts_with('0')) zeros = 1;
  const std::size_t length = prefix + zeros + digits.size();
  // A precision and left alignment both turn zero filling off.
  const bool fills = conversion.zero && !conversion.left && !conversion.precision;
  return fills && conversion.width > length ? zeros + conversion.width - length : zeros;
}

}  // namespace

SnapshotFormat::SnapshotFormat(std::span<const char, kSize> raw, Arguments arguments) {
  const auto end = std::ranges::find(raw, '\0');
  if (end != raw.end() && read({raw.begin(), end}, arguments)) return;
  plain_.front() = ShortText(std::string_view(raw.begin(), end));
  conversionCount_ = 0;
}

bool SnapshotFormat::read(std::string_view rest, Arguments arguments) {
  const std::string_view types = arguments == Arguments::kText ? "s" : "diuoxX";
  const std::size_t most = arguments == Arguments::kTwoValues ? 2 : 1;
  while (!rest.empty()) {
    const char next = rest.front();
    rest.remove_prefix(1);
    if (next != '%' || rest.starts_with('%')) {
      if (next == '%') rest.remove_prefix(1);
      plain_[conversionCount_].append(next);
      continue;
    }
    if (conversionCount_ == most) return false;
    Conversion& conversion = conversions_[conversionCount_++];
    if (!readConversion(rest, types, conversion)) return false;
  }
  return true;
}

void SnapshotFormat::appendUnusual(SnapshotText& out, const ShortText& label, const Conversion& conversion,
                                   std::uint32_t value) {
  out.appendShort(label);
  const bool isSigned = conversion.type == 'd' || conversion.type == 'i';
  const bool negative = isSigned && value >> 31 != 0;
  const std::uint32_t magnitude = negative ? 0 - value : value;
  std::array<char, 11> storage;  // the longest: 32 bits in octal
  const int base = conversion.type == 'o' ? 8 : isHexadecimal(conversion) ? 16 : 10;
  char* end = std::to_chars(storage.begin(), storage.end(), magnitude, base).ptr;
  if (conversion.type == 'X')
    std::transform(storage.begin(), end, storage.begin(),
                   [](char c) { return c >= 'a' ? static_cast<char>(c - 'a' + 'A') : c; });
  // A value of 0 in a precision of 0 has no digits.
  if (magnitude == 0 && conversion.precision == 0) end = storage.begin();
  const std::string_view digits(storage.begin(), end);
  const std::string_view prefix = prefixOf(conversion, isSigned, negative, magnitude);
  const std::size_t zeros = leadingZeros(conversion, prefix.size(), digits);
  appendPadded(out, conversion, prefix.size() + zeros + digits.size(), [&] {
    out.append(prefix);
    out.appendFill('0', zeros);
    out.append(digits);
  });
}

void SnapshotFormat::append(SnapshotText& out, std::string_view argument) const {
  for (std::size_t i = 0; i < conversionCount_; ++i) {
    out.appendShort(plain_[i]);
    const std::string_view shown = argument.substr(0, conversions_[i].precision.value_or(argument.size()));
    appendPadded(out, conversions_[i], shown.size(), [&] { out.append(shown); });
  }
  out.appendShort(plain_[conversionCount_]);
}

}  // namespace tbdaily
