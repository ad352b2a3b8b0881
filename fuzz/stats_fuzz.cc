// Statistics buffers of a controller to NAND info: figures within what the buffer holds, the same whatever
// size the controller announces, and nothing left open.
#include "fuzz/input.h"
#include "storage/nand_info.h"
#include "storage/storage_connection.h"
#include "storage/storage_test_support.h"
#include "testing/fake_platform.h"

using namespace tbdaily;
using fuzz::Input;
using fuzz::require;

namespace {

constexpr std::uint32_t kStatistics = 13;

void parse(std::span<const std::byte> buffer) {
  StatsContext context, shorter;
  const bool accepted = STXParseBufferToCxt(context, buffer);
  require(accepted == STXParseBufferToCxt(shorter, buffer.first(buffer.size() / 8 * 8)) &&
              context.nodes.size() == shorter.nodes.size() && context.exportVersion == shorter.exportVersion,
          "bytes behind the last whole word do not count");
  require(context.nodes.size() <= buffer.size() / 8, "no more values than words");
  for (const StatNode& node : context.nodes)
    require(node.isNamed(node.name()), "a value has the name that it says");
  if (!accepted) require(context.exportVersion == 0, "a refused buffer has no version");
  STXReleaseContext(context);
  require(context.nodes.empty() && context.exportVersion == 0, "released is as if new");
}

PlistDictionary infoOf(const std::vector<std::byte>& buffer, std::optional<std::uint64_t> announced,
                       std::optional<std::size_t> filled, std::size_t statuses) {
  testing::FakePlatform fake;
  testing::ScriptedController controller(fake.driverRegistry, "STXStorage");
  controller.buffers[kStatistics] = buffer;
  controller.sizeAnswer = announced;
  controller.filled = filled;
  if ((statuses & 1) != 0) controller.sizeStatus = kKdError;
  if ((statuses & 2) != 0) controller.dataStatus = kKdError;
  PlistDictionary info = CopyNANDInfo(fake.platform);
  require(fake.driverRegistry.openHandles() == 0, "no handle stays open");
  const bool failed = info.contains(kNANDInfoErrorKey);
  require(!failed || info.size() == 2, "a failure is two entries");
  for (const auto& [key, value] : info)
    require(failed ? value.asString().has_value() : value.asInteger().has_value(), "figures are integers");

  PlistDictionary target;
  DumpNANDInfo(fake.platform, target);
  require(target.size() <= info.size(), "the log variant has fewer entries");
  for (const auto& [key, value] : target)
    require(info.get(key) == value, "both variants have the same figures");
  return info;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  Input input(data, size);
  const std::size_t more = input.number<std::uint16_t>(), statuses = input.below(16),
                    filled = input.number<std::uint16_t>();
  const std::vector<std::byte> buffer(input.rest().begin(), input.rest().end());
  parse(buffer);
  const PlistDictionary info = infoOf(buffer, {}, {}, 0);
  if (!buffer.empty())
    require(infoOf(buffer, buffer.size() + more, {}, 0) == info, "the same in a larger room");
  (void)infoOf(buffer, more, filled, statuses);
  return 0;
}
