// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "tests/support/MediaFixtures.h"
#include "tests/support/QuiltProgram.h"

namespace quilt::support {
namespace {

using nlohmann::json;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::SizeIs;

/// A library with one document "movie" of one movie with sound.
class CheckCommandTest : public QuiltProgramTest {
 protected:
  void SetUp() override {
    MediaSpec spec;
    spec.duration = 1;
    std::filesystem::copy_file(makeMedia(spec), folder() / "movie.mp4");
    const json imported = quiltJson({"import", folder() / "movie.mp4"})["result"][0];
    package = imported["path"].get<std::string>();
    uuid = imported["uuid"];
    derivative =
        package / quiltJson({"show", uuid})["result"]["Media"][0]["Sources"][0]["Derivatives"][0]["RelativePath"]
                      .get<std::string>();
  }

  /// The one finding, which makes the command fail.
  json finding(const Arguments& arguments = {"check"}) const {
    const json findings = quiltJson(arguments, 4)["result"];
    EXPECT_THAT(findings, SizeIs(1)) << findings;
    return findings.empty() ? json() : findings[0];
  }

  std::filesystem::path package;
  std::string uuid;
  std::filesystem::path derivative;
};

TEST_F(CheckCommandTest, AGoodLibraryHasNoFindings) {
  const Snapshot before = snapshot(library());
  const Ended run = quilt({"check"});
  EXPECT_EQ(0, run.exit) << run.err;
  EXPECT_EQ("", run.out);
  EXPECT_EQ(before, snapshot(library()));
  EXPECT_THAT(quiltJson({"check", uuid})["result"], IsEmpty());
}

TEST_F(CheckCommandTest, AMissingFileIsFound) {
  std::filesystem::remove(derivative);
  const json found = finding();
  EXPECT_EQ("missing", found["kind"]);
  EXPECT_EQ(derivative.native(), found["path"]);
  EXPECT_EQ(uuid, found["uuid"]);
  const Ended run = quilt({"check", "movie"});
  EXPECT_EQ(4, run.exit);
  EXPECT_THAT(run.out, HasSubstr(uuid + "\tmissing\t" + derivative.native() + "\t"));
  EXPECT_THAT(run.err, HasSubstr("1 finding in 1 document"));
}

TEST_F(CheckCommandTest, AFileOfAnotherSizeIsFound) {
  write(derivative, read(derivative) + "x");
  EXPECT_EQ("size", finding()["kind"]);
}

TEST_F(CheckCommandTest, AFileThatNoRecordNamesIsFound) {
  write(derivative.parent_path() / "stray.mp4", "stray");
  const json found = finding();
  EXPECT_EQ("unreferenced", found["kind"]);
  EXPECT_THAT(found["path"].get<std::string>(), HasSubstr("stray.mp4"));
}

TEST_F(CheckCommandTest, ALinkOutOfThePackageIsFound) {
  std::filesystem::remove(derivative);
  std::filesystem::create_symlink(folder() / "movie.mp4", derivative);
  EXPECT_EQ("outside", finding()["kind"]);
}

TEST_F(CheckCommandTest, ANameThatLeadsOutIsFoundAndNotFollowed) {
  std::string record = read(package / "properties.plist");
  const std::string name = derivative.filename().native();
  const std::string element = "<string>" + name + "</string>";
  ASSERT_NE(std::string::npos, record.find(element));
  record.replace(record.find(element), element.size(), "<string>../../" + name + "</string>");
  write(package / "properties.plist", record);
  const json findings = quiltJson({"check"}, 4)["result"];
  ASSERT_FALSE(findings.empty());
  EXPECT_EQ("outside", findings[0]["kind"]);
}

TEST_F(CheckCommandTest, ADamagedRecordIsFound) {
  write(package / "properties.plist", "no record");
  const json found = finding();
  EXPECT_EQ("damaged", found["kind"]);
  EXPECT_EQ((package / "properties.plist").native(), found["path"]);
}

TEST_F(CheckCommandTest, ADocumentThatIsNotThereIsNotFound) { EXPECT_EQ(3, quilt({"check", "nothing"}).exit); }

}  // namespace
}  // namespace quilt::support
