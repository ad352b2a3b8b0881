#include "platform/linux/live/live_discovery.h"

#include <algorithm>
#include <system_error>

namespace tbdaily {

namespace fs = std::filesystem;

std::string pathOf(std::initializer_list<std::string_view> parts) {
  std::string path;
  for (const std::string_view part : parts) path.append(path.empty() ? "" : "/").append(part);
  return path;
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
  // Those of the group stand together, at the end.
  const auto isOfGroup = [&](const LiveChannel& other) {
    return other.group == group && other.subgroup == subgroup;
  };
  const auto hasName = [&](const LiveChannel& other) { return other.name == name; };
  const auto end = std::find_if_not(channels_.rbegin(), channels_.rend(), isOfGroup);
  while (std::any_of(channels_.rbegin(), end, hasName)) name.append(".").append(stem);
  LiveChannel channel{std::string(group), std::string(subgroup), std::move(name), unit, false, {}};
  channel.elements.push_back({0, std::move(value), {}});
  add(std::move(channel));
}

}  // namespace tbdaily
