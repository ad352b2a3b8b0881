// tallyctl export: reports as rows for engines, the device as metrics for monitoring.

#include <unistd.h>

#include <CLI/CLI.hpp>
#include <algorithm>

#include "tools/tallyctl/export/report_files.h"
#include "tools/tallyctl/export/report_rows.h"
#include "tools/tallyctl/export/textfile.h"
#include "tools/tallyctl/output_file.h"
#include "tools/tallyctl/report/kept_reports.h"
#include "tools/tallyctl/stop_signals.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

enum class ExportFormat : std::uint8_t { Tsv, Ndjson, Prometheus };
struct ExportFormatName {
  std::string_view name;
  ExportFormat format;
};
constexpr std::array<ExportFormatName, 3> kFormats{
    {{"tsv", ExportFormat::Tsv}, {"ndjson", ExportFormat::Ndjson}, {"prometheus", ExportFormat::Prometheus}}};

struct ExportArguments {
  std::string format = "tsv", table, output = "-", list;
  std::optional<std::string> device;
  std::vector<std::string> files;
};

template <typename Named>
std::string namesOf(const Named& all) {
  std::string names;
  for (const auto& one : all) names.append(names.empty() ? "" : ", ").append(one.name);
  return names;
}

// Null when the text is the name of none.
template <typename Named>
auto findNamed(const Named& all, std::string_view name) -> decltype(all.data()) {
  const auto* end = all.data() + all.size();
  const auto* found = std::find_if(all.data(), end, [name](const auto& one) { return one.name == name; });
  return found != end ? found : nullptr;
}

// Where the export goes: standard output, through what shows text where that is a terminal, or a file.
class ExportOutput {
 public:
  ExportOutput(Tool& tool, const std::string& path)
      : tool_(tool), path_(path), isTerminal_(path == "-" && ::isatty(STDOUT_FILENO) != 0) {
    if (path != "-") signals_.emplace();  // nothing stays beside the file when the program is told to end
  }

  // These three say what fails.
  bool open(OutputMode mode) { return isTerminal_ || holds(file_.open(path_, mode)); }
  bool write(std::string_view text) {
    if (!isTerminal_) return holds(file_.write(std::as_bytes(std::span(text))));
    tool_.out().print(ShownText::lines(text));
    return true;
  }
  bool finish() {
    if (!isStopped()) return isTerminal_ || holds(file_.finish());
    tool_.fail("interrupted; " + path_ + " is as it was");
    return false;
  }

  // Whether the program was told to end.
  bool isStopped() const { return signals_ && signals_->haveCome(); }

 private:
  bool holds(const Outcome<Nothing>& outcome) {
    if (!outcome) tool_.fail(outcome.reason());
    return static_cast<bool>(outcome);
  }

  Tool& tool_;
  const std::string path_;
  const bool isTerminal_;
  std::optional<StopSignals> signals_;
  OutputFile file_;
};

// What one file lacks is said, and the others go on.
void sayOfFile(Tool& tool, const std::string& line) {
  printError(line);
  tool.exitStatus = kFailed;
}

void addFile(Tool& tool, RowWriter& rows, ExportTable table, const Outcome<ReportFile>& file) {
  if (!file) return sayOfFile(tool, file.reason());
  const auto report = DailyReport::decode(file->root);
  if (!report) return sayOfFile(tool, file->name + ": " + report.reason());
  if (!file->descriptionFault.empty()) sayOfFile(tool, file->descriptionFault);
  const auto leftOut = appendRows(rows, table, *report, file->origin);
  if (!leftOut) return sayOfFile(tool, file->name + ": " + leftOut.reason());
  if (!leftOut->empty()) sayOfFile(tool, file->name + ": " + *leftOut);
}

void exportRows(Tool& tool, const ExportArguments& arguments, RowFormat format,
                const ExportTableDescription& table) {
  const bool isOfDevice = arguments.files.empty() && arguments.list.empty();
  if (isOfDevice && !tool.hasUsableRoot()) return;
  ExportOutput output(tool, arguments.output);
  if (!output.open(OutputMode::Users)) return;
  RowWriter rows(format, table.columns, [&output](std::string_view lines) { return output.write(lines); });
  ReportFiles files(tool.platform(), arguments.device);
  {
    Progress progress("export", Progress::Of::Bytes, 0);
    const ReportVisitor visitor = [&](const Outcome<ReportFile>& file, std::size_t bytes) {
      addFile(tool, rows, table.table, file);
      progress.at(bytes);
      return rows.isTaken() && !output.isStopped();
    };
    Outcome<Nothing> read = Nothing{};
    if (isOfDevice)
      read = files.visitKept(visitor);
    else if (!arguments.list.empty())
      read = files.visitListed(arguments.list, visitor);
    else
      files.visit(arguments.files, visitor);
    if (!read && !output.isStopped()) return tool.fail(read.reason());
  }
  if (rows.finish()) output.finish();
}

// The newest report that may leave, where there is one.
void addNewestReport(Tool& tool, std::string& text) {
  const DeviceFiles& files = tool.platform().host().files();
  const auto reports = keptReports(files, ReportFolders::Leaving);
  if (!reports) return tool.fail(reports.reason());
  if (reports->empty()) return;
  const std::string& path = reports->back().path;
  const auto root = readKeptReport(files, tool.platform().services().propertyListCodec, path);
  if (!root) return sayOfFile(tool, root.reason());
  const std::string name = files.place(path).native();
  const auto report = DailyReport::decode(*root);
  if (!report) return sayOfFile(tool, name + ": " + report.reason());
  const std::string leftOut = appendReportMetrics(text, *report);
  if (!leftOut.empty()) sayOfFile(tool, name + ": " + leftOut);
}

void exportMetrics(Tool& tool, const ExportArguments& arguments) {
  if (!arguments.files.empty() || !arguments.list.empty() || !arguments.table.empty() || arguments.device)
    return tool.fail(
        "--format prometheus is about this device: it takes no FILE, --files-from, --table or --device",
        kWrongUsage);
  if (!tool.hasUsableRoot()) return;
  ExportOutput output(tool, arguments.output);
  std::string text;
  addNewestReport(tool, text);
  appendDeviceMetrics(text, tool);
  if (output.open(OutputMode::ReadableByAll) && output.write(text)) output.finish();
}

void runExport(Tool& tool, const ExportArguments& arguments) {
  if (tool.options.json)
    return tool.fail("export has formats of its own and does not go with --json; take --format ndjson",
                     kWrongUsage);
  const ExportFormatName* format = findNamed(kFormats, arguments.format);
  if (format == nullptr)
    return tool.fail("there is no format \"" + arguments.format + "\"; there are " + namesOf(kFormats),
                     kWrongUsage);
  if (format->format == ExportFormat::Prometheus) return exportMetrics(tool, arguments);
  const ExportTableDescription* table = findNamed(kExportTables, arguments.table);
  if (table == nullptr) {
    const std::string reason = arguments.table.empty()
                                   ? std::string("rows are of one table: name it with --table")
                                   : "there is no table \"" + arguments.table + "\"";
    return tool.fail(reason + "; there are " + namesOf(kExportTables), kWrongUsage);
  }
  exportRows(tool, arguments, format->format == ExportFormat::Tsv ? RowFormat::Tsv : RowFormat::Ndjson,
             *table);
}

}  // namespace

void addExportCommand(CLI::App& app, Tool& tool) {
  CLI::App* command = app.add_subcommand(
      "export", "Turn reports into rows for engines, or this device into metrics for monitoring");
  auto arguments = std::make_shared<ExportArguments>();
  CLI::Option* files = command->add_option(
      "FILE", arguments->files,
      "Reports; - is standard input (default: the device's that wait or were handed over)");
  command
      ->add_option("--format", arguments->format,
                   "tsv (the default), ndjson, or prometheus: a textfile of this device")
      ->type_name("ROWS");
  command
      ->add_option("--table", arguments->table,
                   "With tsv and ndjson: reports, scalars, distributions or histograms")
      ->type_name("TABLE");
  command
      ->add_option(
          "--device", arguments->device,
          "The device that the reports are of (default: the name of the device root that they lie in)")
      ->type_name("TEXT");
  command->add_option("-o,--output", arguments->output, "Write to this file, which is replaced as a whole")
      ->type_name("FILE");
  command
      ->add_option("--files-from", arguments->list,
                   "A file with the names of reports, one a line; - is standard input")
      ->type_name("FILE")
      ->excludes(files);
  command->callback([&tool, arguments] { runExport(tool, *arguments); });
}

}  // namespace tbdaily
