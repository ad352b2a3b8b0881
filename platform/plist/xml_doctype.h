// Finds the document type declaration of an XML document, so that a reader can leave it out. Nothing in it is
// interpreted: what it declares does not exist for the document, whatever it holds and however deep its
// declarations lean on each other.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace tbdaily {

struct DoctypePlace {
  std::size_t begin = 0,
              end = 0;  // byte offsets; equal when there is no whole declaration in front of the root element
};

DoctypePlace findDoctype(std::string_view document);

// White space with as many lines and as many characters in the last line: what follows keeps its line and
// column.
std::string blankOf(std::string_view text);

}  // namespace tbdaily
