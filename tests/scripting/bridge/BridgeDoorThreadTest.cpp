// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <cstdio>
#include <fstream>

#include "tests/support/BridgeFixture.h"

namespace quilt::scripting {
namespace {

using support::HttpAnswer;
using support::HttpClient;
using ::testing::HasSubstr;
using ::testing::Not;

/// Who is let in, and who is not.
class BridgeDoorThreadTest : public support::BridgeFixture {
 protected:
  BridgeDoorThreadTest() { writeFile(document()->path() / "index.html", "<head></head>Hello"); }

  [[nodiscard]] int statusOf(const std::string& method, const std::string& target, const Fields& fields = {},
                             const std::string& body = "") const {
    return ask(method, target, fields, body).status;
  }
  [[nodiscard]] std::string page() const { return path("package/index.html"); }
  /// A call that would change the title if it were let in.
  [[nodiscard]] std::string edit(const Json& session) const {
    return Json{{"session", session["session"]},
                {"object", session["roots"]["document"]["object"]},
                {"method", "cvSetTitle:"},
                {"arguments", {"Changed"}}}
        .dump();
  }
};

TEST_F(BridgeDoorThreadTest, ListensOnTheLoopbackAddressAtARandomPort) {
  EXPECT_THAT(bridge().address(), ::testing::StartsWith("http://127.0.0.1:"));
  EXPECT_NE(0, port());
  // 0100007F: 127.0.0.1 as the kernel lists it; no other address listens at this port.
  std::ifstream table("/proc/self/net/tcp");
  char digits[8];
  std::snprintf(digits, sizeof digits, ":%04X", port());
  int listeners = 0;
  for (std::string line; std::getline(table, line);) {
    if (line.find(std::string(digits) + " 00000000:0000 0A") == std::string::npos) continue;
    EXPECT_THAT(line, HasSubstr("0100007F:"));
    ++listeners;
  }
  EXPECT_EQ(1, listeners);
}

TEST_F(BridgeDoorThreadTest, EachBridgeHasATokenOfItsOwn) {
  const std::string first = token();
  EXPECT_EQ(32U, first.size());
  serve({});
  EXPECT_NE(first, token());
  EXPECT_EQ(401, statusOf("GET", '/' + first + "/package/index.html"));
}

TEST_F(BridgeDoorThreadTest, APortThatIsTakenIsAnError) {
  const auto second = Bridge::serve(document(), {.port = port()});
  ASSERT_FALSE(second.hasValue());
  EXPECT_EQ(platform::ErrorKind::AlreadyExists, second.error().kind);
  EXPECT_THAT(second.error().text, HasSubstr("Port " + std::to_string(port()) + " cannot be had"));
}

TEST_F(BridgeDoorThreadTest, WithoutTheTokenEveryPathIsAnsweredAlike) {
  const HttpAnswer refusal = ask("GET", "/");
  EXPECT_EQ(401, refusal.status);
  std::string wrong = token();
  wrong.back() = wrong.back() == '0' ? '1' : '0';
  for (const std::string& target :
       {std::string("/package/index.html"), '/' + wrong + "/package/index.html", '/' + token() + "x/package/index.html",
        '/' + token().substr(1) + "/package/index.html", "/x/" + token() + "/package/", std::string("/conveyor/open"),
        std::string("/conveyor.js"), std::string("/?") + token(), std::string("//") + token()})
    for (const Fields& fields : {Fields{}, Fields{{"Range", "bytes=9-1,5"}}, Fields{{"X-Conveyor-Token", token()}}})
      EXPECT_EQ(refusal, ask("GET", target, fields)) << target;
  EXPECT_EQ(refusal, ask("POST", "/conveyor/open", callFields(), "{}"));
  EXPECT_EQ(refusal, ask("DELETE", "/"));
  EXPECT_EQ(200, statusOf("GET", page()));
}

TEST_F(BridgeDoorThreadTest, AHostOfAnotherNameIsForbiddenBeforeAnythingElse) {
  const std::string number = std::to_string(port());
  for (const std::string& name : {"127.0.0.1:" + number, "localhost:" + number, "[::1]:" + number})
    EXPECT_EQ(200, statusOf("GET", page(), {{"Host", name}})) << name;
  for (const std::string& name :
       {std::string(), std::string("127.0.0.1"), std::string("localhost"), "example.org:" + number,
        "localhost.:" + number, "127.0.0.1.:" + number, "127.0.0.1:" + number + ".", "127.0.0.1:1" + number,
        "127.0.0.1:" + number + " ,127.0.0.1:" + number, "127.1:" + number, "0.0.0.0:" + number, "::1:" + number,
        "127.0.0.1:" + number + "@example.org", "localhost.example.org:" + number})
    for (const std::string& target : {page(), std::string("/")})
      EXPECT_EQ(403, statusOf("GET", target, {{"Host", name}})) << name << target;
}

TEST_F(BridgeDoorThreadTest, AMissingOrDoubledHostIsForbidden) {
  HttpClient without(port());
  without.send("GET " + page() + " HTTP/1.1\r\n\r\n");
  EXPECT_EQ(403, without.read().status);
  EXPECT_EQ(403, statusOf("GET", page(), {{"Host", host()}, {"Host", host()}}));
  EXPECT_EQ(403, statusOf("GET", page(), {{"Host", host()}, {"host", "example.org"}}));
}

TEST_F(BridgeDoorThreadTest, APageOfAnotherSiteIsForbidden) {
  EXPECT_EQ(200, statusOf("GET", page(), {{"Origin", "http://" + host()}}));
  for (const std::string& origin :
       {std::string("null"), std::string("http://example.org"), std::string("http://127.0.0.1:1"),
        std::string("http://127.0.0.1"), "https://" + host(), "http://localhost:" + std::to_string(port()),
        std::string(), "http://" + host() + "/", "http://" + host() + ".example.org"}) {
    const HttpAnswer answer = ask("GET", page(), {{"Origin", origin}});
    EXPECT_EQ(403, answer.status) << origin;
    for (const auto& [name, unused] : answer.fields)
      EXPECT_THAT(name, Not(::testing::StartsWith("access-control"))) << origin;
  }
  EXPECT_EQ(403, statusOf("GET", page(), {{"Origin", "http://" + host()}, {"Origin", "http://" + host()}}));
}

TEST_F(BridgeDoorThreadTest, NoAnswerInvitesOtherSites) {
  for (const HttpAnswer& answer : {ask("GET", page(), {{"Origin", "http://" + host()}}),
                                   ask("OPTIONS", path("conveyor/call"),
                                       {{"Origin", "http://example.org"}, {"Access-Control-Request-Method", "POST"}})})
    for (const auto& [name, unused] : answer.fields) EXPECT_THAT(name, Not(::testing::StartsWith("access-control")));
  EXPECT_EQ(405, statusOf("OPTIONS", path("conveyor/call")));
}

TEST_F(BridgeDoorThreadTest, EditsNeedTheTokenInAFieldAndJson) {
  meanwhile([&] {
    const Json session = opened();
    const std::string target = path("conveyor/call");
    const std::string shown = token();
    EXPECT_EQ(401, statusOf("POST", target, {{"Content-Type", "application/json"}}, edit(session)));
    EXPECT_EQ(401, statusOf("POST", target,
                            {{"Content-Type", "application/json"}, {"X-Conveyor-Token", shown.substr(1) + "x"}},
                            edit(session)));
    EXPECT_EQ(401,
              statusOf("POST", target,
                       {{"Content-Type", "application/json"}, {"X-Conveyor-Token", shown}, {"X-Conveyor-Token", shown}},
                       edit(session)));
    for (const char* type : {"text/plain", "application/x-www-form-urlencoded", "multipart/form-data; boundary=x",
                             "text/plain; application/json", "application/jsonp", ""})
      EXPECT_EQ(415, statusOf("POST", target, {{"Content-Type", type}, {"X-Conveyor-Token", shown}}, edit(session)))
          << type;
    EXPECT_EQ(415, statusOf("POST", target, {{"X-Conveyor-Token", shown}}, edit(session)));
    EXPECT_EQ(403, statusOf("POST", target,
                            {{"Content-Type", "application/json"}, {"X-Conveyor-Token", shown}, {"Origin", "null"}},
                            edit(session)));
    for (const char* method : {"GET", "HEAD"})
      EXPECT_EQ(404, statusOf(method, target, callFields(), edit(session))) << method;
    for (const char* method : {"PUT", "DELETE", "PATCH", "post", "CONNECT"})
      EXPECT_EQ(405, statusOf(method, target, callFields(), edit(session))) << method;
    EXPECT_EQ(404, statusOf("POST", path("package/index.html"), callFields(), edit(session)));
  });
  EXPECT_EQ("Untitled Episode", document()->title());
  meanwhile([&] { EXPECT_EQ(200, statusOf("POST", path("conveyor/call"), callFields(), edit(opened()))); });
  EXPECT_EQ("Changed", document()->title());
}

TEST_F(BridgeDoorThreadTest, TheStreamOfChangesNeedsTheTokenInAField) {
  meanwhile([&] {
    const std::string target = path("conveyor/events?session=") + opened()["session"].get<std::string>();
    EXPECT_EQ(401, statusOf("GET", target));
    EXPECT_EQ(200, statusOf("GET", target, {{"X-Conveyor-Token", token()}}));
  });
}

TEST_F(BridgeDoorThreadTest, EveryAnswerCarriesTheRulesForBrowsers) {
  for (const HttpAnswer& answer : {ask("GET", "/"), ask("GET", page()), ask("GET", path("package/none")),
                                   ask("GET", page(), {{"Host", "example.org"}})}) {
    EXPECT_EQ("nosniff", answer.fields.at("x-content-type-options"));
    EXPECT_EQ("no-referrer", answer.fields.at("referrer-policy"));
    EXPECT_EQ("same-origin", answer.fields.at("cross-origin-resource-policy"));
    const std::string& policy = answer.fields.at("content-security-policy");
    for (const char* rule : {"default-src 'none'", "script-src 'self';", "connect-src 'self'", "object-src 'none'",
                             "base-uri 'none'", "form-action 'none'"})
      EXPECT_THAT(policy, HasSubstr(rule));
    EXPECT_THAT(policy, Not(HasSubstr("unsafe-eval")));
  }
}

TEST_F(BridgeDoorThreadTest, TheTokenIsInNoLogLine) {
  takeLines();
  meanwhile([&] {
    const Json session = opened();
    (void)value(session, session["roots"]["document"], "cvTitle");
    (void)ask("GET", page());
    (void)ask("GET", path("package/none"));
  });
  const auto lines = takeLines();
  EXPECT_FALSE(lines.empty());
  for (const auto& line : lines) EXPECT_THAT(line.text, Not(HasSubstr(token())));
}

}  // namespace
}  // namespace quilt::scripting
