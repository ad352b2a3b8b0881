// Legends of drivers and collections of channels: filing keeps every channel, a property list of a
// collection reads back as the same collection, and nothing stays open.
#include "drivermetrics/kd_report_test_support.h"
#include "fuzz/plist_input.h"
#include "platform/plist/codec.h"

using namespace kdreport;
using tbdaily::fuzz::Input;
using tbdaily::fuzz::require;

namespace {

constexpr std::array<std::string_view, 21> kWords = {kd_report_key::kLegend,
                                                     kd_report_key::kLegendPublic,
                                                     kd_report_key::kGroupName,
                                                     kd_report_key::kSubGroupName,
                                                     kd_report_key::kChannelInfo,
                                                     kd_report_key::kChannels,
                                                     kd_report_key::kChannelUnit,
                                                     kd_report_key::kChannelConfig,
                                                     kd_report_key::kDriverID,
                                                     kd_report_key::kDriverName,
                                                     kd_report_key::kLegendChannel,
                                                     kd_report_key::kChannelName,
                                                     kd_report_key::kUnitLabel,
                                                     kd_report_key::kProcessedChannelConfig,
                                                     kd_report_key::kStateNames,
                                                     kd_report_key::kRawElements,
                                                     kd_report_key::kQueryOptions,
                                                     kd_report_key::kDrivers,
                                                     kd_report_key::kChannelGroups,
                                                     "Fan",
                                                     "Cooling"};

void readsBack(const KdReportCollection& collection) {
  const PlistValue list = KdReportCopyPropertyList(collection.get());
  const KdReportCollection again = KdReportCreateAggregateFromPropertyList(list);
  require(again != nullptr, "a collection reads back from its property list");
  require(KdReportCopyPropertyList(again.get()) == list, "its property list is then the same");
  require(KdReportGetChannelCount(again.get()) == KdReportGetChannelCount(collection.get()),
          "and all channels are there");
}

void walksAndPrunes(const KdReportCollection& collection) {
  std::uint32_t visited = 0;
  const std::uint32_t status = KdReportIterate(collection.get(), [&visited](ChannelRecord& channel) {
    ++visited;
    (void)KdReportChannelCopyDescription(&channel, 0, "");
    (void)KdReportSampleCopyDescription(&channel, 0, "");
    (void)KdReportChannelGetUnitLabel(&channel);
    return std::uint32_t{kKdReportKeep};
  });
  const std::uint32_t count = KdReportGetChannelCount(collection.get());
  require((status == kKdReportWalkFailed) == (count == kKdReportNoIndex),
          "a malformed collection has no count");
  if (status == kKdReportWalkFailed) return;
  require(visited == count, "a walk meets every channel");

  for (std::uint32_t options = 0; options < 4; ++options) {
    const KdReportCollection filed = KdReportCreateAggregate(options);
    const std::uint32_t merged = KdReportMergeChannels(filed.get(), collection.get());
    require((merged & 1) != 0 || KdReportGetChannelCount(filed.get()) == count, "filing keeps every channel");
    readsBack(filed);
  }
  std::uint32_t number = 0, kept = 0;
  KdReportPrune(collection.get(), [&](ChannelRecord&) {
    const bool keeps = number++ % 3 == 0;
    kept += keeps ? 1 : 0;
    return std::uint32_t{keeps ? kKdReportKeep : kKdReportRemove};
  });
  require(KdReportGetChannelCount(collection.get()) == kept, "pruning leaves what was kept");
}

// Two drivers with what the input says of them; legends that look like ones, and others.
void discover(Input& input) {
  fakes::FakeDriverRegistry registry;
  for (std::uint64_t driver = 1; driver <= 2; ++driver) {
    PlistArray groups;
    for (std::size_t count = input.below(4); count > 0; --count) {
      PlistArray entries;
      for (std::size_t channels = input.below(8); channels > 0; --channels)
        entries.push_back(
            fakes::legendEntry(input.integer(), {input.number<std::uint64_t>()},
                               input.flag() ? KdReportText(kWords[input.below(kWords.size())]) : nullptr));
      groups.push_back(fakes::legendGroup(input.flag() ? KdReportText("G") : nullptr,
                                          input.flag() ? KdReportText("S") : nullptr,
                                          KdReportCreateUnitInfo(input.integer()), std::move(entries)));
    }
    if (input.below(4) == 0) groups.push_back(tbdaily::fuzz::plistOfSection(input, kWords));
    registry.drivers.push_back(fakes::publishingDriver(driver, "Fan", std::move(groups)));
  }
  std::optional<std::uint32_t> count;
  for (std::uint32_t options = 0; options < 4; ++options) {
    std::optional<ReportError> error;
    const KdReportCollection channels = KdReportCopyAllChannels(registry, options, &error);
    require((channels == nullptr) == error.has_value(), "an error on every failure and on failure only");
    require(registry.openHandles() == 0, "no handle stays open");
    if (channels == nullptr) continue;
    require(
        count.value_or(KdReportGetChannelCount(channels.get())) == KdReportGetChannelCount(channels.get()),
        "as many channels in whatever filing");
    count = KdReportGetChannelCount(channels.get());
    readsBack(channels);
    if (options == (kKdReportFileByDriver | kKdReportFileByGroup)) walksAndPrunes(channels);
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  Input input(data, size);
  KdReportSetLogSink([](std::string_view) {});
  discover(input);
  const KdReportCollection foreign =
      KdReportCreateAggregateFromPropertyList(tbdaily::fuzz::plistOf(input, kWords));
  if (foreign == nullptr) return 0;
  const PlistValue list = KdReportCopyPropertyList(foreign.get());
  tbdaily::PlistCodec codec;
  const auto written = codec.write(list);
  require(!written.ok || codec.parse(std::as_bytes(std::span(written.bytes))).value == list,
          "a collection's property list may go by way of a file");
  walksAndPrunes(foreign);
  return 0;
}
