// The channels of this host's drivers: what they are called, what they count, and the readings behind each
// word.
#pragma once

#include <cstdint>
#include <initializer_list>
#include <string>
#include <string_view>
#include <vector>

#include "platform/linux/live/live_readings.h"

namespace tbdaily {

// Unit codes: the quantity in the upper 8 bits, below it the scale.
enum class LiveUnit : std::uint64_t {
  Count = 0,
  Seconds = 0x0100'0000'0000'0000,
  Milliseconds = 0x0100'007C'0000'0000,
  Microseconds = 0x0100'0079'0000'0000,
  Microwatts = 0x0200'0079'0000'0000,
  Microjoules = 0x0300'0079'0000'0000,
  Milliamperes = 0x0400'007C'0000'0000,
  Millivolts = 0x0500'007C'0000'0000,
  Bytes = 0x0900'8200'0000'0000,
  Celsius = 0x0A00'0000'0000'0000,
  Millicelsius = 0x0A00'007C'0000'0000,
  Events = 0x6400'0000'0000'0000,
  Packets = 0x6500'0000'0000'0000,
};

// What a daily run turns into keys, and what it does not.
enum class LiveCategory : std::uint16_t { Daily = 1 << 8, OnDemand = 1 << 9 };

// A sum of readings, times a factor over a divisor; held at the largest number where it is larger.
struct LiveWord {
  std::vector<Slot> slots;
  std::int64_t factor = 1, divisor = 1;

  std::int64_t of(const Readings& readings) const;
};

// One state of a channel; the only element of a simple one, whose value is its first word.
struct LiveElement {
  std::uint64_t identifier = 0;  // of a state
  LiveWord first, second;        // a value; or how often a state was entered, and the time in it
};

struct LiveChannel {
  std::string group, subgroup, name;
  LiveUnit unit = LiveUnit::Count;
  bool hasStates = false;
  std::vector<LiveElement> elements;

  // As drivers pack it: format, categories, number of elements.
  std::uint64_t type(LiveCategory category) const;
};

// The states of one channel get their identifiers in the order of their numbers: the first 8 bytes of the
// name, "stateN" where that cannot be.
class StateIdentifiers {
 public:
  std::uint64_t next(std::string_view name, std::size_t number);

 private:
  std::vector<std::uint64_t> taken_;
};

// The parts of a channel's name, with dots between them.
std::string dotted(std::initializer_list<std::string_view> parts);

// Names that differ in the number at their end alone by that: "nvme2" before "nvme10"; others in byte order.
void sortByNumber(std::vector<std::string>& names);
// What of a text can be part of a name: U+FFFD for what is no UTF-8 and for controls.
std::string liveName(std::string_view text);
// The 64-bit FNV-1a hash of the four, each followed by a zero byte, without its highest bit.
std::uint64_t liveChannelIdentifier(std::string_view driver, const LiveChannel& channel);

}  // namespace tbdaily
