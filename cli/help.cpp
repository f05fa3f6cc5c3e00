// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>

#include <algorithm>

#include "cli/ActingDelegate.h"
#include "cli/Completions.h"
#include "cli/ManualPage.h"
#include "cli/Options.h"
#include "cli/Text.h"
#include "cli/version.h"

namespace quilt::cli {

namespace {

struct HelpRow {
  std::string name;
  std::string help;
};

std::string table(const char* heading, const std::vector<HelpRow>& rows) {
  if (rows.empty()) return "";
  std::size_t width = 0;
  for (const HelpRow& row : rows) width = std::max(width, columns(row.name));
  std::string text = fmt::format("\n{}:\n", heading);
  for (const HelpRow& row : rows) text += fmt::format("  {}  {}\n", padded(row.name, width), row.help);
  return text;
}

std::vector<HelpRow> rowsOf(const std::vector<Option>& options) {
  std::vector<HelpRow> rows;
  for (const Option& option : options) {
    const std::string letter = option.letter.empty() ? "" : std::string(option.letter) + ", ";
    rows.push_back({letter + usageOf(option), std::string(option.help)});
  }
  return rows;
}

std::string overview() {
  std::vector<HelpRow> rows;
  for (const CommandDescription& command : commands())
    rows.push_back({std::string(command.name), std::string(command.summary)});
  std::string text = "Usage: quilt COMMAND [ARGUMENT...]\n\nMakes and keeps interactive media packages.\n";
  text += table("Commands", rows);
  text += table("Options of every command", rowsOf(commonOptions()));
  text += "\nAfter \"--\" nothing is an option. \"quilt help COMMAND\" tells more.\n";
  text +=
      "\nExit codes: 0 done, 1 failed, 2 usage, 3 not found, 4 invalid or damaged input, 5 some of several failed,\n"
      "6 locked by another process, 7 no space or I/O error, 130 stopped by Ctrl-C, 143 by SIGTERM.";
  return text;
}

std::string explain(const CommandDescription& command) {
  std::string text = "Usage: " + usageOf(command) + "\n\n";
  std::string summary(command.summary);
  summary.front() = static_cast<char>(std::toupper(static_cast<unsigned char>(summary.front())));
  text += summary + ".\n";
  if (!command.details.empty()) (text += "\n") += command.details;
  std::vector<HelpRow> positionals;
  for (const Positional& positional : command.positionals)
    positionals.push_back({std::string(positional.name), std::string(positional.help)});
  text += table("Arguments", positionals);
  text += table("Options", rowsOf(optionsOf(command)));
  text += "\n\"quilt help\" lists the options of every command.";
  return text;
}

}  // namespace

void ActingDelegate::perform(const HelpRequest& request) {
  const CommandDescription* command = request.command ? findCommand(*request.command) : nullptr;
  if (request.command && !command)
    throw Failure(ExitCode::Usage, "There is no command " + inQuotes(*request.command) + "; see \"quilt help\"");
  std::string text;
  if (request.as == "man") {
    text = manualPage(command);
  } else if (request.as == "bash") {
    text = bashCompletion();
  } else if (request.as == "zsh") {
    text = zshCompletion();
  } else if (request.as == "fish") {
    text = fishCompletion();
  } else {
    text = command ? explain(*command) : overview();
  }
  _context.output.object({{"help", text}}, text);
}

void ActingDelegate::perform(const VersionRequest&) {
  _context.output.object({{"name", "quilt"}, {"version", version()}}, std::string("quilt ") + version());
}

}  // namespace quilt::cli
