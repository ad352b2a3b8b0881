// Reading histogram channels: the values of their buckets, and the bounds that the configuration gives.

#include "drivermetrics/values.h"
#include "platform/byte_reader.h"

namespace tbdaily {

namespace {

// One segment of a bucket configuration. The bounds of all segments follow one another; they are absolute.
struct Segment {
  static constexpr std::size_t kSize = 16;

  std::uint32_t base;
  bool isExponential;    // upper bounds base, base^2, base^3 ... instead of base, 2 base, 3 base ...
  std::int32_t buckets;  // 0 or less: none
};

std::optional<Segment> segmentAt(std::span<const std::byte> config, std::size_t index) {
  const ByteReader reader(config);
  const std::size_t at = index * Segment::kSize;
  const auto base = reader.at<std::uint32_t>(at);
  const auto progression = reader.at<std::uint32_t>(at + 4);
  const auto buckets = reader.at<std::uint32_t>(at + 12);
  if (!buckets) return std::nullopt;
  return Segment{*base, *progression != 0, static_cast<std::int32_t>(*buckets)};
}

// Appends the segment's upper bounds; false when one does not lie above its predecessor or they become more
// than `most`.
bool appendBounds(PlistArray& bounds, const Segment& segment, std::int64_t& last, std::size_t most) {
  std::uint64_t power = 1;
  for (std::int32_t bucket = 0; bucket < segment.buckets; ++bucket) {
    power *= segment.base;
    const std::uint32_t multiple = segment.base * (static_cast<std::uint32_t>(bucket) + 1);
    const auto bound = static_cast<std::int64_t>(segment.isExponential ? power : multiple);
    if (bound <= last || bounds.size() == most) return false;
    bounds.push_back(PlistValue::int64(bound));
    last = bound;
  }
  return true;
}

// None when the configuration is missing or wrong.
PlistValue boundsOf(const ChannelRecord& channel) {
  const std::uint32_t buckets = announcedElements(&channel, kKdReportHistogram);
  const auto config = getChannelConfig(&channel);
  if (buckets == kKdReportNoIndex || !config || config->size() < Segment::kSize) return {};
  PlistArray bounds;
  std::int64_t last = 0;
  for (std::size_t i = 0; const auto segment = segmentAt(*config, i); ++i) {
    if (!appendBounds(bounds, *segment, last, buckets)) return {};
  }
  return PlistValue::array(std::move(bounds));
}

std::int64_t bucketWord(const ChannelRecord* channel, std::int32_t bucket, std::size_t word) {
  return elementWord(channel, kKdReportHistogram, bucket, word);
}

}  // namespace

std::uint32_t KdReportHistogramGetBucketCount(const ChannelRecord* channel) {
  return announcedElements(channel, kKdReportHistogram);
}

std::int64_t KdReportHistogramGetBucketHits(const ChannelRecord* channel, std::int32_t bucket) {
  return bucketWord(channel, bucket, histogram_word::kHits);
}

std::int64_t KdReportHistogramGetBucketMinValue(const ChannelRecord* channel, std::int32_t bucket) {
  return bucketWord(channel, bucket, histogram_word::kMinimum);
}

std::int64_t KdReportHistogramGetBucketMaxValue(const ChannelRecord* channel, std::int32_t bucket) {
  return bucketWord(channel, bucket, histogram_word::kMaximum);
}

std::int64_t KdReportHistogramGetBucketSum(const ChannelRecord* channel, std::int32_t bucket) {
  return bucketWord(channel, bucket, histogram_word::kSum);
}

std::int64_t KdReportHistogramGetMinValue(const ChannelRecord* channel) {
  const auto buckets = announcedRawElements(channel, kKdReportHistogram);
  for (std::size_t i = 0; buckets && i < buckets->count(); ++i) {
    const std::int64_t hits = buckets->word(i, histogram_word::kHits);
    if (hits == kKdReportInvalid) break;
    if (hits != 0) return buckets->word(i, histogram_word::kMinimum);
  }
  return kKdReportInvalid;
}

std::int64_t KdReportHistogramGetMaxValue(const ChannelRecord* channel) {
  const auto buckets = announcedRawElements(channel, kKdReportHistogram);
  for (std::size_t i = buckets ? buckets->count() : 0; i-- > 0;) {
    const std::int64_t hits = buckets->word(i, histogram_word::kHits);
    if (hits == kKdReportInvalid) break;
    if (hits != 0) return buckets->word(i, histogram_word::kMaximum);
  }
  return kKdReportInvalid;
}

KdStatus KdReportHistogramGetBucketBounds(ChannelRecord* channel, std::int32_t bucket, std::int64_t* lower,
                                          std::int64_t* upper) {
  if (channel == nullptr) return kKdError;
  if (channel->cached().processedChannelConfig.isNone())
    channel->cache(&CachedAnswers::processedChannelConfig, boundsOf(*channel));
  const PlistArray* bounds = channel->cached().processedChannelConfig.asArray();
  if (bounds == nullptr || bucket < 0 || static_cast<std::size_t>(bucket) >= bounds->size()) return kKdError;
  const auto place = static_cast<std::size_t>(bucket);
  const std::int64_t above = integerOrInvalid((*bounds)[place]);
  const std::int64_t below = place == 0 ? 0 : integerOrInvalid((*bounds)[place - 1]);
  if ((upper != nullptr && above == kKdReportInvalid) || (lower != nullptr && below == kKdReportInvalid))
    return kKdError;
  if (upper != nullptr) *upper = above;
  if (lower != nullptr) *lower = below;
  return kKdSuccess;
}

}  // namespace tbdaily
