// The key whitelist: which keys a daily report may carry, and how their values are coarsened before they
// leave the device.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/platform.h"
#include "report/key_table.h"

namespace tbdaily {

inline constexpr std::string_view kWhitelistPath =
    "/Library/Application Support/Tallybook/Whitelist_Nimbos.plist";

// Options of a key; other entries of an options dictionary mean nothing to the report.
namespace whitelist_option {
inline constexpr std::string_view kBucketInterval = "bucket_interval";
inline constexpr std::string_view kSignificantFigures = "sig_fig";
inline constexpr std::string_view kIntervals = "intervals";
}  // namespace whitelist_option

enum class KeyKind : std::uint8_t { Scalar, Distribution };
enum class MatchKind : std::uint8_t { Exact, Prefix, Internal };

// Why a key may be reported. Borrowed from the TBConfig.
struct WhitelistMatch {
  MatchKind by = MatchKind::Exact;
  std::string_view entry;  // the exact key or the prefix; empty for Internal
  std::string_view group;  // empty for Internal
  const PlistDictionary* options = nullptr;
};

// Read-only once loaded. Keeps a reference to the platform's log.
class TBConfig {
 public:
  // An entry whose rules cannot be read shadows: what it would have matched is not reported, on any device.
  //
  // Reads, digests and parses the whitelist. Null when it cannot be read or is no property list with a
  // dictionary at its root; the log says why. Groups that a tasking switched off, and what is not understood,
  // are left out with a message.
  static std::unique_ptr<TBConfig> init(Platform& platform);

  // The key's options, or null when it may not be reported. An exact entry beats every prefix; of several
  // prefixes the first in file order wins; on an internal device everything else is allowed with empty
  // options. Borrowed.
  const PlistDictionary* configOptionsForScalarKey(std::string_view key) const;
  const PlistDictionary* configOptionsForDistributionKey(std::string_view key) const;

  // The same answer with its reason.
  std::optional<WhitelistMatch> match(KeyKind kind, std::string_view key) const;
  // The entry with unreadable rules that keeps the key from being reported; its options are null.
  std::optional<WhitelistMatch> unreadableEntry(KeyKind kind, std::string_view key) const;

  // MD5 of the file's bytes as read: 32 lowercase hexadecimal digits.
  const std::string& configFileDigest() const { return _configFileDigest; }
  bool isInternalDevice() const { return _isInternalDevice; }

 private:
  std::optional<WhitelistMatch> listed(KeyKind kind, std::string_view key) const;
  explicit TBConfig(Platform& platform);

  bool groupIsEnabled(Platform& platform, std::string_view group) const;
  void loadGroup(const std::string& name, const PlistValue& group);
  void mergeEntries(KeyTable& table, const std::string& where, const PlistValue& entries);

  SystemLog& log_;
  KeyTable _scalarKeys;
  KeyTable _scalarPrefixes;
  KeyTable _distributionKeys;
  KeyTable _distributionPrefixes;
  bool _isInternalDevice = false;
  std::string _configFileDigest;
  std::vector<std::string> groupNames_;  // in the order of loading; the tables refer to them by number
};

}  // namespace tbdaily
