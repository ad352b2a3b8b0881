#include "storage/content_deletion.h"

#include <array>
#include <cstddef>
#include <cstdint>

#include "platform/byte_reader.h"
#include "storage/storage_connection.h"

namespace tbdaily {

bool NandRecommendsContentDeletion(DriverRegistry& registry, Diagnostics& diagnostics) {
  const StorageService service(registry);
  const std::uint32_t method = service.descriptor().recommendationMethod;
  if (method == kNoMethod) return false;
  if (!service) {
    diagnostics.error("_load_nand_infoCould not get matching KdKit service for exporting classes\n");
    return false;
  }
  const StorageConnection connection(service, diagnostics);
  if (!connection) return false;
  std::array<std::byte, sizeof(std::uint32_t)> answer{};
  std::size_t answered = 0;
  return connection.call(method, nullptr, answer, answered) == kKdSuccess && answered >= answer.size() &&
         ByteReader(answer).at<std::uint32_t>(0) != 0U;
}

}  // namespace tbdaily
