#include "tools/tallyctl/whitelist_review.h"

#include "platform/file_system.h"
#include "platform/property_list_codec.h"
#include "tools/tallyctl/whitelist_lint.h"

namespace tbdaily {

PlistValue whitelistRoot(Platform& platform) {
  const auto bytes = platform.fileSystem.readFile(kWhitelistPath);
  return bytes ? platform.propertyListCodec.parse(*bytes).value : PlistValue();
}

std::unique_ptr<WhitelistReview> reviewWhitelist(const Platform& real) {
  auto review = std::make_unique<WhitelistReview>();
  Platform platform = platformWith(real, review->log);
  review->config = TBConfig::init(platform);
  if (!review->config) return review;
  review->problems = review->log.errors();
  review->isFault = !review->problems.empty();
  const PlistValue root = whitelistRoot(platform);
  if (root.asDictionary() == nullptr) return review;
  for (WhitelistOddity& oddity : whitelistOddities(*root.asDictionary())) {
    review->isFault |= oddity.isUnknownOption;
    review->problems.push_back(std::move(oddity.text));
  }
  return review;
}

}  // namespace tbdaily
