#include "tools/tallyctl/whitelist_lint.h"

#include <array>
#include <map>
#include <string_view>

#include "report/tb_config.h"

namespace tbdaily {

namespace {

struct GroupTable {
  std::string_view name;
  bool isPrefixTable;
  bool isScalarTable;
};

constexpr std::array<GroupTable, 4> kTables = {{
    {"ScalarKeys", false, true},
    {"DistributionKeys", false, false},
    {"ScalarKeyPrefixes", true, true},
    {"DistributionKeyPrefixes", true, false},
}};

const GroupTable* tableNamed(std::string_view name) {
  for (const GroupTable& table : kTables) {
    if (table.name == name) return &table;
  }
  return nullptr;
}

class Linter {
 public:
  void visitGroup(const std::string& group, const PlistDictionary& entries) {
    for (const auto& [name, keys] : entries) {
      const GroupTable* table = tableNamed(name);
      if (table == nullptr) {
        say(group, "has the entry \"" + name + "\", which means nothing");
      } else if (const PlistDictionary* dictionary = keys.asDictionary()) {
        for (const auto& [key, options] : *dictionary) visitKey(group, *table, key, options);
      }
    }
  }
  std::vector<WhitelistOddity> takeFindings() { return std::move(findings_); }

 private:
  void say(const std::string& where, const std::string& what, bool isUnknownOption = false) {
    findings_.push_back({where + " " + what, isUnknownOption});
  }

  void visitKey(const std::string& group, const GroupTable& table, const std::string& key,
                const PlistValue& options) {
    const std::string where = group + "/" + std::string(table.name) + "/" + key;
    if (const auto [earlier, isNew] = seen_[table.name].emplace(key, group); !isNew) {
      say(where, "replaces the options that group " + earlier->second + " gave");
      earlier->second = group;
    }
    if (table.isPrefixTable) visitPrefix(where, table, key);
    if (const PlistDictionary* rules = options.asDictionary()) visitOptions(where, table, *rules);
  }

  void visitPrefix(const std::string& where, const GroupTable& table, const std::string& prefix) {
    if (prefix.empty()) return say(where, "is an empty prefix and matches no key");
    std::map<std::string, bool>& prefixes = prefixes_[table.name];
    for (std::size_t length = 1; length < prefix.size(); ++length) {
      if (!prefixes.contains(prefix.substr(0, length))) continue;
      say(where, "is never reached: the earlier prefix \"" + prefix.substr(0, length) + "\" takes its keys");
      break;
    }
    prefixes[prefix] = true;
  }

  void visitOptions(const std::string& where, const GroupTable& table, const PlistDictionary& rules) {
    for (const auto& [name, value] : rules) {
      const bool forScalars =
          name == whitelist_option::kBucketInterval || name == whitelist_option::kSignificantFigures;
      if (!forScalars && name != whitelist_option::kIntervals) {
        say(where, "has the option \"" + name + "\", which means nothing", true);
      } else if (forScalars != table.isScalarTable) {
        say(where, "has the option \"" + name + "\", which has no effect on this kind of key");
      }
    }
    const auto interval = rules.get(whitelist_option::kBucketInterval).asNumber();
    if (interval && interval->toUInt64() == 0)
      say(where, "has a \"bucket_interval\" of 0: every value becomes 0");
    if (interval && interval->toInt64() < 0) say(where, "has a negative \"bucket_interval\"");
    const auto figures = rules.get(whitelist_option::kSignificantFigures).asNumber();
    if (figures && figures->toInt64() <= 0) say(where, "keeps no significant figure");
    visitIntervals(where, rules.get(whitelist_option::kIntervals));
  }

  void visitIntervals(const std::string& where, const PlistValue& intervals) {
    const PlistArray* boundaries = intervals.asArray();
    if (boundaries == nullptr) return;
    for (std::size_t i = 1; i < boundaries->size(); ++i) {
      const auto lower = (*boundaries)[i - 1].asNumber();
      const auto upper = (*boundaries)[i].asNumber();
      if (lower && upper && !(lower->toDouble() < upper->toDouble()))
        return say(where, "has boundaries that do not ascend");
    }
  }

  std::map<std::string_view, std::map<std::string, std::string>>
      seen_;  // by table: key to the group that listed it last
  std::map<std::string_view, std::map<std::string, bool>> prefixes_;  // by table
  std::vector<WhitelistOddity> findings_;
};

}  // namespace

std::vector<WhitelistOddity> whitelistOddities(const PlistDictionary& root) {
  Linter linter;
  for (const auto& [group, entries] : root) {
    if (const PlistDictionary* dictionary = entries.asDictionary()) linter.visitGroup(group, *dictionary);
  }
  return linter.takeFindings();
}

}  // namespace tbdaily
