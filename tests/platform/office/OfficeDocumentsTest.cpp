// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/office/OfficeDocuments.h"

#include <gmock/gmock.h>
#include <signal.h>

#include <atomic>
#include <thread>

#include "quilt/platform/mupdf/MupdfDocuments.h"
#include "tests/support/DocumentFixtures.h"
#include "tests/support/Environment.h"
#include "tests/support/ImageFixtures.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/ModelFixture.h"
#include "tests/support/PlainFiles.h"

namespace quilt::platform {
namespace {

using namespace std::chrono_literals;
using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::StartsWith;

/// A toolkit with a cache of its own, in which a script stands for LibreOffice.
class OfficeDocumentsTest : public support::ModelFixture {
 protected:
  OfficeDocumentsTest() {
    settings.cache = folder() / "cache";
    settings.program = folder() / "program";
    convertsTo(support::makePages(3));
  }

  /// The program becomes these lines of shell. "$out" is where it shall write, "$in" what it shall convert, and each
  /// run leaves a line in "runs".
  void program(const std::string& lines) {
    writeFile(settings.program, "#!/bin/sh\ncd '" + folder().native() +
                                    "'\necho run >> runs\nfor in; do :; done\nout=\"${in%/*}/out\"\n" + lines + "\n");
    std::filesystem::permissions(settings.program, std::filesystem::perms::owner_all);
  }
  void convertsTo(const std::string& pdf) {
    writeFile(folder() / "made.pdf", pdf);
    program("cp made.pdf \"$out/document.pdf\"");
  }
  std::size_t runs() const {
    const std::string lines = support::readPlainly(folder() / "runs");
    return static_cast<std::size_t>(std::ranges::count(lines, '\n'));
  }
  Path document(const std::string& name = "a.docx", const std::string& bytes = "PK\3\4 words") {
    return support::writeFile(folder() / name, bytes);
  }
  OfficeDocuments toolkit() const { return OfficeDocuments(std::make_shared<MupdfDocuments>(), settings); }
  std::size_t pageCount(const Path& file) const {
    const auto opened = toolkit().openDocument(file);
    EXPECT_TRUE(opened) << (opened ? "" : opened.error().text);
    return opened ? *(*opened)->pageCount() : 0;
  }
  Error error(const Path& file) const {
    const auto opened = toolkit().openDocument(file);
    EXPECT_FALSE(opened);
    return opened ? Error{} : opened.error();
  }

  OfficeDocuments::Settings settings;
};
using OfficeDocumentsThreadTest = OfficeDocumentsTest;

TEST_F(OfficeDocumentsTest, ADocumentIsConvertedOnce) {
  const Path file = document();
  EXPECT_EQ(pageCount(file), 3U);
  EXPECT_EQ(pageCount(file), 3U) << "by another toolkit with the same cache";
  EXPECT_EQ(runs(), 1U);
}

TEST_F(OfficeDocumentsTest, ACopyIsNotConvertedAgain) {
  const Path file = document();
  pageCount(file);
  std::filesystem::copy_file(file, folder() / "copy.docx");
  EXPECT_EQ(pageCount(folder() / "copy.docx"), 3U);
  EXPECT_EQ(runs(), 1U);
}

TEST_F(OfficeDocumentsTest, AChangedDocumentIsConvertedAgain) {
  pageCount(document());
  convertsTo(support::makePages(5));
  std::filesystem::remove(folder() / "a.docx");
  EXPECT_EQ(pageCount(document("a.docx", "PK\3\4 other words")), 5U);
  EXPECT_EQ(runs(), 2U);
}

TEST_F(OfficeDocumentsTest, OtherKindsAreNotConverted) {
  EXPECT_EQ(pageCount(support::writeFile(folder() / "a.pdf", support::makePages(2))), 2U);
  EXPECT_EQ(error(writeFile(folder() / "a.txt", "words")).text, "This is no PDF or EPUB document.");
  EXPECT_EQ(error(folder() / "missing.docx").kind, ErrorKind::NotFound);
  EXPECT_EQ(runs(), 0U);
}

TEST_F(OfficeDocumentsTest, EveryNamedKindIsConverted) {
  std::size_t expected = 0;
  const std::string packed = "PK\3\4" + std::string(30, '\0'), binary = "\1 words", text = "<words>";
  const std::pair<const char*, std::string> kinds[] = {{"doc", binary},  {"docx", packed}, {"wordml", text},
                                                       {"odt", packed},  {"fodt", text},   {"ppt", binary},
                                                       {"pptx", packed}, {"odp", packed},  {"fodp", text}};
  for (const auto& [extension, bytes] : kinds) {
    EXPECT_EQ(pageCount(document(std::string("a.") + extension, bytes)), 3U) << extension;
    EXPECT_EQ(runs(), ++expected) << extension;
  }
}

TEST_F(OfficeDocumentsTest, NothingIsLeftBesideTheDocumentOrInTheCache) {
  std::filesystem::create_directory(folder() / "documents");
  pageCount(document("documents/a.docx"));
  EXPECT_THAT(namesIn(folder() / "documents"), ElementsAre("a.docx"));
  EXPECT_THAT(namesIn(settings.cache), ElementsAre(::testing::EndsWith("-docx.pdf")));
  program("exit 0");
  error(document("documents/b.docx", "PK\3\4 others"));
  EXPECT_EQ(namesIn(settings.cache).size(), 1U);
}

TEST_F(OfficeDocumentsTest, TheCacheIsForItsOwnerAlone) {
  pageCount(document());
  EXPECT_EQ(std::filesystem::status(settings.cache).permissions(), std::filesystem::perms::owner_all);
}

TEST_F(OfficeDocumentsTest, TheLeastUsedMakeRoom) {
  const Path first = document("1.docx", "PK\3\4 1"), second = document("2.docx", "PK\3\4 2"),
             third = document("3.docx", "PK\3\4 3");
  settings.maximumCache = 2 * support::makePages(3).size();
  const auto age = [&](std::chrono::hours hours) {
    for (const auto& entry : std::filesystem::directory_iterator(settings.cache)) {
      std::filesystem::last_write_time(entry.path(), entry.last_write_time() - hours);
    }
  };
  pageCount(first);
  age(1h);
  pageCount(second);
  age(1h);
  pageCount(first);
  pageCount(third);
  EXPECT_EQ(runs(), 3U);
  pageCount(first);
  pageCount(third);
  EXPECT_EQ(runs(), 3U) << "both are kept";
  pageCount(second);
  EXPECT_EQ(runs(), 4U) << "the one that was not used for longest was not";
}

TEST_F(OfficeDocumentsTest, AResultThatIsLargerThanTheCacheIsUsedAllTheSame) {
  settings.maximumCache = 1;
  EXPECT_EQ(pageCount(document()), 3U);
}

TEST_F(OfficeDocumentsTest, ADamagedCacheIsMadeAnew) {
  const Path file = document();
  pageCount(file);
  writeFile(settings.cache / namesIn(settings.cache).front(), "");
  EXPECT_EQ(pageCount(file), 3U);
  EXPECT_EQ(runs(), 2U);
}

TEST_F(OfficeDocumentsTest, WhatKilledProcessesLeftIsRemoved) {
  const Path old = settings.cache / ".converting-old", young = settings.cache / ".converting-young";
  for (const Path& left : {old, young}) std::filesystem::create_directories(left / "profile");
  std::filesystem::last_write_time(old, std::filesystem::file_time_type::clock::now() - 2h);
  pageCount(document());
  EXPECT_FALSE(std::filesystem::exists(old));
  EXPECT_TRUE(std::filesystem::exists(young)) << "another process may be at work there";
}

// ---- The program

TEST_F(OfficeDocumentsTest, WithoutLibreOfficeTheErrorNamesIt) {
  settings.program.clear();
  EXPECT_EQ(error(document()).text, "LibreOffice, which office documents need, is not installed.");
  settings.program = folder() / "nothing";
  EXPECT_EQ(error(document()).text, "LibreOffice, which office documents need, cannot be started.");
}

TEST_F(OfficeDocumentsTest, TheProgramMayAskToBeStartedAgain) {
  program("test -e again && exec cp made.pdf \"$out/document.pdf\"\ntouch again\nexit 81");
  EXPECT_EQ(pageCount(document()), 3U);
  EXPECT_EQ(runs(), 2U);
  program("exit 81");
  EXPECT_EQ(error(document("b.docx", "PK\3\4 others")).kind, ErrorKind::Damaged);
  EXPECT_EQ(runs(), 4U) << "once";
}

TEST_F(OfficeDocumentsTest, WhatCannotBeConvertedIsDamaged) {
  program("exit 0");
  const Path file = document();
  EXPECT_EQ(error(file).kind, ErrorKind::Damaged);
  EXPECT_EQ(error(file).text, "LibreOffice cannot read the document; it is damaged or protected by a password.");
  EXPECT_EQ(error(file).file, file);
  program("kill -SEGV $$");
  EXPECT_EQ(error(file).text, "LibreOffice crashed on the document.");
  convertsTo("no document");
  EXPECT_EQ(error(file).file, file) << "and not the file in the cache";
}

TEST_F(OfficeDocumentsTest, WhatTakesTooLongIsKilledWithItsChildren) {
  program("sleep 1000 &\necho $! > child\nwait");
  settings.timeout = 300ms;
  EXPECT_EQ(error(document()).text, "LibreOffice took too long to convert the document.");
  const pid_t child = std::stoi(support::readPlainly(folder() / "child"));
  const auto isGone = [&] {
    const std::string status = support::readPlainly("/proc/" + std::to_string(child) + "/stat");
    return status.empty() || status.find(") Z") != std::string::npos;
  };
  for (int i = 0; i < 200 && !isGone(); ++i) std::this_thread::sleep_for(10ms);
  EXPECT_TRUE(isGone());
  EXPECT_THAT(namesIn(settings.cache), IsEmpty());
}

TEST_F(OfficeDocumentsTest, ACancelEndsAConversionAtOnceAndIsNoFailureOfTheDocument) {
  program("sleep 60 & echo $! > child; wait");
  const Path file = document();
  const auto start = std::chrono::steady_clock::now();
  const auto opened = toolkit().openDocument(file, [this] { return !std::filesystem::exists(folder() / "child"); });
  ASSERT_FALSE(opened);
  EXPECT_EQ(opened.error().kind, ErrorKind::Cancelled);
  EXPECT_EQ(opened.error().file, file);
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(30));
  EXPECT_THAT(namesIn(settings.cache), IsEmpty());
  convertsTo(support::makePages(3));
  EXPECT_EQ(pageCount(file), 3U);
}

TEST_F(OfficeDocumentsThreadTest, WaitingForAnotherConversionCanBeCancelled) {
  program("touch started; sleep 60 & wait");
  const OfficeDocuments shared = toolkit();
  std::atomic<bool> goesOn = true;
  std::thread other(
      [&] { EXPECT_FALSE(shared.openDocument(document("b.docx", "PK\3\4 others"), [&] { return goesOn.load(); })); });
  while (!std::filesystem::exists(folder() / "started")) std::this_thread::sleep_for(std::chrono::milliseconds(2));
  const auto opened = shared.openDocument(document(), [] { return false; });
  goesOn = false;
  other.join();
  ASSERT_FALSE(opened);
  EXPECT_EQ(opened.error().kind, ErrorKind::Cancelled);
  EXPECT_EQ(runs(), 1U);
}

TEST_F(OfficeDocumentsTest, NoNameReachesAShellOrAnOption) {
  program("echo \"$@\" > words\ncp made.pdf \"$out/document.pdf\"");
  for (const char* name : {"$(touch escaped).docx", "-i.docx", "|x.docx", "a.doc;touch escaped"}) {
    const Path file = document(name, std::string("PK\3\4 ") + name);
    if (FDYTypePreferredIdentifier(file) == types::kWordOpenXML) {
      EXPECT_EQ(pageCount(file), 3U) << name;
    }
    EXPECT_FALSE(std::filesystem::exists(folder() / "escaped"));
    EXPECT_THAT(support::readPlainly(folder() / "words"), Not(HasSubstr(name)));
  }
}

TEST_F(OfficeDocumentsTest, TheProgramHasNoNetworkAndNoneOfOurFiles) {
  program("cat /proc/net/dev > net\nls -l /proc/self/fd > open\nenv > environment\ncp made.pdf \"$out/document.pdf\"");
  const support::Environment secret("QUILT_SECRET", "token"), display("DISPLAY", ":0");
  const std::FILE* const ours = std::fopen((folder() / "made.pdf").c_str(), "r");
  EXPECT_EQ(pageCount(document()), 3U);
  EXPECT_THAT(support::readPlainly(folder() / "open"), Not(HasSubstr("made.pdf")));
  EXPECT_THAT(support::readPlainly(folder() / "environment"),
              AllOf(Not(HasSubstr("token")), Not(HasSubstr("DISPLAY"))));
  std::fclose(const_cast<std::FILE*>(ours));
  if (support::readPlainly("/proc/sys/user/max_user_namespaces") == "0\n") GTEST_SKIP() << "no user namespaces here";
  const std::string devices = support::readPlainly(folder() / "net");
  EXPECT_EQ(std::ranges::count(devices, '\n'), 3) << "two lines of headings and the loop: " << devices;
}

TEST_F(OfficeDocumentsThreadTest, ThreadsThatAskAtOnceConvertOnce) {
  const Path file = document();
  const OfficeDocuments shared = toolkit();
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([&] {
      const auto opened = shared.openDocument(file);
      ASSERT_TRUE(opened);
      EXPECT_EQ(*(*opened)->pageCount(), 3U);
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(runs(), 1U);
}

// ---- LibreOffice itself

class LibreOfficeTest : public OfficeDocumentsTest {
 protected:
  void SetUp() override {
    settings.program = OfficeDocuments::findProgram();
    if (settings.program.empty()) GTEST_SKIP() << "no LibreOffice";
  }
  std::shared_ptr<PagedDocument> open(const Path& file) const {
    const auto opened = toolkit().openDocument(file);
    EXPECT_TRUE(opened) << file << ": " << (opened ? "" : opened.error().text);
    return opened ? *opened : nullptr;
  }
};

TEST_F(LibreOfficeTest, ATextDocumentBecomesPages) {
  const auto opened = open(writeFile(folder() / "a.fodt",
                                     R"(<?xml version="1.0" encoding="UTF-8"?>
<office:document xmlns:office="urn:oasis:names:tc:opendocument:xmlns:office:1.0" xmlns:text="urn:oasis:names:tc:opendocument:xmlns:text:1.0" office:version="1.2" office:mimetype="application/vnd.oasis.opendocument.text">
<office:body><office:text><text:p>Größe</text:p><text:p>Second line</text:p></office:text></office:body></office:document>)"));
  ASSERT_TRUE(opened);
  EXPECT_EQ(*opened->pageCount(), 1U);
  EXPECT_THAT(*opened->textOfPage(0), AllOf(StartsWith("Größe\n"), HasSubstr("Second line")));
}

TEST_F(LibreOfficeTest, AWebPageCalledDocumentIsShownWithoutPicturesFromElsewhere) {
  const Path secret = support::writeFile(
      folder() / "secret.png",
      support::encode(support::paint(200, 200, [](auto, auto) { return support::kRed; }), {.suffix = ".png"}));
  const auto opened =
      open(writeFile(folder() / "a.doc", "<html><body><p>Hello</p><img src='" + Url::fileUrl(secret).absoluteString() +
                                             "'/><img src='http://127.0.0.1:1/a.png'/></body></html>"));
  ASSERT_TRUE(opened);
  EXPECT_THAT(*opened->textOfPage(0), HasSubstr("Hello"));
  const Bitmap page = *opened->drawPage(0, {300, 400});
  for (std::size_t i = 0; i < page.pixels.size(); i += 4) {
    ASSERT_FALSE(page.pixels[i] > 200 && page.pixels[i + 1] < 50 && page.pixels[i + 2] < 50) << "a red pixel";
  }
}

TEST_F(LibreOfficeTest, NothingOfItsOwnIsLeftInTheHomeFolder) {
  const support::Environment home("HOME", (folder() / "home").c_str());
  const support::Environment cached("XDG_CACHE_HOME", nullptr), data("XDG_DATA_HOME", nullptr);
  ASSERT_TRUE(open(writeFile(folder() / "a.doc", "<html><body>Hello</body></html>")));
  for (const char* name : {"home/.cache/dconf", "home/.config", "home/.local"}) {
    EXPECT_FALSE(std::filesystem::exists(folder() / name)) << name;
  }
}

TEST_F(LibreOfficeTest, RealDocuments) {
  struct Known {
    const char* name;
    std::size_t pages;
    const char* words;
  };
  QUILT_CORPUS_FILE(pictures, "docx-pictures.docx");
  for (const Known& known : {Known{"pptx-simple.pptx", 3, ""}, Known{"ppt-2-images.ppt", 1, "quick brown fox"},
                             Known{"doc-3-images.doc", 1, "quick brown fox"}, Known{"doc-simple.doc", 2, ""},
                             Known{"docx-various.docx", 2, ""}}) {
    SCOPED_TRACE(known.name);
    const auto opened = open(support::corpusFile(known.name));
    if (!opened) continue;
    EXPECT_EQ(*opened->pageCount(), known.pages);
    EXPECT_THAT(*opened->textOfPage(0), HasSubstr(known.words));
    EXPECT_TRUE(opened->drawPage(0, {320, 240}));
  }
}

TEST_F(LibreOfficeTest, ATruncatedDocumentIsDamaged) {
  QUILT_CORPUS_FILE(file, "bad-docx-truncated.docx");
  EXPECT_EQ(error(file).kind, ErrorKind::Damaged);
}

TEST_F(LibreOfficeTest, TheDoctorTellsOfIt) {
  const Capability capability = OfficeDocuments::capability();
  EXPECT_EQ(capability.name, "Office documents (LibreOffice)");
  EXPECT_TRUE(capability.present);
  EXPECT_THAT(capability.remedy, IsEmpty());
}

TEST_F(OfficeDocumentsTest, TheProgramIsFoundBesideTheCommandOnThePath) {
  std::filesystem::create_directories(folder() / "office");
  std::filesystem::create_directories(folder() / "bin");
  for (const char* name : {"soffice", "soffice.bin"}) {
    std::filesystem::copy_file(settings.program, folder() / "office" / name);
  }
  std::filesystem::create_symlink(folder() / "office/soffice", folder() / "bin/soffice");
  const support::Environment path("PATH", (folder() / "bin").c_str());
  EXPECT_EQ(OfficeDocuments::findProgram(), std::filesystem::canonical(folder() / "office/soffice.bin"));
}

}  // namespace
}  // namespace quilt::platform
