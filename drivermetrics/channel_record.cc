#include "drivermetrics/channel_record.h"

#include <algorithm>

#include "drivermetrics/object_blocks.h"

namespace kdreport {

namespace {

PlistValue infoValue(const ChannelRecord* channel, std::string_view key) {
  const PlistDictionary* info = channel != nullptr ? channel->group().channelInfo.asDictionary() : nullptr;
  return info != nullptr ? info->get(key) : PlistValue();
}

std::optional<std::string_view> stringOf(const ChannelRecord* channel, const PlistValue LegendGroup::*value) {
  return channel != nullptr ? (channel->group().*value).asString() : std::nullopt;
}

bool isPrintable(unsigned byte) {
  return byte >= 0x20 && byte <= 0x7E;
}

}  // namespace

std::int64_t integerOrInvalid(const PlistValue& value) {
  const auto number = value.asNumber();
  return number ? number->toInt64() : kKdReportInvalid;
}

const std::optional<LegendEntry>& ChannelSource::legendChannel() const {
  return block->entries[static_cast<std::size_t>(this - block->objects.data())];
}

bool ChannelSource::hasTypeNumber() const {
  return legendChannel() && legendChannel()->channelType.asNumber();
}

SourceBlock::SourceBlock(std::shared_ptr<const LegendGroup> of)
    : group(std::move(of)), driverID(integerOrInvalid(group->driverID)) {}

void ChannelRecord::takeOver(const ChannelRecord& other) {
  ElementBlock* holder = other.block->elements.find(
      [&other](const ElementBlock& candidate) { return candidate.holds(other.elements_); });
  if (holder != nullptr) setElements(other.elements_, other.elementsSize_, *holder);
}

void ChannelRecord::copyElements(std::span<const std::byte> bytes) {
  const auto alone = std::make_shared<ElementBlock>(bytes.size());
  std::ranges::copy(bytes, alone->bytes.get());
  setElements(alone->bytes.get(), bytes.size(), *alone);
}

struct AnswerCache::Kept {
  Kept(CachedAnswer of, PlistValue kept) : answer(of), value(std::move(kept)) {}

  CachedAnswer answer;
  PlistValue value;
  const Kept* before = nullptr;                  // owned
  mutable std::atomic<std::uint32_t> owners{1};  // caches and the answer kept next
};

const AnswerCache::Kept* AnswerCache::retained(const Kept* kept) {
  if (kept != nullptr) kept->owners.fetch_add(1, std::memory_order_relaxed);
  return kept;
}

void AnswerCache::release(const Kept* kept) {
  // The only owner need not count down: nobody is left who could make another.
  while (kept != nullptr && (kept->owners.load(std::memory_order_acquire) == 1 ||
                             kept->owners.fetch_sub(1, std::memory_order_acq_rel) == 1))
    delete std::exchange(kept, kept->before);
}

const PlistValue& AnswerCache::find(CachedAnswer answer) const {
  static const PlistValue none;
  const Kept* kept = last_.load(std::memory_order_acquire);
  while (kept != nullptr && kept->answer != answer) kept = kept->before;
  return kept != nullptr ? kept->value : none;
}

const PlistValue& AnswerCache::keep(CachedAnswer answer, PlistValue value) {
  if (value.isNone()) return find(answer);
  auto kept = std::make_unique<Kept>(answer, std::move(value));
  kept->before = last_.load(std::memory_order_acquire);
  while (find(answer).isNone()) {
    if (last_.compare_exchange_weak(kept->before, kept.get(), std::memory_order_acq_rel))
      return kept.release()->value;
  }
  return find(answer);
}

AnswerCache* RecordBlock::answersOf(const ChannelRecord& record) const {
  AnswerCache* all = answers_.load(std::memory_order_acquire);
  return all != nullptr ? all + (&record - objects.data()) : nullptr;
}

AnswerCache& RecordBlock::makeAnswersOf(const ChannelRecord& record) {
  if (answersOf(record) == nullptr) {
    auto made = std::make_unique<AnswerCache[]>(objects.capacity());
    AnswerCache* none = nullptr;
    if (answers_.compare_exchange_strong(none, made.get(), std::memory_order_acq_rel)) (void)made.release();
  }
  return *answersOf(record);
}

const PlistValue& ChannelRecord::cached(CachedAnswer answer) const {
  static const PlistValue none;
  const AnswerCache* answers = block->answersOf(*this);
  return answers != nullptr ? answers->find(answer) : none;
}

const PlistValue& ChannelRecord::cache(CachedAnswer answer, PlistValue value) const {
  return value.isNone() ? cached(answer) : block->makeAnswersOf(*this).keep(answer, std::move(value));
}

std::optional<LegendEntry> legendEntryOf(const PlistValue& value) {
  const PlistArray* places = value.asArray();
  if (places == nullptr) return std::nullopt;
  const auto place = [places](std::size_t i) { return i < places->size() ? (*places)[i] : PlistValue(); };
  return LegendEntry{place(0), place(1), place(2)};
}

PlistValue legendType(const ChannelSource& source) {
  if (!source.legendChannel()) return {};
  const auto found = source.foundType.get();
  return found ? PlistValue::int64(*found) : source.legendChannel()->channelType;
}

KdStatus getChannelType(const ChannelRecord* channel, ChannelType& type) {
  const auto known = channel != nullptr ? channel->source->type() : std::nullopt;
  if (!known) return kKdError;
  type = *known;
  return kKdSuccess;
}

KdStatus setChannelType(ChannelRecord* channel, ChannelType type) {
  if (channel == nullptr || !channel->source->legendChannel()) return kKdError;
  channel->source->foundType.set(static_cast<std::int64_t>(type.bits));
  return kKdSuccess;
}

std::optional<std::span<const std::byte>> getChannelConfig(const ChannelRecord* channel) {
  const PlistDictionary* info = channel != nullptr ? channel->group().channelInfo.asDictionary() : nullptr;
  const PlistValue* config = info != nullptr ? info->find(kd_report_key::kChannelConfig) : nullptr;
  return config != nullptr ? config->asData() : std::nullopt;
}

std::optional<std::string> _copyPrintableIDString(std::int64_t identifier) {
  std::string text;
  for (unsigned shift = 64; shift > 0; shift -= 8) {
    const auto byte = static_cast<unsigned>(static_cast<std::uint64_t>(identifier) >> (shift - 8) & 0xFF);
    if (byte == 0) continue;
    if (!isPrintable(byte)) return std::nullopt;
    text += static_cast<char>(byte);
  }
  if (text.empty()) return std::nullopt;
  return text;
}

KdReportChannel KdReportRetainChannel(ChannelRecord& channel) {
  return {channel.block->shared_from_this(), &channel};
}

std::int64_t KdReportChannelGetDriverID(const ChannelRecord* channel) {
  return channel != nullptr ? channel->driverID() : kKdReportInvalid;
}

std::int64_t KdReportChannelGetChannelID(const ChannelRecord* channel) {
  return channel != nullptr ? channel->channelID() : kKdReportInvalid;
}

std::uint8_t KdReportChannelGetFormat(const ChannelRecord* channel) {
  return channel != nullptr ? channel->format() : std::uint8_t{kKdReportUnknownFormat};
}

std::uint16_t KdReportChannelGetCategories(const ChannelRecord* channel) {
  ChannelType type;
  return getChannelType(channel, type) == kKdSuccess ? type.categories() : kKdReportAllCategories;
}

std::uint16_t KdReportChannelGetElementCount(const ChannelRecord* channel) {
  ChannelType type;
  return getChannelType(channel, type) == kKdSuccess ? type.elementCount() : std::uint16_t{0};
}

std::optional<std::string_view> KdReportChannelGetGroup(const ChannelRecord* channel) {
  return stringOf(channel, &LegendGroup::groupName);
}

std::optional<std::string_view> KdReportChannelGetSubGroup(const ChannelRecord* channel) {
  return stringOf(channel, &LegendGroup::subGroupName);
}

std::optional<std::string_view> KdReportChannelGetDriverName(const ChannelRecord* channel) {
  return stringOf(channel, &LegendGroup::driverName);
}

std::int64_t KdReportChannelGetUnit(const ChannelRecord* channel) {
  return integerOrInvalid(infoValue(channel, kd_report_key::kChannelUnit));
}

std::optional<std::string_view> KdReportChannelGetChannelName(const ChannelRecord* channel) {
  if (channel == nullptr) return std::nullopt;
  const PlistValue& cached = channel->cached(CachedAnswer::ChannelName);
  if (!cached.isNone()) return cached.asString();
  const auto& entry = channel->source->legendChannel();
  PlistValue name = entry ? entry->channelName : PlistValue();
  if (!name.asString()) {
    const auto text = _copyPrintableIDString(KdReportChannelGetChannelID(channel));
    if (!text) return std::nullopt;
    name = PlistValue::string(*text);
  }
  return channel->cache(CachedAnswer::ChannelName, std::move(name)).asString();
}

}  // namespace kdreport
