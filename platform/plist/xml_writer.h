// Writes the XML encoding of property lists.
#pragma once

#include "platform/property_list_codec.h"

namespace tbdaily {

// May throw std::bad_alloc.
PlistWriteResult writeXmlPlist(const PlistValue& value, PlistForm form);

}  // namespace tbdaily
