#include "report/tb_config.h"

#include <algorithm>
#include <array>

#include "platform/file_system.h"
#include "platform/hexadecimal.h"
#include "platform/message_digest.h"
#include "platform/preferences_store.h"
#include "platform/property_list_codec.h"
#include "platform/system_log.h"
#include "report/internal_device.h"

namespace tbdaily {

namespace {

constexpr std::string_view kInternalGroup = "InternalTesting";
const PlistDictionary kNoOptions;

bool isAbsentOrNumber(const PlistDictionary& options, std::string_view key) {
  const PlistValue* value = options.find(key);
  return value == nullptr || value->asNumber().has_value();
}

bool isAbsentOrNumbers(const PlistDictionary& options, std::string_view key) {
  const PlistValue* value = options.find(key);
  if (value == nullptr) return true;
  const PlistArray* array = value->asArray();
  return array != nullptr && std::all_of(array->begin(), array->end(), [](const PlistValue& element) {
           return element.asNumber().has_value();
         });
}

// A coarsening rule that cannot be read must never mean that a value leaves the device as it is.
bool rulesAreReadable(const PlistDictionary& options) {
  return isAbsentOrNumber(options, whitelist_option::kBucketInterval) &&
         isAbsentOrNumber(options, whitelist_option::kSignificantFigures) &&
         isAbsentOrNumbers(options, whitelist_option::kIntervals);
}

}  // namespace

TBConfig::TBConfig(Platform& platform)
    : log_(platform.systemLog), _isInternalDevice(TBIsInternalDevice(platform.deviceAnswers)) {}

std::unique_ptr<TBConfig> TBConfig::init(Platform& platform) {
  std::unique_ptr<TBConfig> config(new TBConfig(platform));
  SystemLog& log = platform.systemLog;

  const auto bytes = platform.fileSystem.readFile(kWhitelistPath);
  if (!bytes) {
    log.message(LogLevel::Error, "Couldn't load whitelist");
    return nullptr;
  }
  appendHexadecimal(config->_configFileDigest, platform.messageDigest.md5(*bytes));

  PlistParseResult parsed = platform.propertyListCodec.parse(*bytes);
  const PlistDictionary* root = parsed.value.asDictionary();
  if (root == nullptr) {
    if (parsed.error.empty()) parsed.error = "the root is no dictionary";
    log.message(LogLevel::Error, "Couldn't parse the contents of the config file. Error: %@", parsed.error);
    return nullptr;
  }
  for (const auto& [name, group] : *root) {
    if (name == kInternalGroup && !config->_isInternalDevice) continue;
    if (config->groupIsEnabled(platform, name)) config->loadGroup(name, group);
  }
  config->_scalarPrefixes.indexPrefixes();
  config->_distributionPrefixes.indexPrefixes();
  return config;
}

bool TBConfig::groupIsEnabled(Platform& platform, std::string_view group) const {
  const PreferenceBoolean enabled = platform.preferences.getBoolean(group, preference_domain::kTaskingValues);
  if (enabled.value || _isInternalDevice || !enabled.valid) return true;
  log_.message(LogLevel::Default, "keyGroup %@ is disabled by tasking", group);
  return false;
}

void TBConfig::loadGroup(const std::string& name, const PlistValue& group) {
  const std::array<std::pair<std::string_view, KeyTable*>, 4> tables = {{
      {"ScalarKeys", &_scalarKeys},
      {"DistributionKeys", &_distributionKeys},
      {"ScalarKeyPrefixes", &_scalarPrefixes},
      {"DistributionKeyPrefixes", &_distributionPrefixes},
  }};
  const PlistDictionary* entries = group.asDictionary();
  if (entries == nullptr) {
    log_.message(LogLevel::Error, "whitelist group %{public}@ is no dictionary and is skipped", name);
    return;
  }
  groupNames_.push_back(name);
  for (const auto& [entryName, keys] : *entries) {
    for (const auto& [tableName, table] : tables) {
      if (entryName == tableName) mergeEntries(*table, std::string(name).append("/").append(entryName), keys);
    }
  }
}

void TBConfig::mergeEntries(KeyTable& table, const std::string& where, const PlistValue& entries) {
  const PlistDictionary* keys = entries.asDictionary();
  if (keys == nullptr) {
    log_.message(LogLevel::Error, "whitelist entry %{public}@ is no dictionary and is skipped", where);
    return;
  }
  const auto group = static_cast<std::uint32_t>(groupNames_.size() - 1);
  for (const auto& [key, options] : *keys) {
    const PlistDictionary* rules = options.asDictionary();
    const bool isReadable = rules != nullptr && rulesAreReadable(*rules);
    if (!isReadable) {
      log_.message(LogLevel::Error,
                   rules == nullptr ? "options of whitelist key %{public}@ in %{public}@ are no dictionary; "
                                      "what it matches is not reported"
                                    : "options of whitelist key %{public}@ in %{public}@ cannot be read; "
                                      "what it matches is not reported",
                   key, where);
    }
    table.set(key, isReadable ? options : PlistValue::boolean(false), group);
  }
}

std::optional<WhitelistMatch> TBConfig::listed(KeyKind kind, std::string_view key) const {
  const bool scalar = kind == KeyKind::Scalar;
  if (const auto found = (scalar ? _scalarKeys : _distributionKeys).exact(key)) {
    return WhitelistMatch{MatchKind::Exact, found->entry, groupNames_[found->group], found->options};
  }
  if (const auto found = (scalar ? _scalarPrefixes : _distributionPrefixes).firstPrefixOf(key)) {
    log_.message(LogLevel::Debug, "prefix match %@ for %@", found->entry, key);
    return WhitelistMatch{MatchKind::Prefix, found->entry, groupNames_[found->group], found->options};
  }
  return std::nullopt;
}

std::optional<WhitelistMatch> TBConfig::match(KeyKind kind, std::string_view key) const {
  if (const auto found = listed(kind, key)) return found->options != nullptr ? found : std::nullopt;
  if (!_isInternalDevice) return std::nullopt;
  log_.message(LogLevel::Debug, "passing @{} for %@ as device is Velmora Internal", key);
  return WhitelistMatch{MatchKind::Internal, {}, {}, &kNoOptions};
}

std::optional<WhitelistMatch> TBConfig::unreadableEntry(KeyKind kind, std::string_view key) const {
  const auto found = listed(kind, key);
  return found && found->options == nullptr ? found : std::nullopt;
}

const PlistDictionary* TBConfig::configOptionsForScalarKey(std::string_view key) const {
  const auto found = match(KeyKind::Scalar, key);
  return found ? found->options : nullptr;
}

const PlistDictionary* TBConfig::configOptionsForDistributionKey(std::string_view key) const {
  const auto found = match(KeyKind::Distribution, key);
  return found ? found->options : nullptr;
}

}  // namespace tbdaily
