// SPDX-License-Identifier: Apache-2.0
// What README.md and docs/ tell people to type is run, word for word and in order, from an empty home.
#include <gmock/gmock.h>

#include <fstream>
#include <regex>
#include <set>

#include "tests/support/DocumentFixtures.h"
#include "tests/support/ImageFixtures.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/Program.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::support {
namespace {

namespace fs = std::filesystem;
using ::testing::IsEmpty;

/// Blocks that are not run here, by their first line.
struct NotRun {
  const char* firstLine;
  const char* reason;
};
constexpr NotRun kNotRun[] = {
    {"scripts/demo [FILE...]", "installs packages and builds; continuous integration does what it does"},
    {"cmake --preset release", "builds and installs; tests/consumer/run installs what is built"},
    {"g++ -std=c++20 host.cpp", "needs what is installed; tests/consumer/run types it"},
};

const NotRun* notRun(const std::string& block) {
  for (const NotRun& one : kNotRun)
    if (block.starts_with(one.firstLine)) return &one;
  return nullptr;
}

/// A fenced block of a text, and the name in `backticks` that was the last before it: a file's, when it is no commands.
struct Block {
  std::string language;
  std::string content;
  std::string named;
};

std::vector<Block> blocksOf(const fs::path& text) {
  std::vector<Block> blocks;
  std::ifstream in(text);
  std::string named;
  const std::regex name("`([^` ]+\\.[a-zA-Z]+)`");
  for (std::string line; std::getline(in, line);) {
    if (!line.starts_with("```")) {
      for (std::sregex_iterator found(line.begin(), line.end(), name), end; found != end; ++found) named = (*found)[1];
      continue;
    }
    Block block{line.substr(3), "", named};
    while (std::getline(in, line) && line != "```") block.content += line + "\n";
    blocks.push_back(block);
  }
  return blocks;
}

/// README.md and every text of docs/.
std::vector<fs::path> texts() {
  std::vector<fs::path> all{fs::path(QUILT_SOURCE_FOLDER) / "README.md"};
  for (const auto& entry : fs::directory_iterator(fs::path(QUILT_SOURCE_FOLDER) / "docs"))
    if (entry.path().extension() == ".md") all.push_back(entry.path());
  return all;
}

// What a user has besides the program: a browser, and Ctrl-C for a command that goes on until then.
constexpr const char* kUser = R"(
quilt() {
  [[ $1 == serve ]] || { command quilt "$@"; return; }
  command quilt "$@" >served &
  until grep -q ^http served; do kill -0 $!; sleep 0.1; done
  kill $!
  wait $! || [[ $? == 143 ]]
}
)";

/// A home with nothing in it but the files that the texts name as the user's own.
class DocumentedCommandsTest : public ::testing::Test {
 protected:
  DocumentedCommandsTest() {
    fs::create_directories(home());
    fs::create_directories(_folder / "bin");
    fs::create_symlink(QUILT_PROGRAM, _folder / "bin/quilt");
    writeBytes(_folder / "bin/xdg-open", "#!/bin/sh\n");
    fs::permissions(_folder / "bin/xdg-open", fs::perms::owner_all);
  }

  [[nodiscard]] fs::path home() const { return _folder / "home"; }

  void giveTheUsersFiles() const {
    fs::copy_file(makeMedia({.width = 800, .height = 600}), home() / "talk.mp4");
    fs::copy_file(makeMedia({}), home() / "movie.mp4");
    writeFile(home() / "slides.pdf", makePages(3));
    writeFile(home() / "some-picture.jpg", encode(quadrants(640, 400), {.suffix = ".jpg"}));
  }

  /// In the home, by bash, until the first command that fails.
  ProgramResult type(const std::string& commands) const {
    writeFile(_folder / "commands",
              "set -eE\ntrap 'echo \"This fails: $BASH_COMMAND\"' ERR\ncd\n" + std::string(kUser) + commands);
    return runProgram({"env", "-i", "HOME=" + home().native(), "PATH=" + (_folder / "bin").native() + ":/usr/bin:/bin",
                       "LC_ALL=C.UTF-8", "bash", _folder / "commands"});
  }

  /// Types every block of a text, and writes the files that it shows.
  void follow(const fs::path& text) const {
    for (const Block& block : blocksOf(text)) {
      const bool isAFile = block.language == "xml" || block.language == "html" || block.language == "css" ||
                           block.language == "js" || block.language == "json";
      if (isAFile && !block.named.empty() && fs::exists((home() / block.named).parent_path()))
        writeFile(home() / block.named, block.content);
      if (block.language != "sh" || notRun(block.content)) continue;
      const ProgramResult typed = type(block.content);
      ASSERT_EQ(0, typed.status) << text << "\n" << block.content << typed.output;
    }
  }

 private:
  ScratchFolder _folder;
};

TEST_F(DocumentedCommandsTest, TheReadmeTellsWhatWorks) {
  giveTheUsersFiles();
  follow(fs::path(QUILT_SOURCE_FOLDER) / "README.md");
  if (HasFatalFailure()) return;
  for (const char* made : {"A talk.qpk.zip", "A course.qpk/index.html", "packages/In short.qpk/index.html",
                           ".local/share/bash-completion/completions/quilt"})
    EXPECT_TRUE(fs::is_regular_file(home() / made)) << made;
}

TEST_F(DocumentedCommandsTest, TheThemeOfTheTutorialIsBuiltAndInstalled) {
  giveTheUsersFiles();
  follow(fs::path(QUILT_SOURCE_FOLDER) / "docs/theme-bundle.md");
  if (HasFatalFailure()) return;
  EXPECT_TRUE(fs::is_regular_file(home() / "out/My first theme.qpk/plain.js"));
  EXPECT_THAT(type("quilt themes").output, ::testing::HasSubstr("org.quilt.theme.plain"));
}

TEST_F(DocumentedCommandsTest, NoTextHasCommandsThatAreTypedNowhere) {
  std::vector<std::string> left;
  std::set<const NotRun*> seen;
  for (const fs::path& text : texts())
    for (const Block& block : blocksOf(text)) {
      EXPECT_FALSE(block.language == "bash" || block.language == "console") << text << ": write \"sh\"";
      if (block.language != "sh") continue;
      seen.insert(notRun(block.content));
      const bool isFollowed = text.filename() == "README.md" || text.filename() == "theme-bundle.md";
      if (!isFollowed && !notRun(block.content)) left.push_back(text.filename().native() + ":\n" + block.content);
    }
  EXPECT_THAT(left, IsEmpty()) << "follow that text in a test of its own";
  for (const NotRun& one : kNotRun)
    EXPECT_TRUE(seen.contains(&one)) << one.firstLine << " stands nowhere: " << one.reason;
}

}  // namespace
}  // namespace quilt::support
