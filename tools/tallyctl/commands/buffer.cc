// tallyctl buffer, stats and snapshots: the controller's raw buffers, and what they say.

#include <CLI/CLI.hpp>
#include <array>
#include <functional>

#include "storage/snapshot_renderer.h"
#include "storage/stats_context.h"
#include "tools/tallyctl/controller_buffer.h"
#include "tools/tallyctl/input_file.h"
#include "tools/tallyctl/output_file.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

// From the file when one is named, else from the controller; says why not, and answers nothing then.
std::optional<std::vector<std::byte>> bufferOf(Tool& tool, const std::string& file, std::string_view kind) {
  if (!file.empty()) {
    auto input = readInput(file, kLargestBufferInput);
    if (input) return std::move(*input);
    tool.fail(input.reason());
    return std::nullopt;
  }
  if (!tool.hasUsableRoot()) return std::nullopt;
  auto buffer = fetchControllerBuffer(tool.platform().services().driverRegistry, kind);
  if (!tool.hasReadAll()) return std::nullopt;
  if (buffer) return std::move(*buffer);
  tool.fail(buffer.reason());
  return std::nullopt;
}

void saveBuffer(Tool& tool, const std::string& kind, std::uint16_t list, const std::string& file) {
  if (!tool.hasUsableRoot()) return;
  const auto buffer = fetchControllerBuffer(tool.platform().services().driverRegistry, kind, list);
  if (!tool.hasReadAll()) return;
  if (!buffer) return tool.fail(kind + ": " + buffer.reason());
  if (const auto written = writeOutputFile(file, *buffer); !written) return tool.fail(written.reason());
  if (file == "-") return;
  if (tool.printedAsJson(PlistValue::dictionary(
          {{"file", PlistValue::string(file)},
           {"bytes", PlistValue::int64(static_cast<std::int64_t>(buffer->size()))}}))) {
    return;
  }
  tool.out().line("wrote " + std::to_string(buffer->size()) + " bytes to " + file);
}

struct ContextField {
  std::string_view name;
  std::uint64_t (*value)(const StatsContext&);
};

constexpr std::array<ContextField, 18> kContextFields = {{
    {"exportVersion", [](const StatsContext& c) { return std::uint64_t{c.exportVersion}; }},
    {"driverVersion", [](const StatsContext& c) { return std::uint64_t{c.driverVersion}; }},
    {"numVirtualBlocks", [](const StatsContext& c) { return std::uint64_t{c.numVirtualBlocks}; }},
    {"blocksPerVirtualBlock", [](const StatsContext& c) { return std::uint64_t{c.blocksPerVirtualBlock}; }},
    {"pagesPerVirtualBlock", [](const StatsContext& c) { return std::uint64_t{c.pagesPerVirtualBlock}; }},
    {"bytesPerPage", [](const StatsContext& c) { return std::uint64_t{c.bytesPerPage}; }},
    {"hostReads", [](const StatsContext& c) { return c.hostReads; }},
    {"hostWrites", [](const StatsContext& c) { return c.hostWrites; }},
    {"numFreeVirtualBlocks", [](const StatsContext& c) { return c.numFreeVirtualBlocks; }},
    {"wearLevMoves", [](const StatsContext& c) { return c.wearLevMoves; }},
    {"nandReads", [](const StatsContext& c) { return c.nandReads; }},
    {"nandWrites", [](const StatsContext& c) { return c.nandWrites; }},
    {"bandErases", [](const StatsContext& c) { return c.bandErases; }},
    {"IND_pool_free", [](const StatsContext& c) { return c.IND_pool_free; }},
    {"IND_pool_count", [](const StatsContext& c) { return c.IND_pool_count; }},
    {"utilFormatTime", [](const StatsContext& c) { return c.utilFormatTime; }},
    {"numSleepOps", [](const StatsContext& c) { return c.numSleepOps; }},
    {"maxHighEnduranceBlockErases", [](const StatsContext& c) { return c.maxHighEnduranceBlockErases; }},
}};

void writeStats(JsonWriter& json, const StatsContext& context, bool complete) {
  const auto root = json.object();
  json.add("complete", complete);
  {
    const auto fields = json.object("fields");
    for (const ContextField& field : kContextFields) json.add(field.name, field.value(context));
    const auto histogram = json.array("readCountHisto");
    for (const std::uint64_t count : context.readCountHisto) json.add(count);
  }
  const auto stats = json.array("stats");
  for (const StatNode& node : context.nodes) {
    const auto pair = json.array();
    json.add(node.name());
    json.add(node.value);
  }
}

void showStats(Tool& tool, const std::string& file) {
  const auto bytes = bufferOf(tool, file, "stats");
  if (!bytes) return;
  StatsContext context;
  const bool complete = STXParseBufferToCxt(context, *bytes);
  if (!complete && context.nodes.empty())
    return tool.fail((file.empty() ? "the controller's buffer" : file) + ": this is no statistics buffer");
  Terminal& out = tool.out();
  if (tool.printedAsJson([&](JsonWriter& json) { writeStats(json, context, complete); })) return;
  if (!complete)
    out.line(out.styled("The buffer is damaged; this is what was read before the damage.", Style::Bad));
  out.line(out.styled("Fields", Style::Heading));
  Table fields({Table::Align::Left, Table::Align::Right});
  for (const ContextField& field : kContextFields)
    fields.add({std::string(field.name), std::to_string(field.value(context))});
  fields.print(out);
  out.line(out.styled("Statistics (" + std::to_string(context.nodes.size()) + ")", Style::Heading));
  Table stats({Table::Align::Left, Table::Align::Right});
  for (const StatNode& node : context.nodes) stats.add({node.name(), node.text()});
  stats.print(out);
}

constexpr std::size_t kRenderedAtOnce = std::size_t{64} << 10;
constexpr std::size_t kTextPerByte = 8;  // a record of the fixed layout takes less, whatever its values

// Nothing but the rendered text goes to standard output; each answers false when it failed, which is said
// then.
using PutText = std::function<void(std::string_view piece)>;

bool renderFixed(Tool& tool, const PutText& put, const std::vector<std::byte>& records) {
  std::vector<char> text(kRenderedAtOnce + records.size() * kTextPerByte);
  std::size_t size = text.size();
  if (!STXParseSnapshotBuffer(records, text.data(), size)) {
    tool.fail("the snapshots do not fit the renderer's buffer");
    return false;
  }
  put({text.data(), size});
  return true;
}

bool renderDescribed(Tool& tool, const PutText& put, const std::vector<std::byte>& records,
                     const std::vector<std::byte>& header) {
  const auto failed = [&tool](std::string_view why) {
    tool.fail(why);
    return false;
  };
  std::vector<char> text(kRenderedAtOnce);
  std::uint32_t cursor = 0;
  while (true) {
    const std::uint32_t before = cursor;
    std::size_t size = text.size();
    const bool finished = STXParseSnapshotBufferWithInplaceParser(records, text.data(), size, header, cursor);
    put({text.data(), size > 0 ? size - 1 : 0});
    if (finished) return true;
    if (cursor == before) return failed("the snapshot header cannot be used");
    // The record that did not fit was passed: it comes first in the next piece.
    --cursor;
    if (size <= 1) text.resize(text.size() * 2);
    if (text.size() > kRenderedAtOnce * 1024) return failed("a snapshot is too long to be rendered");
  }
}

struct SnapshotArguments {
  std::string records, header;
  bool fixed = false;
};

// The header that describes the records: the one that is named, or that of the controller with its own
// records, where it has one. Without one they are of the fixed layout.
bool render(Tool& tool, const PutText& put, const SnapshotArguments& arguments) {
  const auto records = bufferOf(tool, arguments.records, "snapshot");
  if (!records) return false;
  if (arguments.fixed) return renderFixed(tool, put, *records);
  if (!arguments.header.empty()) {
    const auto header = bufferOf(tool, arguments.header, "snapshot-header");
    return header && renderDescribed(tool, put, *records, *header);
  }
  if (!arguments.records.empty()) return renderFixed(tool, put, *records);
  const auto own = fetchControllerBuffer(tool.platform().services().driverRegistry, "snapshot-header");
  if (!tool.hasReadAll()) return false;
  return own && !own->empty() ? renderDescribed(tool, put, *records, *own) : renderFixed(tool, put, *records);
}

void showSnapshots(Tool& tool, const SnapshotArguments& arguments) {
  if (!tool.options.json) {
    render(
        tool, [&tool](std::string_view piece) { tool.out().print(ShownText::lines(piece)); }, arguments);
    return;
  }
  std::string text;
  if (render(
          tool, [&text](std::string_view piece) { text += piece; }, arguments))
    tool.printedAsJson(PlistValue::dictionary({{"text", PlistValue::string(std::move(text))}}));
}

}  // namespace

void addBufferCommands(CLI::App& app, Tool& tool) {
  auto kind = std::make_shared<std::string>();
  auto list = std::make_shared<std::uint16_t>(std::uint16_t{0});
  auto output = std::make_shared<std::string>();
  std::vector<std::string> kinds;
  std::string choices;
  for (const BufferKind& known : kBufferKinds) {
    kinds.emplace_back(known.name);
    choices.append(choices.empty() ? "" : ", ").append(known.name);
  }
  CLI::App* buffer = app.add_subcommand("buffer", "Fetch a raw buffer of the storage controller");
  buffer->add_option("KIND", *kind, "What to fetch: " + choices)->required()->check(CLI::IsMember(kinds));
  buffer->add_option("--list", *list, "Sub-list, for telemetry 0 to 2")
      ->type_name("N")
      ->check(CLI::Range(0, 255));
  buffer->add_option("-o,--output", *output, "Where to write it; - is standard output")
      ->required()
      ->type_name("FILE");
  buffer->callback([&tool, kind, list, output] { saveBuffer(tool, *kind, *list, *output); });

  auto statsFile = std::make_shared<std::string>();
  CLI::App* stats =
      app.add_subcommand("stats", "Decode a statistics buffer: the controller's, or that of a file");
  stats->add_option("FILE", *statsFile, "A statistics buffer; - is standard input");
  stats->callback([&tool, statsFile] { showStats(tool, *statsFile); });

  auto arguments = std::make_shared<SnapshotArguments>();
  CLI::App* snapshots =
      app.add_subcommand("snapshots", "Render snapshots as text, from the controller or from files");
  snapshots->add_option("--records", arguments->records, "Snapshot records in place of the controller's")
      ->type_name("FILE");
  snapshots->add_option("--header", arguments->header, "The header that describes them")->type_name("FILE");
  snapshots->add_flag("--fixed", arguments->fixed, "The fixed layout, whatever a header says");
  snapshots->callback([&tool, arguments] { showSnapshots(tool, *arguments); });
}

}  // namespace tbdaily
