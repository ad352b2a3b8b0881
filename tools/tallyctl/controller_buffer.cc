#include "tools/tallyctl/controller_buffer.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <iterator>

#include "storage/storage_connection.h"

namespace tbdaily {

namespace {

std::string statusText(std::string_view what, KdStatus status) {
  std::array<char, 16> code;
  std::snprintf(code.data(), code.size(), "0x%08x", static_cast<unsigned>(status));
  return std::string(what).append(": the controller answered ").append(code.data());
}

}  // namespace

Outcome<std::vector<std::byte>> fetchControllerBuffer(DriverRegistry& registry, std::string_view name,
                                                      std::uint16_t list) {
  const auto kind = std::find_if(std::begin(kBufferKinds), std::end(kBufferKinds),
                                 [name](const BufferKind& candidate) { return candidate.name == name; });
  if (kind == std::end(kBufferKinds)) return Failure{"there is no buffer of this kind"};
  QuietDiagnostics quiet;
  const StorageService service(registry);
  if (!service) return Failure{"the device has no storage controller that the job knows"};
  const StorageConnection connection(service, quiet);
  if (!connection) return Failure{"the storage controller does not accept a connection"};
  const SelectorGetter getter = service.descriptor().*kind->selectors;
  const STXSelectorPair* selectors = getter != nullptr ? getter() : nullptr;
  if (selectors == nullptr) return Failure{"the storage controller has no buffer of this kind"};

  const StxRequest query = StxRequest::sizeQuery(*selectors, {list, false});
  std::uint32_t size = 0;
  if (const KdStatus status = connection.querySize(&query, size); status != kKdSuccess) {
    return Failure{statusText("the size of the buffer cannot be had", status)};
  }
  StorageBuffer buffer(size);
  if (!buffer) return Failure{"there is no memory for a buffer of " + std::to_string(size) + " bytes"};
  const StxRequest fetch = StxRequest::dataFetch(*selectors, {list, false});
  if (const KdStatus status = connection.fetch(&fetch, buffer); status != kKdSuccess) {
    return Failure{statusText("the buffer cannot be fetched", status)};
  }
  const auto filled = buffer.filled();
  return std::vector<std::byte>(filled.begin(), filled.end());
}

}  // namespace tbdaily
