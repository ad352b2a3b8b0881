#include "platform/plist_text.h"

#include "platform/calendar.h"
#include "platform/hexadecimal.h"
#include "platform/number_text.h"

namespace tbdaily {

namespace {

void appendQuoted(std::string& out, std::string_view text) {
  out += '"';
  for (const char c : text) {
    switch (c) {
      case '"':
        out += "\\\"";
        break;
      case '\\':
        out += "\\\\";
        break;
      case '\n':
        out += "\\n";
        break;
      case '\r':
        out += "\\r";
        break;
      case '\t':
        out += "\\t";
        break;
      default:
        out += c;
    }
  }
  out += '"';
}

std::string logDateText(PlistDate date) {
  std::string text = dateText(date, DateFraction::Drop);
  text[text.find('T')] = ' ';
  text.replace(text.size() - 1, 1, " +0000");
  return text;
}

void appendText(std::string& out, const PlistValue& value, bool quoteStrings) {
  if (const auto text = value.asString()) {
    quoteStrings ? appendQuoted(out, *text) : void(out += *text);
  } else if (const auto number = value.asNumber()) {
    out += numberText(*number);
  } else if (const auto boolean = value.asBoolean()) {
    out += *boolean ? '1' : '0';
  } else if (const auto date = value.asDate()) {
    out += logDateText(*date);
  } else if (const auto data = value.asData()) {
    out += '<';
    appendHexadecimal(out, *data);
    out += '>';
  } else if (const PlistArray* array = value.asArray()) {
    out += '[';
    for (const PlistValue& element : *array) {
      if (&element != array->data()) out += ", ";
      appendText(out, element, true);
    }
    out += ']';
  } else if (const PlistDictionary* dictionary = value.asDictionary()) {
    out += '{';
    bool first = true;
    for (const auto& [key, entry] : *dictionary) {
      if (!first) out += ", ";
      first = false;
      appendQuoted(out, key);
      out += ": ";
      appendText(out, entry, true);
    }
    out += '}';
  } else {
    out += "(null)";
  }
}

}  // namespace

std::string plistText(const PlistValue& value) {
  std::string text;
  appendText(text, value, false);
  return text;
}

}  // namespace tbdaily
