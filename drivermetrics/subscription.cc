#include "drivermetrics/subscription.h"

#include <array>
#include <limits>
#include <new>

#include "drivermetrics/channel_collection.h"
#include "drivermetrics/report_error.h"
#include "platform/byte_writer.h"

namespace kdreport {

namespace {

constexpr std::string_view kHubClass = "KdReportHub";
constexpr std::uint32_t kConnectionType = 0;

enum HubMethod : std::uint32_t { kOpenUserClient = 0, kConfigureInterests = 2, kUpdate = 3 };

constexpr std::size_t kInterestHeaderSize = 8;  // the count, and as many bytes that stay zero
constexpr std::size_t kInterestSize = 24;
constexpr std::uint32_t kMostInterests = 89478477;  // keep the list below 2^31 bytes

}  // namespace

std::optional<std::size_t> interestListSize(std::uint32_t count) {
  if (count > kMostInterests) return std::nullopt;
  return kInterestHeaderSize + kInterestSize * count;
}

std::optional<std::vector<std::byte>> createInterestList(const ChannelCollection* channels,
                                                         std::uint32_t count) {
  const auto size = interestListSize(count);
  if (!size) return std::nullopt;
  std::vector<std::byte> list;
  list.reserve(*size);
  tbdaily::appendLittleEndian(list, std::uint64_t{count});
  const std::uint32_t status =
      KdReportIterate(channels, [&list, &size](ChannelRecord& channel) -> std::uint32_t {
        const std::int64_t driver = KdReportChannelGetDriverID(&channel);
        const std::int64_t identifier = KdReportChannelGetChannelID(&channel);
        ChannelType type;
        if (driver == kKdReportInvalid || identifier == kKdReportInvalid ||
            getChannelType(&channel, type) != kKdSuccess || list.size() == *size) {
          return kKdReportStop;
        }
        tbdaily::appendLittleEndian(list, static_cast<std::uint64_t>(driver));
        tbdaily::appendLittleEndian(list, static_cast<std::uint64_t>(identifier));
        tbdaily::appendLittleEndian(list, type.bits);
        return kKdReportKeep;
      });
  if (status != 0 || list.size() != *size) return std::nullopt;
  return list;
}

KdReportSubscription::~KdReportSubscription() {
  if (mapping_) registry_.KdConnectUnmapMemory(connection_, memoryType(), *mapping_);
  if (connection_ != 0) registry_.KdServiceClose(connection_);
}

KdStatus KdReportSubscription::openHub(KdReportErrorOut error) {
  const PlistValue matching = registry_.KdServiceMatching(kHubClass);
  if (matching.isNone()) {
    setError(error, kKdNoMemory);
    return kKdNoMemory;
  }
  const DriverHandle hub(registry_, registry_.KdServiceGetMatchingService(matching));
  if (hub.get() == 0) {
    setError(error, kKdNotFound);
    return kKdNotFound;
  }
  KdHandle connection = 0;
  const KdStatus status = registry_.KdServiceOpen(hub.get(), kConnectionType, connection);
  if (status == kKdSuccess) {
    connection_ = connection;
  } else {
    setError(error, status, "Could not open KdReportHub");
  }
  return status;
}

bool KdReportSubscription::connect(KdReportErrorOut error) {
  if (openHub(error) != kKdSuccess) return false;
  std::size_t outputs = 0;
  const KdStatus status = registry_.KdConnectCallScalarMethod(connection_, kOpenUserClient, {}, {}, outputs);
  if (status != kKdSuccess) setError(error, status, "kKdReportUserClientOpen failed");
  return status == kKdSuccess;
}

bool KdReportSubscription::configure(std::span<const std::byte> interestList, KdReportErrorOut error) {
  std::array<std::uint64_t, 1> identifier{};
  KdMethodOutput output{.scalars = identifier, .scalarCount = 0, .structure = {}, .structureSize = 0};
  KdStatus status = registry_.KdConnectCallMethod(connection_, kConfigureInterests,
                                                  {.scalars = {}, .structure = interestList}, output);
  if (status == kKdSuccess && output.scalarCount < identifier.size()) status = kKdError;
  if (status != kKdSuccess) {
    setError(error, status, "kKdReportUserClientConfigureInterests failed");
    return false;
  }
  bufferIdentifier_ = identifier[0];
  return true;
}

bool KdReportSubscription::mapBuffer(KdReportErrorOut error) {
  std::span<std::byte> memory;
  const KdStatus status = registry_.KdConnectMapMemory(connection_, memoryType(), memory);
  if (status != kKdSuccess) {
    setError(error, status, "KdConnectMapMemory() failed");
    return false;
  }
  mapping_ = memory;
  return true;
}

KdStatus KdReportSubscription::update() const {
  const std::array<std::uint64_t, 1> identifier{bufferIdentifier_};
  KdMethodOutput none;
  return registry_.KdConnectCallMethod(connection_, kUpdate, {.scalars = identifier, .structure = {}}, none);
}

KdStatus updateKernelBuffer(KdReportSubscription* subscription, KdReportErrorOut error) {
  const KdStatus status = subscription != nullptr ? subscription->update() : kKdBadArgument;
  if (status != kKdSuccess) setError(error, status);
  return status;
}

std::shared_ptr<KdReportSubscription> KdReportCreateSubscription(
    DriverRegistry& registry, std::pmr::memory_resource* allocator, const ChannelCollection* channels,
    KdReportCollection* subscribedChannels, std::uint32_t /*options*/, KdReportErrorOut error) {
  const auto fail = [error](KdStatus status, std::optional<std::string_view> reason) {
    setError(error, status, reason);
    return nullptr;
  };
  if (channels == nullptr || subscribedChannels == nullptr) return fail(kKdBadArgument, "bad arguments");
  const std::uint32_t count = KdReportGetChannelCount(channels);
  if (count > std::uint32_t{std::numeric_limits<std::int32_t>::max()})
    return fail(kKdBadArgument, "iteration error");
  if (count == 0) return fail(kKdBadArgument, "no channels");
  const auto interestList = createInterestList(channels, count);
  if (!interestList) return fail(kKdNoMemory, "createInterestList() failed");

  std::shared_ptr<KdReportSubscription> subscription;
  try {
    const std::pmr::polymorphic_allocator<KdReportSubscription> from(
        allocator != nullptr ? allocator : std::pmr::get_default_resource());
    subscription = std::allocate_shared<KdReportSubscription>(from, registry);
  } catch (const std::bad_alloc&) {
    return fail(kKdNoMemory, std::nullopt);
  }
  if (!subscription->connect(error) || !subscription->configure(*interestList, error) ||
      !subscription->mapBuffer(error)) {
    return nullptr;
  }
  KdReportCollection copy = cloneAggregate(
      channels, [](const ChannelRecord&, ChannelRecord&) -> std::uint32_t { return kKdReportKeep; });
  if (copy == nullptr) return fail(kKdError, std::nullopt);
  *subscribedChannels = std::move(copy);
  return subscription;
}

}  // namespace kdreport
