#include "fuzz/plist_input.h"

#include "platform/plist/codec.h"

namespace tbdaily::fuzz {

namespace {

constexpr std::int64_t kMostQuarters = std::int64_t{1}
                                       << 52;  // of a second, in dates: the codec knows no others
constexpr int kMostLevels = 6;
constexpr std::size_t kMostEntries = 12;

PlistValue described(Input& input, std::span<const std::string_view> words, int levels);

PlistValue arrayOf(Input& input, std::span<const std::string_view> words, int levels) {
  PlistArray elements;
  for (std::size_t count = input.below(kMostEntries); count > 0 && !input.isEmpty(); --count)
    elements.push_back(described(input, words, levels));
  return PlistValue::array(std::move(elements));
}

PlistValue dictionaryOf(Input& input, std::span<const std::string_view> words, int levels) {
  PlistDictionary entries;
  for (std::size_t count = input.below(kMostEntries); count > 0 && !input.isEmpty(); --count) {
    const std::string key = input.wordOrText(words);
    entries.set(key, described(input, words, levels));
  }
  return PlistValue::dictionary(std::move(entries));
}

PlistValue described(Input& input, std::span<const std::string_view> words, int levels) {
  const std::size_t kind = input.below(levels > 0 ? 16 : 11);
  switch (kind) {
    case 0:
    case 1:
      return PlistValue::boolean(kind == 1);
    case 2:
      return PlistValue::int64(input.integer());
    case 3:
      return PlistValue::int32(static_cast<std::int32_t>(input.integer()));
    case 4:
      return PlistValue::int8(static_cast<std::int8_t>(input.integer()));
    case 5:
      return PlistValue::float64(input.number<double>());
    case 6:
      return PlistValue::float32(input.number<float>());
    case 7:
      return PlistValue(
          PlistDate{static_cast<double>(std::clamp(input.integer(), -kMostQuarters, kMostQuarters)) / 4});
    case 8:
    case 9:
      return PlistValue::string(input.wordOrText(words));
    case 10: {
      const auto bytes = input.section();
      return PlistValue::data({bytes.begin(), bytes.end()});
    }
    case 11:
    case 12:
      return arrayOf(input, words, levels - 1);
    default:
      return dictionaryOf(input, words, levels - 1);
  }
}

}  // namespace

PlistValue plistOf(Input& input, std::span<const std::string_view> words) {
  const auto bytes = input.rest();
  const std::string_view text(reinterpret_cast<const char*>(bytes.data()), bytes.size());
  if (text.starts_with('<') || text.starts_with("bplist")) return PlistCodec().parse(bytes).value;
  return described(input, words, kMostLevels);
}

PlistValue plistOfSection(Input& input, std::span<const std::string_view> words) {
  Input section(input.section());
  return plistOf(section, words);
}

}  // namespace tbdaily::fuzz
