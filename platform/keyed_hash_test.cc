#include "platform/keyed_hash.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <set>
#include <string>

namespace tbdaily {
namespace {

// Keys that are alike in all but one bit, at every length and place.
TEST(KeyedHash, TellsAlikeKeysApart) {
  std::set<std::uint32_t> hashes;
  std::size_t keys = 0;
  for (std::size_t length = 0; length < 300; ++length) {
    std::string key(length, '\0');
    hashes.insert(KeyedHash::of(key));
    hashes.insert(KeyedHash::of(length, 0));
    for (char& c : key) {
      c = 1;
      hashes.insert(KeyedHash::of(key));
      c = 0;
    }
    keys += length + 2;
    EXPECT_EQ(KeyedHash::of(key), KeyedHash::of(std::string(length, '\0')));
  }
  EXPECT_GT(hashes.size(), keys - 50);
}

TEST(KeyedHash, SpreadsIdentifiersWhoeverChoseThem) {
  // Multiples that meet in one place where identifiers are spread by the usual multiplication, by 2^64 over
  // the golden ratio: they are of its inverse.
  constexpr std::uint64_t kInverse = 0xF1DE83E19937733D;
  std::array<int, 4096> places{};
  for (std::uint64_t i = 1; i <= places.size(); ++i) ++places[KeyedHash::of(0, i * kInverse) % places.size()];
  EXPECT_LT(*std::ranges::max_element(places), 20);
}

}  // namespace
}  // namespace tbdaily
