#include "storage/storage_connection.h"

#include <array>
#include <optional>
#include <string>
#include <utility>

#include "platform/byte_reader.h"

namespace tbdaily {

namespace {

constexpr std::uint32_t kConnectionType = 0;

// The connection, or 0.
KdHandle openService(DriverRegistry& registry, KdHandle service, KdStatus& status) {
  KdHandle connection = 0;
  status = registry.KdServiceOpen(service, kConnectionType, connection);
  return status == kKdSuccess ? connection : 0;
}

const StxRequest* orNull(const std::optional<StxRequest>& request) {
  return request ? &*request : nullptr;
}

// A controller that has no selectors for its statistics is asked without a request.
bool fetchAndParse(const StorageConnection& connection, const NandExporter& descriptor, StatsContext& context,
                   Diagnostics& diagnostics) {
  std::optional<StxRequest> sizeQuery, dataFetch;
  if (descriptor.statsSelectors != nullptr) {
    const STXSelectorPair* selectors = descriptor.statsSelectors();
    if (selectors == nullptr || selectors->sizeQuery == kNoSelector) return false;
    sizeQuery = StxRequest::sizeQuery(*selectors);
    dataFetch = StxRequest::dataFetch(*selectors);
  }
  std::uint32_t size = 0;
  if (const KdStatus status = connection.querySize(orNull(sizeQuery), size); status != kKdSuccess) {
    diagnostics.error("KdConnectCallStructMethod: %d", status);
    return false;
  }
  StorageBuffer buffer(size);
  if (!buffer) {
    diagnostics.error("Could not valloc %zd bytes", static_cast<std::ptrdiff_t>(size));
    return false;
  }
  if (connection.fetch(orNull(dataFetch), buffer) != kKdSuccess) {
    diagnostics.error("Could not retrieve data from driver for selector %x\n",
                      dataFetch ? dataFetch->command : 0U);
    return false;
  }
  const bool accepted = descriptor.parseBufferToCxt(context, buffer.filled());
  context.buffer = std::move(buffer);
  return accepted;
}

}  // namespace

KdHandle findNandExporter(DriverRegistry& registry, const NandExporter*& descriptor,
                          NandExporterTable exporters) {
  descriptor = exporters.data();
  for (; !descriptor->className.empty(); ++descriptor) {
    const PlistValue matching = registry.KdServiceMatching(descriptor->className);
    if (!matching) continue;
    if (const KdHandle service = registry.KdServiceGetMatchingService(matching); service != 0) return service;
  }
  return 0;
}

StorageService::StorageService(DriverRegistry& registry, NandExporterTable exporters)
    : registry_(registry), handle_(registry, findNandExporter(registry, descriptor_, exporters)) {}

StorageConnection::StorageConnection(const StorageService& service, Diagnostics& diagnostics)
    : service_(service), diagnostics_(diagnostics) {
  KdStatus status = kKdSuccess;
  handle_ = openService(service.registry(), service.handle(), status);
  if (handle_ == 0) diagnostics.error("Could not get connection to service\n");
}

StorageConnection::~StorageConnection() {
  if (handle_ != 0 && service_.registry().KdServiceClose(handle_) != kKdSuccess)
    diagnostics_.error("Could not close connection to service\n");
}

KdStatus StorageConnection::call(std::uint32_t method, const StxRequest* request, std::span<std::byte> output,
                                 std::size_t& outputSize) const {
  std::array<std::byte, 24> bytes{};
  if (request != nullptr) bytes = request->bytes();
  outputSize = output.size();
  return service_.registry().KdConnectCallStructMethod(
      handle_, method, std::span(bytes).first(request != nullptr ? bytes.size() : 0), output, outputSize);
}

KdStatus StorageConnection::querySize(const StxRequest* request, std::uint32_t& size) const {
  std::array<std::byte, sizeof(size)> answer{};
  std::size_t answered = 0;
  const KdStatus status = call(service_.descriptor().sizeMethod, request, answer, answered);
  size = *ByteReader(answer).at<std::uint32_t>(0);
  return status;
}

KdStatus StorageConnection::fetch(const StxRequest* request, StorageBuffer& buffer) const {
  std::size_t filled = 0;
  const KdStatus status = call(service_.descriptor().dataMethod, request, buffer.all(), filled);
  buffer.setFilled(status == kKdSuccess ? filled : 0);
  return status;
}

bool FetchStatsContext(DriverRegistry& registry, const NandExporter*& descriptor, StatsContext& context,
                       Diagnostics& diagnostics, NandExporterTable exporters) {
  const StorageService service(registry, exporters);
  descriptor = &service.descriptor();
  if (!service) {
    diagnostics.error("Could not get matching KdKit service for exporting classes\n");
    return false;
  }
  const StorageConnection connection(service, diagnostics);
  return connection && fetchAndParse(connection, *descriptor, context, diagnostics);
}

FetchedStats::FetchedStats(DriverRegistry& registry, Diagnostics& diagnostics)
    : fetched_(FetchStatsContext(registry, descriptor_, context_, diagnostics)) {}

FetchedStats::~FetchedStats() {
  if (descriptor_->releaseContext != nullptr) descriptor_->releaseContext(context_);
}

KdHandle FlashConnect(DriverRegistry& registry, const NandExporter*& descriptor, Diagnostics& diagnostics) {
  const StorageService service(registry);
  descriptor = &service.descriptor();
  if (!service) {
    diagnostics.error("No class found");
    return 0;
  }
  KdStatus status = kKdSuccess;
  const KdHandle connection = openService(registry, service.handle(), status);
  if (status != kKdSuccess) {
    diagnostics.error("KdServiceOpen failed for class '%s', result 0x%x\n",
                      std::string(descriptor->className).c_str(), static_cast<std::uint32_t>(status));
  }
  return connection;
}

void FlashDisconnect(DriverRegistry& registry, KdHandle connection, Diagnostics& diagnostics) {
  if (registry.KdServiceClose(connection) != kKdSuccess)
    diagnostics.error("closing connection to service failed\n");
}

bool openSTXConnection(DriverRegistry& registry, StxConnection& connection, Diagnostics& diagnostics) {
  connection.service = findNandExporter(registry, connection.descriptor, nand_exporters);
  if (connection.service == 0) {
    diagnostics.error("Can't get STX Connection, no matching service!\n");
    closeSTXConnection(registry, connection);
    return false;
  }
  // Looks the service up again, so the descriptor may be another one by now.
  connection.connection = FlashConnect(registry, connection.descriptor, diagnostics);
  if (connection.connection == 0 || connection.descriptor->statsSelectors != STXGetStatsSelectors) {
    diagnostics.error("Can't get STX Connection!\n");
    closeSTXConnection(registry, connection);
    return false;
  }
  return true;
}

void closeSTXConnection(DriverRegistry& registry, StxConnection& connection) {
  if (connection.connection != 0) registry.KdServiceClose(connection.connection);
  connection.connection = 0;
  if (connection.service != 0) registry.KdObjectRelease(connection.service);
  connection.service = 0;
}

}  // namespace tbdaily
