#include "tools/tallyctl/export/row_writer.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>

#include "platform/number_text.h"
#include "platform/plist/json_writer.h"
#include "platform/utf8.h"

namespace tbdaily {

namespace {

constexpr std::size_t kPiece = std::size_t{64} << 10;
constexpr double kWholeBelow = 1e15;  // whole numbers are written without an exponent

// Whether either format takes the text as it is: no control, nothing but ASCII, no quotation mark and
// backslash. Without a branch for a character, so that many are looked at together.
bool isPlain(std::string_view text) {
  bool isOther = false;
  for (const char c : text) isOther |= c < 0x20 || c >= 0x7F || c == '"' || c == '\\';
  return !isOther;
}

// Well-formed, without U+0000.
std::string takenByEngines(std::string_view text) {
  std::string taken;
  while (!text.empty()) {
    const std::size_t length = text.front() == '\0' ? 0 : utf8CharacterLength(text);
    taken += length == 0 ? kReplacementCharacter : text.substr(0, length);
    text.remove_prefix(std::max<std::size_t>(length, 1));
  }
  return taken;
}

void appendDigits(std::string& out, std::int64_t value) {
  std::array<char, 24> digits;
  out.append(digits.data(), std::to_chars(digits.data(), digits.data() + digits.size(), value).ptr);
}

void appendEscapedForTsv(std::string& out, std::string_view text) {
  constexpr std::string_view kEscaped = "\t\n\r\\", kLetters = "tnr\\";
  for (const char c : text) {
    const std::size_t which = kEscaped.find(c);
    if (which == std::string_view::npos)
      out += c;
    else
      out.append("\\").append(1, kLetters[which]);
  }
}

}  // namespace

RowWriter::RowWriter(RowFormat format, std::span<const std::string_view> columns, Sink sink)
    : format_(format), sink_(std::move(sink)) {
  std::string names;
  for (const std::string_view column : columns) {
    const bool isFirst = leads_.empty();
    names.append(isFirst ? "" : "\t").append(column);
    leads_.push_back(format == RowFormat::Tsv ? (isFirst ? "" : "\t")
                                              : (isFirst ? "{\"" : ",\"") + std::string(column) + "\":");
  }
  if (format == RowFormat::Tsv) out_ = names + "\n";
}

void RowWriter::share(std::span<const std::string_view> texts) {
  std::string rows;
  out_.swap(rows);  // the fields are put together where rows are
  column_ = 0;
  for (const std::string_view text : texts) this->text(text);
  sharedColumns_ = column_;
  shared_ = std::move(out_);
  out_ = std::move(rows);
}

void RowWriter::begin() {
  out_ += shared_;
  column_ = sharedColumns_;
}

void RowWriter::lead() {
  out_ += leads_[column_++];
}

void RowWriter::text(std::string_view text) {
  lead();
  if (isPlain(text)) {
    const std::string_view mark = format_ == RowFormat::Tsv ? "" : "\"";
    out_.append(mark).append(text).append(mark);
    return;
  }
  const std::string taken = takenByEngines(text);
  if (format_ == RowFormat::Tsv) return appendEscapedForTsv(out_, taken);
  JsonWriter json(JsonLayout::OneLine);
  json.add(taken);
  out_ += json.take();
}

void RowWriter::integer(std::int64_t value) {
  lead();
  appendDigits(out_, value);
}

void RowWriter::real(double value) {
  lead();
  // The text is the same, and comes sooner: bounds of buckets are whole numbers for the most part.
  if (std::fabs(value) < kWholeBelow && value == std::trunc(value) && !(value == 0 && std::signbit(value)))
    return appendDigits(out_, static_cast<std::int64_t>(value));
  const std::string_view mark = format_ == RowFormat::Tsv || std::isfinite(value) ? "" : "\"";
  out_.append(mark).append(realText(value)).append(mark);
}

void RowWriter::end() {
  out_ += format_ == RowFormat::Tsv ? "\n" : "}\n";
  if (out_.size() >= kPiece) finish();
}

bool RowWriter::finish() {
  if (isTaken_ && !out_.empty()) isTaken_ = sink_(out_);
  out_.clear();
  return isTaken_;
}

}  // namespace tbdaily
