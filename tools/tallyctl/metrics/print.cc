#include "tools/tallyctl/metrics/print.h"

#include <unistd.h>

#include "tools/tallyctl/metrics/json.h"
#include "tools/tallyctl/metrics/sampler.h"
#include "tools/tallyctl/metrics/view.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

using namespace kdreport;

namespace {

// Without what could drive a terminal in the text's lines.
std::string printableLines(const std::string& text) {
  std::string shown;
  for (std::size_t begin = 0; begin < text.size();) {
    const std::size_t end = std::min(text.find('\n', begin), text.size());
    shown += printable(std::string_view(text).substr(begin, end - begin));
    if (end < text.size()) shown += '\n';
    begin = end + 1;
  }
  return shown;
}

}  // namespace

bool hasNothingToShow(Tool& tool, const MetricsRequest& request, const ChannelSelection& selection) {
  if (!selection.channels) return true;
  if (selection.selected != 0) return false;
  if (request.describe || tool.printedAsJson(PlistValue::array({}))) return true;
  tool.out().line(selection.published != 0 ? "no channels match" : "no driver publishes channels");
  return true;
}

std::string descriptionsText(const ChannelCollection* collection, ChannelContents contents) {
  std::string text;
  KdReportIterate(collection, [&text, contents](ChannelRecord& channel) {
    text += (contents == ChannelContents::Values ? KdReportSampleCopyDescription(&channel, 0, "")
                                                 : KdReportChannelCopyDescription(&channel, 0, ""))
                .value_or("");
    return kKdReportKeep;
  });
  return ::isatty(STDOUT_FILENO) != 0 ? printableLines(text) : text;
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
