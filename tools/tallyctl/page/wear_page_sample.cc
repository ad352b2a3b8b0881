// Prints the wear page of a device root: what the test of pages looks at.
#include <cstdio>

#include "tools/tallyctl/page/wear_page.h"
#include "tools/tallyctl/tool.h"
#include "tools/tallyctl/wear/wear_history.h"

// Usage: wear_page_sample ROOT FIRST LAST [CYCLES]
int main(int argc, char** argv) {
  using namespace tbdaily;
  if (argc < 4) return kWrongUsage;
  Tool tool;
  tool.options.root = argv[1];
  const auto history = readWearHistory(tool.platform(), std::atoi(argv[2]), std::atoi(argv[3]));
  if (!history) return tool.fail(history.reason()), kFailed;
  WearPageSubject subject{argv[1], wearPace(*history, 30), std::nullopt};
  if (argc > 4) subject.enduranceCycles = std::atoll(argv[4]);
  const std::string page = wearPage(*history, subject);
  return std::fwrite(page.data(), 1, page.size(), stdout) == page.size() ? kDone : kFailed;
}
