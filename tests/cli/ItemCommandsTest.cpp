// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <csignal>

#include "tests/support/ImageFixtures.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/QuiltProgram.h"

namespace quilt::support {
namespace {

using nlohmann::json;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::SizeIs;

/// A document "Talk" without items.
class ItemCommandsTest : public QuiltProgramTest {
 protected:
  void SetUp() override { quiltJson({"new", "document", "Talk", "--type", "Static"}); }

  std::filesystem::path movie(const std::string& name, double duration = 1) const {
    MediaSpec spec;
    spec.duration = duration;
    return copied(makeMedia(spec), name);
  }
  std::filesystem::path sound(const std::string& name) const {
    MediaSpec spec = m4aSound();
    spec.duration = 1;
    return copied(makeMedia(spec), name);
  }
  std::filesystem::path image(const std::string& name) const {
    return writeFile(folder() / name, encode(quadrants(64, 48), {.suffix = ".jpg"}));
  }
  std::filesystem::path copied(const std::filesystem::path& file, const std::string& name) const {
    std::filesystem::copy_file(file, folder() / name);
    return folder() / name;
  }

  json items() const { return quiltJson({"show", "Talk"})["result"]["Media"]; }
  std::filesystem::path package() const { return quiltJson({"show", "Talk"})["result"]["path"].get<std::string>(); }
  std::vector<std::string> titles() const {
    std::vector<std::string> all;
    const json result = quiltJson({"show", "Talk"})["result"];
    if (!result.contains("Media")) return all;
    for (const json& item : result["Media"]) all.push_back(item["Title"]);
    return all;
  }
  std::string added(const Arguments& arguments) const { return quiltJson(arguments)["result"][0]["uuid"]; }
  void addThree() const { quiltJson({"add", "Talk", image("a.jpg"), image("b.jpg"), image("c.jpg"), image("d.jpg")}); }
  std::string idOf(const std::string& title) const {
    for (const json& item : items())
      if (item["Title"] == title) return item["UUID"];
    return {};
  }
};

using AddCommandTest = ItemCommandsTest;

TEST_F(AddCommandTest, MakesAnItemOfEachSource) {
  const Ended run = quilt({"add", "Talk", movie("one.mp4"), image("two.jpg"), "https://example.org/three"});
  EXPECT_EQ(0, run.exit) << run.err;
  EXPECT_THAT(run.out, ::testing::MatchesRegex("[-0-9A-F]{36}\tMovie\tone\n"
                                               "[-0-9A-F]{36}\tImage\ttwo\n"
                                               "[-0-9A-F]{36}\tWeb\thttps://example.org/three\n"));
  const json all = items();
  ASSERT_THAT(all, SizeIs(3));
  EXPECT_EQ(run.out.substr(0, 36), all[0]["UUID"]);
  for (const json& item : all) EXPECT_EQ(true, item["Sources"][0]["Derivatives"][0]["IsFlattened"]) << item["Title"];
}

TEST_F(AddCommandTest, CopiesTheFilesAndLeavesTheOriginalsAlone) {
  const std::filesystem::path file = movie("one.mp4");
  const std::string before = read(file);
  const json item = quiltJson({"add", "Talk", file})["result"][0];
  EXPECT_EQ(before, read(file));
  std::filesystem::remove(file);
  const json derivative = items()[0]["Sources"][0]["Derivatives"][0];
  const std::filesystem::path copy = package() / derivative["RelativePath"].get<std::string>();
  EXPECT_TRUE(std::filesystem::exists(copy)) << copy;
  EXPECT_THAT(copy.native(), HasSubstr(item["path"].get<std::string>()));
}

TEST_F(AddCommandTest, TakesATitleAndTheTitleInTheFile) {
  MediaSpec named;
  named.duration = 1;
  named.tags = {{"title", "A walk"}};
  quiltJson({"add", "Talk", copied(makeMedia(named), "x.mp4")});
  quiltJson({"add", "Talk", image("b.jpg"), "--title", "The gate"});
  EXPECT_THAT(titles(), ElementsAre("A walk", "The gate"));
}

TEST_F(AddCommandTest, MakesOneMontageWithItsTimecodesAndCommentary) {
  const json made = quiltJson({"add", "Talk", image("a.jpg"), image("b.jpg"), "--montage", "--title", "Walk",
                               "--commentary", sound("voice.m4a"), "--timecode", "0", "--timecode", "4.5"})["result"];
  ASSERT_THAT(made, SizeIs(1));
  EXPECT_EQ("Montage", made[0]["category"]);
  const json item = items()[0];
  EXPECT_EQ("Walk", item["Title"]);
  ASSERT_THAT(item["Sources"], SizeIs(2));
  EXPECT_EQ(0, item["Sources"][0]["Timecode"]);
  EXPECT_EQ(4.5, item["Sources"][1]["Timecode"]);
  EXPECT_EQ("voice", item["AudioCommentarySource"]["Title"]);
  EXPECT_EQ(true, item["AudioCommentarySource"]["IsFlattened"]);
}

TEST_F(AddCommandTest, AMontageIsAllOrNothing) {
  EXPECT_EQ(3, quilt({"add", "Talk", image("a.jpg"), "missing.jpg", "--montage"}).exit);
  const Ended run = quilt({"add", "Talk", image("b.jpg"), movie("c.mp4"), "--montage"});
  EXPECT_EQ(4, run.exit);
  EXPECT_THAT(run.err, HasSubstr("A montage is made of images"));
  EXPECT_THAT(titles(), IsEmpty());
}

TEST_F(AddCommandTest, MakesOneDualSourceItemOfTwoThatPlay) {
  const json made = quiltJson({"add", "Talk", movie("speaker.mp4"), movie("slides.mp4"), "--dual"})["result"];
  ASSERT_THAT(made, SizeIs(1));
  EXPECT_EQ("DualSource", made[0]["category"]);
  EXPECT_EQ("speaker", made[0]["title"]);
  EXPECT_THAT(items()[0]["Sources"], SizeIs(2));

  EXPECT_THAT(quilt({"add", "Talk", folder() / "speaker.mp4", "--dual"}).err, HasSubstr("two files, and not of 1"));
  EXPECT_EQ(4, quilt({"add", "Talk", folder() / "speaker.mp4", image("a.jpg"), "--dual"}).exit);
  EXPECT_THAT(items(), SizeIs(1));
}

TEST_F(AddCommandTest, AddsExtrasToAnItem) {
  const std::string item = added({"add", "Talk", movie("one.mp4")});
  const Ended run = quilt({"add", "Talk", image("hand-out.jpg"), sound("voice.m4a"), "--extra-of", item});
  EXPECT_EQ(0, run.exit) << run.err;
  const json extras = items()[0]["Extras"];
  ASSERT_THAT(extras, SizeIs(2));
  EXPECT_EQ(extras[0]["UUID"].get<std::string>() + "\n" + extras[1]["UUID"].get<std::string>() + "\n", run.out);
  EXPECT_EQ("hand-out", extras[0]["Title"]);
  EXPECT_EQ(true, extras[0]["Derivatives"][0]["IsFlattened"]);
  EXPECT_THAT(items(), SizeIs(1));
}

TEST_F(AddCommandTest, ReplacesTheCommentaryOfAnItemWithItsFiles) {
  const std::string item = added({"add", "Talk", image("one.jpg")});
  const std::filesystem::path first =
      quiltJson({"add", "Talk", sound("a.m4a"), "--commentary-of", item})["result"][0]["path"].get<std::string>();
  EXPECT_TRUE(std::filesystem::exists(first));
  const std::string second = added({"add", "Talk", sound("b.m4a"), "--commentary-of", item});
  EXPECT_EQ(second, items()[0]["AudioCommentarySource"]["UUID"]);
  EXPECT_FALSE(std::filesystem::exists(first));

  const Ended run = quilt({"add", "Talk", folder() / "one.jpg", "--commentary-of", item});
  EXPECT_EQ(4, run.exit);
  EXPECT_THAT(run.err, HasSubstr("It is no audio file"));
  EXPECT_EQ(second, items()[0]["AudioCommentarySource"]["UUID"]);
}

TEST_F(AddCommandTest, WhatCannotBeAddedIsToldAndTheRestIsDone) {
  write(folder() / "notes.txt", "text");
  write(folder() / "fake.mp4", "no movie");
  const Ended run =
      quilt({"add", "Talk", "missing.mp4", image("a.jpg"), folder() / "notes.txt", folder(), folder() / "fake.mp4"});
  EXPECT_EQ(5, run.exit);
  EXPECT_THAT(run.err, HasSubstr("Cannot use \"missing.mp4\": There is no such file"));
  EXPECT_THAT(run.err, HasSubstr("notes.txt\": Files of type public.plain-text cannot be shown"));
  EXPECT_THAT(run.err, HasSubstr("It is a folder, not a file"));
  EXPECT_THAT(run.err, HasSubstr("fake.mp4"));
  EXPECT_THAT(titles(), ElementsAre("a"));
}

TEST_F(AddCommandTest, WhatIsNotThereIsNotFound) {
  EXPECT_EQ(3, quilt({"add", "Nothing", image("a.jpg")}).exit);
  EXPECT_EQ(3, quilt({"add", "Talk", folder() / "a.jpg", "--extra-of", "nothing"}).exit);
  EXPECT_EQ(3, quilt({"add", "Talk", "missing.jpg"}).exit);
  EXPECT_THAT(titles(), IsEmpty());
}

TEST_F(AddCommandTest, AFileUrlIsAFile) {
  image("a.jpg");
  EXPECT_EQ("Image", quiltJson({"add", "Talk", "file://" + (folder() / "a.jpg").native()})["result"][0]["category"]);
  EXPECT_EQ(4, quilt({"add", "Talk", "https://exa mple.org"}).exit);
}

TEST_F(AddCommandTest, ADryRunAddsNothing) {
  const Snapshot before = snapshot(library());
  const Ended run = quilt({"add", "Talk", image("a.jpg"), "https://example.org/", "--dry-run"});
  EXPECT_EQ(0, run.exit) << run.err;
  EXPECT_EQ(
      "Would add the Image item \"a\" to the document \"Talk\"\n"
      "Would add the Web item \"https://example.org/\" to the document \"Talk\"\n",
      run.out);
  EXPECT_EQ(before, snapshot(library()));
}

TEST_F(AddCommandTest, AFullPackageIsLeftAsItWas) {
  quiltJson({"add", "Talk", image("a.jpg")});
  const Snapshot before = snapshot(package());
  // A file where the folder of the items has to be.
  std::filesystem::rename(package() / "media", folder() / "media");
  write(package() / "media", "in the way");
  const Ended run = quilt({"add", "Talk", movie("b.mp4")});
  EXPECT_NE(0, run.exit);
  EXPECT_THAT(run.err, HasSubstr("Cannot add \"b\""));
  std::filesystem::remove(package() / "media");
  std::filesystem::rename(folder() / "media", package() / "media");
  EXPECT_THAT(titles(), ElementsAre("a"));
  for (const auto& [path, facts] : before) EXPECT_TRUE(snapshot(package()).contains(path)) << path;
}

TEST_F(AddCommandTest, AnInterruptLeavesTheItemsThatAreDone) {
  std::vector<std::string> arguments{"add", "Talk", "--progress=json"};
  const std::filesystem::path source = movie("movie.mp4", 2);
  for (int i = 0; i < 400; ++i) arguments.push_back(source);
  const auto program = start(arguments);
  ASSERT_TRUE(waitUntil([&] { return program->errorsSoFar().find("Adding") != std::string::npos; }));
  program->signal(SIGINT);
  const Ended run = program->wait();
  EXPECT_EQ(130, run.exit) << run.err;
  const auto done = static_cast<std::size_t>(std::count(run.out.begin(), run.out.end(), '\n'));
  EXPECT_LT(done, 400U);
  EXPECT_THAT(titles(), SizeIs(done));
  std::size_t folders = 0;
  if (std::filesystem::exists(package() / "media"))
    for ([[maybe_unused]] const auto& entry : std::filesystem::directory_iterator(package() / "media")) ++folders;
  EXPECT_EQ(done, folders);
}

using MoveCommandTest = ItemCommandsTest;

TEST_F(MoveCommandTest, TheFirstOfTheGroupComesToBeAtTheIndex) {
  addThree();
  EXPECT_EQ(0, quilt({"move", "Talk", idOf("a"), "--to", "2"}).exit);
  EXPECT_THAT(titles(), ElementsAre("b", "c", "a", "d"));
  EXPECT_EQ(0, quilt({"move", "Talk", idOf("d"), idOf("c"), "--to", "0"}).exit);
  EXPECT_THAT(titles(), ElementsAre("c", "d", "b", "a"));
  const Ended run = quilt({"move", "Talk", idOf("c"), idOf("b"), "--to", "1"});
  EXPECT_EQ("", run.out);
  EXPECT_THAT(titles(), ElementsAre("d", "c", "b", "a"));
}

TEST_F(MoveCommandTest, TheCountIsTheEnd) {
  addThree();
  EXPECT_EQ(0, quilt({"move", "Talk", idOf("a"), "--to", "4"}).exit);
  EXPECT_THAT(titles(), ElementsAre("b", "c", "d", "a"));
  const Ended run = quilt({"move", "Talk", idOf("a"), "--to", "5"});
  EXPECT_EQ(2, run.exit);
  EXPECT_THAT(run.err, HasSubstr("There is no place 5: the document \"Talk\" has 4 items"));
}

TEST_F(MoveCommandTest, AllItemsStayWhereTheyAre) {
  addThree();
  EXPECT_EQ(0, quilt({"move", "Talk", idOf("b"), idOf("a"), idOf("d"), idOf("c"), "--to", "3"}).exit);
  EXPECT_THAT(titles(), ElementsAre("a", "b", "c", "d"));
}

TEST_F(MoveCommandTest, AnItemThatIsNotThereMovesNothing) {
  addThree();
  EXPECT_EQ(3, quilt({"move", "Talk", idOf("a"), "nothing", "--to", "2"}).exit);
  EXPECT_EQ("Would move 1 item of the document \"Talk\" to place 2\n",
            quilt({"move", "Talk", idOf("a"), "--to", "2", "--dry-run"}).out);
  EXPECT_THAT(titles(), ElementsAre("a", "b", "c", "d"));
}

TEST_F(MoveCommandTest, JsonListsTheItemsInTheirNewOrder) {
  addThree();
  const json moved = quiltJson({"move", "Talk", idOf("d"), "--to", "0"})["result"];
  ASSERT_THAT(moved, SizeIs(4));
  EXPECT_EQ("d", moved[0]["title"]);
  EXPECT_EQ("c", moved[3]["title"]);
}

using ConvertCommandTest = ItemCommandsTest;

TEST_F(ConvertCommandTest, MakesTheMissingDerivativesOnce) {
  writeFile(folder() / "large.jpg", encode(quadrants(1600, 1200), {.suffix = ".jpg"}));
  quiltJson({"add", "Talk", folder() / "large.jpg"});
  const Ended run = quilt({"convert", "Talk", "--format", "720p", "--format", "480p"});
  EXPECT_EQ(0, run.exit) << run.err;
  EXPECT_THAT(run.out, ::testing::MatchesRegex("[-0-9A-F]{36}\t720p\tlarge\n[-0-9A-F]{36}\t480p\tlarge\n"));
  const json derivatives = items()[0]["Sources"][0]["Derivatives"];
  ASSERT_THAT(derivatives, SizeIs(3));
  EXPECT_EQ(960, derivatives[1]["Width"]);
  EXPECT_EQ(720, derivatives[1]["Height"]);
  EXPECT_EQ(640, derivatives[2]["Width"]);
  for (const json& derivative : derivatives)
    EXPECT_TRUE(std::filesystem::exists(package() / derivative["RelativePath"].get<std::string>()));
  EXPECT_EQ("", quilt({"convert", "Talk", "--format", "720p"}).out);
}

TEST_F(ConvertCommandTest, TellsBothGradesOfAMovieByTheirFormats) {
  MediaSpec film;
  film.duration = 0.4;
  film.width = 1920;
  film.height = 1080;
  quiltJson({"add", "Talk", makeMedia(film)});
  const json made = quiltJson({"convert", "Talk", "--format", "720p", "--format", "480p"})["result"];
  ASSERT_THAT(made, SizeIs(2));
  EXPECT_EQ("720p", made[0]["format"]);
  EXPECT_EQ("480p", made[1]["format"]);
  const json derivatives = items()[0]["Sources"][0]["Derivatives"];
  ASSERT_THAT(derivatives, SizeIs(3));
  EXPECT_EQ(1280, derivatives[1]["Width"]);
  EXPECT_EQ(640, derivatives[2]["Width"]);
}

TEST_F(ConvertCommandTest, WhatIsSmallEnoughStaysAlone) {
  quiltJson({"add", "Talk", image("a.jpg"), "https://example.org/"});
  const json made = quiltJson({"convert", "Talk", "--format", "480p", "--format", "Desktop"})["result"];
  EXPECT_THAT(made, IsEmpty());
}

TEST_F(ConvertCommandTest, ADryRunMakesNothing) {
  writeFile(folder() / "large.jpg", encode(quadrants(1600, 1200), {.suffix = ".jpg"}));
  quiltJson({"add", "Talk", folder() / "large.jpg"});
  const Snapshot before = snapshot(library());
  EXPECT_EQ("Would make what is missing of the format 720p in the document \"Talk\"\n",
            quilt({"convert", "Talk", "--format", "720p", "--dry-run"}).out);
  EXPECT_EQ(before, snapshot(library()));
  EXPECT_EQ(3, quilt({"convert", "Nothing", "--format", "720p"}).exit);
}

}  // namespace
}  // namespace quilt::support
