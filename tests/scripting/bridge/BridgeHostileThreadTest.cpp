// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <atomic>
#include <chrono>
#include <deque>
#include <thread>

#include "quilt/platform/base/MainThread.h"
#include "tests/support/BridgeFixture.h"
#include "tests/support/QuiltProgram.h"
#include "tests/support/Stopwatch.h"

namespace quilt::scripting {
namespace {

using namespace std::chrono_literals;
using support::HttpAnswer;
using support::HttpClient;
using ::testing::AnyOf;

/// Clients that are slow, huge, many or out of their mind.
class BridgeHostileThreadTest : public support::BridgeFixture {
 protected:
  BridgeHostileThreadTest() {
    writeFile(document()->path() / "clip.mp4", "0123456789");
    Bridge::Options options;
    options.limits.connections = 8;
    options.limits.idle = 300ms;
    options.limits.head = 300ms;
    options.limits.body = 300ms;
    options.limits.stall = 300ms;
    options.limits.headBytes = 4096;
    options.limits.bodyBytes = 65536;
    serve(options);
  }

  [[nodiscard]] std::string wanted() const { return request("GET", path("package/clip.mp4")); }
  /// Somebody who belongs here is served.
  void expectService() const { EXPECT_EQ("0123456789", ask("GET", path("package/clip.mp4")).body); }
  static std::size_t descriptors() { return namesIn("/proc/self/fd").size(); }
};

TEST_F(BridgeHostileThreadTest, AHeadThatIsTooLargeIsRefused) {
  HttpClient client(port());
  client.send("GET / HTTP/1.1\r\nHost: " + host() + "\r\nX: " + std::string(8000, 'a'));
  EXPECT_EQ(431, client.read().status);
  EXPECT_TRUE(client.isEnded());
  HttpClient many(port());
  std::string fields;
  for (int i = 0; i < 2000; ++i) fields += "X:\r\n";
  many.send("GET / HTTP/1.1\r\n" + fields + "\r\n");
  EXPECT_EQ(431, many.read().status);
  HttpClient endless(port());
  for (int i = 0; i < 10000 && endless.send(std::string(4096, 'x')); ++i) continue;
  EXPECT_THAT(endless.read().status, AnyOf(431, 0));
  expectService();
}

TEST_F(BridgeHostileThreadTest, ABodyThatIsTooLargeIsRefusedBeforeItIsRead) {
  Fields fields = callFields();
  fields.emplace_back("Content-Length", "65537");
  EXPECT_EQ(413, ask("POST", path("conveyor/call"), fields).status);
  fields.back().second = "99999999999999999999999999";
  EXPECT_EQ(411, ask("POST", path("conveyor/call"), fields).status);
  HttpClient sends(port());
  fields.back().second = "10000000";
  sends.send(request("POST", path("conveyor/call"), fields));
  for (int i = 0; i < 100 && sends.send(std::string(100000, 'x')); ++i) continue;
  EXPECT_THAT(sends.read().status, AnyOf(413, 0));
  expectService();
}

TEST_F(BridgeHostileThreadTest, ALengthThatCanBeReadTwoWaysIsRefused) {
  const std::string target = path("conveyor/call");
  for (const Fields& lengths :
       {Fields{{"Content-Length", "2"}, {"Content-Length", "3"}},
        Fields{{"Content-Length", "2"}, {"Content-Length", "2"}}, Fields{{"Transfer-Encoding", "chunked"}},
        Fields{{"Content-Length", "2"}, {"Transfer-Encoding", "chunked"}}, Fields{{"Content-Length", "+2"}},
        Fields{{"Content-Length", "-2"}}, Fields{{"Content-Length", "2 "}, {"Expect", "100-continue"}},
        Fields{{"Content-Length", "0x2"}}, Fields{{"Content-Length", "2,2"}}, Fields{{"Content-Length", ""}}}) {
    Fields fields = callFields();
    fields.insert(fields.end(), lengths.begin(), lengths.end());
    EXPECT_EQ(411, ask("POST", target, fields).status);
  }
}

TEST_F(BridgeHostileThreadTest, WhatIsNoRequestIsRefused) {
  const std::string name = "Host: " + host() + "\r\n";
  for (const std::string& text :
       {std::string("\r\n\r\n"), std::string("x\r\n\r\n"), "GET  / HTTP/1.1\r\n" + name + "\r\n",
        "GET / HTTP/2.0\r\n" + name + "\r\n", "GET /\r\n" + name + "\r\n",
        "GET http://example.org/ HTTP/1.1\r\n" + name + "\r\n", "GET * HTTP/1.1\r\n" + name + "\r\n",
        "GET /\x01 HTTP/1.1\r\n" + name + "\r\n", "GET /\xff HTTP/1.1\r\n" + name + "\r\n",
        "GET / HTTP/1.1\r\n" + name + " folded: x\r\n\r\n", "GET / HTTP/1.1\r\nHost : " + host() + "\r\n\r\n",
        "GET / HTTP/1.1\r\n" + name + "X: a\nY: b\r\n\r\n", "GET / HTTP/1.1\r\n" + name + ": x\r\n\r\n",
        "GET / HTTP/1.1\r\n" + name + "X\r\n\r\n", "G\tT / HTTP/1.1\r\n" + name + "\r\n",
        "GET / HTTP/1.1\r\n" + name + std::string("X: a\0b\r\n\r\n", 10), std::string("\x16\x03\x01\x02\r\n\r\n")}) {
    HttpClient client(port());
    client.send(text);
    EXPECT_EQ(400, client.read().status) << text;
    EXPECT_TRUE(client.isEnded()) << text;
  }
}

TEST_F(BridgeHostileThreadTest, ARefusedRequestIsTheLastOfItsConnection) {
  HttpClient client(port());
  client.send(request("POST", path("conveyor/call"), {{"Content-Type", "text/plain"}, {"X-Conveyor-Token", token()}},
                      wanted()));
  EXPECT_EQ(415, client.read().status);
  EXPECT_EQ(0, client.read().status) << "the body of one request is never read as another";
}

TEST_F(BridgeHostileThreadTest, SlowClientsAreShownOut) {
  HttpClient silent(port());
  HttpClient dripping(port());
  HttpClient withholding(port());
  Fields fields = callFields();
  fields.emplace_back("Content-Length", "10");
  withholding.send(request("POST", path("conveyor/call"), fields) + "12345");
  for (int i = 0; i < 1000 && dripping.send("x"); ++i) std::this_thread::sleep_for(10ms);
  EXPECT_EQ(408, withholding.read().status);
  EXPECT_TRUE(silent.isEnded());
  EXPECT_TRUE(dripping.isEnded());
}

TEST_F(BridgeHostileThreadTest, AClientThatReadsNothingIsLetGo) {
  writeFile(document()->path() / "large.bin", std::string(32 << 20, 'x'));
  const std::size_t before = descriptors();
  HttpClient client(port());
  client.send(request("GET", path("package/large.bin")));
  EXPECT_TRUE(support::waitUntil([&] { return descriptors() > before + 1; })) << "socket and file are open";
  EXPECT_TRUE(support::waitUntil([&] { return descriptors() <= before + 1; })) << "its own end is left";
}

TEST_F(BridgeHostileThreadTest, AClientThatHasSaidAllIsAnswered) {
  HttpClient client(port());
  client.send(wanted());
  client.endSending();
  EXPECT_EQ("0123456789", client.read().body);
  EXPECT_TRUE(client.isEnded());
  HttpClient half(port());
  half.send("GET / HTT");
  half.endSending();
  EXPECT_TRUE(half.isEnded());
}

TEST_F(BridgeHostileThreadTest, StrangersDoNotCrowdOutThoseWhoBelongHere) {
  std::vector<std::unique_ptr<HttpClient>> strangers;
  for (int i = 0; i < 100; ++i) {
    strangers.push_back(std::make_unique<HttpClient>(port()));
    if (i % 2 == 0) strangers.back()->send("GET / HTTP/1.1\r\n");
  }
  expectService();
}

TEST_F(BridgeHostileThreadTest, MoreThanTheyMayBeAreTurnedAway) {
  std::vector<std::unique_ptr<HttpClient>> clients;
  for (int i = 0; i < 8; ++i) {
    clients.push_back(std::make_unique<HttpClient>(port()));
    clients.back()->send(wanted());
    EXPECT_EQ(200, clients.back()->read().status) << i;
  }
  EXPECT_EQ(503, ask("GET", path("package/clip.mp4")).status);
  clients.pop_back();
  EXPECT_TRUE(support::waitUntil([&] { return ask("GET", path("package/clip.mp4")).status == 200; }));
}

TEST_F(BridgeHostileThreadTest, ThoseWhoBelongHereComeInWhileStrangersKeepComing) {
  serve({});  // with few places, it is a matter of luck who has shown the token in time
  std::atomic<bool> isDone = false;
  std::vector<std::jthread> strangers;
  for (int i = 0; i < 4; ++i)
    strangers.emplace_back([&] {
      std::deque<HttpClient> here;
      while (!isDone) {
        here.emplace_back(port());
        if (here.size() > 20) here.pop_front();
        std::this_thread::sleep_for(10ms);
      }
    });
  for (int i = 0; i < 20; ++i) expectService();
  isDone = true;
}

TEST_F(BridgeHostileThreadTest, DescriptorsDoNotGrow) {
  expectService();
  ASSERT_TRUE(support::waitUntil([&] { return descriptors() < 100; }));
  std::this_thread::sleep_for(100ms);
  const std::size_t before = descriptors();
  for (int i = 0; i < 200; ++i) {
    HttpClient client(port());
    client.send(i % 3 == 0 ? wanted() : i % 3 == 1 ? "GET / HTTP/1.1\r\n\r\n" : "GE");
    if (i % 3 != 2) (void)client.read();
  }
  EXPECT_TRUE(support::waitUntil([&] { return descriptors() <= before; })) << descriptors() << " > " << before;
}

TEST_F(BridgeHostileThreadTest, TheModelStaysResponsive) {
  serve({});
  std::atomic<bool> isDone = false;
  std::vector<std::thread> attackers;
  for (int i = 0; i < 3; ++i)
    attackers.emplace_back([&] {
      while (!isDone) {
        HttpClient client(port());
        client.send("POST / HTTP/1.1\r\nContent-Length: 99\r\n\r\n");
        HttpClient other(port());
        other.send(std::string(5000, 'x'));
      }
    });
  const support::Stopwatch watch;
  for (int i = 0; i < 200; ++i) {
    document()->setTitle(std::to_string(i));
    platform::MainThread::runQueuedBlocks();
  }
  const double took = watch.seconds();
  meanwhile([&] {
    const Json session = opened();
    EXPECT_EQ("199", value(session, session["roots"]["document"], "cvTitle"));
  });
  isDone = true;
  for (std::thread& attacker : attackers) attacker.join();
  EXPECT_LT(took, 1);
}

}  // namespace
}  // namespace quilt::scripting
