// SPDX-License-Identifier: Apache-2.0
#include "cli/Completions.h"

#include <fmt/format.h>

#include "cli/Options.h"

namespace quilt::cli {

namespace {

std::vector<Option> allOptionsOf(const CommandDescription& command) {
  std::vector<Option> options = optionsOf(command);
  options.insert(options.end(), commonOptions().begin(), commonOptions().end());
  return options;
}

std::string words(const std::vector<std::string_view>& all) { return fmt::format("{}", fmt::join(all, " ")); }

std::string namesOf(const std::vector<Option>& options) {
  std::vector<std::string_view> names;
  for (const Option& option : options) {
    names.push_back(option.name);
    if (!option.letter.empty()) names.push_back(option.letter);
  }
  return words(names);
}

std::vector<std::string_view> commandNames() {
  std::vector<std::string_view> names;
  for (const CommandDescription& command : commands()) names.push_back(command.name);
  return names;
}

/// Text between single quotes, for a shell in which `quote` stands for one inside of them.
std::string quoted(std::string_view text, std::string_view quote) {
  std::string out = "'";
  for (const char c : text) c == '\'' ? out.append(quote) : out.append(1, c);
  return out + "'";
}

std::string inShell(std::string_view text) { return quoted(text, "'\\''"); }
std::string inFish(std::string_view text) { return quoted(text, "\\'"); }

/// Every choice that the command's arguments have; the commands themselves for help.
std::vector<std::string_view> choicesOf(const CommandDescription& command) {
  std::vector<std::string_view> choices;
  for (const Positional& positional : command.positionals) {
    choices.insert(choices.end(), positional.choices.begin(), positional.choices.end());
    if (positional.name == "COMMAND") choices = commandNames();
  }
  return choices;
}

// The part of a description that zsh would take for its own syntax is escaped.
std::string zshText(std::string_view text) {
  std::string out;
  for (const char c : text) {
    if (c == '[' || c == ']' || c == ':' || c == '\\') out += '\\';
    out += c;
  }
  return out;
}

std::string zshSpec(const Option& option) {
  const std::string value = option.value.empty()     ? ""
                            : option.choices.empty() ? fmt::format(":{}:_files", option.value)
                                                     : fmt::format(":{}:({})", option.value, words(option.choices));
  std::string spec;
  for (const std::string_view name : {option.name, option.letter})
    if (!name.empty())
      spec += " " + inShell(fmt::format("{}{}[{}]{}", option.repeats ? "*" : "", name, zshText(option.help), value));
  return spec;
}

}  // namespace

std::string bashCompletion() {
  std::string text =
      "# Completions of quilt for bash.\n"
      "_quilt() {\n"
      "  local word=${COMP_WORDS[COMP_CWORD]} previous=${COMP_WORDS[COMP_CWORD - 1]} command= i\n"
      "  COMPREPLY=()\n"
      "  for ((i = 1; i < COMP_CWORD; ++i)); do\n"
      "    case ${COMP_WORDS[i]} in\n";
  for (const Option& option : commonOptions())
    if (!option.value.empty()) text += fmt::format("      {}) ((++i)) ;;\n", option.name);
  text +=
      "      -*) ;;\n"
      "      *) command=${COMP_WORDS[i]}; break ;;\n"
      "    esac\n"
      "  done\n"
      "  local options= choices=\n"
      "  case $command in\n";
  text += fmt::format("    '') options={}; choices={} ;;\n", inShell(namesOf(commonOptions())),
                      inShell(words(commandNames())));
  for (const CommandDescription& command : commands())
    text += fmt::format("    {}) options={}; choices={} ;;\n", command.name, inShell(namesOf(allOptionsOf(command))),
                        inShell(words(choicesOf(command))));
  text +=
      "  esac\n"
      "  case $command$previous in\n";
  const auto valueCases = [&text](std::string_view command, const std::vector<Option>& options) {
    for (const Option& option : options) {
      if (option.value.empty()) continue;
      text += option.choices.empty() ? fmt::format("    {}{}) return ;;\n", command, option.name)
                                     : fmt::format("    {}{}) COMPREPLY=($(compgen -W {} -- \"$word\")); return ;;\n",
                                                   command, option.name, inShell(words(option.choices)));
    }
  };
  valueCases("", commonOptions());
  for (const CommandDescription& command : commands()) valueCases(command.name, allOptionsOf(command));
  text +=
      "  esac\n"
      "  [[ $word == -* ]] && choices=$options\n"
      "  COMPREPLY=($(compgen -W \"$choices\" -- \"$word\"))\n"
      "}\n"
      "complete -o default -F _quilt quilt";
  return text;
}

std::string zshCompletion() {
  std::string text =
      "#compdef quilt\n"
      "# Completions of quilt for zsh.\n"
      "_quilt() {\n"
      "  local context state line\n"
      "  local -a commands\n"
      "  commands=(\n";
  for (const CommandDescription& command : commands())
    text += "    " + inShell(fmt::format("{}:{}", command.name, zshText(command.summary))) + "\n";
  text += "  )\n  _arguments -C";
  for (const Option& option : commonOptions()) text += zshSpec(option);
  text +=
      " '1:command:->command' '*::argument:->argument'\n"
      "  case $state in\n"
      "    command) _describe command commands ;;\n"
      "    argument)\n"
      "      case $line[1] in\n";
  for (const CommandDescription& command : commands()) {
    text += fmt::format("        {}) _arguments", command.name);
    for (const Option& option : allOptionsOf(command)) text += zshSpec(option);
    const auto choices = choicesOf(command);
    text += choices.empty()
                ? " '*:argument:_files' ;;\n"
                : " " + inShell(fmt::format("1:argument:({})", words(choices))) + " '*:argument:_files' ;;\n";
  }
  text +=
      "      esac ;;\n"
      "  esac\n"
      "}\n"
      "_quilt \"$@\"";
  return text;
}

std::string fishCompletion() {
  std::string text = "# Completions of quilt for fish.";
  const auto addOption = [&text](const std::string& condition, const Option& option) {
    text += "\ncomplete -c quilt" + condition;
    for (const std::string_view name : {option.name, option.letter}) {
      if (name.starts_with("--")) {
        text += fmt::format(" -l {}", name.substr(2));
      } else if (!name.empty()) {
        text += fmt::format(" -s {}", name.substr(1));
      }
    }
    if (!option.value.empty()) text += " -r";
    if (!option.choices.empty()) text += " -f -a " + inFish(words(option.choices));
    text += " -d " + inFish(option.help);
  };
  for (const Option& option : commonOptions()) addOption("", option);
  for (const CommandDescription& command : commands()) {
    text += fmt::format("\ncomplete -c quilt -n __fish_use_subcommand -f -a {} -d {}", command.name,
                        inFish(command.summary));
    const std::string condition = fmt::format(" -n '__fish_seen_subcommand_from {}'", command.name);
    for (const Option& option : optionsOf(command)) addOption(condition, option);
    if (const auto choices = choicesOf(command); !choices.empty())
      text += "\ncomplete -c quilt" + condition + " -f -a " + inFish(words(choices));
  }
  return text;
}

}  // namespace quilt::cli
