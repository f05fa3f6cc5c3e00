// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "cli/Request.h"

namespace quilt::cli {

/// The one description of the command line: parsing, help, completions and man pages all come from it.

struct Option {
  std::string_view name;    ///< "--collection"
  std::string_view letter;  ///< "-q"; empty: none
  std::string_view value;   ///< what the value is called in help; empty: a switch
  std::string_view help;
  bool repeats = false;
  std::vector<std::string_view> choices = {};  ///< empty: any value; case does not matter
};

struct Positional {
  std::string_view name;
  std::string_view help;
  bool required = true;
  bool repeats = false;
  std::vector<std::string_view> choices = {};
};

/// What the parser found for one command, each value under its option's name or positional's name.
class Arguments {
 public:
  void add(std::string_view name, std::string value) { _values[std::string(name)].push_back(std::move(value)); }
  [[nodiscard]] bool has(std::string_view name) const { return _values.contains(std::string(name)); }
  [[nodiscard]] std::vector<std::string> all(std::string_view name) const;
  [[nodiscard]] std::optional<std::string> first(std::string_view name) const;

 private:
  std::map<std::string, std::vector<std::string>> _values;
};

struct CommandDescription {
  std::string_view name;
  std::string_view summary;  ///< one line
  std::string_view details;  ///< paragraphs of help, lines as they are to be printed
  std::vector<Positional> positionals;
  std::vector<Option> options;
  bool writes = false;  ///< changes the library or the disk, and so has --wait and --dry-run
  /// Makes the request; throws a Failure for what the table cannot express.
  Command (*request)(const Arguments& arguments) = nullptr;
};

const std::vector<Option>& commonOptions();
const std::vector<CommandDescription>& commands();
const CommandDescription* findCommand(std::string_view name);
/// The command's own options, with --wait and --dry-run when it writes.
std::vector<Option> optionsOf(const CommandDescription& command);

/// "--collection C", as usage lines show it.
std::string usageOf(const Option& option);
/// "quilt import FILE... [--collection C]".
std::string usageOf(const CommandDescription& command);

}  // namespace quilt::cli
