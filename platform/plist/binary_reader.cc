#include "platform/plist/binary_reader.h"

#include <algorithm>
#include <bit>
#include <limits>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/calendar.h"
#include "platform/plist/big_endian_reader.h"
#include "platform/plist/limits.h"
#include "platform/utf8.h"

namespace tbdaily {

namespace {

constexpr std::string_view kAnyMagic = "bplist", kMagic = "bplist00";
constexpr std::size_t kTrailerSize = 32;
constexpr std::uint64_t kLeastValueLimit = 1'000'000;
constexpr std::uint64_t kLeastPayloadLimit = std::uint64_t{256} << 20;

bool beginsWith(std::span<const std::byte> bytes, std::string_view text) {
  return bytes.size() >= text.size() && std::ranges::equal(bytes.first(text.size()), text, {}, {},
                                                           [](char c) { return static_cast<std::byte>(c); });
}

enum Kind : unsigned {
  kSimple = 0,
  kInteger = 1,
  kReal = 2,
  kDate = 3,
  kData = 4,
  kAscii = 5,
  kUtf16 = 6,
  kArray = 10,
  kDictionary = 13
};

struct Trailer {
  std::uint64_t offsetWidth = 0, referenceWidth = 0, objectCount = 0, rootIndex = 0, tableOffset = 0;
};

// An object that has been read, and what it comes to when it is written out in full.
struct Object {
  PlistValue value;
  std::uint64_t values = 1;   // itself and all that it holds
  std::uint64_t payload = 0;  // bytes of text, keys and data in it, as they are encoded
  int height = 0;             // levels of containers
};

std::uint64_t saturatingSum(std::uint64_t a, std::uint64_t b) {
  return a > std::numeric_limits<std::uint64_t>::max() - b ? std::numeric_limits<std::uint64_t>::max()
                                                           : a + b;
}

class BinaryReader {
 public:
  explicit BinaryReader(std::span<const std::byte> bytes)
      : whole_(bytes),
        valueLimit_(std::max<std::uint64_t>(kLeastValueLimit, bytes.size())),
        payloadLimit_(std::max<std::uint64_t>(kLeastPayloadLimit, bytes.size())) {}

  PlistParseResult parse();

 private:
  static constexpr std::uint32_t kUnread = 0, kInProgress = 1, kFirstRead = 2;

  // What has been made so far: never more than the root comes to in the end, so that its limits hold on the
  // way, too.
  struct Made {
    std::uint64_t values = 0;   // in containers
    std::uint64_t payload = 0;  // in objects of text and data
    std::uint64_t keys = 0;     // in dictionaries
  };

  // An object's marker, and where its contents begin.
  struct Marker {
    std::uint64_t offset = 0;
    unsigned kind = 0, low = 0;
    std::uint64_t contents = 0;
  };

  // The text lives in the bytes or in the value.
  struct Key {
    std::string_view text;
    std::uint64_t payload = 0;
    PlistValue value;
  };

  // Each fails at most once; nothing and false mean that it has.
  std::nullopt_t fail(std::uint64_t offset, std::string_view reason);
  bool readTrailer();
  std::string_view trailerFault() const;
  std::optional<Marker> markerOf(std::uint64_t index, std::uint64_t referrer);
  const Object* read(std::uint64_t index, std::uint64_t referrer, int depth);
  const Object* readOnce(const Marker& marker, std::uint64_t index, std::uint64_t referrer, int depth);
  std::optional<Object> readScalar(const Marker& marker);
  std::optional<Object> readSimple(const Marker& marker);
  std::optional<std::int64_t> readInteger(const Marker& marker);
  std::optional<Object> readReal(const Marker& marker);
  std::optional<Object> readDate(const Marker& marker);
  std::optional<std::uint64_t> readLength(Marker& marker);
  std::optional<std::span<const std::byte>> readBytes(Marker marker);
  std::optional<Object> readPayload(const Marker& marker);
  std::optional<std::string_view> readAscii(const Marker& marker, std::span<const std::byte> bytes);
  std::optional<std::string> readUtf16(const Marker& marker, std::span<const std::byte> bytes);
  std::optional<Object> readContainer(Marker marker, int depth);
  bool readElements(const Marker& marker, std::uint64_t count, int depth, Object& object);
  bool readEntries(const Marker& marker, std::uint64_t count, int depth, Object& object);
  std::optional<Key> readKey(std::uint64_t place, int depth);
  const Object* readReference(std::uint64_t place, int depth);
  bool addTo(Object& container, const Object& child, const Marker& marker);
  bool fitsLimits(std::uint64_t offset, const Made& more);

  BigEndianReader whole_;
  BigEndianReader objects_{std::span<const std::byte>()};  // all that lies before the trailer
  Trailer trailer_;
  std::uint64_t valueLimit_, payloadLimit_;
  Made made_;
  // Of each object of text, data or a container by its index: one of the above, from kFirstRead on its place
  // in read_.
  std::vector<std::uint32_t> states_;
  std::vector<Object> read_;
  Object
      scalar_;  // the last one that was read; what takes no room of its own is read again where it is shared
  std::string error_;
};

std::nullopt_t BinaryReader::fail(std::uint64_t offset, std::string_view reason) {
  error_ = "byte " + std::to_string(offset) + ": ";
  error_ += reason;
  return std::nullopt;
}

PlistParseResult BinaryReader::parse() {
  const Object* root =
      readTrailer() ? read(trailer_.rootIndex, whole_.bytes().size() - kTrailerSize, 0) : nullptr;
  if (root == nullptr) return {{}, std::move(error_), false};
  return {root->value, {}};
}

bool BinaryReader::readTrailer() {
  if (!beginsWith(whole_.bytes(), kMagic)) {
    fail(kAnyMagic.size(), "no version of the binary encoding that can be read");
    return false;
  }
  if (whole_.bytes().size() < kMagic.size() + kTrailerSize) {
    fail(whole_.bytes().size(), "the trailer is missing");
    return false;
  }
  const std::uint64_t begin = whole_.bytes().size() - kTrailerSize;
  objects_ = BigEndianReader(whole_.bytes().first(begin));
  const auto field = [&](std::uint64_t offset, std::uint64_t width) {
    return *whole_.unsignedAt(begin + offset, width);
  };
  trailer_ = {field(6, 1), field(7, 1), field(8, 8), field(16, 8), field(24, 8)};
  if (const std::string_view fault = trailerFault(); !fault.empty()) {
    fail(begin, fault);
    return false;
  }
  states_.resize(trailer_.objectCount, kUnread);
  return true;
}

std::string_view BinaryReader::trailerFault() const {
  const auto isWidth = [](std::uint64_t width) { return width >= 1 && width <= 8; };
  const std::uint64_t end = objects_.bytes().size();
  if (!isWidth(trailer_.offsetWidth)) return "a width of offsets other than 1 to 8";
  if (!isWidth(trailer_.referenceWidth)) return "a width of references other than 1 to 8";
  if (trailer_.tableOffset < kMagic.size() || trailer_.tableOffset > end)
    return "the offset table is outside of the buffer";
  if (trailer_.objectCount > (end - trailer_.tableOffset) / trailer_.offsetWidth)
    return "the offset table is cut off";
  if (trailer_.objectCount > std::numeric_limits<std::uint32_t>::max() - kFirstRead)
    return "too many objects";
  if (trailer_.rootIndex >= trailer_.objectCount) return "the root is no object";
  return {};
}

// `referrer` is where the index was found.
std::optional<BinaryReader::Marker> BinaryReader::markerOf(std::uint64_t index, std::uint64_t referrer) {
  if (index >= states_.size()) return fail(referrer, "a reference to no object");
  const std::uint64_t entry = trailer_.tableOffset + index * trailer_.offsetWidth;
  const std::uint64_t offset = *objects_.unsignedAt(entry, trailer_.offsetWidth);
  if (offset < kMagic.size() || offset >= objects_.bytes().size())
    return fail(entry, "an offset outside of the objects");
  const auto byte = static_cast<unsigned>(*objects_.unsignedAt(offset, 1));
  return Marker{offset, byte >> 4, byte & 15U, offset + 1};
}

// The object of that index; null after a failure. The result is borrowed until the next object is read.
const Object* BinaryReader::read(std::uint64_t index, std::uint64_t referrer, int depth) {
  const auto marker = markerOf(index, referrer);
  if (!marker) return nullptr;
  switch (marker->kind) {
    case kSimple:
    case kInteger:
    case kReal:
    case kDate: {
      auto scalar = readScalar(*marker);
      if (!scalar) return nullptr;
      scalar_ = std::move(*scalar);
      return &scalar_;
    }
    case kData:
    case kAscii:
    case kUtf16:
    case kArray:
    case kDictionary:
      return readOnce(*marker, index, referrer, depth);
    default:
      fail(marker->offset, "an unknown marker");
      return nullptr;
  }
}

const Object* BinaryReader::readOnce(const Marker& marker, std::uint64_t index, std::uint64_t referrer,
                                     int depth) {
  if (states_[index] == kInProgress) {
    fail(referrer, "an object that holds itself");
    return nullptr;
  }
  if (states_[index] == kUnread) {
    states_[index] = kInProgress;
    const bool isContainer = marker.kind == kArray || marker.kind == kDictionary;
    std::optional<Object> object = isContainer ? readContainer(marker, depth) : readPayload(marker);
    if (!object) return nullptr;
    states_[index] = static_cast<std::uint32_t>(read_.size()) + kFirstRead;
    read_.push_back(std::move(*object));
  }
  return &read_[states_[index] - kFirstRead];
}

std::optional<Object> BinaryReader::readScalar(const Marker& marker) {
  if (marker.kind == kSimple) return readSimple(marker);
  if (marker.kind == kReal) return readReal(marker);
  if (marker.kind == kDate) return readDate(marker);
  const auto value = readInteger(marker);
  return value ? std::optional(Object{PlistValue::int64(*value)}) : std::nullopt;
}

std::optional<Object> BinaryReader::readSimple(const Marker& marker) {
  if (marker.low != 8 && marker.low != 9) return fail(marker.offset, "an unknown marker");
  return Object{PlistValue::boolean(marker.low == 9)};
}

// One, two and four bytes are unsigned, eight and sixteen signed.
std::optional<std::int64_t> BinaryReader::readInteger(const Marker& marker) {
  if (marker.kind != kInteger || marker.low > 4) return fail(marker.offset, "an unknown marker");
  const std::uint64_t width = std::uint64_t{1} << marker.low;
  if (!objects_.slice(marker.contents, width)) return fail(marker.offset, "an integer that is cut off");
  if (width < 16) return static_cast<std::int64_t>(*objects_.unsignedAt(marker.contents, width));
  const auto value = static_cast<std::int64_t>(*objects_.unsignedAt(marker.contents + 8, 8));
  const std::uint64_t extension = value < 0 ? std::numeric_limits<std::uint64_t>::max() : 0;
  if (*objects_.unsignedAt(marker.contents, 8) != extension)
    return fail(marker.offset, "an integer of more than 64 bits");
  return value;
}

std::optional<Object> BinaryReader::readReal(const Marker& marker) {
  if (marker.low != 2 && marker.low != 3) return fail(marker.offset, "an unknown marker");
  const auto bits = objects_.unsignedAt(marker.contents, std::uint64_t{1} << marker.low);
  if (!bits) return fail(marker.offset, "a real number that is cut off");
  if (marker.low == 3) return Object{PlistValue::float64(std::bit_cast<double>(*bits))};
  return Object{PlistValue::float32(std::bit_cast<float>(static_cast<std::uint32_t>(*bits)))};
}

std::optional<Object> BinaryReader::readDate(const Marker& marker) {
  if (marker.low != 3) return fail(marker.offset, "an unknown marker");
  const auto bits = objects_.unsignedAt(marker.contents, 8);
  if (!bits) return fail(marker.offset, "a date that is cut off");
  const PlistDate date{std::bit_cast<double>(*bits)};
  if (!isRepresentable(date)) return fail(marker.offset, "a date outside of the calendar");
  return Object{PlistValue(date)};
}

// The length in the marker, or in the integer object behind it, which is then passed over.
std::optional<std::uint64_t> BinaryReader::readLength(Marker& marker) {
  if (marker.low < 15) return marker.low;
  const auto byte = objects_.unsignedAt(marker.contents, 1);
  if (!byte) return fail(marker.offset, "a length that is cut off");
  const Marker length{marker.contents, static_cast<unsigned>(*byte) >> 4, static_cast<unsigned>(*byte) & 15U,
                      marker.contents + 1};
  const auto value = readInteger(length);
  if (!value) return std::nullopt;
  if (*value < 0) return fail(length.offset, "a negative length");
  marker.contents = length.contents + (std::uint64_t{1} << length.low);
  return static_cast<std::uint64_t>(*value);
}

// Of text or data.
std::optional<std::span<const std::byte>> BinaryReader::readBytes(Marker marker) {
  const auto length = readLength(marker);
  if (!length) return std::nullopt;
  const std::uint64_t unit = marker.kind == kUtf16 ? 2 : 1;
  const auto bytes =
      *length > objects_.bytes().size() ? std::nullopt : objects_.slice(marker.contents, *length * unit);
  if (!bytes) return fail(marker.offset, "text or data that is cut off");
  return bytes;
}

std::optional<Object> BinaryReader::readPayload(const Marker& marker) {
  const auto bytes = readBytes(marker);
  if (!bytes || !fitsLimits(marker.offset, {.payload = bytes->size()})) return std::nullopt;
  if (marker.kind == kData)
    return Object{PlistValue::data(PlistData(bytes->begin(), bytes->end())), 1, bytes->size()};
  std::optional<std::string> text;
  if (marker.kind == kAscii) {
    text = readAscii(marker, *bytes);
  } else {
    text = readUtf16(marker, *bytes);
  }
  if (!text) return std::nullopt;
  return Object{PlistValue::string(std::move(*text)), 1, bytes->size()};
}

// Borrowed from the bytes.
std::optional<std::string_view> BinaryReader::readAscii(const Marker& marker,
                                                        std::span<const std::byte> bytes) {
  const std::string_view text(reinterpret_cast<const char*>(bytes.data()), bytes.size());
  std::byte seen{0};
  for (const std::byte byte : bytes) seen |= byte;
  if ((seen & std::byte{0x80}) != std::byte{0}) return fail(marker.offset, "a character outside of ASCII");
  return text;
}

std::optional<std::string> BinaryReader::readUtf16(const Marker& marker, std::span<const std::byte> bytes) {
  std::string text;
  text.reserve(bytes.size());
  const auto unitAt = [bytes](std::size_t i) {
    return i < bytes.size()
               ? std::to_integer<char32_t>(bytes[i]) << 8 | std::to_integer<char32_t>(bytes[i + 1])
               : U'\0';
  };
  for (std::size_t i = 0; i < bytes.size(); i += 2) {
    char32_t codePoint = unitAt(i);
    if (codePoint >= 0xD800 && codePoint < 0xE000) {
      const char32_t low = unitAt(i + 2);
      if (codePoint >= 0xDC00 || low < 0xDC00 || low >= 0xE000)
        return fail(marker.offset, "half of a surrogate pair");
      codePoint = 0x10000 + ((codePoint - 0xD800) << 10) + (low - 0xDC00);
      i += 2;
    }
    appendUtf8(text, codePoint);
  }
  return text;
}

std::optional<Object> BinaryReader::readContainer(Marker marker, int depth) {
  if (depth == kPlistNestingLimit) return fail(marker.offset, kPlistNestingError);
  const auto count = readLength(marker);
  if (!count) return std::nullopt;
  const std::uint64_t references = marker.kind == kDictionary ? 2 : 1;
  if (*count > objects_.bytes().size() ||
      !objects_.slice(marker.contents, *count * references * trailer_.referenceWidth)) {
    return fail(marker.offset, "references that are cut off");
  }
  if (!fitsLimits(marker.offset, {.values = *count})) return std::nullopt;
  Object object;
  object.height = 1;
  const bool ok = marker.kind == kDictionary ? readEntries(marker, *count, depth, object)
                                             : readElements(marker, *count, depth, object);
  return ok ? std::optional(std::move(object)) : std::nullopt;
}

bool BinaryReader::readElements(const Marker& marker, std::uint64_t count, int depth, Object& object) {
  PlistArray elements;
  elements.reserve(count);
  for (std::uint64_t i = 0; i < count; ++i) {
    const Object* element = readReference(marker.contents + i * trailer_.referenceWidth, depth + 1);
    if (element == nullptr || !addTo(object, *element, marker)) return false;
    elements.push_back(element->value);
  }
  object.value = PlistValue::array(std::move(elements));
  return true;
}

bool BinaryReader::readEntries(const Marker& marker, std::uint64_t count, int depth, Object& object) {
  std::vector<PlistDictionary::Entry> entries;
  entries.reserve(count);
  for (std::uint64_t i = 0; i < count; ++i) {
    const std::uint64_t place = marker.contents + i * trailer_.referenceWidth;
    const auto key = readKey(place, depth + 1);
    if (!key) return false;
    object.payload = saturatingSum(object.payload, key->payload);
    if (!fitsLimits(place, {.keys = key->payload})) return false;
    const Object* value = readReference(place + count * trailer_.referenceWidth, depth + 1);
    if (value == nullptr || !addTo(object, *value, marker)) return false;
    entries.emplace_back(key->text, value->value);
  }
  object.value = PlistValue::dictionary(PlistDictionary(std::move(entries)));
  return true;
}

std::optional<BinaryReader::Key> BinaryReader::readKey(std::uint64_t place, int depth) {
  const std::uint64_t index = *objects_.unsignedAt(place, trailer_.referenceWidth);
  const auto marker = markerOf(index, place);
  if (!marker) return std::nullopt;
  if (marker->kind == kAscii) {
    const auto bytes = readBytes(*marker);
    const auto text = bytes ? readAscii(*marker, *bytes) : std::nullopt;
    return text ? std::optional(Key{*text, text->size(), {}}) : std::nullopt;
  }
  const Object* object = read(index, place, depth);
  if (object == nullptr) return std::nullopt;
  Key key{{}, object->payload, object->value};
  const auto text = key.value.asString();
  if (!text) return fail(place, "a key that is no string");
  key.text = *text;
  return key;
}

const Object* BinaryReader::readReference(std::uint64_t place, int depth) {
  return read(*objects_.unsignedAt(place, trailer_.referenceWidth), place, depth);
}

// Counts the child into what the container comes to.
bool BinaryReader::addTo(Object& container, const Object& child, const Marker& marker) {
  container.values = saturatingSum(container.values, child.values);
  container.payload = saturatingSum(container.payload, child.payload);
  container.height = std::max(container.height, child.height + 1);
  if (container.height > kPlistNestingLimit) {
    fail(marker.offset, kPlistNestingError);
    return false;
  }
  if (container.values <= valueLimit_ && container.payload <= payloadLimit_) return true;
  fail(marker.offset, "shared objects that come to too much when written out");
  return false;
}

// Counts what is about to be made.
bool BinaryReader::fitsLimits(std::uint64_t offset, const Made& more) {
  made_.values = saturatingSum(made_.values, more.values);
  made_.payload = saturatingSum(made_.payload, more.payload);
  made_.keys = saturatingSum(made_.keys, more.keys);
  if (made_.values <= valueLimit_ && made_.payload <= payloadLimit_ && made_.keys <= payloadLimit_)
    return true;
  fail(offset, "objects that share their bytes and come to too much");
  return false;
}

}  // namespace

bool isBinaryPlist(std::span<const std::byte> bytes) {
  return beginsWith(bytes, kAnyMagic);
}

PlistParseResult parseBinaryPlist(std::span<const std::byte> bytes) {
  return BinaryReader(bytes).parse();
}

}  // namespace tbdaily
