#include "platform/linux/live/live_channels.h"

#include <algorithm>
#include <limits>

#include "platform/utf8.h"

namespace tbdaily {

namespace {

constexpr std::uint64_t kSimple = 1, kStates = 2;

}  // namespace

std::string dotted(std::initializer_list<std::string_view> parts) {
  std::string name;
  for (const std::string_view part : parts) name.append(name.empty() ? "" : ".").append(part);
  return name;
}

std::int64_t LiveWord::of(const Readings& readings) const {
  constexpr std::int64_t kMost = std::numeric_limits<std::int64_t>::max();
  std::int64_t sum = 0, product = 0;
  for (const Slot slot : slots) {
    if (__builtin_add_overflow(sum, readings[slot], &sum)) return kMost;
  }
  // The remainder apart, so that the product is not larger than what comes out.
  if (__builtin_mul_overflow(sum / divisor, factor, &product) ||
      __builtin_add_overflow(product, sum % divisor * factor / divisor, &product))
    return sum < 0 ? -kMost : kMost;
  return product;
}

std::uint64_t LiveChannel::type(LiveCategory category) const {
  return (hasStates ? kStates : kSimple) | static_cast<std::uint64_t>(category) << 16 |
         std::uint64_t{elements.size()} << 32;
}

std::uint64_t StateIdentifiers::next(std::string_view name, std::size_t number) {
  const auto packed = [](std::string_view text) {
    std::uint64_t identifier = 0;
    for (const char c : text.substr(0, sizeof identifier))
      identifier = identifier << 8 | static_cast<unsigned char>(c);
    return identifier;
  };
  const std::string_view text = name.substr(0, sizeof(std::uint64_t));
  const bool isPlain =
      !text.empty() && std::ranges::all_of(text, [](char c) { return c >= 0x20 && c <= 0x7E; });
  std::uint64_t identifier = packed(text);
  if (!isPlain || std::ranges::find(taken_, identifier) != taken_.end())
    identifier = packed("state" + std::to_string(number));
  taken_.push_back(identifier);
  return identifier;
}

void sortByNumber(std::vector<std::string>& names) {
  const auto stemOf = [](std::string_view name) {
    return name.substr(0, name.find_last_not_of("0123456789") + 1);
  };
  std::ranges::sort(names, [&](const std::string& a, const std::string& b) {
    const bool differInNumber = stemOf(a) == stemOf(b) && a.size() != b.size();
    return differInNumber ? a.size() < b.size() : a < b;
  });
}

std::string liveName(std::string_view text) {
  std::string name;
  for (std::size_t at = 0; at < text.size();) {
    const std::size_t length = utf8CharacterLength(text.substr(at));
    const std::string_view character = text.substr(at, std::max<std::size_t>(length, 1));
    const bool isControl =
        length == 1 && (static_cast<unsigned char>(character[0]) < 0x20 || character[0] == 0x7F);
    const bool isUpperControl = length == 2 && character >= "\xC2\x80" && character <= "\xC2\x9F";
    name += length == 0 || isControl || isUpperControl ? kReplacementCharacter : character;
    at += character.size();
  }
  return name;
}

std::uint64_t liveChannelIdentifier(std::string_view driver, const LiveChannel& channel) {
  std::uint64_t hash = 0xCBF29CE484222325;
  const auto add = [&hash](unsigned char byte) { hash = (hash ^ byte) * 0x100000001B3; };
  for (const std::string_view part : {driver, std::string_view(channel.group),
                                      std::string_view(channel.subgroup), std::string_view(channel.name)}) {
    for (const char c : part) add(static_cast<unsigned char>(c));
    add(0);
  }
  return hash & ~(std::uint64_t{1} << 63);
}

}  // namespace tbdaily
