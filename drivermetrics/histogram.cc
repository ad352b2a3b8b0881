// Reading histogram channels: the values of their buckets, and the bounds that the configuration gives.

#include "drivermetrics/values.h"

namespace kdreport {

namespace {

// None when the configuration is missing or wrong.
PlistValue boundsOf(const ChannelRecord& channel) {
  const std::uint32_t buckets = announcedElements(&channel, kKdReportHistogram);
  const auto config = getChannelConfig(&channel);
  if (buckets == kKdReportNoIndex || !config) return {};
  const auto bounds = KdReportCopyBucketBounds(*config, buckets);
  if (!bounds) return {};
  PlistArray numbers;
  numbers.reserve(bounds->size());
  for (const std::int64_t bound : *bounds) numbers.push_back(PlistValue::int64(bound));
  return PlistValue::array(std::move(numbers));
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

KdStatus KdReportHistogramGetBucketBounds(const ChannelRecord* channel, std::int32_t bucket,
                                          std::int64_t* lower, std::int64_t* upper) {
  if (channel == nullptr) return kKdError;
  const PlistValue& cached = channel->cached(CachedAnswer::ProcessedChannelConfig);
  const PlistArray* bounds =
      (cached.isNone() ? channel->cache(CachedAnswer::ProcessedChannelConfig, boundsOf(*channel)) : cached)
          .asArray();
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

}  // namespace kdreport
