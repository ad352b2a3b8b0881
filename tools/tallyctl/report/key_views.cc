#include "tools/tallyctl/report/key_views.h"

#include <array>

#include "tools/tallyctl/sizes.h"

namespace tbdaily {

namespace {

using enum Table::Align;

const char* kindName(KeyKind kind) {
  return kind == KeyKind::Scalar ? "scalar" : "distribution";
}

std::string counted(const std::optional<std::int64_t>& number, KeyKind kind) {
  if (!number) return "-";
  if (kind == KeyKind::Scalar) return std::to_string(*number);
  return std::to_string(*number) + (*number == 1 ? " value" : " values");
}

// "812345 -> 810000, sig_fig 2".
std::string change(const KeyStory& story) {
  std::string text = story.recorded ? counted(story.recorded, story.kind) : "measured";
  if (story.kind == KeyKind::Scalar)
    text += " -> " + counted(story.reported, story.kind);
  else
    text += " -> statistics";
  return text + (story.rule.empty() ? ", as it is" : ", " + story.rule);
}

void printHeading(Terminal& out, const std::string& heading) {
  out.line();
  out.line(out.styled(heading, Style::Heading));
}

}  // namespace

void printKeyStories(Terminal& out, const std::vector<KeyStory>& stories) {
  Table reported({Left, Left}), kept({Left, Right, Left});
  reported.add({"key", "recorded -> reported, rule"});
  kept.add({"key", "recorded", "why it stays"});
  std::size_t leaving = 0;
  for (const KeyStory& story : stories) {
    if (!story.reason.empty()) {
      kept.add({story.key, counted(story.recorded, story.kind), story.reason});
      continue;
    }
    reported.add({story.key, change(story)});
    ++leaving;
  }
  const std::size_t staying = stories.size() - leaving;
  printHeading(out, "From recorded to reported (" + std::to_string(leaving) + ")");
  reported.print(out);
  printHeading(out, "What stays here (" + std::to_string(staying) + ")");
  if (staying == 0) return out.line("  nothing of what was recorded");
  kept.print(out);
}

void writeKeyStories(JsonWriter& json, const std::vector<KeyStory>& stories) {
  const auto root = json.object();
  const auto keys = json.array("keys");
  for (const KeyStory& story : stories) {
    const auto entry = json.object();
    json.add("key", story.key);
    json.add("kind", kindName(story.kind));
    json.add("recorded", story.recorded);
    json.add("reported", story.reported);
    json.add("rule", story.rule.empty() ? std::nullopt : std::optional(story.rule));
    json.add("reason", story.reason.empty() ? std::nullopt : std::optional(story.reason));
  }
}

void printIdentifiability(Terminal& out, const Identifiability& found) {
  double sum = 0;
  std::size_t bounded = 0;
  printHeading(out, "At most so many different values (" + std::to_string(found.keys.size()) + " keys)");
  Table table({Left, Left, Right, Right, Left});
  table.add({"key", "kind", "values", "bits", ""});
  for (const KeyIdentifiability& key : found.keys) {
    const auto bits = key.bits();
    if (bits) sum += *bits, ++bounded;
    table.add({key.key, kindName(key.kind), key.values ? std::to_string(*key.values) : "unbounded",
               bits ? withDigits(*bits, 1) : "-", key.followsValues ? "the statistics say each value" : ""});
  }
  table.print(out);
  out.line("  " + std::to_string(bounded) + " keys with a bound, at most " + withDigits(sum, 1) +
           " bits together; " + std::to_string(found.keys.size() - bounded) + " without one");
  printHeading(out, "Beside the whitelisted keys");
  for (const std::string& name : found.outside) out.line("  " + name);
  out.line();
  out.line("Upper bounds by the whitelist's rules for one report; no promise of privacy.");
}

void writeIdentifiability(JsonWriter& json, const Identifiability& found) {
  const auto root = json.object();
  {
    const auto keys = json.array("keys");
    for (const KeyIdentifiability& key : found.keys) {
      const auto entry = json.object();
      json.add("key", key.key);
      json.add("kind", kindName(key.kind));
      json.add("values", key.values);
      json.add("bits", key.bits());
      json.add("followsValues", key.followsValues);
    }
  }
  const auto outside = json.array("outside");
  for (const std::string& name : found.outside) json.add(name);
}

void printOtherLogs(Terminal& out, const std::vector<OtherLog>& logs) {
  static constexpr std::array<const char*, 3> kStates{"waits", "the run would write", "the run would add"};
  printHeading(out, "Other logs (" + std::to_string(logs.size()) + ")");
  if (logs.empty()) return out.line("  none waits, and a run would write none");
  Table table({Left, Left, Right});
  table.add({"log", "", "size"});
  for (const OtherLog& log : logs)
    table.add({log.name, kStates.at(static_cast<std::size_t>(log.state)), sizeText(log.bytes)});
  table.print(out);
}

}  // namespace tbdaily
