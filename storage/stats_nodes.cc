#include "storage/stats_nodes.h"

#include <array>
#include <charconv>

namespace tbdaily {

std::string StatNode::name() const {
  std::string text(kStats[row].name);
  if (element != kBareName) text += std::to_string(element);
  return text;
}

bool StatNode::isNamed(std::string_view name) const {
  const std::string_view stat = kStats[row].name;
  if (element == kBareName) return name == stat;
  if (!name.starts_with(stat)) return false;
  std::array<char, std::numeric_limits<std::uint16_t>::digits10 + 1> digits{};
  const auto written = std::to_chars(digits.data(), digits.data() + digits.size(), element);
  return name.substr(stat.size()) == std::string_view(digits.data(), written.ptr);
}

}  // namespace tbdaily
