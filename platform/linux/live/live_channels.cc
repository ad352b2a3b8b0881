#include "platform/linux/live/live_channels.h"

#include <algorithm>
#include <limits>
#include <system_error>

#include "platform/utf8.h"

namespace tbdaily {

namespace fs = std::filesystem;

namespace {

constexpr std::uint64_t kSimple = 1, kStates = 2;

std::string joined(std::initializer_list<std::string_view> parts, char between) {
  std::string all;
  for (const std::string_view part : parts) {
    if (!all.empty()) all += between;
    all += part;
  }
  return all;
}

}  // namespace

std::string pathOf(std::initializer_list<std::string_view> parts) {
  return joined(parts, '/');
}

std::string dotted(std::initializer_list<std::string_view> parts) {
  return joined(parts, '.');
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

fs::path LiveDiscovery::place(std::string_view path) const {
  return root_ / fs::path(path).relative_path();
}

std::vector<std::string> LiveDiscovery::names(std::string_view folder) const {
  std::vector<std::string> names;
  std::error_code error;
  for (fs::directory_iterator entries(place(folder), error); !error && entries != fs::directory_iterator();
       entries.increment(error))
    names.push_back(entries->path().filename().native());
  std::ranges::sort(names);
  return names;
}

std::vector<std::string> LiveDiscovery::numbered(std::string_view folder, std::string_view prefix,
                                                 std::string_view ending) const {
  std::vector<std::string> found = names(folder);
  std::erase_if(found, [&](std::string_view name) {
    if (name.size() <= prefix.size() + ending.size() || !name.starts_with(prefix) || !name.ends_with(ending))
      return true;
    const std::string_view number = name.substr(prefix.size(), name.size() - prefix.size() - ending.size());
    return !std::ranges::all_of(number, [](char c) { return c >= '0' && c <= '9'; });
  });
  // Shorter numbers are lower ones: the kernel writes no leading zeros.
  std::ranges::sort(found, [](const std::string& a, const std::string& b) {
    return a.size() != b.size() ? a.size() < b.size() : a < b;
  });
  return found;
}

bool LiveDiscovery::has(std::string_view path) const {
  std::error_code ignored;
  return fs::exists(place(path), ignored);
}

const std::optional<std::string>& LiveDiscovery::text(const std::string& file) {
  auto found = texts_.find(file);
  if (found == texts_.end()) found = texts_.emplace(file, liveText(place(file))).first;
  return found->second;
}

std::optional<std::string> LiveDiscovery::name(const std::string& file) {
  const std::optional<std::string>& contents = text(file);
  if (!contents) return std::nullopt;
  std::string_view rest = *contents;
  const std::string_view line = takeLine(rest);
  return line.empty() ? std::nullopt : std::optional(liveName(line));
}

std::optional<Slot> LiveDiscovery::number(const std::string& file, NumberRange range) {
  return cell(file, {.range = range, .isAlone = true});
}

std::optional<Slot> LiveDiscovery::cell(const std::string& file, TextCell cell) {
  const std::optional<std::string>& contents = text(file);
  const auto value = contents ? cellNumber(*contents, cell) : std::nullopt;
  if (!value) return std::nullopt;
  std::vector<TextCell>& cells = sources_[file];
  // The same number may be part of a channel of its own and of a sum.
  const auto same = std::ranges::find_if(cells, [&cell](const TextCell& known) {
    return known.line == cell.line && known.word == cell.word && known.label == cell.label;
  });
  if (same != cells.end()) return same->slot;
  cell.slot = slot(*value);
  cells.push_back(cell);
  return cell.slot;
}

Slot LiveDiscovery::slot(std::int64_t value) {
  readings_.push_back(value);
  return readings_.size() - 1;
}

void LiveDiscovery::addSimple(std::string_view group, std::string_view subgroup, std::string name,
                              LiveUnit unit, LiveWord value, std::string_view stem) {
  const auto isTaken = [&](const LiveChannel& other) {
    return other.name == name && other.group == group && other.subgroup == subgroup;
  };
  while (std::ranges::any_of(channels_, isTaken)) name.append(".").append(stem);
  LiveChannel channel{std::string(group), std::string(subgroup), std::move(name), unit, false, {}};
  channel.elements.push_back({0, std::move(value), {}});
  add(std::move(channel));
}

}  // namespace tbdaily
