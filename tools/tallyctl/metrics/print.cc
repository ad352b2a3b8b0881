#include "tools/tallyctl/metrics/print.h"

#include "tools/tallyctl/metrics/json.h"
#include "tools/tallyctl/metrics/sampler.h"
#include "tools/tallyctl/metrics/view.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

using namespace kdreport;

bool hasNothingToShow(Tool& tool, const MetricsRequest& request, const ChannelSelection& selection) {
  if (!selection.channels) return true;
  if (selection.selected != 0) return false;
  if (request.describe || tool.printedAsJson(PlistValue::array({}))) return true;
  tool.out().line(selection.published != 0 ? "no channels match" : "no driver publishes channels");
  return true;
}

ShownText descriptionsText(const ChannelCollection* collection, ChannelContents contents) {
  std::string text;
  KdReportIterate(collection, [&text, contents](ChannelRecord& channel) {
    text += (contents == ChannelContents::Values ? KdReportSampleCopyDescription(&channel, 0, "")
                                                 : KdReportChannelCopyDescription(&channel, 0, ""))
                .value_or("");
    return kKdReportKeep;
  });
  return ShownText::lines(text);
}

void printChannels(Tool& tool, const MetricsRequest& request, const ChannelCollection* collection,
                   ChannelContents contents) {
  if (request.describe) return tool.out().print(descriptionsText(collection, contents));
  const auto channels = readChannels(collection, contents);
  if (!channels) return failMetrics(tool, "the channels cannot be read", std::nullopt);
  if (tool.printedAsJson([&](JsonWriter& json) { writeChannels(json, *channels, contents); })) return;
  if (channels->empty()) return tool.out().line("the hub has no values of these channels");
  contents == ChannelContents::Values ? printValueTree(tool.out(), *channels)
                                      : printChannelTree(tool.out(), *channels);
}

}  // namespace tbdaily
