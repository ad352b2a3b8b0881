// Looking through /proc, /sys and /dev for what this host measures.
#pragma once

#include <filesystem>
#include <initializer_list>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/linux/live/live_channels.h"

namespace tbdaily {

// The parts of a path, with slashes between them.
std::string pathOf(std::initializer_list<std::string_view> parts);

// What a driver looks through when it asks what this host has. Sources that a driver has named are read in
// each update of a channel that needs them.
class LiveDiscovery {
 public:
  // Borrows the numbers' list.
  LiveDiscovery(std::filesystem::path root, Readings& readings)
      : root_(std::move(root)), readings_(readings) {}

  // The names in a folder, in byte order; none where it cannot be read.
  std::vector<std::string> names(std::string_view folder) const;
  // Those that are a prefix and a number, and an ending, by the number: "cpu2" before "cpu10".
  std::vector<std::string> numbered(std::string_view folder, std::string_view prefix,
                                    std::string_view ending = {}) const;
  bool has(std::string_view path) const;
  // The first line of a file as a name; nothing where it cannot be read or is empty.
  std::optional<std::string> name(const std::string& file);
  // All of a file; read once.
  const std::optional<std::string>& text(const std::string& file);
  std::filesystem::path place(std::string_view path) const;

  // The slot of a file's number, or of a number in a text; nothing where there is none now.
  std::optional<Slot> number(const std::string& file, NumberRange range = NumberRange::Counter);
  std::optional<Slot> cell(const std::string& file, TextCell cell);
  // A slot of a source that a driver reads by itself.
  Slot slot(std::int64_t value);
  void add(LiveChannel channel) { channels_.push_back(std::move(channel)); }
  // A channel of one value. Where its name is taken in the group, the stem of its file stands behind it.
  void addSimple(std::string_view group, std::string_view subgroup, std::string name, LiveUnit unit,
                 LiveWord value, std::string_view stem = "value");

  // What was found.
  std::vector<LiveChannel>& channels() { return channels_; }
  // The file and the cells behind each slot.
  using TextSources = std::map<std::string, std::vector<TextCell>, std::less<>>;
  const TextSources& textSources() const { return sources_; }

 private:
  const std::filesystem::path root_;
  Readings& readings_;
  std::map<std::string, std::optional<std::string>, std::less<>> texts_;
  TextSources sources_;
  std::vector<LiveChannel> channels_;
};

}  // namespace tbdaily
