// One channel's names and values in words.
#pragma once

#include <string>
#include <vector>

#include "platform/plist_value.h"
#include "tools/tallyctl/metrics/values.h"

namespace tbdaily {

// "-" for a number that is missing.
std::string numberText(std::int64_t value);
// "12.5%"; "-" for a share that is not a number.
std::string percentage(double share);

// The identifier, in hexadecimal, in place of a missing name.
std::string nameOf(const ChannelValues& channel);
std::string stateName(const StateValues& state);
// Driver, group and subgroup, those that there are.
std::vector<std::string> pathOf(const ChannelValues& channel);
// "driver/group/subgroup/name".
std::string wholeName(const ChannelValues& channel);

std::string withUnit(const std::string& value, const ChannelValues& channel);
// The hits of all buckets; kKdReportInvalid when those of one are missing.
std::int64_t allHits(const ChannelValues& channel);
// The value with its unit; of a state channel the current state, of a histogram its hits; "-" for none.
std::string shortValue(const ChannelValues& channel);

// One line: the time, then "name=value unit" of each channel, two spaces apart. Of a name that several
// channels have the whole is written.
std::string valuesLine(PlistDate time, const std::vector<ChannelValues>& channels);

}  // namespace tbdaily
