#include "platform/linux/linux_kernel.h"

#include <sys/sysinfo.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>  // program_invocation_short_name too
#include <cmath>
#include <ctime>
#include <limits>
#include <stdexcept>

#include "platform/byte_writer.h"
#include "platform/linux/base/host_notes.h"

namespace tbdaily {

namespace {

constexpr std::string_view kNextEccEvent = "kern.next_ecc_event";
constexpr std::string_view kSwapUsage = "vm.swapusage";

int copyData(std::span<const std::byte> data, std::span<std::byte> buffer, std::size_t& length) {
  if (data.size() > buffer.size()) return ENOMEM;
  std::copy(data.begin(), data.end(), buffer.begin());
  length = data.size();
  return 0;
}

int copyInteger(std::int64_t value, std::span<std::byte> buffer, std::size_t& length) {
  if (buffer.size() != sizeof(std::uint32_t) && buffer.size() != sizeof(std::uint64_t)) return EINVAL;
  writeLittleEndian(buffer, static_cast<std::uint64_t>(value));
  length = buffer.size();
  return 0;
}

// The device kernel's record: total, available and used bytes, page size, encrypted flag.
int liveSwapUsage(std::span<std::byte> buffer, std::size_t& length) {
  struct sysinfo info {};
  if (::sysinfo(&info) != 0) return errno;
  const std::uint64_t total = std::uint64_t{info.totalswap} * info.mem_unit;
  const std::uint64_t available = std::uint64_t{info.freeswap} * info.mem_unit;
  std::array<std::byte, 32> record{};
  const std::span<std::byte> bytes(record);
  writeLittleEndian(bytes.subspan(0, 8), total);
  writeLittleEndian(bytes.subspan(8, 8), available);
  writeLittleEndian(bytes.subspan(16, 8), total - std::min(available, total));
  writeLittleEndian(bytes.subspan(24, 4), static_cast<std::uint64_t>(::sysconf(_SC_PAGESIZE)));
  return copyData(record, buffer, length);
}

timespec clockTime(clockid_t clock) {
  timespec time{};
  ::clock_gettime(clock, &time);
  return time;
}

std::optional<std::uint32_t> unsigned32(const PlistValue& value) {
  const auto integer = value.asInteger();
  if (!integer || *integer < 0 || *integer > std::numeric_limits<std::uint32_t>::max()) return std::nullopt;
  return static_cast<std::uint32_t>(*integer);
}

}  // namespace

int LinuxKernel::recordedErrno(std::string_view name) {
  const auto number = recordings_.entry(recording::kKernel, "errno").get(name).asInteger();
  constexpr std::int64_t kLimit = std::numeric_limits<int>::max();
  return number && *number > 0 && *number <= kLimit ? static_cast<int>(*number) : 0;
}

int LinuxKernel::nextEccEvent(std::span<std::byte> buffer, std::size_t& length) {
  const PlistValue events = recordings_.entry(recording::kKernel, "eccEvents");
  const PlistArray* array = events.asArray();
  if (array == nullptr || eccEventsRead_ >= array->size()) {
    const int error = recordedErrno(kNextEccEvent);
    return error != 0 ? error : ENOENT;
  }
  const auto data = (*array)[eccEventsRead_++].asData();
  return data ? copyData(*data, buffer, length) : EINVAL;
}

int LinuxKernel::sysctlByName(std::string_view name, std::span<std::byte> buffer, std::size_t& length) {
  buffer = buffer.first(std::min(length, buffer.size()));
  if (name == kNextEccEvent) return nextEccEvent(buffer, length);
  if (const int error = recordedErrno(name); error != 0) return error;

  const PlistValue value = recordings_.entry(recording::kKernel, "sysctl").get(name);
  if (const auto integer = value.asInteger()) return copyInteger(*integer, buffer, length);
  if (const auto data = value.asData()) return copyData(*data, buffer, length);
  if (host_.live() && name == kSwapUsage) return liveSwapUsage(buffer, length);
  return ENOENT;
}

std::uint64_t LinuxKernel::tickCount() {
  if (const auto ticks = recordings_.entry(recording::kClock, "ticks").asInteger()) {
    return static_cast<std::uint64_t>(*ticks);
  }
  if (!host_.live()) return 0;
  // Linux stops this clock while the machine is suspended.
  const timespec time = clockTime(CLOCK_MONOTONIC);
  return static_cast<std::uint64_t>(time.tv_sec) * 1'000'000'000U + static_cast<std::uint64_t>(time.tv_nsec);
}

std::optional<Timebase> LinuxKernel::timebase() {
  const auto numerator = unsigned32(recordings_.entry(recording::kClock, "numerator"));
  const auto denominator = unsigned32(recordings_.entry(recording::kClock, "denominator"));
  if (numerator && denominator) return Timebase{*numerator, *denominator};
  if (!host_.live()) return std::nullopt;
  return Timebase{1, 1};
}

std::optional<PlistDate> LinuxKernel::recordedNow() {
  const std::optional<PlistValue> now = recordings_.readableEntry(recording::kClock, "now");
  const std::lock_guard guard(mutex_);
  if (now) {
    recordedNow_ = now->asDate();
  } else if (!recordedNow_) {
    throw std::runtime_error("what time it is stands in " +
                             host_.files().place(Recordings::path(recording::kClock)).native() +
                             ", which cannot be read");
  }
  return recordedNow_;
}

PlistDate LinuxKernel::currentTime() {
  if (const auto now = recordedNow()) return *now;
  if (!host_.live()) {
    noteOnce("live sources are off and " + host_.files().place(Recordings::path(recording::kClock)).native() +
             " records no \"now\": the time is 1970-01-01");
    return PlistDate::fromUnixSeconds(0);
  }
  const timespec time = clockTime(CLOCK_REALTIME);
  const double second = static_cast<double>(time.tv_sec) - PlistDate::kUnixEpochOffset;
  const double moment = second + static_cast<double>(time.tv_nsec) * 1e-9;
  // The last moments of a second are not the first one of the next, which may be another day.
  return {moment < second + 1 ? moment : std::nextafter(second + 1, second)};
}

std::string LinuxKernel::processName() {
  return program_invocation_short_name;
}
std::int32_t LinuxKernel::processIdentifier() {
  return ::getpid();
}

}  // namespace tbdaily
