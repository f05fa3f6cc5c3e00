// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <map>

#include "quilt/collections/QuiltCollection.h"
#include "quilt/media/QuiltMediaExtra.h"
#include "quilt/scripting/Accessor.h"
#include "tests/support/BridgeFixture.h"

namespace quilt::scripting {
namespace {

using support::HttpAnswer;
using support::HttpClient;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

/// Each accessor as it is reached from outside, on a document with a picture. Not for the thread sanitizer, which knows
/// nothing of the image library's threads; what runs at once here has suites for it beside this one.
class BridgeAccessorsTest : public support::BridgeFixture {
 protected:
  BridgeAccessorsTest() {
    collection->setIsLoading(true);
    document()->setCollectionOwner(collection);
    source = addSource(pictureFile(8, 6));
    extra->setTitle("Slides");
    item()->addExtra(extra);
    item()->setAudioCommentarySource(QuiltMediaSource::init());
    serve({});
  }

  /// One reference of each exposed class.
  [[nodiscard]] std::map<std::string, Json> oneOfEach(const Json& session) const {
    std::map<std::string, Json> objects;
    const auto add = [&](const Json& object) { objects[object["class"].get<std::string>()] = object; };
    add(session["roots"]["collection"]);
    add(session["roots"]["document"]);
    add(value(session, objects["QuiltDocument"], "cvMediaAtIndex:", {0}));
    add(value(session, objects["QuiltMedia"], "cvSourceAtIndex:", {0}));
    add(value(session, objects["QuiltMediaSource"], "cvDerivativeAtIndex:", {0}));
    add(value(session, objects["QuiltMediaSource"], "cvPreviewAtIndex:", {0}));
    return objects;
  }
  static Json argumentsFor(const Accessor& accessor) {
    switch (accessor.argument) {
      case Argument::None:
        return Json::array();
      case Argument::Text:
        return Json::array({"text"});
      case Argument::Index:
        return Json::array({0});
    }
    return {};
  }

  const std::shared_ptr<QuiltCollection> collection = QuiltCollection::init();
  const std::shared_ptr<QuiltMediaExtra> extra = QuiltMediaExtra::init();
  std::shared_ptr<QuiltMediaSource> source;
};

TEST_F(BridgeAccessorsTest, EveryAccessorIsReached) {
  std::map<std::string, std::size_t> reached;
  meanwhile([&] {
    const Json session = opened();
    const auto objects = oneOfEach(session);
    for (const ExposedClass& type : exposedClasses())
      for (const Accessor& accessor : type.accessors) {
        const HttpAnswer answer =
            called(session, objects.at(std::string(type.name)), std::string(accessor.name), argumentsFor(accessor));
        EXPECT_EQ(200, answer.status) << type.name << ' ' << accessor.name << answer.body;
        EXPECT_TRUE(answer.json().contains("value"));
        ++reached[std::string(type.name)];
      }
  });
  EXPECT_EQ((std::map<std::string, std::size_t>{{"QuiltCollection", 7},
                                                {"QuiltDocument", 10},
                                                {"QuiltMedia", 15},
                                                {"QuiltMediaSource", 12},
                                                {"QuiltMediaDerivative", 5},
                                                {"QuiltMediaPreview", 7}}),
            reached);
}

TEST_F(BridgeAccessorsTest, ValuesTravelAsJson) {
  document()->setTitle("Ümlaut \"quoted\" \xE2\x80\xA8 </script>");
  source->setTimecode(4.5);
  source->derivativeAtIndex(0)->setCompatibilityTags(std::vector<std::string>{"Desktop", "720p"});
  meanwhile([&] {
    const Json session = opened();
    const auto objects = oneOfEach(session);
    EXPECT_EQ(document()->title(), value(session, objects.at("QuiltDocument"), "cvTitle"));
    EXPECT_EQ(Json(), value(session, objects.at("QuiltDocument"), "cvAuthor"));
    EXPECT_EQ(Json(1), value(session, objects.at("QuiltDocument"), "cvMediaCount"));
    EXPECT_EQ(Json(4.5), value(session, objects.at("QuiltMediaSource"), "cvTimeCode"));
    EXPECT_EQ(Json::array({"Desktop", "720p"}),
              value(session, objects.at("QuiltMediaDerivative"), "cvCompatibilityTags"));
    EXPECT_EQ(Json(), value(session, objects.at("QuiltDocument"), "cvMediaAtIndex:", {1}));
    EXPECT_EQ(Json(), value(session, objects.at("QuiltDocument"), "cvMediaAtIndex:", {-1}));
    EXPECT_EQ("QuiltMediaSource", value(session, objects.at("QuiltMedia"), "cvExtraAtIndex:", {0})["class"]);
  });
}

TEST_F(BridgeAccessorsTest, EditsReachTheModelAndItsFile) {
  meanwhile([&] {
    const Json session = opened();
    const auto objects = oneOfEach(session);
    EXPECT_EQ(Json(), value(session, objects.at("QuiltDocument"), "cvSetTitle:", {"A talk"}));
    EXPECT_EQ(Json(), value(session, objects.at("QuiltMedia"), "cvSetTitle:", {"Opening"}));
    EXPECT_EQ(Json(), value(session, objects.at("QuiltDocument"), "cvSetAuthor:", {"Ann"}));
    EXPECT_EQ("Ann", value(session, objects.at("QuiltDocument"), "cvAuthor"));
    EXPECT_EQ(Json(), value(session, objects.at("QuiltDocument"), "cvSetAuthor:", {nullptr}));
    EXPECT_EQ(Json(), value(session, objects.at("QuiltMedia"), "cvRemoveExtraAtIndex:", {0}));
  });
  EXPECT_EQ("A talk", readRecord(document()->propertiesPath()).string("Title"));
  EXPECT_EQ("Opening", item()->title());
  EXPECT_EQ(std::nullopt, document()->author());
  EXPECT_EQ(0U, item()->extraCount());
}

TEST_F(BridgeAccessorsTest, WrongArgumentsAreRefusedAndChangeNothing) {
  Json session;
  std::map<std::string, Json> objects;
  meanwhile([&] {
    session = opened();
    objects = oneOfEach(session);
  });
  takeLines();
  meanwhile([&] {
    // Compilers differ over what one list in braces is; a vector is the same to all.
    const auto list = [](const std::vector<Json>& values) { return Json(values); };
    const Json wrongForAll[] = {
        list({Json(true)}),         list({Json::object()}),       list({Json::array()}),
        list({Json::array({"a"})}), list({Json("a"), Json("b")}), list({Json(0), Json(0)}),
        list({Json(1.5)}),          list({Json(1e300)}),          list({Json(18446744073709551615U)})};
    for (const ExposedClass& type : exposedClasses())
      for (const Accessor& accessor : type.accessors) {
        std::vector<Json> wrong(std::begin(wrongForAll), std::end(wrongForAll));
        if (accessor.argument != Argument::None) wrong.push_back(Json::array());
        if (accessor.argument != Argument::Text) wrong.push_back(list({Json("text")}));
        if (accessor.argument != Argument::Text) wrong.push_back(list({Json(nullptr)}));
        if (accessor.argument != Argument::Index) wrong.push_back(list({Json(0)}));
        for (const Json& given : wrong) {
          const HttpAnswer answer =
              called(session, objects.at(std::string(type.name)), std::string(accessor.name), given);
          EXPECT_EQ(400, answer.status) << accessor.name << given;
          EXPECT_EQ("wrong-arguments", codeOf(answer)) << accessor.name << given;
        }
      }
  });
  EXPECT_THAT(takeLines(), IsEmpty());
  EXPECT_EQ("Untitled Episode", document()->title());
  EXPECT_EQ(1U, item()->extraCount());
}

TEST_F(BridgeAccessorsTest, ReadingChangesNothing) {
  meanwhile([&] {
    const Json session = opened();
    const Json document = session["roots"]["document"];
    const auto readAll = [&] {
      const Json media = value(session, document, "cvMediaAtIndex:", {0});
      const Json source = value(session, media, "cvSourceAtIndex:", {0});
      const Json derivative = value(session, source, "cvMainDerivative");
      const Json preview = value(session, source, "cvPreviewAtIndex:", {0});
      for (const Json& object : {document, media, source, derivative, preview})
        for (const Json& name : session["classes"][object["class"].get<std::string>()])
          if (name.get<std::string>().back() != ':') (void)value(session, object, name);
    };
    readAll();  // makes what is made when it is first asked for
    HttpClient stream(port());
    stream.send(request("GET", path("conveyor/events?session=") + session["session"].get<std::string>(), callFields()));
    stream.readUntil("event: open");
    (void)value(session, document, "cvSetAuthor:", {"Mark"});
    stream.readUntil("cvAuthor");
    readAll();
    (void)value(session, document, "cvSetDescription:", {"Mark"});
    const std::string heard = stream.readUntil("cvDescription");
    EXPECT_THAT(heard, HasSubstr("\"accessors\":[\"cvDescription\"]"));
    EXPECT_EQ(heard.find("event: change"), heard.rfind("event: change")) << heard;
  });
}

}  // namespace
}  // namespace quilt::scripting
