// tallyctl whitelist: which keys may leave the device, and why.

#include <CLI/CLI.hpp>

#include "platform/platform.h"
#include "platform/plist_text.h"
#include "tools/tallyctl/tool.h"
#include "tools/tallyctl/whitelist_review.h"

namespace tbdaily {

namespace {

std::string_view nameOf(MatchKind kind) {
  return kind == MatchKind::Exact ? "exact" : kind == MatchKind::Prefix ? "prefix" : "internal";
}
std::string_view nameOf(KeyKind kind) {
  return kind == KeyKind::Scalar ? "scalar" : "distribution";
}

struct KeyAnswer {
  std::string key;
  KeyKind kind;
  std::optional<WhitelistMatch> match;
  std::optional<WhitelistMatch> unreadable;  // what keeps it from being reported
};

void writeAnswer(JsonWriter& json, const KeyAnswer& answer) {
  const auto& match = answer.match;
  const bool listed = match && match->by != MatchKind::Internal;
  const auto root = json.object();
  json.add("key", answer.key);
  json.add("kind", nameOf(answer.kind));
  json.add("allowed", match.has_value());
  json.add("by", match ? std::optional(nameOf(match->by)) : std::nullopt);
  json.add("entry", listed ? std::optional(match->entry) : std::nullopt);
  json.add("group", listed ? std::optional(match->group) : std::nullopt);
  json.add("options", match ? PlistValue::dictionary(*match->options) : PlistValue());
}

void writeCheck(JsonWriter& json, const TBConfig& config, const std::vector<std::string>& problems,
                const std::vector<KeyAnswer>& answers) {
  const auto root = json.object();
  json.add("digest", config.configFileDigest());
  json.add("internal", config.isInternalDevice());
  {
    const auto texts = json.array("problems");
    for (const std::string& problem : problems) json.add(problem);
  }
  const auto keys = json.array("keys");
  for (const KeyAnswer& answer : answers) writeAnswer(json, answer);
}

void printAnswer(Terminal& out, const KeyAnswer& answer) {
  ShownText line = "  " + answer.key + " as a " + std::string(nameOf(answer.kind)) + ": ";
  if (answer.unreadable) {
    return out.line(line + out.styled("not reported", Style::Bad) + ": the rules of " +
                    answer.unreadable->entry + " of " + answer.unreadable->group + " cannot be read");
  }
  if (!answer.match) return out.line(line + out.styled("not reported", Style::Dim));
  const WhitelistMatch& match = *answer.match;
  line += out.styled("reported", Style::Good);
  if (match.by == MatchKind::Internal) {
    line += ", since the device is internal";
  } else {
    line += " by the " + ShownText(nameOf(match.by)) + (match.by == MatchKind::Exact ? " entry " : " ") +
            match.entry + " of " + match.group;
  }
  line +=
      match.options->empty() ? ", unchanged" : ", with " + plistText(PlistValue::dictionary(*match.options));
  out.line(line);
}

void check(Tool& tool, const std::vector<std::string>& keys, bool strict) {
  if (!tool.hasUsableRoot()) return;
  const auto review = reviewWhitelist(tool.platform().services());
  if (!tool.hasReadAll()) return;
  const auto& config = review->config;
  const std::vector<std::string>& problems = review->problems;
  if (!config) {
    const std::vector<std::string> errors = review->log.errors();
    return tool.fail(errors.empty() ? "the whitelist cannot be loaded" : errors.front());
  }
  std::vector<std::string> disabled;  // groups that a tasking switched off: nothing odd, but good to know
  for (const CapturedLog::Message& message : review->log.messages) {
    if (message.level != LogLevel::Error) disabled.push_back(message.text);
  }
  std::vector<KeyAnswer> answers;
  for (const std::string& key : keys) {
    for (const KeyKind kind : {KeyKind::Scalar, KeyKind::Distribution}) {
      answers.push_back({key, kind, config->match(kind, key), config->unreadableEntry(kind, key)});
    }
  }

  if (review->isFault || (strict && !problems.empty())) {
    tool.fail(std::string(kWhitelistPath) +
              (review->isFault ? " has rules that cannot be read or options that are unknown"
                               : " has something odd in it"));
  }
  if (tool.printedAsJson([&](JsonWriter& json) { writeCheck(json, *config, problems, answers); })) return;
  Terminal& out = tool.out();
  out.line(out.styled("Whitelist", Style::Heading));
  out.line("  digest   " + config->configFileDigest());
  out.line(std::string("  device   ") +
           (config->isInternalDevice() ? "internal: every key is reported" : "ordinary"));
  for (const std::string& line : disabled) out.line("  tasking  " + line);
  out.line("  problems " + (problems.empty() ? "none" : std::to_string(problems.size())));
  for (const std::string& problem : problems) out.line("    " + out.styled(problem, Style::Bad));
  if (!answers.empty()) out.line(out.styled("Keys", Style::Heading));
  for (const KeyAnswer& answer : answers) printAnswer(out, answer);
}

}  // namespace

void addWhitelistCommand(CLI::App& app, Tool& tool) {
  CLI::App* command = app.add_subcommand("whitelist", "Look at the key whitelist");
  command->require_subcommand(1);
  auto keys = std::make_shared<std::vector<std::string>>();
  CLI::App* checking = command->add_subcommand("check",
                                               "Validate the whitelist, and say for each key whether it may "
                                               "be reported, by which entry, with which options");
  checking->add_option("KEY", *keys, "Keys to look up");
  auto strict = std::make_shared<bool>(false);
  checking->add_flag("--strict", *strict,
                     "Fail for everything odd, not only for rules that cannot be read and unknown options");
  checking->callback([&tool, keys, strict] { check(tool, *keys, *strict); });
}

}  // namespace tbdaily
