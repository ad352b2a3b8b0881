// Snapshot records of the fixed layout.

#include "platform/byte_reader.h"
#include "storage/snapshot_layout.h"
#include "storage/snapshot_renderer.h"
#include "storage/snapshot_text.h"

namespace tbdaily {

namespace {

// The words of one record. The tables name no word beyond its end.
class SnapshotRecord {
 public:
  explicit SnapshotRecord(std::span<const std::byte> bytes) : reader_(bytes) {}
  std::uint32_t operator[](std::size_t word) const {
    return reader_.at<std::uint32_t>(word * sizeof(std::uint32_t)).value_or(0);
  }

 private:
  ByteReader reader_;
};

void renderColumns(SnapshotText& out, const SnapshotRecord& record, std::span<const SnapshotColumn> columns) {
  for (const SnapshotColumn& column : columns)
    out.appendNumber(column.label, record[column.word], column.width, column.fill);
}

void renderHysteresis(SnapshotText& out, const SnapshotRecord& record) {
  const auto [whole, hundredths] = splitThousands(record[kSnapshotHysteresisColumn.word]);
  out.appendNumber(kSnapshotHysteresisColumn.label, whole, kSnapshotHysteresisColumn.width);
  out.appendNumber(".", hundredths, 2, '0');
}

void renderPriorities(SnapshotText& out, const SnapshotRecord& record) {
  for (const SnapshotColumn& column : kSnapshotPriorityColumns) {
    for (std::size_t priority = 0; priority < kSnapshotPriorities; ++priority) {
      const ShortText& label = priority == 0 ? column.label : kPriorityDelimiter;
      out.appendNumber(label, record[column.word + priority * kPriorityTripleWords], column.width);
    }
  }
}

}  // namespace

bool STXParseSnapshotBuffer(std::span<const std::byte> records, char* text, std::size_t& size) {
  SnapshotText out(text, size);
  out.append(kSnapshotLegend);
  const auto count = static_cast<std::uint32_t>(records.size() / kSnapshotRecordSize);
  for (std::uint32_t i = 0; i < count && out.fits(); ++i) {
    const SnapshotRecord record(records.subspan(i * kSnapshotRecordSize, kSnapshotRecordSize));
    renderColumns(out, record, kSnapshotColumnsBeforeHysteresis);
    renderHysteresis(out, record);
    renderColumns(out, record, kSnapshotColumnsAfterHysteresis);
    renderPriorities(out, record);
    out.appendShort("\n");
  }
  out.append("\n");
  out.endAt(out.length());
  if (out.fits()) size = out.length();
  return out.fits();
}

}  // namespace tbdaily
