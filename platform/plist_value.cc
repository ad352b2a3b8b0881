#include "platform/plist_value.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <limits>
#include <utility>

#include "platform/keyed_hash.h"

namespace tbdaily {

std::int64_t saturatingInt64(double value) {
  constexpr double kTwoTo63 = 9223372036854775808.0;
  if (std::isnan(value)) return 0;
  if (value >= kTwoTo63) return std::numeric_limits<std::int64_t>::max();
  if (value < -kTwoTo63) return std::numeric_limits<std::int64_t>::min();
  return static_cast<std::int64_t>(value);
}

std::int64_t PlistNumber::toInt64() const {
  return isReal() ? saturatingInt64(real_) : integer_;
}

std::uint64_t PlistNumber::toUInt64() const {
  constexpr double kTwoTo63 = 9223372036854775808.0;
  if (!isReal() || !(real_ >= kTwoTo63)) return static_cast<std::uint64_t>(toInt64());
  if (real_ >= 2 * kTwoTo63) return std::numeric_limits<std::uint64_t>::max();
  return static_cast<std::uint64_t>(real_);
}

bool operator==(const PlistNumber& a, const PlistNumber& b) {
  if (a.kind_ != b.kind_) return false;
  if (!a.isReal()) return a.integer_ == b.integer_;
  if (std::isnan(a.real_) || std::isnan(b.real_)) return std::isnan(a.real_) && std::isnan(b.real_);
  return std::bit_cast<std::uint64_t>(a.real_) == std::bit_cast<std::uint64_t>(b.real_);
}

PlistValue PlistValue::boolean(bool v) {
  PlistValue value;
  value.value_ = v;
  return value;
}

PlistValue PlistValue::string(std::string text) {
  PlistValue value;
  value.value_ = std::make_shared<const std::string>(std::move(text));
  return value;
}

PlistValue PlistValue::data(PlistData bytes) {
  PlistValue value;
  value.value_ = std::make_shared<const PlistData>(std::move(bytes));
  return value;
}

PlistValue PlistValue::array(PlistArray elements) {
  PlistValue value;
  value.value_ = std::make_shared<const PlistArray>(std::move(elements));
  return value;
}

PlistValue PlistValue::dictionary(PlistDictionary entries) {
  PlistValue value;
  value.value_ = std::make_shared<const PlistDictionary>(std::move(entries));
  return value;
}

namespace {
template <typename T, typename Variant>
std::optional<T> scalarOf(const Variant& value) {
  const T* held = std::get_if<T>(&value);
  return held != nullptr ? std::optional<T>(*held) : std::nullopt;
}
}  // namespace

std::optional<bool> PlistValue::asBoolean() const {
  return scalarOf<bool>(value_);
}
std::optional<PlistNumber> PlistValue::asNumber() const {
  return scalarOf<PlistNumber>(value_);
}
std::optional<PlistDate> PlistValue::asDate() const {
  return scalarOf<PlistDate>(value_);
}

std::optional<std::int64_t> PlistValue::asInteger() const {
  const auto* number = std::get_if<PlistNumber>(&value_);
  if (number == nullptr || number->isReal()) return std::nullopt;
  return number->toInt64();
}

std::optional<std::string_view> PlistValue::asString() const {
  const Text* text = std::get_if<Text>(&value_);
  return text != nullptr ? std::optional<std::string_view>(**text) : std::nullopt;
}

std::optional<std::span<const std::byte>> PlistValue::asData() const {
  const Bytes* bytes = std::get_if<Bytes>(&value_);
  return bytes != nullptr ? std::optional<std::span<const std::byte>>(**bytes) : std::nullopt;
}

const PlistArray* PlistValue::asArray() const {
  const Elements* elements = std::get_if<Elements>(&value_);
  return elements != nullptr ? elements->get() : nullptr;
}

const PlistDictionary* PlistValue::asDictionary() const {
  const Entries* entries = std::get_if<Entries>(&value_);
  return entries != nullptr ? entries->get() : nullptr;
}

PlistValue PlistValue::get(std::string_view key) const {
  const PlistDictionary* dictionary = asDictionary();
  return dictionary != nullptr ? dictionary->get(key) : PlistValue();
}

PlistDictionary PlistValue::mutableDictionary() const {
  const PlistDictionary* dictionary = asDictionary();
  return dictionary != nullptr ? *dictionary : PlistDictionary();
}

bool operator==(const PlistValue& a, const PlistValue& b) {
  if (a.value_.index() != b.value_.index()) return false;
  return std::visit(
      [&b](const auto& left) {
        using T = std::decay_t<decltype(left)>;
        const T& right = std::get<T>(b.value_);
        if constexpr (requires { *left; }) {
          return left == right || *left == *right;
        } else {
          return left == right;
        }
      },
      a.value_);
}

PlistDictionary::PlistDictionary(std::initializer_list<Entry> entries) {
  for (const Entry& entry : entries) set(entry.first, entry.second);
}

PlistDictionary::PlistDictionary(std::vector<Entry> entries) : entries_(std::move(entries)) {
  if (makeIndex()) return;
  std::vector<Entry> repeated = std::exchange(entries_, {});
  slots_.clear();
  for (Entry& entry : repeated) set(entry.first, std::move(entry.second));
}

std::size_t PlistDictionary::indexOf(std::string_view key) const {
  return indexOf(key, slots_.empty() ? 0 : KeyedHash::of(key));
}

std::size_t PlistDictionary::indexOf(std::string_view key, std::uint32_t hash) const {
  if (slots_.empty()) {
    for (std::size_t i = 0; i < entries_.size(); ++i) {
      if (entries_[i].first == key) return i;
    }
    return kNoEntry;
  }
  const std::size_t mask = slots_.size() - 1;
  for (std::size_t slot = hash & mask; slots_[slot].entry != 0; slot = (slot + 1) & mask) {
    const std::size_t entry = slots_[slot].entry - 1;
    if (slots_[slot].hash == hash && entries_[entry].first == key) return entry;
  }
  return kNoEntry;
}

void PlistDictionary::place(std::vector<Slot>& slots, const Slot& filled) {
  const std::size_t mask = slots.size() - 1;
  std::size_t slot = filled.hash & mask;
  while (slots[slot].entry != 0) slot = (slot + 1) & mask;
  slots[slot] = filled;
}

// Of all entries; false where a key comes twice.
bool PlistDictionary::makeIndex() {
  slots_.clear();  // without an index, should there be no memory for one, keys are searched in order
  const std::size_t count = entries_.size();
  if (count < kIndexFrom) {
    for (std::size_t i = 1; i < count; ++i) {
      for (std::size_t before = 0; before < i; ++before) {
        if (entries_[before].first == entries_[i].first) return false;
      }
    }
    return true;
  }
  std::vector<std::uint32_t> hashes(count);
  std::ranges::transform(entries_, hashes.begin(),
                         [](const Entry& entry) { return KeyedHash::of(entry.first); });
  slots_.assign(std::bit_ceil(count + count / 2), {});
  const std::size_t mask = slots_.size() - 1;
  for (std::size_t i = 0; i < count; ++i) {
    // The index of many entries is not in the caches: the places of the next ones are fetched meanwhile.
    constexpr std::size_t kAhead = 16;
    if (i + kAhead < count) __builtin_prefetch(&slots_[hashes[i + kAhead] & mask], 1);
    std::size_t slot = hashes[i] & mask;
    for (; slots_[slot].entry != 0; slot = (slot + 1) & mask) {
      if (slots_[slot].hash == hashes[i] && entries_[slots_[slot].entry - 1].first == entries_[i].first)
        return false;
    }
    slots_[slot] = {hashes[i], static_cast<std::uint32_t>(i + 1)};
  }
  return true;
}

const PlistValue* PlistDictionary::find(std::string_view key) const {
  const std::size_t entry = indexOf(key);
  return entry == kNoEntry ? nullptr : &entries_[entry].second;
}

std::optional<std::size_t> PlistDictionary::positionOf(std::string_view key) const {
  const std::size_t entry = indexOf(key);
  return entry == kNoEntry ? std::nullopt : std::optional(entry);
}

PlistValue PlistDictionary::get(std::string_view key) const {
  const PlistValue* value = find(key);
  return value != nullptr ? *value : PlistValue();
}

void PlistDictionary::set(std::string_view key, PlistValue value) {
  if (value.isNone()) return remove(key);
  const std::uint32_t hash = slots_.empty() ? 0 : KeyedHash::of(key);
  const std::size_t entry = indexOf(key, hash);
  if (entry != kNoEntry) {
    entries_[entry].second = std::move(value);
    return;
  }
  // What may run out of memory comes first: the dictionary has the entry and its index, or neither.
  const std::size_t count = entries_.size() + 1;
  const bool isIndexFull = count >= kIndexFrom && count * 4 > slots_.size() * 3;
  std::vector<Slot> larger(isIndexFull ? std::bit_ceil(count * 2) : 0);
  entries_.emplace_back(std::string(key), std::move(value));
  if (slots_.empty() && isIndexFull) {
    slots_ = std::move(larger);
    for (std::size_t i = 0; i < count; ++i)
      place(slots_, {KeyedHash::of(entries_[i].first), static_cast<std::uint32_t>(i + 1)});
    return;
  }
  if (isIndexFull) {
    for (const Slot& slot : slots_) {
      if (slot.entry != 0) place(larger, slot);
    }
    slots_ = std::move(larger);
  }
  if (!slots_.empty()) place(slots_, {hash, static_cast<std::uint32_t>(count)});
}

void PlistDictionary::remove(std::string_view key) {
  const std::size_t entry = indexOf(key);
  if (entry == kNoEntry) return;
  entries_.erase(entries_.begin() + static_cast<std::ptrdiff_t>(entry));
  makeIndex();
}

bool operator==(const PlistDictionary& a, const PlistDictionary& b) {
  if (a.size() != b.size()) return false;
  for (const auto& [key, value] : a) {
    const PlistValue* other = b.find(key);
    if (other == nullptr || !(*other == value)) return false;
  }
  return true;
}

}  // namespace tbdaily
