// Property lists as bytes: reads the XML and the binary encoding, writes XML.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <span>
#include <string>

#include "platform/plist_value.h"

namespace tbdaily {

// Plain: the elements alone, whole-second dates; for other programs. A character that XML cannot carry is
// replaced by U+FFFD. Exact: number widths and fractions of a second are kept, so that it reads back equal in
// value and kind; such a character is an error. Carried: exact, but for such a character, which is replaced.
enum class PlistForm : std::uint8_t { Exact, Plain, Carried };

struct PlistParseResult {
  PlistValue value;             // none on failure
  std::string error;            // one line with the place in the input; empty on success
  bool ranOutOfMemory = false;  // a failure that says nothing about the input
};

struct PlistWriteResult {
  bool ok = false;
  std::string bytes;
  std::string error;  // one line; empty on success
};

// Takes a piece of what is written; false ends the writing.
using PlistPieceSink = std::function<bool(std::span<const std::byte> piece)>;

class PropertyListCodec {
 public:
  virtual ~PropertyListCodec() = default;

  virtual PlistParseResult parse(std::span<const std::byte> bytes) = 0;
  virtual PlistWriteResult write(const PlistValue& value, PlistForm form = PlistForm::Exact) = 0;
  // Why the value cannot be written in the plain form, in one line; empty when it can.
  virtual std::string whyNotPlain(const PlistValue& value) = 0;
  // The same bytes, piece by piece as they come to be: the result's stay empty.
  virtual PlistWriteResult writeInPieces(const PlistValue& value, PlistForm form,
                                         const PlistPieceSink& sink) = 0;
};

}  // namespace tbdaily
