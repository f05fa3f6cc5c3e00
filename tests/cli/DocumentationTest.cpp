// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <sstream>

#include "cli/Completions.h"
#include "cli/ManualPage.h"
#include "cli/Options.h"
#include "tests/support/Program.h"
#include "tests/support/QuiltProgram.h"

namespace quilt::support {
namespace {

using ::testing::HasSubstr;

class DocumentationTest : public QuiltProgramTest {
 protected:
  /// What bash offers for the last of the words.
  std::string completed(const std::string& words) {
    write(folder() / "completion", cli::bashCompletion());
    const std::string script = "source '" + (folder() / "completion").string() + "'; COMP_WORDS=(" + words +
                               "); COMP_CWORD=$((${#COMP_WORDS[@]} - 1)); _quilt; echo \"${COMPREPLY[*]}\"";
    const ProgramResult run = runProgram({"bash", "-c", script});
    EXPECT_EQ(0, run.status) << run.output;
    return run.output;
  }
};

TEST_F(DocumentationTest, EveryCommandAndOptionStandsInTheManual) {
  const std::string manual = cli::manualPage(nullptr);
  for (const cli::CommandDescription& command : cli::commands()) {
    EXPECT_THAT(manual, HasSubstr(std::string(".B ") + std::string(command.name) + "\n"));
    const std::string page = cli::manualPage(&command);
    EXPECT_THAT(page, HasSubstr(".TH quilt\\-" + std::string(command.name) + " 1"));
    for (const cli::Option& option : cli::optionsOf(command)) {
      std::string name;
      for (const char c : option.name) name += c == '-' ? std::string("\\-") : std::string(1, c);
      EXPECT_THAT(page, HasSubstr(name)) << command.name;
    }
  }
}

TEST_F(DocumentationTest, TheManualIsPrintedByTheProgram) {
  const Ended run = quilt({"help", "--as", "man", "import"});
  EXPECT_EQ(0, run.exit);
  EXPECT_EQ(cli::manualPage(cli::findCommand("import")), run.out.substr(0, run.out.size() - 1));
  EXPECT_EQ(2, quilt({"help", "--as", "troff"}).exit);
  EXPECT_EQ(2, quilt({"help", "--as", "bash", "import"}).exit);
}

TEST_F(DocumentationTest, NoLineOfAManualIsTakenForARequestByAccident) {
  for (const cli::CommandDescription& command : cli::commands()) {
    std::istringstream lines(cli::manualPage(&command));
    for (std::string line; std::getline(lines, line);)
      if (line.starts_with('.') || line.starts_with('\'')) {
        EXPECT_TRUE(line.starts_with(".TH ") || line.starts_with(".SH ") || line == ".TP" || line == ".PP" ||
                    line.starts_with(".B "))
            << line;
      }
  }
}

TEST_F(DocumentationTest, BashCompletesCommandsOptionsAndChoices) {
  EXPECT_EQ("import info\n", completed("quilt i"));
  EXPECT_EQ("export\n", completed("quilt --library /tmp ex"));
  EXPECT_EQ("--format\n", completed("quilt export --form"));
  EXPECT_EQ("720p\n", completed("quilt export Talk out --format 7"));
  EXPECT_EQ("auto json none\n", completed("quilt --progress ''"));
  EXPECT_EQ("collection document\n", completed("quilt new ''"));
  EXPECT_EQ("doctor\n", completed("quilt help do"));
  EXPECT_EQ("\n", completed("quilt import ''")) << "left to the shell, which offers files";
}

TEST_F(DocumentationTest, TheScriptsAreValid) {
  write(folder() / "bash", cli::bashCompletion());
  EXPECT_EQ(0, runProgram({"bash", "-n", folder() / "bash"}).status);
  for (const auto& [shell, script] :
       {std::pair{"zsh", cli::zshCompletion()}, std::pair{"fish", cli::fishCompletion()}}) {
    if (runProgram({"sh", "-c", std::string("command -v ") + shell}).status != 0) continue;
    write(folder() / shell, script);
    EXPECT_EQ(0, runProgram({shell, "-n", folder() / shell}).status) << shell;
  }
}

TEST_F(DocumentationTest, EveryCommandStandsInEveryScript) {
  for (const cli::CommandDescription& command : cli::commands())
    for (const std::string& script : {cli::bashCompletion(), cli::zshCompletion(), cli::fishCompletion()})
      EXPECT_THAT(script, HasSubstr(command.name)) << command.name;
}

}  // namespace
}  // namespace quilt::support
