#include "platform/linux/live/nvme_health.h"

#include <libnvme.h>

#include <cerrno>
#include <limits>

namespace tbdaily {

namespace {
constexpr std::int64_t kDataUnit = 512'000, kMinute = 60, kHour = 3'600, kKelvin = -273;
constexpr std::size_t kTemperature = 1;
}  // namespace

constinit const std::array<NvmeFigure, 15> kNvmeFigures{{
    {"criticalWarning", 0, 1, LiveUnit::Count},
    {"availableSpare", 3, 1, LiveUnit::Count},
    {"spareThreshold", 4, 1, LiveUnit::Count},
    {"percentUsed", 5, 1, LiveUnit::Count},
    {"temperature", kTemperature, 2, LiveUnit::Celsius, 1, kKelvin},
    {"readBytes", 32, 16, LiveUnit::Bytes, kDataUnit},
    {"writtenBytes", 48, 16, LiveUnit::Bytes, kDataUnit},
    {"readCommands", 64, 16, LiveUnit::Events},
    {"writeCommands", 80, 16, LiveUnit::Events},
    {"powerCycles", 112, 16, LiveUnit::Events},
    {"unsafeShutdowns", 144, 16, LiveUnit::Events},
    {"mediaErrors", 160, 16, LiveUnit::Events},
    {"errorLogEntries", 176, 16, LiveUnit::Events},
    {"busyTime", 96, 16, LiveUnit::Seconds, kMinute},
    {"powerOnTime", 128, 16, LiveUnit::Seconds, kHour},
}};

std::optional<std::int64_t> nvmeFigure(const NvmeFigure& figure,
                                       std::span<const std::byte, kNvmeHealthSize> page) {
  constexpr std::int64_t kMost = std::numeric_limits<std::int64_t>::max();
  constexpr std::uint64_t kUpperByte = std::uint64_t{0xFF} << 56;
  const auto bytes = page.subspan(figure.at, figure.width);
  std::uint64_t value = 0;
  for (std::size_t i = bytes.size(); i-- > 0;) {
    if ((value & kUpperByte) != 0) return kMost;
    value = value << 8 | std::to_integer<std::uint64_t>(bytes[i]);
  }
  if (figure.at == kTemperature && value == 0) return std::nullopt;
  const auto factor = static_cast<std::uint64_t>(figure.factor);
  if (value > static_cast<std::uint64_t>(kMost) / factor) return kMost;
  return static_cast<std::int64_t>(value * factor) + figure.offset;
}

int readNvmeHealth(int controller, NvmeHealthPage& page) {
  constexpr std::uint32_t kPatience = 2'000;  // in milliseconds
  nvme_get_log_args request{};
  request.args_size = static_cast<int>(sizeof request);
  request.fd = controller;
  request.log = page.data();
  request.len = static_cast<std::uint32_t>(page.size());
  request.timeout = kPatience;
  request.lid = NVME_LOG_LID_SMART;
  request.nsid = NVME_NSID_ALL;
  request.csi = NVME_CSI_NVM;
  request.lsi = NVME_LOG_LSI_NONE;
  request.lsp = NVME_LOG_LSP_NONE;
  request.uuidx = NVME_UUID_NONE;
  request.rae = true;  // reading changes nothing
  errno = 0;
  const int status = ::nvme_get_log(&request);
  if (status == 0) return 0;
  return status < 0 && errno != 0 ? errno : EIO;  // above zero: what the controller answered
}

}  // namespace tbdaily
