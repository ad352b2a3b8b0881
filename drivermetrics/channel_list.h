// The channels of one level of a collection.
#pragma once

#include <vector>

#include "drivermetrics/object_blocks.h"

namespace kdreport {

// Channels in their order; null ones stand for what is no channel. Keeps alive the blocks they lie in.
class ChannelList {
 public:
  void reserve(std::size_t n) { channels_.reserve(n); }
  void add(ChannelRecord* channel) {
    if (channel != nullptr) blocks_.keep(*channel->block);
    channels_.push_back(channel);
  }
  void swap(std::size_t one, std::size_t other) { std::swap(channels_[one], channels_[other]); }
  // The channels from `begin` up to `end`.
  void erase(std::size_t begin, std::size_t end);

  bool empty() const { return channels_.empty(); }
  std::size_t size() const { return channels_.size(); }
  ChannelRecord* operator[](std::size_t index) const { return channels_[index]; }
  std::vector<ChannelRecord*>::const_iterator begin() const { return channels_.begin(); }
  std::vector<ChannelRecord*>::const_iterator end() const { return channels_.end(); }

 private:
  std::vector<ChannelRecord*> channels_;
  KeptBlocks<RecordBlock> blocks_;
};

}  // namespace kdreport
