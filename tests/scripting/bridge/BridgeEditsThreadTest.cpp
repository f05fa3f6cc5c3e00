// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/media/QuiltMediaExtra.h"
#include "tests/support/BridgeFixture.h"
#include "tests/support/QuiltProgram.h"

namespace quilt::scripting {
namespace {

using support::HttpAnswer;
using ::testing::HasSubstr;
using ::testing::Not;

/// Edits are kept: in the record when the call is answered, in the data of the page when it is asked for and at the
/// end.
class BridgeEditsThreadTest : public support::BridgeFixture {
 protected:
  BridgeEditsThreadTest() {
    source = addEmptySource();
    item()->addExtra(extra);
    EXPECT_TRUE(document()->update());
  }

  /// The first item of the record on disk.
  [[nodiscard]] Dictionary itemOnDisk() const {
    const Dictionary record = readRecord(document()->propertiesPath());
    const Array* items = record.array("Media");
    return items && !items->empty() ? *items->front().as<Dictionary>() : Dictionary();
  }
  static Dictionary firstOf(const Dictionary& record, const char* key) {
    const Array* list = record.array(key);
    return list && !list->empty() ? *list->front().as<Dictionary>() : Dictionary();
  }
  /// As a finalized document has it.
  void writeData() const { writeFile(data(), "var appData = {};"); }
  [[nodiscard]] Path data() const { return document()->dataControllerPath(); }
  [[nodiscard]] HttpAnswer askForData() const { return ask("GET", path("package/controllers/data.js")); }
  /// Where the record is written there is a folder with something in it.
  void barRecord() const {
    std::filesystem::remove(document()->propertiesPath());
    writeFile(document()->propertiesPath() / "x", "x");
  }

  const std::shared_ptr<QuiltMediaExtra> extra = QuiltMediaExtra::init();
  std::shared_ptr<QuiltMediaSource> source;
};

TEST_F(BridgeEditsThreadTest, EachTextIsInTheRecordWhenItsCallIsAnswered) {
  meanwhile([&] {
    const Json session = opened();
    const Json root = session["roots"]["document"];
    const Json media = value(session, root, "cvMediaAtIndex:", {0});
    const Json part = value(session, media, "cvSourceAtIndex:", {0});
    const Json more = value(session, media, "cvExtraAtIndex:", {0});
    const auto isOnDisk = [&](const Json& object, const std::string& method, const std::string& text) {
      (void)value(session, object, method, {text});
      EXPECT_THAT(readFile(document()->propertiesPath()), HasSubstr("<string>" + text + "</string>")) << method;
    };
    isOnDisk(root, "cvSetTitle:", "Title of the document");
    isOnDisk(root, "cvSetDescription:", "Description of the document");
    isOnDisk(root, "cvSetAuthor:", "Author");
    isOnDisk(media, "cvSetTitle:", "Title of the item");
    isOnDisk(media, "cvSetDescription:", "Description of the item");
    isOnDisk(part, "cvSetTitle:", "Title of the source");
    isOnDisk(more, "cvSetTitle:", "Title of the extra");
    (void)value(session, media, "cvSetTitle:", {nullptr});
    EXPECT_FALSE(itemOnDisk().contains("Title"));
    EXPECT_EQ("Title of the source", firstOf(itemOnDisk(), "Sources").string("Title"));
    EXPECT_EQ("Title of the extra", firstOf(itemOnDisk(), "Extras").string("Title"));
  });
}

TEST_F(BridgeEditsThreadTest, ARemovedExtraIsGoneFromTheRecordAndFromDisk) {
  const Path folder = extra->path();
  writeFile(folder / "derivatives" / "slides.pdf", "x");
  meanwhile([&] {
    const Json session = opened();
    const Json media = value(session, session["roots"]["document"], "cvMediaAtIndex:", {0});
    (void)value(session, media, "cvRemoveExtraAtIndex:", {0});
    EXPECT_FALSE(itemOnDisk().contains("Extras"));
    EXPECT_FALSE(std::filesystem::exists(folder));
    (void)value(session, media, "cvRemoveExtraAtIndex:", {0});
    EXPECT_EQ(1U, document()->mediaCount()) << "one that is not there is no harm";
  });
}

TEST_F(BridgeEditsThreadTest, ReadingAndRefusedCallsSaveNothing) {
  const auto before = std::filesystem::last_write_time(document()->propertiesPath());
  meanwhile([&] {
    const Json session = opened();
    const Json root = session["roots"]["document"];
    const Json media = value(session, root, "cvMediaAtIndex:", {0});
    (void)value(session, media, "cvTitle");
    EXPECT_EQ("wrong-arguments", codeOf(called(session, media, "cvSetTitle:", {1})));
    EXPECT_EQ("no-accessor", codeOf(called(session, media, "update")));
  });
  EXPECT_EQ(before, std::filesystem::last_write_time(document()->propertiesPath()));
}

TEST_F(BridgeEditsThreadTest, ARecordThatCannotBeWrittenIsToldAndWrittenOnceItCan) {
  barRecord();
  meanwhile([&] {
    const Json session = opened();
    const Json root = session["roots"]["document"];
    const Json media = value(session, root, "cvMediaAtIndex:", {0});
    for (const Json& object : {root, media}) {
      const HttpAnswer answer = called(session, object, "cvSetTitle:", {"Kept"});
      EXPECT_EQ(500, answer.status);
      EXPECT_EQ("not-saved", codeOf(answer));
      EXPECT_EQ("Kept", value(session, object, "cvTitle"));
    }
  });
  EXPECT_FALSE(bridge().settle());
  std::filesystem::remove_all(document()->propertiesPath());
  EXPECT_TRUE(bridge().settle());
  EXPECT_EQ("Kept", itemOnDisk().string("Title"));
}

TEST_F(BridgeEditsThreadTest, WhatALongOperationHoldsIsSavedOnceItEnds) {
  document()->setIsProcessing(true);
  meanwhile([&] {
    const Json session = opened();
    const Json media = value(session, session["roots"]["document"], "cvMediaAtIndex:", {0});
    EXPECT_EQ(200, called(session, media, "cvSetTitle:", {"Meanwhile"}).status);
  });
  EXPECT_FALSE(itemOnDisk().contains("Title"));
  EXPECT_TRUE(bridge().settle());
  EXPECT_FALSE(itemOnDisk().contains("Title"));
  document()->setIsProcessing(false);
  meanwhile([&] { EXPECT_TRUE(support::waitUntil([&] { return itemOnDisk().string("Title") == "Meanwhile"; })); });
}

TEST_F(BridgeEditsThreadTest, APageThatIsLoadedAnewReadsWhatWasEdited) {
  serve({});  // with nothing to do
  writeData();
  meanwhile([&] {
    EXPECT_EQ("var appData = {};", askForData().body) << "nothing was edited";
    const Json session = opened();
    const Json media = value(session, session["roots"]["document"], "cvMediaAtIndex:", {0});
    (void)value(session, media, "cvSetTitle:", {"By a client </script>"});
    const std::string script = askForData().body;
    EXPECT_THAT(script, HasSubstr("By a client"));
    EXPECT_THAT(script, Not(HasSubstr("</script>")));
    EXPECT_EQ(script, readFile(data()));
    EXPECT_THAT(readFile(document()->jukeboxMetadataPath()), HasSubstr("<plist"));
  });
  document()->setAuthor("By the host");
  meanwhile([&] { EXPECT_THAT(askForData().body, HasSubstr("By the host")); });
}

TEST_F(BridgeEditsThreadTest, ThePageOnDiskFollowsSoonAndAtTheEnd) {
  writeData();
  document()->setTitle("Soon");
  meanwhile(
      [&] { EXPECT_TRUE(support::waitUntil([&] { return readFile(data()).find("Soon") != std::string::npos; })); });
  document()->setTitle("At the end");
  endBridge();
  EXPECT_THAT(readFile(data()), HasSubstr("At the end"));
}

TEST_F(BridgeEditsThreadTest, ADocumentThatWasNeverFinalizedGetsNoDataOfAPage) {
  document()->setTitle("New");
  meanwhile([&] { EXPECT_EQ(404, askForData().status); });
  endBridge();
  EXPECT_FALSE(std::filesystem::exists(data().parent_path()));
}

}  // namespace
}  // namespace quilt::scripting
