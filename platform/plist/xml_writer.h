// Writes the XML encoding of property lists.
#pragma once

#include "platform/property_list_codec.h"

namespace tbdaily {

// Into the result, or piece by piece into a sink. May throw std::bad_alloc, and what the sink throws.
PlistWriteResult writeXmlPlist(const PlistValue& value, PlistForm form, const PlistPieceSink& sink = nullptr);

// What keeps the value from being written in the plain form; empty when nothing does.
std::string whyNoPlainXmlPlist(const PlistValue& value);

}  // namespace tbdaily
