// The bucket configuration of a histogram channel.

#include "drivermetrics/kd_report.h"
#include "platform/byte_reader.h"

namespace kdreport {

namespace {

struct Segment {
  static constexpr std::size_t kSize = 16;

  std::uint32_t base;
  bool isExponential;
  std::int32_t buckets;  // 0 or less: none
};

std::optional<Segment> segmentAt(std::span<const std::byte> config, std::size_t index) {
  const tbdaily::ByteReader reader(config);
  const std::size_t at = index * Segment::kSize;
  const auto base = reader.at<std::uint32_t>(at);
  const auto progression = reader.at<std::uint32_t>(at + 4);
  const auto buckets = reader.at<std::uint32_t>(at + 12);
  if (!buckets) return std::nullopt;
  return Segment{*base, *progression != 0, static_cast<std::int32_t>(*buckets)};
}

// Appends the segment's bounds, which do not build on those of the segment before. False when one does not
// rise or they become too many.
bool appendBounds(std::vector<std::int64_t>& bounds, const Segment& segment, std::size_t most) {
  std::uint64_t power = 1;
  for (std::int32_t bucket = 0; bucket < segment.buckets; ++bucket) {
    power *= segment.base;
    const std::uint32_t multiple = segment.base * (static_cast<std::uint32_t>(bucket) + 1);
    const auto bound = static_cast<std::int64_t>(segment.isExponential ? power : multiple);
    if (bound <= (bounds.empty() ? 0 : bounds.back()) || bounds.size() == most) return false;
    bounds.push_back(bound);
  }
  return true;
}

}  // namespace

std::optional<std::vector<std::int64_t>> KdReportCopyBucketBounds(std::span<const std::byte> config,
                                                                  std::size_t mostBuckets) {
  if (config.size() < Segment::kSize) return std::nullopt;
  std::vector<std::int64_t> bounds;
  for (std::size_t i = 0; const auto segment = segmentAt(config, i); ++i) {
    if (!appendBounds(bounds, *segment, mostBuckets)) return std::nullopt;
  }
  return bounds;
}

}  // namespace kdreport
