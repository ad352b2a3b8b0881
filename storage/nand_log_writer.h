// The NAND log: a dictionary of NAND health values as a small text log that is submitted at most once every
// seven days. Its text, in UTF-8:
//
//   System ID: ...
//   Hardware Model: ...
//   OS Version: ...
//   Date: 2026-11-16 09:07:04 -0800
//   Incident ID: ...
//   Faultdesk Key: ...
//
//   2026-11-16 09:07:04 -0800 tbdaily[412]: UserWamp:2.50;NumFlushes:7;ValidityList[2]:3,0,12
#pragma once

#include <string>
#include <string_view>

#include "platform/device_answers.h"
#include "platform/platform.h"
#include "platform/plist_value.h"

namespace tbdaily {

// Writes the numbers of `info`, and those of its arrays that hold a number, in the order of the dictionary;
// other entries are left out. `logType` is decimal text. Does nothing when `info` is null. When the last
// attempt, kept in the job's own preferences, is less than seven days ago, says so in the system log and does
// nothing; an attempt counts whether or not the log could be written. An exception of a service (anything
// derived from std::exception) ends the call with a line in the system log; anything else thrown is passed
// on.
void NLW_WriteLog(Platform& platform, std::string_view logType, const PlistDictionary* info);

// The device's answer "InverseDeviceID", or "error" when that is not a string.
std::string GetFaultdeskKey(DeviceAnswers& answers);

}  // namespace tbdaily
