#include "report/prefix_index.h"

#include <gtest/gtest.h>

#include <random>

namespace tbdaily {
namespace {

// A scan tries the prefixes in their order; empty ones match nothing.
TEST(PrefixIndex, AgreesWithAScanOfTheList) {
  std::mt19937 random(3);
  const auto text = [&random](std::size_t longest) {
    std::string s(random() % (longest + 1), ' ');
    for (char& c : s) c = static_cast<char>("acd\xff"[random() % 4]);
    return s;
  };
  for (int round = 0; round < 200; ++round) {
    std::vector<std::string> texts;
    for (unsigned i = 0; i < random() % 40; ++i) {
      std::string candidate = text(6);
      if (std::find(texts.begin(), texts.end(), candidate) == texts.end())
        texts.push_back(std::move(candidate));
    }
    const PrefixIndex index({texts.begin(), texts.end()});
    for (int i = 0; i < 100; ++i) {
      const std::string key = text(9);
      std::optional<std::uint32_t> expected;
      for (std::uint32_t place = 0; place < texts.size() && !expected; ++place) {
        if (!texts[place].empty() && key.starts_with(texts[place])) expected = place;
      }
      ASSERT_EQ(index.firstMatch(key), expected) << key;
    }
  }
}

TEST(PrefixIndex, AChainAsDeepAsItsLongestPrefixIsNoTrouble) {
  std::vector<std::string> chain;
  for (std::size_t length = 3000; length > 0; --length) chain.emplace_back(length, 'a');
  const PrefixIndex index({chain.begin(), chain.end()});
  EXPECT_EQ(index.firstMatch(std::string(5000, 'a')), 0U);
  EXPECT_EQ(index.firstMatch("ab"), 2999U);
}

}  // namespace
}  // namespace tbdaily
