// SPDX-License-Identifier: Apache-2.0
#include "cli/ManualPage.h"

#include <fmt/format.h>

#include "cli/version.h"

namespace quilt::cli {

namespace {

/// Text as roff prints it: hyphens that can be copied, no line taken for a request.
std::string roff(std::string_view text) {
  std::string out;
  for (const char c : text) {
    if (c == '\\') {
      out += "\\e";
    } else if (c == '-') {
      out += "\\-";
    } else if ((c == '.' || c == '\'') && (out.empty() || out.back() == '\n')) {
      (out += "\\&") += c;
    } else {
      out += c;
    }
  }
  return out;
}

std::string sentence(std::string_view text) {
  std::string out(text);
  out.front() = static_cast<char>(std::toupper(static_cast<unsigned char>(out.front())));
  return out + ".";
}

std::string item(std::string_view term, std::string_view text) {
  return fmt::format(".TP\n.B {}\n{}\n", roff(term), roff(text));
}

std::string itemsOf(const std::vector<Option>& options) {
  std::string text;
  for (const Option& option : options) {
    const std::string letter = option.letter.empty() ? "" : std::string(option.letter) + ", ";
    text += item(letter + usageOf(option), option.help);
  }
  return text;
}

constexpr std::string_view kExitCodes =
    "0 done, 1 failed, 2 usage, 3 not found, 4 invalid or damaged input, 5 some of several failed and the rest was "
    "done, 6 locked by another process, 7 no space or I/O error, 130 stopped by Ctrl-C, 143 by SIGTERM.";

std::string head(const std::string& name, std::string_view summary) {
  return fmt::format(".TH {} 1 \"\" \"quilt {}\" \"User Commands\"\n.SH NAME\n{} \\- {}\n", roff(name), version(),
                     roff(name), roff(summary));
}

std::string programPage() {
  std::string text = head("quilt", "make and keep interactive media packages");
  text += ".SH SYNOPSIS\n.B quilt\n.I COMMAND\n.RI [ ARGUMENT \" ...]\"\n";
  text += ".SH COMMANDS\n";
  for (const CommandDescription& command : commands())
    text += item(command.name, sentence(command.summary) + " See quilt-" + std::string(command.name) + "(1).");
  text += ".SH OPTIONS OF EVERY COMMAND\n" + itemsOf(commonOptions());
  text += item("--", "After it nothing is an option.");
  text += fmt::format(".SH EXIT STATUS\n{}\n", roff(kExitCodes));
  return text;
}

std::string commandPage(const CommandDescription& command) {
  const std::string name = "quilt-" + std::string(command.name);
  std::string text = head(name, command.summary);
  text += fmt::format(".SH SYNOPSIS\n{}\n", roff(usageOf(command)));
  text += fmt::format(".SH DESCRIPTION\n{}\n", roff(sentence(command.summary)));
  if (!command.details.empty()) text += fmt::format(".PP\n{}", roff(command.details));
  if (!command.positionals.empty()) text += ".SH ARGUMENTS\n";
  for (const Positional& positional : command.positionals) text += item(positional.name, positional.help);
  if (const auto options = optionsOf(command); !options.empty()) text += ".SH OPTIONS\n" + itemsOf(options);
  text += ".SH SEE ALSO\nquilt(1) has the options of every command and the exit status.\n";
  return text;
}

}  // namespace

std::string manualPage(const CommandDescription* command) { return command ? commandPage(*command) : programPage(); }

}  // namespace quilt::cli
