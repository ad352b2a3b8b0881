// The storage controller's history of short intervals, the snapshots, as text: one line for each interval.
//
// Every counter is a little-endian 32-bit word. Both renderers write into the caller's characters and
// allocate nothing; no byte is written at or past the capacity, and what stands behind the text and its NUL
// is undefined. A piece of text does not fit when no room is left for the NUL that ends it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

namespace tbdaily {

// Renders records of the fixed layout, 252 bytes each: the legend, a line for each whole record and an empty
// line. Bytes after the last whole record are ignored.
//
// `size` is the capacity of `text` in bytes. True when all fitted: `size` is then the number of characters
// written, without the NUL. False otherwise: `text` holds what fitted and ends with a NUL (unless the
// capacity is 0), and `size` stays.
bool STXParseSnapshotBuffer(std::span<const std::byte> records, char* text, std::size_t& size);

// Renders the records that a snapshot header describes, from the one with index `cursor` on: 0 on the first
// call for a history, then what the previous call left there. The first call begins with a heading: the
// legend for layout versions below 6, else the header's title. A heading stays only before a completed line.
// Records whose first value is 0 are skipped, and the last slot is never rendered.
//
// True when the last slot was reached. False when `header` is empty (missing), which changes nothing, or when
// the text did not fit: `text` then ends with the last complete line, and `cursor` is past the record that
// did not fit, or still 0 when that was the heading. Whatever the result, unless the header is missing,
// `size` becomes the length of the text plus 1 for its NUL (1 for a capacity of 0, too, where no NUL is
// written).
//
// A header is not trusted. Only what lies wholly inside `header` and `records` is rendered:
// - The walk ends, with true and the cursor at the last slot, at the first record that is not wholly inside.
//   So it does, without a line, for a header without slots, with a record size of 0 or without fields.
// - A value outside is left out; a record whose first value is outside counts as empty.
// - Fields after the 512th are read again for each record. Where that would be more than 2^28 times in all,
// it
//   is refused: false, with an empty text and the cursor where it was.
// - A field's format prints its value only if it asks for the arguments of the field's kind and no others, in
//   plain C conversions (d, i, u, o, x, X; s for the letter of a priority group) with a width and a precision
//   of at most 64. Any other format, and one without a NUL in its 16 bytes, is printed as it stands.
bool STXParseSnapshotBufferWithInplaceParser(std::span<const std::byte> records, char* text,
                                             std::size_t& size, std::span<const std::byte> header,
                                             std::uint32_t& cursor);

}  // namespace tbdaily
