// tallyctl status: whether this device is well.

#include <CLI/CLI.hpp>

#include "tools/tallyctl/day_argument.h"
#include "tools/tallyctl/sizes.h"
#include "tools/tallyctl/status/device_status.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

std::string dayOr(const std::optional<DayNumber>& day, const std::string& otherwise) {
  return day ? dayText(*day) : otherwise;
}

std::string spoolText(const SpoolContents& spool) {
  std::string text;
  for (const SpoolPart& part : spool.parts)
    text.append(text.empty() ? "" : ", ")
        .append(std::to_string(part.logs.size()))
        .append(" ")
        .append(part.name);
  return text + " (" + sizeText(spool.bytes()) + ")";
}

void print(Terminal& out, const DeviceStatus& status) {
  out.line(status.isWell()
               ? out.styled("This device is well.", Style::Good)
               : out.styled(status.attention.size() == 1
                                ? "One thing needs attention."
                                : std::to_string(status.attention.size()) + " things need attention.",
                            Style::Bad));
  for (const std::string& line : status.attention) out.line("  " + line);
  const WhitelistStatus& whitelist = status.whitelist;
  const StoreStatus& store = status.store;
  Table table({Table::Align::Left, Table::Align::Left});
  table.add({"root", status.root});
  table.add({"last day processed", dayOr(status.lastDay, "none yet")});
  table.add({"next run", status.nextRun});
  table.add({"submission", status.consent ? "on" : "off"});
  table.add({"whitelist", whitelist.digest ? "digest " + *whitelist.digest : "none that can be used"});
  for (const std::string& problem : whitelist.problems) table.add({"", problem});
  table.add({"store", store.isUsable
                          ? sizeText(store.bytes) + ", " +
                                (store.firstDay ? dayText(*store.firstDay) + " to " + dayOr(store.lastDay, "")
                                                : "without rows")
                          : store.reason.value_or("")});
  table.add({"logs", spoolText(status.spool)});
  table.print(out);
}

void show(Tool& tool) {
  if (!tool.hasUsableRoot()) return;
  const DeviceStatus status = examineDevice(tool.platform());
  tool.exitStatus = status.isWell() ? kDone : kFailed;
  if (!tool.printedAsJson([&status](JsonWriter& json) { writeStatus(json, status); }))
    print(tool.out(), status);
}

}  // namespace

void addStatusCommand(CLI::App& app, Tool& tool) {
  app.add_subcommand(
         "status",
         "Say whether this device is well, and what the next run would do; status 1 when something "
         "needs a person")
      ->callback([&tool] { show(tool); });
}

}  // namespace tbdaily
