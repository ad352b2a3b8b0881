// Finding the storage controller in the driver registry, talking to it, and fetching its statistics. Each
// call finds, opens, closes and releases on its own; troubles are told on standard error and end in "none" or
// false.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

#include "platform/diagnostics.h"
#include "platform/driver_handle.h"
#include "platform/driver_registry.h"
#include "storage/exporters.h"
#include "storage/storage_buffer.h"
#include "storage/stx_request.h"

namespace tbdaily {

// The first service of the first row that has one, or 0. Always writes the descriptor: the row where the
// search stopped, which is the empty one when nothing matched. The caller releases the service.
KdHandle findNandExporter(DriverRegistry& registry, const NandExporter*& descriptor,
                          NandExporterTable exporters = nand_exporters);

// The same as an owner: the destructor releases the service.
class StorageService {
 public:
  explicit StorageService(DriverRegistry& registry, NandExporterTable exporters = nand_exporters);

  explicit operator bool() const { return handle() != 0; }
  KdHandle handle() const { return handle_.get(); }
  // Never null: the empty row when there is no service.
  const NandExporter& descriptor() const { return *descriptor_; }
  DriverRegistry& registry() const { return registry_; }

 private:
  DriverRegistry& registry_;
  const NandExporter* descriptor_ = nullptr;
  DriverHandle handle_;
};

// A connection of user-client type 0. The destructor closes it, and says so when that fails. Borrows the
// service, which outlives it, and the diagnostics.
class StorageConnection {
 public:
  // Says "Could not get connection to service\n" and is false when the service does not open.
  StorageConnection(const StorageService& service, Diagnostics& diagnostics);
  ~StorageConnection();
  StorageConnection(const StorageConnection&) = delete;
  StorageConnection& operator=(const StorageConnection&) = delete;

  explicit operator bool() const { return handle_ != 0; }

  // One call; `request` may be null (no input structure). `outputSize` is the number of bytes filled. Says
  // nothing.
  KdStatus call(std::uint32_t method, const StxRequest* request, std::span<std::byte> output,
                std::size_t& outputSize) const;
  // How many bytes the buffer holds, through the descriptor's size method; bytes that the driver does not
  // answer are 0. Says nothing.
  KdStatus querySize(const StxRequest* request, std::uint32_t& size) const;
  // The buffer itself, through the descriptor's data method. Says nothing.
  KdStatus fetch(const StxRequest* request, StorageBuffer& buffer) const;

 private:
  const StorageService& service_;
  Diagnostics& diagnostics_;
  KdHandle handle_ = 0;
};

// Fetches the statistics buffer and has the descriptor's function parse it into the context, which the caller
// provides zero-filled and which keeps the buffer. Always writes the descriptor. True when the buffer was
// fetched and accepted; the context may hold values after a refusal too.
bool FetchStatsContext(DriverRegistry& registry, const NandExporter*& descriptor, StatsContext& context,
                       Diagnostics& diagnostics, NandExporterTable exporters = nand_exporters);

// FetchStatsContext as an owner: the destructor releases the context through its descriptor, whether the
// fetch succeeded or not.
class FetchedStats {
 public:
  FetchedStats(DriverRegistry& registry, Diagnostics& diagnostics);
  ~FetchedStats();
  FetchedStats(const FetchedStats&) = delete;
  FetchedStats& operator=(const FetchedStats&) = delete;

  explicit operator bool() const { return fetched_; }
  const StatsContext& context() const { return context_; }

 private:
  const NandExporter* descriptor_ = nullptr;
  StatsContext context_;
  bool fetched_;
};

// A connection by hand, for callers that keep it open: 0, or a handle that FlashDisconnect closes. Writes the
// descriptor as findNandExporter does.
KdHandle FlashConnect(DriverRegistry& registry, const NandExporter*& descriptor, Diagnostics& diagnostics);
void FlashDisconnect(DriverRegistry& registry, KdHandle connection, Diagnostics& diagnostics);

// Service and connection by hand. Zero handles mean none.
struct StxConnection {
  KdHandle service = 0;
  KdHandle connection = 0;
  const NandExporter* descriptor = nullptr;
};

// Fills a record that holds nothing. False, and nothing held, when there is no controller of this family.
bool openSTXConnection(DriverRegistry& registry, StxConnection& connection, Diagnostics& diagnostics);
// Closes and releases what the record holds, and zeroes the handles.
void closeSTXConnection(DriverRegistry& registry, StxConnection& connection);

}  // namespace tbdaily
