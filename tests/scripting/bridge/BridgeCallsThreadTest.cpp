// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <thread>

#include "tests/support/BridgeFixture.h"
#include "tests/support/QuiltProgram.h"

namespace quilt::scripting {
namespace {

using support::HttpAnswer;
using support::HttpClient;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

/// Calls, sessions and handles.
class BridgeCallsThreadTest : public support::BridgeFixture {};

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
  serve({.objectsPerSession = 2});
  for (int i = 0; i < 3; ++i) document()->addMedia(QuiltMedia::init());
  meanwhile([&] {
    const Json session = opened();  // holds the document
    const Json document = session["roots"]["document"];
    EXPECT_EQ(200, called(session, document, "cvMediaAtIndex:", {0}).status);
    EXPECT_EQ("too-many-objects", codeOf(called(session, document, "cvMediaAtIndex:", {1})));
    EXPECT_EQ(200, called(session, document, "cvMediaAtIndex:", {0}).status);
    EXPECT_EQ(200, called(session, document, "cvTitle").status);
  });
}

TEST_F(BridgeCallsThreadTest, TheDeadMakeRoomForTheLiving) {
  serve({.objectsPerSession = 2});
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

TEST_F(BridgeCallsThreadTest, TheSilentSessionUsedLongestAgoGivesWayToANewOne) {
  serve({.sessions = 2});
  meanwhile([&] {
    const Json first = opened();
    const Json second = opened();
    EXPECT_EQ(200, called(first, first["roots"]["document"], "cvTitle").status) << "used again";
    const Json third = opened();
    EXPECT_EQ("no-session", codeOf(called(second, second["roots"]["document"], "cvTitle")));
    for (const Json& session : {first, third})
      EXPECT_EQ(200, called(session, session["roots"]["document"], "cvTitle").status);
  });
  EXPECT_EQ(2u, bridge().sessionCount());
}

TEST_F(BridgeCallsThreadTest, PagesThatNeverListenLockNobodyOut) {
  meanwhile([&] {
    for (int i = 0; i < 100; ++i) {
      const Json session = opened();
      EXPECT_EQ(200, called(session, session["roots"]["document"], "cvTitle").status) << i;
    }
  });
}

TEST_F(BridgeCallsThreadTest, ThereAreNoMoreSessionsThatListenThanThereMayBe) {
  serve({.sessions = 1});
  meanwhile([&] {
    const Json session = opened();
    HttpClient client(port());
    client.send(request("GET", path("conveyor/events?session=") + session["session"].get<std::string>(), callFields()));
    EXPECT_THAT(client.readUntil("event: open"), HasSubstr("event: open"));
    EXPECT_EQ("too-many-sessions", codeOf(post("open", Json::object())));
    EXPECT_EQ(200, post("close", {{"session", session["session"]}}).status);
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
  EXPECT_EQ("Untitled Episode", document()->title());
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
