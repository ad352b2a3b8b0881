// A hash of identifiers that come from outside, for tables that must stay quick whoever chose them.
#pragma once

#include <array>
#include <cstdint>

namespace tbdaily {

// Multiplies the halves of two identifiers with numbers that each process draws anew: which of them meet in a
// table cannot be known beforehand, and any two meet no more often than by chance. Of the answer, each bit is
// as good as the others. The same for equal identifiers throughout a process, and from any thread.
class IdentifierHash {
 public:
  IdentifierHash() : seeds_(processSeeds()) {}

  std::uint32_t operator()(std::uint64_t first, std::uint64_t second) const {
    const std::uint64_t sum = (seeds_[0] + low(first)) * (seeds_[1] + high(first)) +
                              (seeds_[2] + low(second)) * (seeds_[3] + high(second)) + seeds_[4];
    return static_cast<std::uint32_t>(high(sum));
  }

 private:
  using Seeds = std::array<std::uint64_t, 5>;

  static const Seeds& processSeeds();
  static std::uint64_t low(std::uint64_t number) { return number & 0xFFFFFFFF; }
  static std::uint64_t high(std::uint64_t number) { return number >> 32; }

  Seeds seeds_;
};

}  // namespace tbdaily
