#include "tools/tallyctl/help/completion.h"

#include <algorithm>
#include <array>
#include <string_view>
#include <vector>

#include "tools/tallyctl/help/command_tree.h"

namespace tbdaily {

namespace {

// What completes the value of an option or argument, by the name that stands for it in the help.
struct ValueKind {
  std::string_view value;  // "DRIVER"
  std::string_view kind;   // as "complete" takes it; "files" and "folders" are the shell's own
};
constexpr std::array<ValueKind, 18> kValueKinds{{
    {"FILE", "files"},
    {"DIR", "folders"},
    {"DRIVER", "drivers"},
    {"GROUP", "groups"},
    {"SUBGROUP", "subgroups"},
    {"CHANNEL", "channels"},
    {"UNIT", "units"},
    {"FORMAT", "formats"},
    {"ROWS", "exports"},
    {"TABLE", "tables"},
    {"KEY", "keys"},
    {"FIGURE", "figures"},
    {"SWITCH", "switches"},
    {"KIND", "buffers"},
    {"NAME,...", "recordings"},
    {"NOTIFICATION", "notifications"},
    {"DAY", "days"},
    {"COMMAND", "commands"},
}};

// Empty when there is none.
std::string_view completionKindOf(std::string_view value) {
  const auto* found = std::ranges::find(kValueKinds, value, &ValueKind::value);
  return found != kValueKinds.end() ? found->kind : std::string_view();
}

// One command with what it completes.
struct Place {
  std::string path;  // "metrics sample"; empty for the program
  const CLI::App* command;
};

void collect(const CLI::App& command, const std::string& path, std::vector<Place>& places) {
  places.push_back({path, &command});
  for (const CLI::App* below : commandsOf(command))
    collect(*below, path.empty() ? below->get_name() : path + " " + below->get_name(), places);
}

std::vector<OptionDeclaration> namedOptions(const CLI::App& command) {
  std::vector<OptionDeclaration> options = optionsOf(command);
  std::erase_if(options, [](const OptionDeclaration& option) { return option.isPositional; });
  const auto common = commonOptionsOf(programOf(command));
  options.insert(options.end(), common.begin(), common.end());
  return options;
}

// The kind of each positional in turn; the last one goes on where it takes many.
std::vector<std::string> positionalKinds(const CLI::App& command) {
  std::vector<std::string> kinds;
  for (const OptionDeclaration& option : optionsOf(command)) {
    if (option.isPositional) kinds.emplace_back(completionKindOf(option.value));
    if (option.isPositional && option.isMany) kinds.back() += "...";
  }
  return kinds;
}

std::string inQuotes(std::string_view text) {
  std::string safe = "'";
  for (const char c : text) {
    if (c == '\'')
      safe += "'\\''";
    else
      safe += c;
  }
  return safe + "'";
}

// What all three scripts have: a line for each place, "path|options with their kinds|kinds of
// arguments|commands". An option is "--name", or "--name=kind" where it takes a value.
struct Line {
  std::string path, options, arguments, commands;
};

std::vector<Line> linesOf(const CLI::App& program) {
  std::vector<Place> places;
  collect(program, "", places);
  std::vector<Line> lines;
  const auto add = [](std::string& words, const std::string& word) {
    words.append(words.empty() ? "" : " ").append(word);
  };
  for (const Place& place : places) {
    Line line;
    line.path = place.path;
    for (const OptionDeclaration& option : namedOptions(*place.command)) {
      for (const std::string& name : option.names) {
        add(line.options, name);
        if (!option.value.empty()) line.options.append("=").append(completionKindOf(option.value));
      }
    }
    for (const std::string& kind : positionalKinds(*place.command))
      add(line.arguments, kind.empty() ? "none" : kind);
    for (const CLI::App* below : commandsOf(*place.command)) add(line.commands, below->get_name());
    lines.push_back(std::move(line));
  }
  return lines;
}

// Finds the place of the words before the cursor, then says what may stand there: lines "word", or "=kind".
constexpr std::string_view kWalk = R"sh(
# What may stand behind the words "$@": each on a line, "=KIND" for values of that kind. Sets _tallyctl_root.
_tallyctl_candidates() {
  local place="" line option word wants="" count=0 skip=""
  _tallyctl_root=()
  for word in "$@"; do
    if [ -n "$skip" ]; then
      [ "$skip" = --root ] && _tallyctl_root=(--root "$word")
      skip=""
      continue
    fi
    line=$(_tallyctl_place "$place")
    case $word in
      --root=*) _tallyctl_root=(--root "${word#--root=}") ;;
      --*=*) ;;
      -*)
        for option in $(printf '%s' "$line" | cut -d'|' -f1); do
          [ "${option%%=*}" = "$word" ] && [ "$option" != "$word" ] && skip=$word && wants=${option#*=}
        done
        ;;
      *)
        if _tallyctl_has "$(printf '%s' "$line" | cut -d'|' -f3)" "$word"; then
          place="${place:+$place }$word"
        else
          count=$((count + 1))
        fi
        ;;
    esac
  done
  if [ -n "$skip" ]; then
    printf '=%s\n' "$wants"
    return
  fi
  line=$(_tallyctl_place "$place")
  for word in $(printf '%s' "$line" | cut -d'|' -f3); do printf '%s\n' "$word"; done
  for word in $(printf '%s' "$line" | cut -d'|' -f2); do
    if [ "$count" -eq 0 ] || [ "$word" != "${word%...}" ]; then
      printf '=%s\n' "${word%...}"
      break
    fi
    count=$((count - 1))
  done
  for option in $(printf '%s' "$line" | cut -d'|' -f1); do printf '%s\n' "${option%%=*}"; done
}
_tallyctl_has() {
  local word
  for word in $1; do [ "$word" = "$2" ] && return 0; done
  return 1
}
)sh";

std::string placeFunction(const CLI::App& program) {
  std::string text =
      "# Options, with \"=KIND\" where they take a value, kinds of arguments, and commands of each "
      "place.\n_tallyctl_place() {\n  case $1 in\n";
  for (const Line& line : linesOf(program))
    text += "    " + inQuotes(line.path) + ") printf '%s' " +
            inQuotes(line.options + "|" + line.arguments + "|" + line.commands) + " ;;\n";
  return text + "  esac\n}\n";
}

constexpr std::string_view kBash = R"sh(
_tallyctl() {
  local candidate value cur=${COMP_WORDS[COMP_CWORD]}
  local -a words=("${COMP_WORDS[@]:1:COMP_CWORD-1}") _tallyctl_root=()
  # The shell takes "=" for a word of its own.
  if [ "$cur" = "=" ]; then
    cur=""
  elif [ "$COMP_CWORD" -gt 1 ] && [ "${words[-1]}" = "=" ]; then
    unset 'words[-1]'
  fi
  COMPREPLY=()
  _tallyctl_candidates "${words[@]}" >/dev/null
  while IFS= read -r candidate; do
    case $candidate in
      =files) compopt -o filenames; mapfile -t -O "${#COMPREPLY[@]}" COMPREPLY < <(compgen -f -- "$cur") ;;
      =folders) compopt -o filenames; mapfile -t -O "${#COMPREPLY[@]}" COMPREPLY < <(compgen -d -- "$cur") ;;
      =none | =) ;;
      =*)
        while IFS= read -r value; do
          [[ $value == "$cur"* || $(printf %q "$value") == "$cur"* ]] && COMPREPLY+=("$(printf %q "$value")")
        done < <(tallyctl "${_tallyctl_root[@]}" complete "${candidate#=}" 2>/dev/null)
        ;;
      -*) [[ -n $cur && $candidate == "$cur"* ]] && COMPREPLY+=("$candidate") ;;
      *) [[ $candidate == "$cur"* ]] && COMPREPLY+=("$candidate") ;;
    esac
  done < <(_tallyctl_candidates "${words[@]}")
}
complete -F _tallyctl tallyctl
)sh";

constexpr std::string_view kZsh = R"sh(
_tallyctl() {
  emulate -L zsh -o sh_word_split
  local candidate cur=$words[CURRENT]
  local -a before=("${(@Q)words[2,CURRENT-1]}") found=() options=() values=() _tallyctl_root=()
  _tallyctl_candidates "$before[@]" >/dev/null
  for candidate in "${(@f)$(_tallyctl_candidates "$before[@]")}"; do
    case $candidate in
      '=files') _files ;;
      '=folders') _files -/ ;;
      '=none' | '=' | '') ;;
      '='*) values=("${(@f)$(tallyctl "$_tallyctl_root[@]" complete "${candidate#=}" 2>/dev/null)}"); compadd -a values ;;
      -*) options+=("$candidate") ;;
      *) found+=("$candidate") ;;
    esac
  done
  compadd -a found
  [[ -n $cur ]] && compadd -a options
  return 0
}
if [ "$funcstack[1]" = _tallyctl ]; then _tallyctl "$@"; else compdef _tallyctl tallyctl; fi
)sh";

std::string fishScript(const CLI::App& program) {
  std::string text = R"sh(# Completion of tallyctl for fish; made from the declarations of its commands.
function __tallyctl_words
    set -l words (commandline -opc)
    set -e words[1]
    printf '%s\n' $words
end
# Whether the words before the cursor, without options and their values, begin with exactly these commands.
function __tallyctl_at
    set -l place
    set -l skip 0
    for word in (__tallyctl_words)
        if test $skip = 1
            set skip 0
            continue
        end
        if string match -qr -- '^--?[a-z]' $word
            contains -- $word $__tallyctl_valued; and set skip 1
            continue
        end
        set -a place $word
    end
    set -l depth (count $argv)
    test (count $place) -ge $depth; or return 1
    test $depth -gt 0; and test "$place[1..$depth]" != "$argv"; and return 1
    # A command further down is a place of its own.
    set -l next (math $depth + 1)
    if test (count $place) -ge $next
        contains -- "$place[1..$next]" $__tallyctl_places; and return 1
    end
    return 0
end
function __tallyctl_values
    set -l root
    set -l words (__tallyctl_words)
    for i in (seq (count $words))
        switch $words[$i]
            case --root
                set -q words[(math $i + 1)]; and set root --root $words[(math $i + 1)]
            case '--root=*'
                set root $words[$i]
        end
    end
    tallyctl $root complete $argv[1] 2>/dev/null
end
complete -c tallyctl -f
)sh";
  std::vector<Place> places;
  collect(program, "", places);
  std::string names = "set -g __tallyctl_places", valued = "set -g __tallyctl_valued", entries;
  for (const Place& place : places) {
    if (!place.path.empty()) names += " " + inQuotes(place.path);
    const std::string at = "complete -c tallyctl -n " + inQuotes("__tallyctl_at " + place.path);
    for (const CLI::App* below : commandsOf(*place.command))
      entries += at + " -a " + below->get_name() + " -d " + inQuotes(below->get_description()) + "\n";
    for (const std::string& kind : positionalKinds(*place.command)) {
      const std::string plain = kind.substr(0, kind.find('.'));
      if (plain == "files" || plain == "folders")
        entries += at + " -F\n";
      else if (!plain.empty())
        entries += at + " -a " + inQuotes("(__tallyctl_values " + plain + ")") + "\n";
    }
    for (const OptionDeclaration& option : namedOptions(*place.command)) {
      entries += at;
      for (const std::string& name : option.names)
        entries += name.starts_with("--") ? " -l " + name.substr(2) : " -s " + name.substr(1);
      const std::string_view kind = completionKindOf(option.value);
      if (kind == "files" || kind == "folders")
        entries += " -r -F";
      else if (!kind.empty())
        entries += " -x -a " + inQuotes("(__tallyctl_values " + std::string(kind) + ")");
      else if (!option.value.empty())
        entries += " -x";
      entries += " -d " + inQuotes(option.says) + "\n";
      if (option.value.empty()) continue;
      for (const std::string& name : option.names) {
        if (valued.find(" " + name + " ") == std::string::npos && !valued.ends_with(" " + name))
          valued += " " + name;
      }
    }
  }
  return text + names + "\n" + valued + "\n" + entries;
}

}  // namespace

std::string completionScript(const CLI::App& program, Shell shell) {
  switch (shell) {
    case Shell::Bash:
      return "# Completion of tallyctl for bash; made from the declarations of its commands.\n" +
             placeFunction(program) + std::string(kWalk) + std::string(kBash);
    case Shell::Zsh:
      return "#compdef tallyctl\n# Completion of tallyctl for zsh; made from the declarations of its "
             "commands.\n" +
             placeFunction(program) + std::string(kWalk) + std::string(kZsh);
    default:
      return fishScript(program);
  }
}

}  // namespace tbdaily
