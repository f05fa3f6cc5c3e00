// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <csignal>

#include "tests/support/ImageFixtures.h"
#include "tests/support/QuiltProgram.h"

namespace quilt::support {
namespace {

using nlohmann::json;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;

/// A PDF of so many pages with a line of text on each.
std::string pdf(int pages) {
  std::string bytes = "%PDF-1.4\n";
  std::vector<std::size_t> places;
  const auto object = [&](const std::string& content) {
    places.push_back(bytes.size());
    bytes += std::to_string(places.size()) + " 0 obj\n" + content + "\nendobj\n";
  };
  object("<< /Type /Catalog /Pages 2 0 R >>");
  std::string kids;
  for (int page = 0; page < pages; ++page) kids += std::to_string(5 + page) + " 0 R ";
  object("<< /Type /Pages /Kids [" + kids + "] /Count " + std::to_string(pages) + " >>");
  object("<< /Type /Font /Subtype /Type1 /BaseFont /Helvetica >>");
  const std::string text = "BT /F1 24 Tf 72 700 Td (A page) Tj ET";
  object("<< /Length " + std::to_string(text.size()) + " >>\nstream\n" + text + "\nendstream");
  for (int page = 0; page < pages; ++page)
    object(
        "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 595 842] /Contents 4 0 R /Resources << /Font << /F1 3 0 R >> >> "
        ">>");
  const std::size_t table = bytes.size();
  bytes += "xref\n0 " + std::to_string(places.size() + 1) + "\n0000000000 65535 f \n";
  for (const std::size_t place : places) {
    const std::string digits = std::to_string(place);
    bytes += std::string(10 - digits.size(), '0') + digits + " 00000 n \n";
  }
  return bytes + "trailer\n<< /Size " + std::to_string(places.size() + 1) + " /Root 1 0 R >>\nstartxref\n" +
         std::to_string(table) + "\n%%EOF\n";
}

class ExportCommandTest : public QuiltProgramTest {
 protected:
  void import(const std::string& name, const std::string& bytes) const {
    write(folder() / name, bytes);
    ASSERT_EQ(0, quilt({"import", folder() / name}).exit);
  }
  std::filesystem::path out() const { return folder() / "made" / "out"; }
  std::vector<std::string> namesIn(const std::filesystem::path& in) const {
    std::vector<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator(in)) names.push_back(entry.path().filename());
    std::sort(names.begin(), names.end());
    return names;
  }
  std::filesystem::path theme() const {
    write(folder() / "Plain.qth/Info.plist",
          "<?xml version=\"1.0\" encoding=\"UTF-8\"?><plist version=\"1.0\"><dict>"
          "<key>CFBundleIdentifier</key><string>org.example.plain</string>"
          "<key>CFBundleDisplayName</key><string>Plain</string>"
          "<key>CFBundleShortVersionString</key><string>1.0</string></dict></plist>");
    writeFile(folder() / "Plain.qth/Preview.png", encode(quadrants(64, 48), {.suffix = ".png"}));
    write(folder() / "Plain.qth/Template/index.html", "<!doctype html><title>Plain</title>");
    return folder() / "Plain.qth";
  }
};

TEST_F(ExportCommandTest, WritesAPackageIntoAFolderThatItMakesAndPrintsItsPath) {
  import("Notes.pdf", pdf(1));
  const Ended run = quilt({"export", "Notes", out()});
  EXPECT_EQ(0, run.exit) << run.err;
  EXPECT_EQ((out() / "Notes.qpk").string() + "\n", run.out);
  EXPECT_THAT(namesIn(out()), ::testing::ElementsAre("Notes.qpk"));
  const json record = quiltJson({"show", out() / "Notes.qpk"})["result"];
  EXPECT_EQ("PDF", record["Type"]);
  EXPECT_EQ(1U, record["Media"].size());
}

TEST_F(ExportCommandTest, CountsWhenTheNameIsTaken) {
  import("Notes.pdf", pdf(1));
  EXPECT_EQ(0, quilt({"export", "Notes", out()}).exit);
  EXPECT_EQ((out() / "Notes-2.qpk").string(), quiltJson({"export", "Notes", out()})["result"]["path"]);
}

TEST_F(ExportCommandTest, WritesAnArchive) {
  import("Notes.pdf", pdf(1));
  const Ended run = quilt({"export", "Notes", out(), "--zip"});
  EXPECT_EQ(0, run.exit) << run.err;
  EXPECT_THAT(namesIn(out()), ::testing::ElementsAre("Notes.qpk.zip"));
  EXPECT_THAT(read(out() / "Notes.qpk.zip"), ::testing::StartsWith("PK"));
}

TEST_F(ExportCommandTest, TellsTheStagesAndNeverGoesBack) {
  import("Notes.pdf", pdf(3));
  const Ended run = quilt({"export", "Notes", out(), "--zip", "--progress=json"});
  ASSERT_EQ(0, run.exit) << run.err;
  std::istringstream lines(run.err);
  double last = -1;
  std::vector<std::string> stages;
  for (std::string line; std::getline(lines, line);) {
    const json event = json::parse(line);
    EXPECT_GE(event["percent"], last);
    last = event["percent"];
    if (stages.empty() || stages.back() != event["stage"]) stages.push_back(event["stage"]);
  }
  EXPECT_EQ(100, last);
  EXPECT_THAT(stages, ::testing::IsSupersetOf({"Converting", "Finalizing", "Archiving"}));
}

TEST_F(ExportCommandTest, AFormatThatTheContentCannotHaveIsNoSilentLoss) {
  import("Notes.pdf", pdf(1));
  const json info = quiltJson({"info", folder() / "Notes.pdf"})["result"][0];
  const Ended run = quilt({"export", "Notes", out(), "--format", "480p"});
  const bool suits = info["tags"].dump().find("480p") != std::string::npos;
  EXPECT_EQ(suits ? 0 : 4, run.exit) << run.err;
  EXPECT_EQ(suits, std::filesystem::exists(out() / "Notes.qpk"));
}

TEST_F(ExportCommandTest, AnInteractiveDocumentNeedsATheme) {
  ASSERT_EQ(0, quilt({"new", "document", "Talk"}).exit);
  const auto before = snapshot(library());
  const Ended run = quilt({"export", "Talk", out()});
  EXPECT_EQ(2, run.exit);
  EXPECT_THAT(run.err, HasSubstr("It has no theme; name one with --theme"));
  EXPECT_EQ(3, quilt({"export", "Talk", out(), "--theme", "org.example.nowhere"}).exit);
  EXPECT_EQ(4, quilt({"export", "Talk", out(), "--theme", folder()}).exit);
  EXPECT_EQ(before, snapshot(library()));
  EXPECT_FALSE(std::filesystem::exists(folder() / "made"));
}

TEST_F(ExportCommandTest, TheThemeIsSetAndItsTemplateExported) {
  ASSERT_EQ(0, quilt({"new", "document", "Talk"}).exit);
  const Ended run = quilt({"export", "Talk", out(), "--theme", theme()});
  EXPECT_EQ(0, run.exit) << run.err;
  EXPECT_TRUE(std::filesystem::exists(out() / "Talk.qpk/index.html"));
  EXPECT_TRUE(std::filesystem::exists(out() / "Talk.qpk/controllers/data.js"));
  EXPECT_EQ(theme().string(), quiltJson({"show", "Talk"})["result"]["ThemePath"]);
}

TEST_F(ExportCommandTest, AWrongDestinationIsRefused) {
  import("Notes.pdf", pdf(1));
  const auto before = snapshot(library());
  EXPECT_EQ(4, quilt({"export", "Notes", folder() / "Notes.pdf"}).exit);
  EXPECT_EQ(2, quilt({"export", "Notes", library() / "Collections"}).exit);
  EXPECT_EQ(4, quilt({"export", "Notes", folder() / "Notes.pdf/below"}).exit);
  EXPECT_EQ(3, quilt({"export", "Nothing", out()}).exit);
  EXPECT_EQ(before, snapshot(library()));
  EXPECT_FALSE(std::filesystem::exists(folder() / "made"));
}

TEST_F(ExportCommandTest, ADamagedDocumentIsInvalid) {
  import("Notes.pdf", pdf(1));
  const std::filesystem::path package = quiltJson({"show", "Notes"})["result"]["path"].get<std::string>();
  write(package / "properties.plist", "nonsense");
  EXPECT_EQ(4, quilt({"export", package, out()}).exit);
  EXPECT_FALSE(std::filesystem::exists(folder() / "made"));
}

TEST_F(ExportCommandTest, APackageThatLacksAnItemIsNoResult) {
  import("Notes.pdf", pdf(1));
  const json record = quiltJson({"show", "Notes"})["result"];
  // The file that the document's only source is made of disappears.
  for (const auto& entry : std::filesystem::recursive_directory_iterator(record["path"].get<std::string>()))
    if (entry.path().extension() == ".pdf") std::filesystem::remove(entry.path());
  const Ended run = quilt({"export", "Notes", out()});
  EXPECT_EQ(4, run.exit) << run.err;
  EXPECT_THAT(run.err, HasSubstr("The document \"Notes\" cannot be exported in full"));
  EXPECT_FALSE(std::filesystem::exists(folder() / "made"));
}

TEST_F(ExportCommandTest, ADryRunPrintsThePlanAndChangesNothing) {
  import("Notes.pdf", pdf(1));
  const auto before = snapshot(library());
  const Ended run = quilt({"export", "Notes", out(), "--zip", "--format", "720p", "--dry-run"});
  EXPECT_EQ(0, run.exit);
  EXPECT_THAT(run.out, HasSubstr("Would export the document \"Notes\" to"));
  EXPECT_EQ(before, snapshot(library()));
  EXPECT_FALSE(std::filesystem::exists(folder() / "made"));
}

TEST_F(ExportCommandTest, CtrlCLeavesNothingInTheDestination) {
  import("Notes.pdf", pdf(3000));
  const auto program = start({"export", "Notes", out(), "--progress=json"});
  ASSERT_TRUE(
      waitUntil([&] { return program->hasEnded() || program->errorsSoFar().find("Finalizing") != std::string::npos; }));
  ASSERT_FALSE(program->hasEnded());
  const auto asked = std::chrono::steady_clock::now();
  program->signal(SIGINT);
  const Ended run = program->wait();
  EXPECT_LT(std::chrono::steady_clock::now() - asked, std::chrono::seconds(10));
  EXPECT_EQ(130, run.exit) << run.err;
  EXPECT_THAT(run.err, HasSubstr("Stopped. Nothing was exported"));
  EXPECT_EQ("", run.out);
  EXPECT_FALSE(std::filesystem::exists(folder() / "made"));
  EXPECT_EQ(0, quilt({"show", "Notes"}).exit);
}

}  // namespace
}  // namespace quilt::support
