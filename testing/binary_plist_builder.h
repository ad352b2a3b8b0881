// Builds binary property lists from objects that the caller encodes, sound ones and others.
#pragma once

#include <bit>
#include <cstdint>
#include <initializer_list>
#include <string>
#include <string_view>
#include <vector>

namespace tbdaily::testing {

// `width` bytes, the highest first.
inline std::string bigEndian(std::uint64_t value, unsigned width) {
  std::string bytes;
  while (width-- > 0) bytes += static_cast<char>(width < 8 ? value >> (8 * width) & 255U : 0U);
  return bytes;
}

class BinaryPlistBuilder {
 public:
  // The index of the object. Object 0 is the root.
  std::size_t add(std::string object) {
    objects_.push_back(std::move(object));
    return objects_.size() - 1;
  }
  void replace(std::size_t index, std::string object) { objects_[index] = std::move(object); }

  std::string build() const {
    std::string bytes = "bplist00", table;
    for (const std::string& object : objects_) {
      table += bigEndian(bytes.size(), kOffsetWidth);
      bytes += object;
    }
    const std::size_t tableOffset = bytes.size();
    return bytes + table + trailer(kOffsetWidth, kReferenceWidth, objects_.size(), 0, tableOffset);
  }

  static std::string trailer(unsigned offsetWidth, unsigned referenceWidth, std::uint64_t count,
                             std::uint64_t root, std::uint64_t tableOffset) {
    return std::string(6, '\0') + bigEndian(offsetWidth, 1) + bigEndian(referenceWidth, 1) +
           bigEndian(count, 8) + bigEndian(root, 8) + bigEndian(tableOffset, 8);
  }
  static std::string marker(unsigned kind, std::uint64_t length) {
    if (length < 15) return bigEndian(kind << 4 | length, 1);
    return bigEndian(kind << 4 | 15U, 1) + "\x12" + bigEndian(length, 4);
  }
  static std::string integer(std::int64_t value) {
    return std::string("\x13").append(bigEndian(static_cast<std::uint64_t>(value), 8));
  }
  static std::string real(double value) {
    return std::string("\x23").append(bigEndian(std::bit_cast<std::uint64_t>(value), 8));
  }
  static std::string ascii(std::string_view text) { return marker(5, text.size()).append(text); }
  static std::string array(const std::vector<std::size_t>& references) {
    return marker(10, references.size()) + encoded(references);
  }
  static std::string dictionary(const std::vector<std::size_t>& keys,
                                const std::vector<std::size_t>& values) {
    return marker(13, keys.size()) + encoded(keys) + encoded(values);
  }

 private:
  static constexpr unsigned kOffsetWidth = 4, kReferenceWidth = 3;

  static std::string encoded(const std::vector<std::size_t>& references) {
    std::string bytes;
    for (const std::size_t reference : references) bytes += bigEndian(reference, kReferenceWidth);
    return bytes;
  }

  std::vector<std::string> objects_;
};

}  // namespace tbdaily::testing
