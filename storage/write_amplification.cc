#include "storage/write_amplification.h"

namespace tbdaily {

namespace {

constexpr unsigned kUnitShift = 12;  // 4 KiB

// The kept precision.
double asSingle(double value) {
  return static_cast<double>(static_cast<float>(value));
}

}  // namespace

WriteAmplification computeWriteAmplification(const StatsContext& context) {
  const auto hostWrites = static_cast<double>(context.hostWrites);
  const std::uint32_t bytesPerBlock =
      context.bytesPerPage * context.pagesPerVirtualBlock;  // wraps at 32 bits
  const std::uint64_t userErases = context.bandErases * std::uint64_t{bytesPerBlock >> kUnitShift};

  std::uint64_t unitsPerSlcBlock = 0, intermediateErases = 0;
  for (const StatNode& node : context.nodes) {
    if (node.isNamed("pagesPerVirtualBlockSlc"))
      unitsPerSlcBlock = node.value * context.bytesPerPage >> kUnitShift;
    if (node.isNamed("intermediateBandErases")) intermediateErases = node.value;
  }
  const bool hasSystem = unitsPerSlcBlock != 0 && intermediateErases != 0;
  const auto systemErases = static_cast<double>(unitsPerSlcBlock * intermediateErases);
  return {asSingle(static_cast<double>(userErases) / hostWrites),
          hasSystem ? asSingle(systemErases / hostWrites) : 0};
}

std::optional<float> preferredWriteAmplificationThreshold(PreferencesStore& preferences) {
  const auto number = preferences.copyApplicationValue("userWAmp", preference_domain::kNandInfo).asNumber();
  if (!number || !number->isReal()) return std::nullopt;
  const auto threshold = static_cast<float>(number->toDouble());
  return 0 < threshold && threshold < 10 ? std::optional(threshold) : std::nullopt;
}

bool isAboveThreshold(double user, PreferencesStore& preferences) {
  const auto preferred = preferredWriteAmplificationThreshold(preferences);
  return preferred ? user > static_cast<double>(*preferred) : user > kDefaultWriteAmplificationThreshold;
}

}  // namespace tbdaily
