// tallyctl whitelist: which keys may leave the device, and why.

#include <CLI/CLI.hpp>

#include "platform/file_system.h"
#include "platform/platform_with.h"
#include "platform/plist_text.h"
#include "platform/property_list_codec.h"
#include "report/tb_config.h"
#include "tools/tallyctl/captured_log.h"
#include "tools/tallyctl/tool.h"
#include "tools/tallyctl/whitelist_lint.h"

namespace tbdaily {

namespace {

PlistArray texts(const std::vector<std::string>& lines) {
  PlistArray array;
  for (const std::string& line : lines) array.push_back(PlistValue::string(line));
  return array;
}

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
};

PlistDictionary describe(const KeyAnswer& answer) {
  const auto& match = answer.match;
  const auto text = [](std::string_view t) { return PlistValue::string(std::string(t)); };
  const bool listed = match && match->by != MatchKind::Internal;
  return {{"key", PlistValue::string(answer.key)},
          {"kind", text(nameOf(answer.kind))},
          {"allowed", PlistValue::boolean(match.has_value())},
          {"by", match ? text(nameOf(match->by)) : jsonNull()},
          {"entry", listed ? text(match->entry) : jsonNull()},
          {"group", listed ? text(match->group) : jsonNull()},
          {"options", match ? PlistValue::dictionary(*match->options) : jsonNull()}};
}

void printAnswer(Terminal& out, const KeyAnswer& answer) {
  std::string line = "  " + printable(answer.key) + " as a " + std::string(nameOf(answer.kind)) + ": ";
  if (!answer.match) return out.line(line + out.styled("not reported", Style::Dim));
  const WhitelistMatch& match = *answer.match;
  line += out.styled("reported", Style::Good);
  if (match.by == MatchKind::Internal) {
    line += ", since the device is internal";
  } else {
    line += " by the " + std::string(nameOf(match.by)) + (match.by == MatchKind::Exact ? " entry " : " ") +
            printable(match.entry) + " of " + printable(match.group);
  }
  line += match.options->empty() ? ", unchanged"
                                 : ", with " + printable(plistText(PlistValue::dictionary(*match.options)));
  out.line(line);
}

void check(Tool& tool, const std::vector<std::string>& keys) {
  CapturedLog log;
  Platform platform = platformWith(tool.platform().services(), log);
  const auto config = TBConfig::init(platform);
  if (!config)
    return tool.fail(log.errors().empty() ? "the whitelist cannot be loaded" : log.errors().front());

  std::vector<std::string> problems;
  std::vector<std::string> disabled;  // groups that a tasking switched off: nothing odd, but good to know
  for (const CapturedLog::Message& message : log.messages) {
    (message.level == LogLevel::Error ? problems : disabled).push_back(message.text);
  }
  const auto bytes = platform.fileSystem.readFile(kWhitelistPath);
  const PlistValue root = bytes ? platform.propertyListCodec.parse(*bytes).value : PlistValue();
  if (root.asDictionary() != nullptr) {
    for (std::string& oddity : whitelistOddities(*root.asDictionary())) problems.push_back(std::move(oddity));
  }
  std::vector<KeyAnswer> answers;
  for (const std::string& key : keys) {
    for (const KeyKind kind : {KeyKind::Scalar, KeyKind::Distribution}) {
      answers.push_back({key, kind, config->match(kind, key)});
    }
  }

  if (tool.options.json) {
    PlistArray described;
    for (const KeyAnswer& answer : answers) described.push_back(PlistValue::dictionary(describe(answer)));
    tool.printedAsJson(PlistValue::dictionary({{"digest", PlistValue::string(config->configFileDigest())},
                                               {"internal", PlistValue::boolean(config->isInternalDevice())},
                                               {"problems", PlistValue::array(texts(problems))},
                                               {"keys", PlistValue::array(std::move(described))}}));
    return;
  }
  Terminal& out = tool.out();
  out.line(out.styled("Whitelist", Style::Heading));
  out.line("  digest   " + config->configFileDigest());
  out.line(std::string("  device   ") +
           (config->isInternalDevice() ? "internal: every key is reported" : "ordinary"));
  for (const std::string& line : disabled) out.line("  tasking  " + printable(line));
  out.line("  problems " + (problems.empty() ? "none" : std::to_string(problems.size())));
  for (const std::string& problem : problems) out.line("    " + out.styled(printable(problem), Style::Bad));
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
  checking->callback([&tool, keys] { check(tool, *keys); });
}

}  // namespace tbdaily
