#include "platform/identifier_hash.h"

#include <random>

namespace tbdaily {

const IdentifierHash::Seeds& IdentifierHash::processSeeds() {
  static const Seeds seeds = [] {
    std::random_device random;
    Seeds drawn;
    for (std::uint64_t& seed : drawn) seed = std::uint64_t{random()} << 32 | random();
    return drawn;
  }();
  return seeds;
}

}  // namespace tbdaily
