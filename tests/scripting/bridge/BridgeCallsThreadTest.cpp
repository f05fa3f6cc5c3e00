// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <algorithm>
#include <thread>

#include "quilt/collections/QuiltCollection.h"
#include "quilt/media/QuiltMediaExtra.h"
#include "quilt/scripting/Accessor.h"
#include "tests/support/BridgeFixture.h"
#include "tests/support/QuiltProgram.h"

namespace quilt::scripting {
namespace {

using support::HttpAnswer;
using support::HttpClient;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

/// The accessors as they are reached from outside.
class BridgeCallsThreadTest : public support::BridgeFixture {
 protected:
  BridgeCallsThreadTest() {
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
  static std::string codeOf(const HttpAnswer& answer) {
    const Json json = answer.json();
    return json.is_object() && json.contains("error") ? json["error"]["code"].get<std::string>() : "";
  }

  const std::shared_ptr<QuiltCollection> collection = QuiltCollection::init();
  const std::shared_ptr<QuiltMediaExtra> extra = QuiltMediaExtra::init();
  std::shared_ptr<QuiltMediaSource> source;
};

TEST_F(BridgeCallsThreadTest, EveryAccessorIsReached) {
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

TEST_F(BridgeCallsThreadTest, ValuesTravelAsJson) {
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

TEST_F(BridgeCallsThreadTest, EditsReachTheModelAndItsFile) {
  letDocumentSave();
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

TEST_F(BridgeCallsThreadTest, OnlyTheAccessorsOfTheClassAreCallable) {
  takeLines();
  meanwhile([&] {
    const Json session = opened();
    const Json document = session["roots"]["document"];
    for (const char* name : {"update", "title", "setTitle:", "path", "reload", "cvTitle:", "cvSetTitle",
                             "cvMediaAtIndex", "cvtitle", "cvTitle ", "", "constructor", "__proto__", "cvExtraCount",
                             "cvSourcesCount", "cvCopyright", "cvTitle\\u0000"})
      for (const Json& arguments : {Json::array(), Json::array({"x"}), Json::array({0})})
        EXPECT_EQ("no-accessor", codeOf(called(session, document, name, arguments))) << name;
  });
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(BridgeCallsThreadTest, WrongArgumentsAreRefusedAndChangeNothing) {
  Json session;
  std::map<std::string, Json> objects;
  meanwhile([&] {
    session = opened();
    objects = oneOfEach(session);
  });
  takeLines();
  meanwhile([&] {
    const Json wrongForAll[] = {
        {true}, {Json::object()}, {Json::array()},        {Json::array({"a"})}, {"a", "b"}, {0, 0},
        {1.5},  {1e300},          {18446744073709551615U}};
    for (const ExposedClass& type : exposedClasses())
      for (const Accessor& accessor : type.accessors) {
        std::vector<Json> wrong(std::begin(wrongForAll), std::end(wrongForAll));
        if (accessor.argument != Argument::None) wrong.push_back(Json::array());
        if (accessor.argument != Argument::Text) wrong.push_back({"text"});
        if (accessor.argument != Argument::Text) wrong.push_back({nullptr});
        if (accessor.argument != Argument::Index) wrong.push_back({0});
        for (const Json& arguments : wrong) {
          const Json given = arguments.is_array() ? arguments : Json::array({arguments});
          const HttpAnswer answer =
              called(session, objects.at(std::string(type.name)), std::string(accessor.name), given);
          EXPECT_EQ(400, answer.status) << accessor.name << given;
          EXPECT_EQ("wrong-arguments", codeOf(answer)) << accessor.name << given;
        }
      }
  });
  EXPECT_THAT(takeLines(), IsEmpty());
  EXPECT_EQ(std::nullopt, document()->title());
  EXPECT_EQ(1U, item()->extraCount());
}

TEST_F(BridgeCallsThreadTest, WhatIsNoCallIsRefused) {
  meanwhile([&] {
    const Json session = opened();
    const Json object = session["roots"]["document"]["object"];
    const Json identity = session["session"];
    for (const Json& body :
         {Json(), Json(1), Json::array(), Json::object(), Json{{"session", identity}},
          Json{{"session", identity}, {"object", object}, {"method", "cvTitle"}},
          Json{{"session", identity}, {"object", 1}, {"method", "cvTitle"}, {"arguments", Json::array()}},
          Json{{"session", identity}, {"object", object}, {"method", 1}, {"arguments", Json::array()}},
          Json{{"session", identity}, {"object", object}, {"method", "cvTitle"}, {"arguments", Json::object()}},
          Json{{"session", identity}, {"object", object}, {"method", "cvTitle"}, {"arguments", nullptr}}})
      EXPECT_EQ("bad-request", codeOf(post("call", body))) << body;
    const std::string target = path("conveyor/call");
    for (const std::string& body : {std::string("{"), std::string("\xff\xfe"), std::string(100000, '['),
                                    std::string("{\"session\":\"\xff\"}"), std::string("x=1&y=2")})
      EXPECT_EQ("bad-request", codeOf(ask("POST", target, callFields(), body)));
    EXPECT_EQ("bad-request", codeOf(ask("POST", target, callFields())));
    EXPECT_EQ("no-call", codeOf(post("update", Json::object())));
    EXPECT_EQ("no-call", codeOf(post("", Json::object())));
    EXPECT_EQ("bad-request", codeOf(post("close", Json::object())));
  });
}

TEST_F(BridgeCallsThreadTest, AnObjectKeepsItsHandle) {
  meanwhile([&] {
    const Json session = opened();
    const Json document = session["roots"]["document"];
    const Json first = value(session, document, "cvMediaAtIndex:", {0});
    EXPECT_EQ(first, value(session, document, "cvMediaAtIndex:", {0}));
    EXPECT_NE(first["object"], document["object"]);
  });
}

TEST_F(BridgeCallsThreadTest, HandlesAreOfOneSession) {
  meanwhile([&] {
    const Json one = opened();
    const Json other = opened();
    const Json media = value(one, one["roots"]["document"], "cvMediaAtIndex:", {0});
    EXPECT_EQ("no-object", codeOf(called(other, media, "cvTitle")));
    for (const char* handle : {"", "0", "99", "-1", "1x", " 1", "99999999999999999999999"})
      EXPECT_EQ("no-object", codeOf(called(one, {{"object", handle}}, "cvTitle"))) << handle;
    EXPECT_EQ(200, post("close", {{"session", one["session"]}}).status);
    EXPECT_EQ("no-session", codeOf(called(one, media, "cvTitle")));
    EXPECT_EQ("no-session", codeOf(post("close", {{"session", one["session"]}})));
    EXPECT_EQ(200, called(other, other["roots"]["document"], "cvTitle").status);
  });
}

TEST_F(BridgeCallsThreadTest, AHandleKeepsNoObjectAlive) {
  Json session;
  Json media;
  meanwhile([&] {
    session = opened();
    media = value(session, session["roots"]["document"], "cvMediaAtIndex:", {1});
    EXPECT_EQ(Json(), media);
  });
  auto second = QuiltMedia::init();
  const std::weak_ptr<QuiltMedia> watched = second;
  document()->addMedia(second);
  meanwhile([&] { media = value(session, session["roots"]["document"], "cvMediaAtIndex:", {1}); });
  document()->removeMedia(second);
  meanwhile([&] { EXPECT_EQ(200, called(session, media, "cvUUID").status); });
  second.reset();
  EXPECT_TRUE(watched.expired());
  meanwhile([&] { EXPECT_EQ("no-object", codeOf(called(session, media, "cvUUID"))); });
}

TEST_F(BridgeCallsThreadTest, ASessionHoldsNoMoreObjectsThanItMay) {
  serve({.objectsPerSession = 3});
  for (int i = 0; i < 3; ++i) document()->addMedia(QuiltMedia::init());
  meanwhile([&] {
    const Json session = opened();  // the document and the collection
    const Json document = session["roots"]["document"];
    EXPECT_EQ(200, called(session, document, "cvMediaAtIndex:", {0}).status);
    EXPECT_EQ("too-many-objects", codeOf(called(session, document, "cvMediaAtIndex:", {1})));
    EXPECT_EQ(200, called(session, document, "cvMediaAtIndex:", {0}).status);
    EXPECT_EQ(200, called(session, document, "cvTitle").status);
  });
}

TEST_F(BridgeCallsThreadTest, TheDeadMakeRoomForTheLiving) {
  serve({.objectsPerSession = 3});
  Json session;
  for (int i = 0; i < 5; ++i) {
    meanwhile([&] {
      if (i == 0) session = opened();
      EXPECT_EQ(200, called(session, session["roots"]["document"], "cvMediaAtIndex:", {1}).status) << i;
    });
    if (i > 0) document()->removeMedia(document()->mediaAtIndex(1));
    document()->addMedia(QuiltMedia::init());
  }
}

TEST_F(BridgeCallsThreadTest, ThereAreNoMoreSessionsThanThereMayBe) {
  serve({.sessions = 2});
  meanwhile([&] {
    const Json first = opened();
    (void)opened();
    EXPECT_EQ("too-many-sessions", codeOf(post("open", Json::object())));
    EXPECT_EQ(200, post("close", {{"session", first["session"]}}).status);
    (void)opened();
  });
}

TEST_F(BridgeCallsThreadTest, ASessionThatIsLeftAloneEnds) {
  serve({.sessionIdle = std::chrono::milliseconds(1)});
  meanwhile([&] {
    (void)opened();
    EXPECT_TRUE(support::waitUntil([&] { return bridge().sessionCount() == 0; }));
  });
}

TEST_F(BridgeCallsThreadTest, ASessionEndsWithItsStreamOfChanges) {
  meanwhile([&] {
    const Json session = opened();
    {
      HttpClient stream(port());
      stream.send(
          request("GET", path("conveyor/events?session=") + session["session"].get<std::string>(), callFields()));
      EXPECT_THAT(stream.readUntil("event: open"), HasSubstr("text/event-stream"));
      EXPECT_EQ(
          "already-listening",
          codeOf(ask("GET", path("conveyor/events?session=") + session["session"].get<std::string>(), callFields())));
      EXPECT_EQ(1U, bridge().sessionCount());
    }
    EXPECT_TRUE(support::waitUntil([&] { return bridge().sessionCount() == 0; }));
    EXPECT_EQ("no-session", codeOf(called(session, session["roots"]["document"], "cvTitle")));
    EXPECT_EQ("no-session", codeOf(ask("GET", path("conveyor/events?session=x"), callFields())));
  });
}

TEST_F(BridgeCallsThreadTest, ABusyApplicationRefusesAndDoesNothingLater) {
  serve({.callTime = std::chrono::milliseconds(50)});
  Json session;
  meanwhile([&] { session = opened(); });
  std::thread client([&] {
    const HttpAnswer answer = called(session, session["roots"]["document"], "cvSetTitle:", {"Late"});
    EXPECT_EQ(503, answer.status);
    EXPECT_EQ("busy", codeOf(answer));
  });
  client.join();  // the main thread does nothing else
  meanwhile([&] { EXPECT_EQ("Untitled Episode", value(session, session["roots"]["document"], "cvTitle")); });
  EXPECT_EQ(std::nullopt, document()->title());
}

TEST_F(BridgeCallsThreadTest, TheEndLetsWaitingClientsGo) {
  Json session;
  meanwhile([&] { session = opened(); });
  const std::string text = request("POST", path("conveyor/call"), callFields(),
                                   Json{{"session", session["session"]},
                                        {"object", session["roots"]["document"]["object"]},
                                        {"method", "cvSetTitle:"},
                                        {"arguments", {"Late"}}}
                                       .dump());
  std::vector<std::unique_ptr<HttpClient>> clients;
  for (int i = 0; i < 10; ++i) {
    clients.push_back(std::make_unique<HttpClient>(port()));
    clients.back()->send(text);
  }
  const auto before = std::chrono::steady_clock::now();
  endBridge();  // on the main thread, which never turned
  EXPECT_LT(std::chrono::steady_clock::now() - before, std::chrono::seconds(5)) << "a call waits for ten";
  for (const auto& client : clients) EXPECT_TRUE(client->isEnded());
}

}  // namespace
}  // namespace quilt::scripting
