// Stack snapshots: what is found lies inside of them, and the key says what is found.
#include "fuzz/input.h"
#include "platform/byte_reader.h"
#include "storage/freezer_writes.h"
#include "testing/fake_platform.h"

using namespace tbdaily;
using fuzz::require;

namespace {

void searchFor(std::span<const std::byte> buffer, std::string_view name) {
  KcdataIOStats stats, withoutCursor;
  std::size_t cursor = 0;
  const bool found = getIOStatsWithThreadnameFromKCDataHelper(buffer, name, stats, &cursor);
  require(cursor <= buffer.size(), "the walk stops inside of the buffer");
  require(getIOStatsWithThreadnameFromKCData(buffer, name, withoutCursor) == found &&
              stats.has_value() == withoutCursor.has_value(),
          "the search is the same without a cursor");
  require(found || !stats, "no statistics of a thread that was not found");
  if (!stats || stats->empty()) return;
  require(stats->data() >= buffer.data() && stats->data() + stats->size() <= buffer.data() + buffer.size(),
          "statistics lie inside of the buffer");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  constexpr std::string_view kFreezer = "VM_swapout";
  const auto bytes = std::as_bytes(std::span(data, size));
  // A copy of exactly this length, so that a look behind it shows.
  const std::vector<std::byte> buffer(bytes.begin(), bytes.end());
  for (const std::string_view name : {kFreezer, std::string_view(), std::string_view("kernel_task")})
    searchFor(buffer, name);

  testing::FakePlatform fake;
  fake.stackSnapshot.bytes = buffer;
  const PlistDictionary info = CopyVMFreezerNANDInfo(fake.platform);
  KcdataIOStats stats;
  const bool found = getIOStatsWithThreadnameFromKCData(buffer, kFreezer, stats);
  require(fake.stackSnapshot.configurations == 0, "the snapshot is released");
  require(info.get(kNANDInfoVMFreezerNumPhysicalWritesKey).asInteger().has_value() == found,
          "a number when the thread was found");
  require(info.size() == (found ? 1U : 2U), "one figure, or two errors");
  return 0;
}
