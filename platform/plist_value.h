// PlistValue: the one type for structured values that cross the platform interfaces.
//
// Scalars are held by value; strings, data, arrays and dictionaries are shared and immutable, so a copy costs
// a reference count at most and may be handed to another thread. To change a container, take a mutable copy
// of it (PlistDictionary and PlistArray are ordinary value types), change that, and make a new PlistValue of
// it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

namespace tbdaily {

class PlistDictionary;
class PlistValue;

using PlistArray = std::vector<PlistValue>;
using PlistData = std::vector<std::byte>;

// A point in time, in seconds since 2001-01-01T00:00:00Z (the epoch of both property-list encodings).
struct PlistDate {
  static constexpr double kUnixEpochOffset = 978307200.0;  // 2001-01-01 minus 1970-01-01, in seconds

  double secondsSinceReference = 0;

  static PlistDate fromUnixSeconds(double seconds) { return {seconds - kUnixEpochOffset}; }
  double unixSeconds() const { return secondsSinceReference + kUnixEpochOffset; }
  friend bool operator==(const PlistDate&, const PlistDate&) = default;
};

// The width that a number was made with. Readers rarely care; the NAND log formats each kind differently.
enum class NumberKind : std::uint8_t { SInt8, SInt32, SInt64, Float32, Float64 };

class PlistNumber {
 public:
  static PlistNumber int8(std::int8_t v) { return {NumberKind::SInt8, std::int64_t{v}}; }
  static PlistNumber int32(std::int32_t v) { return {NumberKind::SInt32, std::int64_t{v}}; }
  static PlistNumber int64(std::int64_t v) { return {NumberKind::SInt64, v}; }
  static PlistNumber float32(float v) { return {NumberKind::Float32, static_cast<double>(v)}; }
  static PlistNumber float64(double v) { return {NumberKind::Float64, v}; }

  NumberKind kind() const { return kind_; }
  bool isReal() const { return kind_ == NumberKind::Float32 || kind_ == NumberKind::Float64; }

  // The value as a signed 64-bit integer: a real loses its fraction, saturates at both ends, and reads as 0
  // when it is not a number.
  std::int64_t toInt64() const;
  // The value as an unsigned 64-bit integer: a negative value as its two's complement, a real as for toInt64
  // (from 2^63 up to 2^64 in full).
  std::uint64_t toUInt64() const;
  double toDouble() const { return isReal() ? real_ : static_cast<double>(integer_); }

  // Equal in value and in kind; two reals that are not numbers are equal, 0.0 and -0.0 are not.
  friend bool operator==(const PlistNumber& a, const PlistNumber& b);

 private:
  PlistNumber(NumberKind kind, std::int64_t v) : kind_(kind), integer_(v) {}
  PlistNumber(NumberKind kind, double v) : kind_(kind), real_(v) {}

  NumberKind kind_;
  union {
    std::int64_t integer_;
    double real_;
  };
};

// Drops the fraction of a real (towards zero); saturates at the ends of the range; a value that is not a
// number gives 0.
std::int64_t saturatingInt64(double value);

class PlistValue {
 public:
  PlistValue() = default;  // none: an absent value, which differs from an empty string, array or dictionary

  // The named makers below exist where an implicit conversion could pick the wrong kind.
  static PlistValue boolean(bool v);
  static PlistValue int8(std::int8_t v) { return PlistValue(PlistNumber::int8(v)); }
  static PlistValue int32(std::int32_t v) { return PlistValue(PlistNumber::int32(v)); }
  static PlistValue int64(std::int64_t v) { return PlistValue(PlistNumber::int64(v)); }
  static PlistValue float32(float v) { return PlistValue(PlistNumber::float32(v)); }
  static PlistValue float64(double v) { return PlistValue(PlistNumber::float64(v)); }
  static PlistValue string(std::string text);  // UTF-8
  static PlistValue data(PlistData bytes);
  static PlistValue array(PlistArray elements);
  static PlistValue dictionary(PlistDictionary entries);
  explicit PlistValue(PlistNumber v) : value_(v) {}
  explicit PlistValue(PlistDate v) : value_(v) {}

  bool isNone() const { return std::holds_alternative<std::monostate>(value_); }
  explicit operator bool() const { return !isNone(); }

  // Typed access: none (or a null pointer) when the value is of another kind. Views and pointers are
  // borrowed: they live as long as this value or any copy of it.
  std::optional<bool> asBoolean() const;
  std::optional<PlistNumber> asNumber() const;
  std::optional<std::int64_t> asInteger() const;  // integer kinds only
  std::optional<PlistDate> asDate() const;
  std::optional<std::string_view> asString() const;
  std::optional<std::span<const std::byte>> asData() const;
  const PlistArray* asArray() const;
  const PlistDictionary* asDictionary() const;
  // The value of the key; none unless this is a dictionary that has it.
  PlistValue get(std::string_view key) const;
  // A copy to change; an empty one unless this is a dictionary.
  PlistDictionary mutableDictionary() const;

  // Same kind and equal contents. Dictionaries are equal when they hold equal entries, in whatever order.
  // Nesting is limited by the codec's reader, not here.
  friend bool operator==(const PlistValue& a, const PlistValue& b);

 private:
  using Text = std::shared_ptr<const std::string>;
  using Bytes = std::shared_ptr<const PlistData>;
  using Elements = std::shared_ptr<const PlistArray>;
  using Entries = std::shared_ptr<const PlistDictionary>;
  std::variant<std::monostate, bool, PlistNumber, PlistDate, Text, Bytes, Elements, Entries> value_;
};

// String keys to values, in the order in which the keys were first set. Look-ups cost the length of the key.
class PlistDictionary {
 public:
  using Entry = std::pair<std::string, PlistValue>;

  PlistDictionary() = default;
  PlistDictionary(std::initializer_list<Entry> entries);
  // All at once, in their order and none of them without a value; as if each had been set, and much faster.
  explicit PlistDictionary(std::vector<Entry> entries);

  // The value of the key, or null. Borrowed until the dictionary changes.
  const PlistValue* find(std::string_view key) const;
  // The value of the key, or none.
  PlistValue get(std::string_view key) const;
  // A copy to change; an empty one unless this is a dictionary.
  PlistDictionary mutableDictionary() const;
  bool contains(std::string_view key) const { return find(key) != nullptr; }
  // The key's place in the order of the keys.
  std::optional<std::size_t> positionOf(std::string_view key) const;
  const Entry& at(std::size_t position) const { return entries_[position]; }

  // A key that is there keeps its place and takes the new value. A none value removes the key.
  void set(std::string_view key, PlistValue value);
  void remove(std::string_view key);
  // Removes every key for which the predicate holds, at the cost of one pass.
  template <typename Predicate>
  void removeIf(const Predicate& isRemoved) {
    std::erase_if(entries_,
                  [&isRemoved](const Entry& entry) { return isRemoved(std::string_view(entry.first)); });
    makeIndex();
  }

  bool empty() const { return entries_.empty(); }
  std::size_t size() const { return entries_.size(); }
  void reserve(std::size_t n) { entries_.reserve(n); }
  std::vector<Entry>::const_iterator begin() const { return entries_.begin(); }
  std::vector<Entry>::const_iterator end() const { return entries_.end(); }

  friend bool operator==(const PlistDictionary& a, const PlistDictionary& b);

 private:
  static constexpr std::size_t kNoEntry = static_cast<std::size_t>(-1);
  static constexpr std::size_t kIndexFrom = 9;  // smaller dictionaries are searched in order

  struct Slot {
    std::uint32_t hash = 0;   // tells most other keys apart without a look at them
    std::uint32_t entry = 0;  // number plus 1; 0 is free
  };

  std::size_t indexOf(std::string_view key) const;
  std::size_t indexOf(std::string_view key, std::uint32_t hash) const;
  static void place(std::vector<Slot>& slots, const Slot& filled);
  bool makeIndex();

  std::vector<Entry> entries_;
  std::vector<Slot> slots_;  // open addressing over entries_; a power of two long
};

}  // namespace tbdaily
