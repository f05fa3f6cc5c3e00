// SPDX-License-Identifier: Apache-2.0
// The program under a kill, or a failing disk, at each call by which it changes the disk: every command that writes
// leaves the old state or the new one, loses nothing, tells the right exit code, and what it leaves hidden goes with
// the next command. An ordinary run takes a share of the calls; with QUILT_FAULT_WALK=whole it takes them all.
#include <gmock/gmock.h>

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <optional>

#include "quilt/platform/base/TemporaryNames.h"
#include "tests/support/ImageFixtures.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/QuiltProgram.h"

#ifdef QUILT_FAULTS

namespace quilt::support {
namespace {

namespace fs = std::filesystem;
using nlohmann::json;

/// What people see of a library and of a folder of exports.
using State = std::string;

/// A command, and what goes before and after it.
struct Command {
  const char* name;
  std::vector<std::vector<std::string>> before;  ///< what makes the library that the command finds
  std::vector<std::string> arguments;
  std::vector<std::string> next;  ///< the next command of somebody who goes on working
};

std::ostream& operator<<(std::ostream& out, const Command& command) { return out << command.name; }

/// Every call of the operating system, or every so-manieth, other ones for each kind of fault.
class Share {
 public:
  explicit Share(std::size_t first) : _next(first) {
    const char* asked = std::getenv("QUILT_FAULT_WALK");
    _step = asked && std::string(asked) == "whole" ? 1 : 0;
  }
  std::size_t begin(std::size_t total) {
    constexpr std::size_t kRunsOfAFault = 4;
    if (_step == 1) return 1;
    _step = std::max<std::size_t>(1, total / kRunsOfAFault);
    return 1 + _next % _step;
  }
  [[nodiscard]] std::size_t step() const { return _step; }

 private:
  std::size_t _next;
  std::size_t _step;
};

class ProgramFaultsTest : public QuiltProgramTest, public ::testing::WithParamInterface<Command> {
 protected:
  ProgramFaultsTest() { environment["XDG_CACHE_HOME"] = folder() / "cache"; }

  void SetUp() override {
    makeInputs();
    for (const auto& arguments : GetParam().before) {
      const Ended run = quilt(named(arguments));
      ASSERT_EQ(0, run.exit) << run.err;
    }
    rememberItems();
    fs::create_directories(out());
    fs::create_directories(library());
    fs::copy(library(), folder() / "kept", fs::copy_options::recursive);
    old = state();
    countCalls();
    renewed = state();
    ASSERT_GT(calls, 0U);
  }

  fs::path out() const { return folder() / "out"; }

  /// The words with the names of real files in them.
  std::vector<std::string> named(std::vector<std::string> words) const {
    for (std::string& word : words) {
      if (word == "OUT") word = out();
      if (word.starts_with("ITEM:")) word = items.at(word.substr(5));
      if (word.starts_with("FILE:")) word = folder() / "in" / word.substr(5);
    }
    return words;
  }

  void restore() const {
    for (const fs::path& path : {library(), out()}) fs::remove_all(path);
    fs::copy(folder() / "kept", library(), fs::copy_options::recursive);
    fs::create_directories(out());
  }

  /// Runs the command with the call failing, or with no error number killed in its place.
  Ended runWithFault(std::size_t call, std::optional<int> error) {
    const auto plain = environment;
    setFaults();
    environment["QUILT_FAULT_AT"] = std::to_string(call);
    if (error) environment["QUILT_FAULT_ERROR"] = std::to_string(*error);
    Ended run = quilt(named(GetParam().arguments));
    environment = plain;
    return run;
  }

  /// Documents with what is in them, and what was exported, without identities and dates.
  State state() const {
    std::string text;
    const Ended listed = quilt({"--json", "list"});
    if (listed.exit == 0)
      for (const json& collection : listed.json()["result"])
        for (const json& document : collection.value("documents", json::array())) text += describe(document);
    std::vector<std::string> exported;
    if (fs::exists(out()))
      for (const auto& entry : fs::directory_iterator(out()))
        if (!entry.path().filename().native().starts_with('.')) exported.push_back(entry.path().filename());
    std::sort(exported.begin(), exported.end());
    for (const std::string& name : exported) text += "exported " + name + "\n";
    return text;
  }

  std::string describe(const json& document) const {
    const std::string uuid = document["uuid"];
    const Ended shown = quilt({"--json", "show", uuid});
    if (shown.exit != 0) return "a damaged document: " + shown.err;
    json record = shown.json()["result"];
    std::string text = "document " + record.value("Title", "none") + ", " + record.value("Description", "") + "\n";
    for (const json& item : record.value("Media", json::array())) {
      text += "  item " + item.value("Title", "none") + "\n";
      for (const json& source : item.value("Sources", json::array()))
        text += "    source of " + std::to_string(source.value("Derivatives", json::array()).size()) + "\n";
      text += "    extras " + std::to_string(item.value("Extras", json::array()).size()) + "\n";
    }
    return text;
  }

  /// Nothing of the library and the exports is hidden, but the locks' own files.
  std::vector<std::string> hidden() const {
    std::vector<std::string> names;
    for (const fs::path& root : {library(), out()})
      for (const auto& entry : fs::recursive_directory_iterator(root))
        if (platform::isHiddenTemporaryName(entry.path().filename().native()))
          names.push_back(entry.path().lexically_relative(folder()));
    return names;
  }

  /// The next command works, and after it nothing is wrong and nothing is hidden.
  void expectSound() const {
    const Ended next = quilt(named(GetParam().next));
    EXPECT_EQ(0, next.exit) << next.err;
    const Ended checked = quilt({"check"});
    EXPECT_EQ(0, checked.exit) << checked.out << checked.err;
    EXPECT_THAT(hidden(), ::testing::IsEmpty());
  }

  std::map<std::string, std::string> items;  ///< of the first document, by their titles
  State old;
  State renewed;
  std::size_t calls = 0;

 private:
  void makeInputs() const {
    const fs::path in = folder() / "in";
    fs::create_directories(in);
    MediaSpec film;
    film.duration = 1;
    film.width = 1920;
    film.height = 1080;
    film.frameRate = 5;
    film.keyFrameInterval = 5;
    fs::copy_file(makeMedia(film), in / "film.mp4");
    MediaSpec sound = m4aSound();
    sound.duration = 1;
    fs::copy_file(makeMedia(sound), in / "sound.m4a");
    writeFile(in / "picture.png", encode(quadrants(1000, 800), {.suffix = ".png"}));
  }

  void rememberItems() {
    const Ended shown = quilt({"--json", "show", "Talk"});
    if (shown.exit != 0) return;
    for (const json& item : shown.json()["result"].value("Media", json::array())) items[item["Title"]] = item["UUID"];
  }

  void setFaults() {
    environment["LD_PRELOAD"] = QUILT_FAULTS;
    environment["QUILT_FAULT_ROOTS"] = library().string() + ":" + out().string();
  }

  void countCalls() {
    const auto plain = environment;
    setFaults();
    environment["QUILT_FAULT_COUNT"] = folder() / "count";
    const Ended run = quilt(named(GetParam().arguments));
    environment = plain;
    EXPECT_EQ(0, run.exit) << run.err;
    std::ifstream(folder() / "count") >> calls;
  }
};

TEST_P(ProgramFaultsTest, AKillLeavesTheOldStateOrTheNewOne) {
  Share share(7);
  for (std::size_t call = share.begin(calls); call <= calls; call += share.step()) {
    SCOPED_TRACE(std::string(GetParam().name) + " is killed at call " + std::to_string(call) + " of " +
                 std::to_string(calls));
    restore();
    const Ended run = runWithFault(call, std::nullopt);
    EXPECT_TRUE(run.exit == -SIGKILL || run.exit == 0) << run.exit << run.err;
    const State found = state();
    EXPECT_TRUE(found == old || found == renewed) << "was:\n" << old << "is:\n" << found << "may be:\n" << renewed;
    expectSound();
    if (HasFailure()) return;
  }
}

TEST_P(ProgramFaultsTest, AFailingCallIsToldAndChangesNothingOrIsNoFailure) {
  Share share(3);
  for (std::size_t call = share.begin(calls); call <= calls; call += share.step()) {
    const int error = call % 2 == 0 ? EIO : ENOSPC;
    SCOPED_TRACE(std::string(GetParam().name) + " meets error " + std::to_string(error) + " at call " +
                 std::to_string(call) + " of " + std::to_string(calls));
    restore();
    const Ended run = runWithFault(call, error);
    const State found = state();
    if (run.exit == 0) {
      EXPECT_EQ(renewed, found) << run.err;
    } else {
      EXPECT_EQ(7, run.exit) << run.err;
      EXPECT_EQ(old, found) << run.err;
    }
    expectSound();
    if (HasFailure()) return;
  }
}

const std::vector<std::string> kMakeTalk{"new", "document", "Talk"};
const std::vector<std::string> kAddFilm{"add", "Talk", "FILE:film.mp4", "--title", "Film"};
const std::vector<std::string> kAddPicture{"add", "Talk", "FILE:picture.png", "--title", "Picture"};
const std::vector<std::string> kDescribe{"set", "Talk", "keywords=next"};

INSTANTIATE_TEST_SUITE_P(
    Commands, ProgramFaultsTest,
    ::testing::Values(
        Command{"NewDocument", {kMakeTalk}, {"new", "document", "Second"}, {"new", "document", "Third"}},
        Command{"NewCollection", {kMakeTalk}, {"new", "collection", "Second"}, {"new", "collection", "Third"}},
        Command{"Import", {kMakeTalk}, {"import", "FILE:sound.m4a"}, {"new", "document", "Third"}},
        Command{"Set", {kMakeTalk}, {"set", "Talk", "description=new words"}, kDescribe},
        Command{"SetPoster", {kMakeTalk}, {"set", "Talk", "poster=FILE:picture.png"}, kDescribe},
        Command{"AddSound", {kMakeTalk}, {"add", "Talk", "FILE:sound.m4a"}, kDescribe},
        Command{"AddPicture", {kMakeTalk}, kAddPicture, kDescribe},
        Command{"Move", {kMakeTalk, kAddFilm, kAddPicture}, {"move", "Talk", "ITEM:Film", "--to", "1"}, kDescribe},
        Command{"RemoveItem",
                {kMakeTalk, kAddFilm, kAddPicture},
                {"remove", "ITEM:Film", "--from", "Talk", "--force"},
                kDescribe},
        Command{
            "RemoveDocument", {kMakeTalk, kAddPicture}, {"remove", "Talk", "--force"}, {"new", "document", "Third"}},
        Command{"RemoveCollection",
                {kMakeTalk, kAddPicture, {"new", "collection", "Other"}},
                {"remove", "Imports", "--force"},
                {"new", "document", "Third"}},
        Command{"Convert", {kMakeTalk, kAddFilm}, {"convert", "Talk", "--format", "480p"}, kDescribe},
        Command{"ConvertPicture", {kMakeTalk, kAddPicture}, {"convert", "Talk", "--format", "480p"}, kDescribe},
        Command{"Finalize", {{"import", "FILE:sound.m4a"}, kMakeTalk}, {"finalize", "sound"}, {"finalize", "sound"}},
        Command{"Export", {{"import", "FILE:sound.m4a"}}, {"export", "sound", "OUT"}, {"export", "sound", "OUT"}},
        Command{"ExportZip",
                {{"import", "FILE:sound.m4a"}},
                {"export", "sound", "OUT", "--zip"},
                {"export", "sound", "OUT", "--zip"}}),
    [](const auto& info) { return std::string(info.param.name); });

}  // namespace
}  // namespace quilt::support

#endif
