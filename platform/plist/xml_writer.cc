#include "platform/plist/xml_writer.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <utility>

#include "platform/calendar.h"
#include "platform/number_text.h"
#include "platform/plist/base64.h"
#include "platform/plist/limits.h"
#include "platform/plist/scalar_text.h"
#include "platform/utf8.h"

namespace tbdaily {

namespace {

constexpr std::string_view kHeader = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<plist version=\"1.0\">\n";
constexpr std::string_view kFooter = "</plist>\n";
constexpr const char* kAbsentValueError = "an absent value cannot be written";
constexpr const char* kDateError = "a date outside of the calendar";
constexpr std::size_t kPieceSize = std::size_t{64} << 10;

// The bytes of a text that cannot be copied as they are without a look at them.
constexpr auto kNeedsCare = [] {
  std::array<bool, 256> table{};
  for (std::size_t c = 0; c < 0x20; ++c) table[c] = c != '\t' && c != '\n';
  for (const char c : {'&', '<', '>'}) table[static_cast<unsigned char>(c)] = true;
  for (std::size_t c = 0x80; c < 0x100; ++c) table[c] = true;
  return table;
}();

std::string_view escapeOf(char c) {
  switch (c) {
    case '&':
      return "&amp;";
    case '<':
      return "&lt;";
    case '>':
      return "&gt;";
    case '\r':
      return "&#13;";  // a bare one would be read as a line feed
    default:
      return {};
  }
}

class XmlWriter {
 public:
  XmlWriter(PlistForm form, const PlistPieceSink& sink)
      : exact_(form != PlistForm::Plain), replaces_(form != PlistForm::Exact), sink_(sink) {}

  PlistWriteResult write(const PlistValue& value) {
    out_ += kHeader;
    if (!writeValue(value, 0)) return {false, {}, error_};
    out_ += kFooter;
    if (sink_ && !handOn()) return {false, {}, error_};
    return {true, std::move(out_), {}};
  }

 private:
  // Each answers false after a failure, with the reason in error_.
  bool fail(const char* reason);
  bool handOn();
  bool writeValue(const PlistValue& value, int depth);
  bool writeArray(const PlistArray& elements, int depth);
  bool writeDictionary(const PlistDictionary& entries, int depth);
  bool writeText(std::string_view opening, std::string_view text, std::string_view closing);
  bool writeDate(PlistDate date);
  void writeNumber(const PlistNumber& number);
  void writeInteger(const PlistNumber& number);
  void writeReal(const PlistNumber& number);
  void indent(int depth) { out_.append(static_cast<std::size_t>(depth), '\t'); }

  bool exact_;
  bool replaces_;  // what XML cannot carry
  const PlistPieceSink& sink_;
  std::string out_;
  const char* error_ = "";
};

bool XmlWriter::fail(const char* reason) {
  error_ = reason;
  return false;
}

bool XmlWriter::handOn() {
  if (!sink_(std::as_bytes(std::span(out_)))) return fail("nobody takes what is written");
  out_.clear();
  return true;
}

bool XmlWriter::writeValue(const PlistValue& value, int depth) {
  if (sink_ && out_.size() >= kPieceSize && !handOn()) return false;
  indent(depth);
  if (const auto text = value.asString()) return writeText("<string>", *text, "</string>\n");
  if (const auto number = value.asNumber()) {
    writeNumber(*number);
    return true;
  }
  if (const PlistDictionary* entries = value.asDictionary()) return writeDictionary(*entries, depth);
  if (const PlistArray* elements = value.asArray()) return writeArray(*elements, depth);
  if (const auto flag = value.asBoolean()) {
    out_ += *flag ? "<true/>\n" : "<false/>\n";
    return true;
  }
  if (const auto date = value.asDate()) return writeDate(*date);
  const auto bytes = value.asData();
  if (!bytes) return fail(kAbsentValueError);
  out_ += "<data>";
  appendBase64(out_, *bytes);
  out_ += "</data>\n";
  return true;
}

bool XmlWriter::writeArray(const PlistArray& elements, int depth) {
  if (depth == kPlistNestingLimit) return fail(kPlistNestingError);
  if (elements.empty()) {
    out_ += "<array/>\n";
    return true;
  }
  out_ += "<array>\n";
  for (const PlistValue& element : elements) {
    if (!writeValue(element, depth + 1)) return false;
  }
  indent(depth);
  out_ += "</array>\n";
  return true;
}

bool XmlWriter::writeDictionary(const PlistDictionary& entries, int depth) {
  if (depth == kPlistNestingLimit) return fail(kPlistNestingError);
  if (entries.empty()) {
    out_ += "<dict/>\n";
    return true;
  }
  out_ += "<dict>\n";
  for (const auto& [key, value] : entries) {
    indent(depth + 1);
    if (!writeText("<key>", key, "</key>\n") || !writeValue(value, depth + 1)) return false;
  }
  indent(depth);
  out_ += "</dict>\n";
  return true;
}

bool XmlWriter::writeText(std::string_view opening, std::string_view text, std::string_view closing) {
  out_ += opening;
  std::size_t written = 0, at = 0;
  while (at < text.size()) {
    if (!kNeedsCare[static_cast<unsigned char>(text[at])]) {
      ++at;
      continue;
    }
    if (const std::size_t length = carriedCharacterLength(text.substr(at)); length > 1) {
      at += length;
      continue;
    }
    std::string_view replacement = escapeOf(text[at]);
    if (replacement.empty()) {
      if (!replaces_) return fail("text with a character that XML cannot carry");
      replacement = kReplacementCharacter;
    }
    out_.append(text, written, at - written);
    out_ += replacement;
    // U+FFFE and U+FFFF are replaced whole, of bytes that are no UTF-8 each.
    at += std::max<std::size_t>(utf8CharacterLength(text.substr(at)), 1);
    written = at;
  }
  out_.append(text, written);
  out_ += closing;
  return true;
}

bool XmlWriter::writeDate(PlistDate date) {
  if (!isRepresentable(date)) return fail(kDateError);
  out_ += "<date>";
  out_ += exact_ ? exactDateText(date) : dateText(date, DateFraction::Drop);
  out_ += "</date>\n";
  return true;
}

void XmlWriter::writeNumber(const PlistNumber& number) {
  if (number.isReal()) return writeReal(number);
  writeInteger(number);
}

void XmlWriter::writeInteger(const PlistNumber& number) {
  out_ += !exact_ || number.kind() == NumberKind::SInt64 ? "<integer>"
          : number.kind() == NumberKind::SInt32          ? "<integer bits=\"32\">"
                                                         : "<integer bits=\"8\">";
  std::array<char, 24> digits{};
  out_.append(digits.data(),
              std::to_chars(digits.data(), digits.data() + digits.size(), number.toInt64()).ptr);
  out_ += "</integer>\n";
}

void XmlWriter::writeReal(const PlistNumber& number) {
  const bool narrow = exact_ && number.kind() == NumberKind::Float32;
  const double value = number.toDouble();
  out_ += narrow ? "<real bits=\"32\">" : "<real>";
  if (std::isinf(value)) {
    out_ += value < 0 ? "-infinity" : "+infinity";
  } else {
    out_ += narrow ? realText(static_cast<float>(value)) : realText(value);
  }
  out_ += "</real>\n";
}

// What the writer would fail with in the plain form, which replaces every character that XML cannot carry.
const char* faultIn(const PlistValue& value, int depth) {
  const PlistDictionary* entries = value.asDictionary();
  const PlistArray* elements = value.asArray();
  const char* fault = "";
  if (entries != nullptr || elements != nullptr) {
    if (depth == kPlistNestingLimit) return kPlistNestingError;
    if (entries != nullptr) {
      for (auto entry = entries->begin(); *fault == '\0' && entry != entries->end(); ++entry)
        fault = faultIn(entry->second, depth + 1);
    } else {
      for (auto element = elements->begin(); *fault == '\0' && element != elements->end(); ++element)
        fault = faultIn(*element, depth + 1);
    }
    return fault;
  }
  if (value.isNone()) return kAbsentValueError;
  const auto date = value.asDate();
  return date && !isRepresentable(*date) ? kDateError : "";
}

}  // namespace

PlistWriteResult writeXmlPlist(const PlistValue& value, PlistForm form, const PlistPieceSink& sink) {
  return XmlWriter(form, sink).write(value);
}

std::string whyNoPlainXmlPlist(const PlistValue& value) {
  return faultIn(value, 0);
}

}  // namespace tbdaily
