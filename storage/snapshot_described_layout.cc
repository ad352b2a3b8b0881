// Snapshot records whose layout a header describes field by field.

#include <algorithm>
#include <array>
#include <cstring>

#include "platform/byte_reader.h"
#include "storage/snapshot_format.h"
#include "storage/snapshot_layout.h"
#include "storage/snapshot_renderer.h"
#include "storage/snapshot_text.h"

namespace tbdaily {

namespace {

// Byte offsets in a header, in its field table and in a field of the table.
constexpr std::size_t kVersionOffset = 4;
constexpr std::size_t kRecordSizeOffset = 8;
constexpr std::size_t kSlotsOffset = 12;
constexpr std::size_t kFieldTableOffset = 24;
constexpr std::size_t kTitleOffset = 36;
constexpr std::size_t kFieldsOffset = 8;
constexpr std::size_t kValueOffsetOffset = 4;
constexpr std::size_t kArraySizeOffset = 8;
constexpr std::size_t kFormatOffset = 12;
constexpr std::size_t kFieldSize = 28;

constexpr std::size_t kMostFieldsReadOnce = 512;
constexpr std::uint64_t kMostFieldsReadAgain = std::uint64_t{1} << 28;  // of all records together
constexpr std::uint32_t kFirstVersionWithTitle = 6;
constexpr std::size_t kTripleSize = kPriorityTripleWords * sizeof(std::uint32_t);

enum class FieldKind : std::uint16_t { kValue = 0, kAlsoValue = 1, kThousands = 2, kPriorities = 3 };

struct Field {
  FieldKind kind{};
  std::uint32_t offset = 0;     // within the record
  std::uint32_t arraySize = 0;  // in bytes; of priority triples only
  SnapshotFormat format;
};

SnapshotFormat::Arguments argumentsOf(FieldKind kind) {
  if (kind == FieldKind::kPriorities) return SnapshotFormat::Arguments::kText;
  return kind == FieldKind::kThousands ? SnapshotFormat::Arguments::kTwoValues
                                       : SnapshotFormat::Arguments::kValue;
}

// A header's contents, each checked against its end. Numbers outside are 0.
class SnapshotHeader {
 public:
  explicit SnapshotHeader(std::span<const std::byte> bytes) : bytes_(bytes), reader_(bytes) {}

  std::uint32_t version() const { return word(kVersionOffset); }
  std::uint32_t recordSize() const { return word(kRecordSizeOffset); }
  std::uint32_t slots() const { return word(kSlotsOffset); }
  std::span<const std::byte> title() const {
    const auto rest = bytes_.subspan(std::min(bytes_.size(), kTitleOffset));
    return {rest.begin(), std::ranges::find(rest, std::byte{0})};
  }
  std::size_t fieldCount() const {
    const std::size_t first = fieldTable() + kFieldsOffset;
    if (first > bytes_.size()) return 0;
    return std::min(std::size_t{word(fieldTable())}, (bytes_.size() - first) / kFieldSize);
  }
  // The index is below fieldCount().
  Field field(std::size_t index) const {
    const std::size_t at = fieldTable() + kFieldsOffset + index * kFieldSize;
    const auto kind = static_cast<FieldKind>(reader_.at<std::uint16_t>(at).value_or(0));
    std::array<char, SnapshotFormat::kSize> format;
    std::memcpy(format.data(), bytes_.subspan(at + kFormatOffset).data(), format.size());
    return {kind, word(at + kValueOffsetOffset), word(at + kArraySizeOffset),
            SnapshotFormat(format, argumentsOf(kind))};
  }

 private:
  std::uint32_t word(std::size_t at) const { return reader_.at<std::uint32_t>(at).value_or(0); }
  std::size_t fieldTable() const { return word(kFieldTableOffset); }

  std::span<const std::byte> bytes_;
  ByteReader reader_;
};

void renderHeading(SnapshotText& out, const SnapshotHeader& header) {
  if (header.version() < kFirstVersionWithTitle) return out.append(kSnapshotLegend);
  out.append("- STX Snapshot - \n");
  out.appendBytes(header.title());
  out.append("\n");
}

constexpr ShortText kNoLabel;

void renderPriorities(SnapshotText& out, std::span<const std::byte> record, const Field& field) {
  const std::size_t inside = record.size() - std::min<std::size_t>(record.size(), field.offset);
  const std::size_t priorities = std::min<std::size_t>(field.arraySize, inside) / kTripleSize;
  const ByteReader reader(record);
  for (const SnapshotColumn& column : kDescribedPriorityColumns) {
    field.format.append(out, column.label.view());
    const std::size_t first = field.offset + column.word * sizeof(std::uint32_t);
    for (std::size_t i = 0; i < priorities && out.fits(); ++i) {
      const auto value = reader.at<std::uint32_t>(first + i * kTripleSize).value_or(0);
      out.appendNumber(i == 0 ? kNoLabel : kPriorityDelimiter, value, column.width);
    }
  }
}

// `record` begins with the record and ends with the buffer: a header may place a value behind its record.
void renderField(SnapshotText& out, std::span<const std::byte> record, const Field& field) {
  if (field.kind == FieldKind::kPriorities) return renderPriorities(out, record, field);
  const auto value = ByteReader(record).at<std::uint32_t>(field.offset);
  if (!value) return;
  if (field.kind == FieldKind::kValue || field.kind == FieldKind::kAlsoValue) {
    field.format.append(out, {*value});
  } else if (field.kind == FieldKind::kThousands) {
    const auto [whole, hundredths] = splitThousands(*value);
    field.format.append(out, {whole, hundredths});
  }
}

// The fields of a header, read once for all records as far as there is room; those behind are read again for
// each.
class Fields {
 public:
  explicit Fields(const SnapshotHeader& header) : header_(header), count_(header.fieldCount()) {
    for (std::size_t i = 0; i < readOnce(); ++i) fields_[i] = header.field(i);
  }

  bool isEmpty(std::span<const std::byte> record) const {
    return ByteReader(record).at<std::uint32_t>(fields_.front().offset).value_or(0) == 0;
  }
  void render(SnapshotText& out, std::span<const std::byte> record) const {
    for (std::size_t i = 0; i < readOnce() && out.fits(); ++i) renderField(out, record, fields_[i]);
    for (std::size_t i = readOnce(); i < count_ && out.fits(); ++i)
      renderField(out, record, header_.field(i));
  }
  std::size_t count() const { return count_; }
  std::uint64_t readAgain() const { return count_ - readOnce(); }

 private:
  std::size_t readOnce() const { return std::min(count_, fields_.size()); }

  const SnapshotHeader& header_;
  std::size_t count_;
  std::array<Field, kMostFieldsReadOnce> fields_;
};

// True when the last slot was reached, false when a record did not fit or there is too much to read. `kept`
// becomes the length up to the last complete line.
bool renderRecords(SnapshotText& out, std::span<const std::byte> records, const SnapshotHeader& header,
                   std::uint32_t& cursor, std::size_t& kept) {
  const Fields fields(header);
  const std::uint32_t lastSlot = std::max(header.slots(), 1U) - 1;
  const std::size_t stride = header.recordSize();
  const std::size_t whole = stride == 0 || fields.count() == 0 ? 0 : records.size() / stride;
  if (fields.readAgain() * std::min<std::uint64_t>(lastSlot, whole) > kMostFieldsReadAgain) return false;
  while (cursor < std::min<std::size_t>(lastSlot, whole)) {
    const auto record = records.subspan(cursor++ * stride);
    if (fields.isEmpty(record)) continue;
    fields.render(out, record);
    out.appendShort("\n");
    if (!out.fits()) return false;
    kept = out.length();
  }
  cursor = std::max(cursor, lastSlot);
  return true;
}

}  // namespace

bool STXParseSnapshotBufferWithInplaceParser(std::span<const std::byte> records, char* text,
                                             std::size_t& size, std::span<const std::byte> header,
                                             std::uint32_t& cursor) {
  if (header.empty()) return false;
  SnapshotText out(text, size);
  const SnapshotHeader description(header);
  if (cursor == 0) renderHeading(out, description);
  std::size_t kept = 0;
  const bool finished = out.fits() && renderRecords(out, records, description, cursor, kept);
  out.endAt(kept);
  size = kept + 1;
  return finished;
}

}  // namespace tbdaily
