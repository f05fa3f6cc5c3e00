// SPDX-License-Identifier: Apache-2.0
#include "cli/Parser.h"

#include <strings.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <charconv>
#include <cmath>

#include "cli/Failure.h"
#include "cli/Options.h"
#include "cli/Text.h"

namespace quilt::cli {

namespace {

using Words = std::vector<std::string>;

const Option* commonOption(std::string_view word) {
  for (const Option& option : commonOptions())
    if (word == option.name || (!option.letter.empty() && word == option.letter)) return &option;
  return nullptr;
}

// The first word that is neither an option nor an option's value; the count of words when there is none.
std::size_t placeOfCommand(const Words& words) {
  for (std::size_t i = 0; i < words.size(); ++i) {
    if (words[i] == "--") return std::min(i + 1, words.size());
    if (words[i].size() < 2 || words[i].front() != '-') return i;
    const Option* option = commonOption(words[i]);
    if (option && !option->value.empty()) ++i;
  }
  return words.size();
}

bool standsBeforeFirstDashes(const Words& words, std::string_view word, std::string_view letter = "") {
  for (const std::string& candidate : words) {
    if (candidate == "--") return false;
    if (candidate == word || (!letter.empty() && candidate == letter)) return true;
  }
  return false;
}

std::size_t distance(std::string_view a, std::string_view b) {
  std::vector<std::size_t> row(b.size() + 1);
  for (std::size_t j = 0; j <= b.size(); ++j) row[j] = j;
  for (std::size_t i = 1; i <= a.size(); ++i) {
    std::size_t diagonal = row[0];
    row[0] = i;
    for (std::size_t j = 1; j <= b.size(); ++j) {
      const std::size_t above = row[j];
      row[j] = std::min({above + 1, row[j - 1] + 1, diagonal + (a[i - 1] == b[j - 1] ? 0 : 1)});
      diagonal = above;
    }
  }
  return row[b.size()];
}

Failure unknownCommand(const std::string& name) {
  std::string message = "There is no command " + inQuotes(name);
  for (const CommandDescription& command : commands())
    if (const std::size_t far = distance(name, command.name); far <= 2 && far * 2 < name.size()) {
      message += ", did you mean " + inQuotes(command.name) + "?";
      return {ExitCode::Usage, message};
    }
  return {ExitCode::Usage, message + "; see \"quilt help\""};
}

// The choice as the table spells it.
std::string choose(const std::vector<std::string_view>& choices, const std::string& value, std::string_view name) {
  if (choices.empty()) return value;
  std::string all;
  for (const std::string_view choice : choices) {
    if (strcasecmp(std::string(choice).c_str(), value.c_str()) == 0) return std::string(choice);
    if (!all.empty()) all += choice == choices.back() ? " or " : ", ";
    all += choice;
  }
  throw Failure(ExitCode::Usage, std::string(name) + " is " + all + ", not " + inQuotes(value));
}

std::string seeHelp(const CommandDescription& command) {
  return "; see \"quilt help " + std::string(command.name) + '"';
}

// The options of one command, given to the parser and read back.
class OptionParser {
 public:
  explicit OptionParser(const CommandDescription& command) : _options(optionsOf(command)) {
    _app.set_help_flag();
    _app.allow_extras();
    _options.insert(_options.begin(), commonOptions().begin(), commonOptions().end());
    for (const Option& option : _options) add(option);
  }

  /// The words that belong to no option, in order.
  Words parse(Words words, Arguments& found) {
    std::reverse(words.begin(), words.end());  // the library takes them from the back
    _app.parse(words);
    for (std::size_t i = 0; i < _options.size(); ++i) read(_options[i], *_parsed[i], found);
    return _app.remaining();
  }

 private:
  void add(const Option& option) {
    const std::string names =
        std::string(option.name) + (option.letter.empty() ? "" : "," + std::string(option.letter));
    if (option.value.empty()) {
      _parsed.push_back(_app.add_flag(names));
      return;
    }
    // Without allow_extra_args, a value in brackets is not taken apart as a list.
    CLI::Option* made = _app.add_option(names)->type_size(1)->expected(1)->allow_extra_args(false);
    _parsed.push_back(made->multi_option_policy(CLI::MultiOptionPolicy::TakeAll));
  }

  static void read(const Option& option, const CLI::Option& parsed, Arguments& found) {
    if (option.value.empty()) {
      if (parsed.count() > 0) found.add(option.name, "");
      return;
    }
    if (parsed.count() > 1 && !option.repeats)
      throw Failure(ExitCode::Usage, std::string(option.name) + " is given more than once");
    for (const std::string& value : parsed.results())
      found.add(option.name, choose(option.choices, value, option.name));
  }

  CLI::App _app;
  std::vector<Option> _options;
  std::vector<CLI::Option*> _parsed;  // in the order of _options; owned by _app
};

// Gives each word to its place: one a positional, the rest to one that repeats, which comes last.
void assign(const CommandDescription& command, const Words& words, Arguments& found) {
  std::size_t next = 0;
  for (const Positional& positional : command.positionals) {
    if (next == words.size() && positional.required)
      throw Failure(ExitCode::Usage, std::string(positional.name) + " is missing");
    const std::size_t end = positional.repeats ? words.size() : std::min(next + 1, words.size());
    for (; next < end; ++next) found.add(positional.name, choose(positional.choices, words[next], positional.name));
  }
  if (next < words.size()) throw Failure(ExitCode::Usage, inQuotes(words[next]) + " is one argument too many");
}

Arguments argumentsOf(const CommandDescription& command, Words words) {
  // What follows "--" is never an option.
  const auto dashes = std::find(words.begin(), words.end(), "--");
  const Words verbatim(dashes == words.end() ? dashes : dashes + 1, words.end());
  words.erase(dashes, words.end());
  Arguments found;
  words = OptionParser(command).parse(std::move(words), found);
  for (const std::string& word : words)
    if (word.size() > 1 && word.front() == '-')
      throw Failure(ExitCode::Usage, "There is no option " + inQuotes(word) + " here");
  words.insert(words.end(), verbatim.begin(), verbatim.end());
  assign(command, words, found);
  return found;
}

// A day is as good as for ever, and still a number of milliseconds.
std::chrono::milliseconds readWait(const std::string& value) {
  constexpr double kLongest = 24.0 * 60 * 60;
  double seconds = 0;
  const auto [end, error] = std::from_chars(value.data(), value.data() + value.size(), seconds);
  if (error != std::errc() || end != value.data() + value.size() || !(seconds >= 0))
    throw Failure(ExitCode::Usage, "--wait is a number of seconds, not " + inQuotes(value));
  return std::chrono::milliseconds(std::llround(std::min(seconds, kLongest) * 1000));
}

Settings settingsFrom(const Arguments& arguments) {
  Settings settings;
  settings.library = arguments.first("--library");
  settings.json = arguments.has("--json");
  settings.quiet = arguments.has("--quiet");
  settings.verbose = arguments.has("--verbose");
  settings.noColor = arguments.has("--no-color");
  settings.dryRun = arguments.has("--dry-run");
  if (const auto wait = arguments.first("--wait")) settings.wait = readWait(*wait);
  const std::string progress = arguments.first("--progress").value_or("auto");
  settings.progress = progress == "json"   ? ProgressStyle::Json
                      : progress == "none" ? ProgressStyle::None
                                           : ProgressStyle::Automatic;
  if (settings.quiet && settings.verbose) throw Failure(ExitCode::Usage, "--quiet and --verbose exclude each other");
  if (settings.library && settings.library->empty()) throw Failure(ExitCode::Usage, "--library is empty");
  return settings;
}

Request parseCommand(const CommandDescription& command, Words words) {
  try {
    const Arguments arguments = argumentsOf(command, std::move(words));
    return {settingsFrom(arguments), command.request(arguments)};
  } catch (const CLI::ArgumentMismatch& error) {
    const std::string text = error.what();  // "--collection: 1 required missing"
    throw Failure(ExitCode::Usage, escaped(text.substr(0, text.find(':'))) + " needs a value" + seeHelp(command));
  } catch (const CLI::ParseError& error) {
    throw Failure(ExitCode::Usage, escaped(error.what()) + seeHelp(command));
  } catch (Failure& failure) {
    failure.message += seeHelp(command);
    throw;
  }
}

}  // namespace

bool asksForJson(const Words& arguments) { return standsBeforeFirstDashes(arguments, "--json"); }

Request parse(const Words& arguments) {
  Settings plain;
  plain.json = asksForJson(arguments);
  if (standsBeforeFirstDashes(arguments, "--version")) return {plain, VersionRequest{}};
  const std::size_t place = placeOfCommand(arguments);
  const bool help = standsBeforeFirstDashes(arguments, "--help", "-h");
  if (place == arguments.size()) {
    if (help) return {plain, HelpRequest{}};
    throw Failure(ExitCode::Usage, "No command is given; see \"quilt help\"");
  }
  const std::string& name = arguments[place];
  const CommandDescription* command = findCommand(name);
  if (!command) throw unknownCommand(name);
  if (help) return {plain, HelpRequest{name}};
  Words words = arguments;
  words.erase(words.begin() + static_cast<std::ptrdiff_t>(place));
  return parseCommand(*command, std::move(words));
}

}  // namespace quilt::cli
