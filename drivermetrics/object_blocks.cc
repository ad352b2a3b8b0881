// What is done once for a block, apart from what is done for each object in it.

#include "drivermetrics/object_blocks.h"

#include <algorithm>

namespace kdreport {

template <typename Block>
void KeptBlocks<Block>::keepAnother(Block& block) {
  if (last_ != nullptr) earlier_.push_back(std::move(last_));
  last_ = block.shared_from_this();
}
template class KeptBlocks<SourceBlock>;
template class KeptBlocks<RecordBlock>;
template class KeptBlocks<ElementBlock>;

template <typename Block>
void Blocks<Block>::begin(std::shared_ptr<Block> block) {
  block_ = std::move(block);
  size_ = std::clamp<std::size_t>(std::max(expected_, 2 * size_), 1, kMostInBlock);
  block_->objects.reserve(size_);
}
template class Blocks<SourceBlock>;
template class Blocks<RecordBlock>;

void ElementBlocks::begin(std::size_t atLeast) {
  size_ = std::max(std::clamp(size_ * 2, kSmallestBlock, kLargestBlock), atLeast);
  block_ = std::make_shared<ElementBlock>(size_);
  free_ = {block_->bytes.get(), size_};
}

}  // namespace kdreport
