// Both renderers of snapshots: a smaller room holds the beginning of the text, or whole lines of it, and
// nothing is written behind it.
#include <memory>

#include "fuzz/input.h"
#include "storage/snapshot_renderer.h"

using namespace tbdaily;
using fuzz::Input;
using fuzz::require;

namespace {

constexpr std::size_t kLarge = std::size_t{1} << 20;

// Characters of exactly this number, so that a write behind them shows.
struct Room {
  explicit Room(std::size_t capacity) : text(new char[capacity]), size(capacity) {}
  std::unique_ptr<char[]> text;
  std::size_t size;
};

void renderFixed(std::span<const std::byte> records, std::size_t capacity) {
  static Room all(kLarge);
  all.size = kLarge;
  if (!STXParseSnapshotBuffer(records, all.text.get(), all.size)) return;
  require(std::strlen(all.text.get()) == all.size, "the size is the text's");
  Room room(capacity);
  const bool fits = STXParseSnapshotBuffer(records, room.text.get(), room.size);
  require(fits == (all.size < capacity), "fits when there is room for the NUL");
  if (!fits) require(room.size == capacity, "the size stays when the text did not fit");
  if (capacity > 0)
    require(std::string_view(all.text.get(), all.size).starts_with(room.text.get()), "a prefix of the text");
}

// The whole lines of `part` come in their order in `all`, from `place` on.
void linesAreOf(std::string_view part, std::string_view all, std::size_t& place) {
  while (!part.empty()) {
    const std::size_t length = part.find('\n');
    require(length != std::string_view::npos, "only whole lines stay");
    const std::string_view line = part.substr(0, length + 1);
    part.remove_prefix(line.size());
    while (place < all.size() && !all.substr(place).starts_with(line)) {
      const std::size_t end = all.find('\n', place);
      place = end == std::string_view::npos ? all.size() : end + 1;
    }
    require(place < all.size(), "each line is one of the whole text");
    place += line.size();
  }
}

void renderDescribed(std::span<const std::byte> header, std::span<const std::byte> records,
                     std::size_t capacity) {
  static Room all(kLarge);
  all.size = kLarge;
  std::uint32_t last = 0;
  const bool whole = STXParseSnapshotBufferWithInplaceParser(records, all.text.get(), all.size, header, last);
  if (header.empty())
    return require(!whole && all.size == kLarge && last == 0, "a missing header changes nothing");
  require(all.size == std::strlen(all.text.get()) + 1, "the size is the text's with its NUL");
  if (!whole) return;
  std::size_t place = 0;
  for (std::uint32_t cursor = 0, calls = 0; calls < 64; ++calls) {
    Room room(capacity);
    const std::uint32_t before = cursor;
    const bool ended =
        STXParseSnapshotBufferWithInplaceParser(records, room.text.get(), room.size, header, cursor);
    require(room.size >= 1 && (capacity == 0 || room.size <= capacity), "the size is within the capacity");
    require(cursor >= before && cursor <= last, "the cursor goes on, to the last slot at most");
    if (capacity > 0) linesAreOf(room.text.get(), {all.text.get(), all.size - 1}, place);
    if (ended) return require(cursor == last, "the walk ends at the last slot");
    if (cursor == before) return require(cursor == 0, "only a heading that does not fit keeps the cursor");
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  Input input(data, size);
  const std::size_t capacity = input.number<std::uint16_t>() % 4096;
  const auto header = input.section();
  const auto records = input.rest();
  renderFixed(records, capacity);
  renderDescribed(header, records, capacity);
  return 0;
}
