// Fuzzer of what comes from the storage controller and from the kernel: statistics buffers, snapshot records
// with and without their header, stack snapshots.
#include <array>
#include <cstddef>
#include <cstdint>
#include <span>

#include "storage/freezer_writes.h"
#include "storage/snapshot_renderer.h"
#include "storage/stats_context.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace tbdaily;
  if (size == 0) return 0;
  // The first byte is the length of a snapshot's header, in sixteenths of the rest.
  const auto bytes = std::as_bytes(std::span(data, size)).subspan(1);
  const std::size_t split = bytes.size() * (data[0] & 15U) / 15;

  StatsContext context;
  STXParseBufferToCxt(context, bytes);
  for (const StatNode& node : context.nodes) (void)node.name();
  STXReleaseContext(context);

  static std::array<char, std::size_t{1} << 16> text;
  std::size_t room = text.size();
  STXParseSnapshotBuffer(bytes, text.data(), room);
  room = text.size();
  std::uint32_t cursor = 0;
  STXParseSnapshotBufferWithInplaceParser(bytes.subspan(split), text.data(), room, bytes.first(split),
                                          cursor);

  KcdataIOStats statistics;
  getIOStatsWithThreadnameFromKCData(bytes, "VM_freezer", statistics);
  return 0;
}
