// A hash of names and identifiers that come from outside, for tables that must stay quick whoever chose them.
#pragma once

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstring>
#include <random>
#include <string_view>

namespace tbdaily {

// A number that nobody outside can know. Asked of the system: asking the processor takes as long as the work
// of a short run where that is a virtual one.
inline std::uint64_t drawSeed() {
#ifdef __GLIBCXX__
  std::random_device random("getentropy");
#else
  std::random_device random;
#endif
  return std::uint64_t{random()} << 32 | random();
}

// Multiplies the halves of words with numbers that each process draws anew: which keys meet in a table cannot
// be known beforehand, and any two meet no more often than by chance. Of the answer, each bit is as good as
// the others. The same for equal keys throughout a process, and from any thread.
class KeyedHash {
 public:
  static std::uint32_t of(std::uint64_t first, std::uint64_t second) {
    const Numbers& drawn = numbers();
    return upperHalf(product(drawn, 0, first) + product(drawn, 1, second) + drawn.back());
  }

  static std::uint32_t of(std::string_view text) {
    const Numbers& drawn = numbers();
    std::uint64_t hash = text.size();
    do {
      // A block of words; the first one is what came before.
      std::uint64_t sum = product(drawn, 0, hash) + drawn.back();
      for (std::size_t i = 1; i < kWords && !text.empty(); ++i) {
        std::uint64_t word = 0;
        const std::size_t bytes = std::min(text.size(), sizeof word);
        std::memcpy(&word, text.data(), bytes);
        text.remove_prefix(bytes);
        sum += product(drawn, i, word);
      }
      hash = sum;
    } while (!text.empty());
    return upperHalf(hash);
  }

 private:
  static constexpr std::size_t kWords = 16;
  using Numbers = std::array<std::uint64_t, 2 * kWords + 1>;

  static const Numbers& numbers() {
    static const Numbers drawn = [] {
      std::mt19937_64 random(drawSeed());
      Numbers numbers;
      for (std::uint64_t& number : numbers) number = random();
      return numbers;
    }();
    return drawn;
  }
  static std::uint64_t product(const Numbers& drawn, std::size_t place, std::uint64_t word) {
    return (drawn[2 * place] + (word & 0xFFFFFFFF)) * (drawn[2 * place + 1] + (word >> 32));
  }
  static std::uint32_t upperHalf(std::uint64_t sum) { return static_cast<std::uint32_t>(sum >> 32); }
};

}  // namespace tbdaily
