// Fuzzer of the driver metrics library: property lists as legends and as collections, and bytes as a hub's
// buffer.
#include <cstddef>
#include <cstdint>

#include "drivermetrics/kd_report.h"
#include "platform/plist/codec.h"
#include "testing/fake_drivers.h"

using namespace tbdaily;
using namespace kdreport;

namespace {

// Asks everything of every channel.
void readAll(ChannelCollection* collection, ChannelCollection* earlier) {
  KdReportIterate(collection, [](ChannelRecord& channel) -> std::uint32_t {
    (void)KdReportChannelCopyDescription(&channel, 0, "");
    (void)KdReportSampleCopyDescription(&channel, 0, "");
    (void)KdReportSampleCreateDelta(&channel, &channel);
    for (const std::int32_t i : {-1, 0, 1, 65535}) {
      (void)KdReportArrayGetValueAtIndex(&channel, i);
      (void)KdReportHistogramGetBucketSum(&channel, i);
      (void)KdReportStateGetDutyCycle(&channel, i);
    }
    (void)KdReportHistogramGetMinValue(&channel);
    (void)KdReportHistogramGetMaxValue(&channel);
    (void)KdReportStateGetIndexForID(&channel, 0x4F4E);
    (void)KdReportStateGetCurrent(&channel);
    return kKdReportKeep;
  });
  (void)KdReportCreateSamplesDelta(earlier, collection);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static PlistCodec codec;
  if (size == 0) return 0;
  // The first byte is the length of the property list, in sixteenths of the rest; the buffer follows.
  const auto bytes = std::as_bytes(std::span(data, size)).subspan(1);
  const std::size_t split = bytes.size() * (data[0] & 15U) / 15;
  const PlistValue value = codec.parse(bytes.first(split)).value;

  testing::FakeDriverRegistry registry;
  registry.drivers = {
      {.identifier = 1,
       .name = "D",
       .serviceClass = "D",
       .properties = {{"KdReportLegendPublic", PlistValue::boolean(true)}, {"KdReportLegend", value}},
       .parent = {}}};
  for (const KdReportCollection& channels :
       {KdReportCopyChannelsForDriver(
            registry, registry.KdServiceGetMatchingService(registry.KdServiceMatching("D")), 3),
        KdReportCreateAggregateFromPropertyList(value)}) {
    const KdReportCollection samples = KdReportCreateSamplesRaw(channels.get(), bytes.subspan(split));
    readAll(channels.get(), samples.get());
    readAll(samples.get(), channels.get());
    (void)KdReportCreateAggregateFromPropertyList(KdReportCopyPropertyList(samples.get()));
  }
  return 0;
}
