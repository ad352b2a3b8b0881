#include "platform/plist/xml_reader.h"

#include <expat.h>

#include <algorithm>
#include <array>
#include <exception>
#include <memory>
#include <type_traits>
#include <utility>

#include "platform/keyed_hash.h"
#include "platform/plist/base64.h"
#include "platform/plist/builder.h"
#include "platform/plist/limits.h"
#include "platform/plist/scalar_text.h"
#include "platform/plist/xml_doctype.h"
#include "platform/utf8.h"

namespace tbdaily {

namespace {

enum class Element : std::uint8_t {
  None,
  Plist,
  Dictionary,
  Array,
  Key,
  String,
  Integer,
  Real,
  True,
  False,
  Date,
  Data
};

struct ElementName {
  std::string_view name;
  Element element;
};

constexpr std::array kElements = {
    ElementName{"key", Element::Key},         ElementName{"string", Element::String},
    ElementName{"integer", Element::Integer}, ElementName{"dict", Element::Dictionary},
    ElementName{"array", Element::Array},     ElementName{"real", Element::Real},
    ElementName{"true", Element::True},       ElementName{"false", Element::False},
    ElementName{"date", Element::Date},       ElementName{"data", Element::Data},
    ElementName{"plist", Element::Plist},
};

Element elementNamed(std::string_view name) {
  for (const ElementName& known : kElements) {
    // The first letter tells nearly all of them apart.
    if (name.front() == known.name.front() && name == known.name) return known.element;
  }
  return Element::None;
}

bool equalsIgnoringCase(std::string_view a, std::string_view b) {
  const auto upper = [](char c) { return c >= 'a' && c <= 'z' ? static_cast<char>(c - 32) : c; };
  return std::ranges::equal(a, b, {}, upper, upper);
}

// The parser would follow the byte order or the zero bytes of a wider encoding, whatever it was told to
// expect.
bool looksWide(std::string_view text) {
  return text.starts_with('\xFE') || text.starts_with('\xFF') ||
         text.substr(0, 2).find('\0') != std::string_view::npos;
}

class XmlReader {
 public:
  XmlReader();
  PlistParseResult parse(std::string_view document);

 private:
  struct FreeParser {
    void operator()(XML_Parser parser) const { XML_ParserFree(parser); }
  };

  // Calls a member from the parser's C code, which no exception may cross.
  template <typename Function>
  static void guarded(void* self, Function function);

  void feed(std::string_view text, bool last);
  void fail(std::string_view reason);
  int readBits(const XML_Char** attributes, int narrowest);
  void startElement(std::string_view name, const XML_Char** attributes);
  void startValue(Element element, const XML_Char** attributes);
  void endElement();
  void endScalar(Element element);
  void addOr(std::optional<PlistValue> value, const char* reason);
  void characters(std::string_view text);

  std::unique_ptr<std::remove_pointer_t<XML_Parser>, FreeParser> parser_;
  PlistBuilder builder_;
  std::string text_;              // of the open scalar or key
  Element open_ = Element::None;  // the scalar or key that is open
  int bits_ = 64;                 // its width
  bool inPlist_ = false;
  std::string error_;
  std::exception_ptr exception_;
};

template <typename Function>
void XmlReader::guarded(void* self, Function function) {
  auto& reader = *static_cast<XmlReader*>(self);
  if (!reader.error_.empty() || reader.exception_) return;
  try {
    function(reader);
  } catch (...) {
    reader.exception_ = std::current_exception();
    XML_StopParser(reader.parser_.get(), XML_FALSE);
  }
}

XmlReader::XmlReader() : parser_(XML_ParserCreate("UTF-8")) {
  if (!parser_) throw std::bad_alloc();
  // Drawn once: else each parser asks the kernel for its own.
  static const unsigned long salt = drawSeed() | 1;
  XML_SetHashSalt(parser_.get(), salt);
  XML_SetUserData(parser_.get(), this);
  XML_SetElementHandler(
      parser_.get(),
      [](void* self, const XML_Char* name, const XML_Char** attributes) {
        guarded(self, [&](XmlReader& reader) { reader.startElement(name, attributes); });
      },
      [](void* self, const XML_Char*) { guarded(self, [](XmlReader& reader) { reader.endElement(); }); });
  XML_SetCharacterDataHandler(parser_.get(), [](void* self, const XML_Char* text, int length) {
    guarded(self, [&](XmlReader& reader) { reader.characters({text, static_cast<std::size_t>(length)}); });
  });
  XML_SetXmlDeclHandler(parser_.get(), [](void* self, const XML_Char*, const XML_Char* encoding, int) {
    guarded(self, [&](XmlReader& reader) {
      if (encoding == nullptr || equalsIgnoringCase(encoding, "UTF-8") ||
          equalsIgnoringCase(encoding, "US-ASCII"))
        return;
      reader.fail("the document declares another encoding than UTF-8");
    });
  });
  XML_SetStartDoctypeDeclHandler(
      parser_.get(), [](void* self, const XML_Char*, const XML_Char*, const XML_Char*, int) {
        guarded(self, [](XmlReader& reader) {
          reader.fail("a document type declaration that is not whole, or is the second");
        });
      });
}

void XmlReader::feed(std::string_view text, bool last) {
  constexpr std::size_t kChunk = std::size_t{1} << 28;  // the parser counts in int and doubles its buffer
  do {
    const std::string_view chunk = text.substr(0, kChunk);
    text.remove_prefix(chunk.size());
    const auto status =
        XML_Parse(parser_.get(), chunk.data(), static_cast<int>(chunk.size()), last && text.empty());
    if (exception_) std::rethrow_exception(exception_);
    if (status != XML_STATUS_OK && error_.empty()) {
      const XML_Error code = XML_GetErrorCode(parser_.get());
      if (code == XML_ERROR_NO_MEMORY) throw std::bad_alloc();
      fail(XML_ErrorString(code));
    }
  } while (!text.empty() && error_.empty());
}

PlistParseResult XmlReader::parse(std::string_view document) {
  const DoctypePlace doctype = findDoctype(document);
  const std::string_view declaration = document.substr(doctype.begin, doctype.end - doctype.begin);
  if (looksWide(document) || !isUtf8(declaration)) {
    fail("the text is not UTF-8");
    return {{}, std::move(error_), false};
  }
  if (!declaration.empty()) {
    feed(document.substr(0, doctype.begin), false);
    if (error_.empty()) feed(blankOf(declaration), false);
  }
  if (error_.empty()) feed(document.substr(doctype.end), true);
  if (!error_.empty()) return {{}, std::move(error_), false};
  return {builder_.takeRoot(), {}};
}

void XmlReader::fail(std::string_view reason) {
  error_ = "line " + std::to_string(XML_GetCurrentLineNumber(parser_.get())) + ", column " +
           std::to_string(XML_GetCurrentColumnNumber(parser_.get()) + 1) + ": ";
  error_ += reason;
  XML_StopParser(parser_.get(), XML_FALSE);
}

// The width that the attribute gives, 64 without one; 0 after a failure.
int XmlReader::readBits(const XML_Char** attributes, int narrowest) {
  for (; *attributes != nullptr; attributes += 2) {
    if (std::string_view(attributes[0]) != "bits") continue;
    const std::string_view bits = attributes[1];
    if (bits == "8" && narrowest == 8) return 8;
    if (bits == "32") return 32;
    if (bits == "64") return 64;
    fail("no such width in bits");
    return 0;
  }
  return 64;
}

void XmlReader::startElement(std::string_view name, const XML_Char** attributes) {
  const Element element = elementNamed(name);
  if (element == Element::None) return fail("an element that property lists do not have");
  if (!inPlist_) {
    if (element != Element::Plist) return fail("the document does not begin with <plist>");
    inPlist_ = true;
    return;
  }
  if (element == Element::Plist) return fail("<plist> inside <plist>");
  if (open_ != Element::None) return fail("an element inside one that holds text");
  if (element != Element::Key) return startValue(element, attributes);
  if (!builder_.inDictionary()) return fail("a key outside of a dictionary");
  if (builder_.hasKey()) return fail("a key where a value should be");
  open_ = Element::Key;
  text_.clear();
}

void XmlReader::startValue(Element element, const XML_Char** attributes) {
  if (!builder_.takesValue())
    return fail(builder_.isOpen() ? "a value without a key" : "a second value in <plist>");
  if (element == Element::Dictionary || element == Element::Array) {
    const bool isDictionary = element == Element::Dictionary;
    const auto kind = isDictionary ? PlistBuilder::Container::Dictionary : PlistBuilder::Container::Array;
    if (!builder_.open(kind)) fail(kPlistNestingError);
    return;
  }
  open_ = element;
  text_.clear();
  if (element == Element::Integer) bits_ = readBits(attributes, 8);
  if (element == Element::Real) bits_ = readBits(attributes, 32);
}

void XmlReader::endElement() {
  if (open_ == Element::Key) {
    builder_.setKey(text_);
  } else if (open_ != Element::None) {
    endScalar(open_);
  } else if (builder_.hasKey()) {
    fail("a key without a value");
  } else if (builder_.isOpen()) {
    builder_.close();
  } else if (!builder_.hasRoot()) {
    fail("<plist> without a value");
  }
  open_ = Element::None;
}

void XmlReader::endScalar(Element element) {
  const auto valueOf = [](const auto& scalar) {
    return scalar ? std::optional(PlistValue(*scalar)) : std::nullopt;
  };
  if (element == Element::String) return builder_.add(PlistValue::string(std::move(text_)));
  if (element == Element::True || element == Element::False)
    return builder_.add(PlistValue::boolean(element == Element::True));
  if (element == Element::Integer)
    return addOr(valueOf(integerOfText(text_, bits_)), "no integer of that width");
  if (element == Element::Real)
    return addOr(valueOf(realOfText(text_, bits_)), "no real number of that width");
  if (element == Element::Date) return addOr(valueOf(dateOfText(text_)), "no date");
  auto bytes = bytesOfBase64(text_);
  addOr(bytes ? std::optional(PlistValue::data(std::move(*bytes))) : std::nullopt, "no base64 text");
}

void XmlReader::addOr(std::optional<PlistValue> value, const char* reason) {
  if (!value) return fail(reason);
  builder_.add(std::move(*value));
}

void XmlReader::characters(std::string_view text) {
  if (open_ != Element::None && open_ != Element::True && open_ != Element::False) {
    text_ += text;
  } else if (!std::ranges::all_of(text, isXmlSpace)) {
    fail("text where only elements may be");
  }
}

}  // namespace

PlistParseResult parseXmlPlist(std::span<const std::byte> bytes) {
  // The parser's interface is char; these are the same bytes.
  return XmlReader().parse({reinterpret_cast<const char*>(bytes.data()), bytes.size()});
}

}  // namespace tbdaily
