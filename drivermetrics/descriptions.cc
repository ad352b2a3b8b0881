// Channels and samples as readable text.

#include <limits>

#include "drivermetrics/text_format.h"
#include "drivermetrics/values.h"
#include "platform/utf8.h"

namespace kdreport {

namespace {

constexpr std::string_view kNullObject = "(null)";
constexpr std::string_view kNoGroup = "(none)";
constexpr std::size_t kLongestChannelID = 9;  // what a name's replacement has room for
constexpr std::size_t kLongestStateID = 19;
constexpr double kPercent = 100;

std::string objectText(const std::optional<std::string_view>& text) {
  return std::string(text.value_or(kNullObject));
}

// What the lines of one sample have in common.
struct Line {
  const ChannelRecord& channel;
  std::string prefix, name, unitLabel;
  // Of state channels: without a kept list of names, asking for one would look at all states again.
  bool hasStateNames = false;
  std::vector<double> shares = {};  // of the states; empty when they cannot be read
};

std::string displayName(const ChannelRecord& channel, const RawElements& elements) {
  const auto name = KdReportChannelGetChannelName(&channel);
  if (name && tbdaily::isUtf8(*name)) return std::string(*name);
  return alternateHexadecimal(static_cast<std::uint64_t>(elements.channelID())).substr(0, kLongestChannelID);
}

using LineText = std::optional<std::string>;

LineText simpleLine(const Line& line, std::int32_t) {
  return formatText("%s%32s = { %12lld %s }\n", line.prefix.c_str(), line.name.c_str(),
                    static_cast<long long>(KdReportSimpleGetIntegerValue(&line.channel)),
                    line.unitLabel.c_str());
}

LineText stateLine(const Line& line, std::int32_t index) {
  const auto unsignedOf = [](std::int64_t value) { return static_cast<std::uint64_t>(value); };
  const auto name = line.hasStateNames ? KdReportStateGetNameForIndex(&line.channel, index) : std::nullopt;
  const std::string state =
      name ? std::string(*name)
           : alternateHexadecimal(unsignedOf(KdReportStateGetIDForIndex(&line.channel, index)))
                 .substr(0, kLongestStateID);
  const std::int64_t residency = KdReportStateGetResidency(&line.channel, index);
  const double seconds =
      KdReportScaleValue(unsignedOf(residency), KdReportChannelGetUnit(&line.channel), kKdReportSeconds);
  const auto place = static_cast<std::size_t>(index);
  const double share =
      place < line.shares.size() ? line.shares[place] : std::numeric_limits<double>::quiet_NaN();
  return formatText("%s%20s[%8s] = { # %-8llu %9.3e %s / %4.1f%% }\n", line.prefix.c_str(), line.name.c_str(),
                    state.c_str(),
                    static_cast<unsigned long long>(KdReportStateGetInTransitions(&line.channel, index)),
                    seconds, "s", share * kPercent);
}

LineText histogramLine(const Line& line, std::int32_t bucket) {
  std::int64_t lower = 0, upper = 0;
  if (KdReportHistogramGetBucketBounds(&line.channel, bucket, &lower, &upper) != kKdSuccess)
    return std::nullopt;
  const std::int64_t hits = KdReportHistogramGetBucketHits(&line.channel, bucket);
  if (hits == kKdReportInvalid) return std::nullopt;
  std::string text =
      formatText("%s%20s[%12lld - %12lld %s] = { ", line.prefix.c_str(), line.name.c_str(),
                 static_cast<long long>(lower), static_cast<long long>(upper), line.unitLabel.c_str());
  if (hits == 0) return text.append("<no hits>; # 0 }\n");
  return text.append(
      formatText("m %12lld; M %12lld; s %12lld; # %12llu }\n",
                 static_cast<long long>(KdReportHistogramGetBucketMinValue(&line.channel, bucket)),
                 static_cast<long long>(KdReportHistogramGetBucketMaxValue(&line.channel, bucket)),
                 static_cast<long long>(KdReportHistogramGetBucketSum(&line.channel, bucket)),
                 static_cast<unsigned long long>(hits)));
}

LineText arrayLine(const Line&, std::int32_t) {
  return "arrays unsupported?";
}

LineText elementLine(const Line& line, std::uint8_t format, std::int32_t element) {
  switch (format) {
    case kKdReportSimple:
      return simpleLine(line, element);
    case kKdReportState:
      return stateLine(line, element);
    case kKdReportHistogram:
      return histogramLine(line, element);
    case kKdReportArray:
      return arrayLine(line, element);
    default:
      return std::nullopt;
  }
}

}  // namespace

std::optional<std::string> KdReportChannelCopyDescription(const ChannelRecord* channel,
                                                          std::uint64_t /*reserved*/, KdReportText prefix) {
  ChannelType type;
  if (getChannelType(channel, type) != kKdSuccess) return std::nullopt;
  std::string text(prefix.get().value_or(""));
  text += objectText(KdReportChannelGetDriverName(channel)) + ' ';
  text += objectText(KdReportChannelGetChannelName(channel)) + " < ";
  text += alternateHexadecimal(static_cast<std::uint64_t>(KdReportChannelGetChannelID(channel)));
  text += " (" + objectText(KdReportChannelGetUnitLabel(channel)) + ") | G/g ";
  text += KdReportChannelGetGroup(channel).value_or(kNoGroup);
  text += '/';
  text += KdReportChannelGetSubGroup(channel).value_or(kNoGroup);
  text += formatText(" | cat %#04x | format %#04x | elts %u >\n", unsigned{type.categories()},
                     unsigned{type.format()}, unsigned{type.elementCount()});
  return text;
}

std::optional<std::string> KdReportSampleCopyDescription(const ChannelRecord* channel,
                                                         std::uint64_t /*reserved*/, KdReportText prefix) {
  const std::uint8_t format = KdReportChannelGetFormat(channel);
  const auto elements = getRawElements(channel, format);
  if (!elements) return std::nullopt;
  Line line{*channel, std::string(prefix.get().value_or("")), displayName(*channel, *elements),
            objectText(KdReportChannelGetUnitLabel(channel))};
  if (format == kKdReportState) {
    (void)KdReportStateGetNameForIndex(channel, 0);
    line.hasStateNames = !channel->cached(CachedAnswer::StateNames).isNone();
    line.shares = KdReportStateCopyDutyCycles(channel);
  }
  std::string text;
  for (std::int32_t element = 0; element < std::int32_t{elements->count()}; ++element) {
    const LineText added = elementLine(line, format, element);
    if (!added) return std::nullopt;
    text += *added;
  }
  return text;
}

}  // namespace kdreport
