#include "storage/nand_log_writer.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <cstdio>
#include <ctime>
#include <exception>
#include <optional>
#include <span>

#include "platform/kernel.h"
#include "platform/log_submission.h"
#include "platform/plist_text.h"
#include "platform/preferences_store.h"
#include "platform/system_log.h"

namespace tbdaily {

namespace {

constexpr std::string_view kLastLoggedKey = "SSLastLoggedAt";
constexpr double kSecondsBetweenLogs = 604800;  // seven days
constexpr std::string_view kLogName = "StorageStatus";
constexpr std::string_view kFaultdeskKeyQuestion = "InverseDeviceID";
constexpr std::string_view kNoFaultdeskKey = "error";

bool isTooEarly(Platform& platform, PlistDate now) {
  const PlistValue last = platform.preferences.ownValue(kLastLoggedKey);
  const auto date = last.asDate();
  if (!date || !(now.secondsSinceReference - date->secondsSinceReference < kSecondsBetweenLogs)) return false;
  const PlistValue current(now);
  const std::array<LogArgument, 2> arguments = {last, current};
  platform.systemLog.writePlain(
      formatLogMessage("NANDLogWriter:Last written at %@ current %@ :skipped", arguments, true));
  return true;
}

// "2026-11-16 09:07:04 -0800", in the time zone that the device is in now. A time that no calendar holds is
// told as 1970-01-01.
std::string localDateText(PlistDate date) {
  const auto seconds = static_cast<std::time_t>(
      saturatingInt64(std::floor(date.secondsSinceReference) + PlistDate::kUnixEpochOffset));
  constexpr std::time_t kEpoch = 0;
  const std::tm* local = std::localtime(&seconds);
  if (local == nullptr) local = std::gmtime(&kEpoch);
  std::array<char, 64> year, rest;
  std::snprintf(year.data(), year.size(), "%04lld", local->tm_year + 1900LL);
  std::strftime(rest.data(), rest.size(), "-%m-%d %H:%M:%S %z", local);
  return std::string(year.data()).append(rest.data());
}

std::string twoDecimals(double value) {
  std::array<char, 512> buffer;  // the longest text has 309 digits before the point
  const auto end =
      std::to_chars(buffer.data(), buffer.data() + buffer.size(), value, std::chars_format::fixed, 2).ptr;
  return {buffer.data(), end};
}

bool isNumber(const PlistValue& value) {
  return value.asNumber() || value.asBoolean();
}

std::string joinedElements(const PlistArray& elements) {
  std::string text;
  for (const PlistValue& element : elements) {
    if (&element != &elements.front()) text += ',';
    text += plistText(element);
  }
  return text;
}

// What follows the key and the colon, or nothing for an entry that is not written.
std::optional<std::string> entryText(const PlistValue& value) {
  if (const PlistArray* elements = value.asArray()) {
    if (!std::ranges::any_of(*elements, isNumber)) return std::nullopt;
    return joinedElements(*elements);
  }
  if (!isNumber(value)) return std::nullopt;
  const auto number = value.asNumber();
  return number && number->isReal() ? twoDecimals(number->toDouble()) : plistText(value);
}

std::string entryLines(const PlistDictionary& info) {
  std::string lines;
  bool isFirst = true;
  for (const auto& [key, value] : info) {
    const auto text = entryText(value);
    if (!text) continue;
    if (!isFirst) lines += ';';
    isFirst = false;
    lines.append(key).append(":").append(*text);
  }
  return lines;
}

std::string bodyLine(Kernel& kernel, const std::string& date, const PlistDictionary& info) {
  const std::string lines = entryLines(info);
  std::string body(date);
  body.append(" ").append(kernel.processName());
  body.append("[").append(std::to_string(kernel.processIdentifier())).append("]: ");
  return body.append(lines).append("\n");
}

// The services are asked in the order of the lines.
std::string header(Platform& platform, const std::string& date) {
  LogSubmission& submission = platform.logSubmission;
  std::string text("System ID: ");
  text.append(submission.systemIdentifier());
  text.append("\nHardware Model: ").append(submission.hardwareModel());
  text.append("\nOS Version: ").append(submission.systemVersion());
  text.append("\nDate: ").append(date);
  text.append("\nIncident ID: ").append(submission.incidentIdentifier());
  text.append("\nFaultdesk Key: ").append(GetFaultdeskKey(platform.deviceAnswers));
  return text.append("\n\n");
}

void writeLog(Platform& platform, std::string_view logType, const PlistDictionary* info) {
  const PlistDate now = platform.kernel.currentTime();
  if (isTooEarly(platform, now) || info == nullptr) return;
  const std::string date = localDateText(now);
  const std::string body = bodyLine(platform.kernel, date, *info);
  const std::string text = header(platform, date).append(body);
  platform.logSubmission.writeLogForSubmission(
      logType, kLogName, PlistValue(), PlistValue(),
      [&text](LogOutput& output) { return output.write(std::as_bytes(std::span(text))); });
  platform.preferences.setOwnValue(kLastLoggedKey, PlistValue(now));
  platform.preferences.synchronizeOwn();
}

}  // namespace

void NLW_WriteLog(Platform& platform, std::string_view logType, const PlistDictionary* info) {
  try {
    writeLog(platform, logType, info);
  } catch (const std::exception& exception) {
    platform.systemLog.writePlain(std::string("An exception occurred: ").append(exception.what()));
  }
}

std::string GetFaultdeskKey(DeviceAnswers& answers) {
  const PlistValue key = answers.copyAnswer(kFaultdeskKeyQuestion);
  return std::string(key.asString().value_or(kNoFaultdeskKey));
}

}  // namespace tbdaily
