// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <atomic>
#include <set>
#include <thread>

#include "quilt/media/QuiltMediaExtra.h"
#include "quilt/scripting/Accessor.h"
#include "quilt/scripting/bridge/ChangedAccessors.h"
#include "tests/support/BridgeFixture.h"

namespace quilt::scripting {
namespace {

using support::HttpClient;
using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::Not;

/// What clients hear of changes, and what comes of edits that race.
class BridgeChangesThreadTest : public support::BridgeFixture {
 protected:
  /// A client that listens.
  struct Listener {
    Listener(const BridgeChangesThreadTest& test, const Json& session) : client(test.port()) {
      client.send(test.request("GET", test.path("conveyor/events?session=") + session["session"].get<std::string>(),
                               test.callFields()));
      client.readUntil("event: open\ndata: {}\n\n");
    }
    HttpClient client;
  };
  static std::string event(const Json& object, const Json& accessors) {
    return "event: change\ndata: {\"object\":" + object["object"].dump() + ",\"accessors\":" + accessors.dump() +
           "}\n\n";
  }
};

TEST_F(BridgeChangesThreadTest, AnEditInTheHostIsHeardAtOnce) {
  Json session;
  std::unique_ptr<Listener> listener;
  meanwhile([&] {
    session = opened();
    listener = std::make_unique<Listener>(*this, session);
  });
  document()->setTitle("New");
  meanwhile([&] {
    const std::string wanted = event(session["roots"]["document"], {"cvTitle"});
    EXPECT_THAT(listener->client.readUntil(wanted), HasSubstr(wanted));
  });
  document()->addMedia(QuiltMedia::init());
  meanwhile([&] {
    const std::string wanted = event(session["roots"]["document"], {"cvMediaAtIndex:", "cvMediaCount"});
    EXPECT_THAT(listener->client.readUntil(wanted), HasSubstr(wanted));
  });
}

TEST_F(BridgeChangesThreadTest, AnEditOfOneClientIsHeardByAnother) {
  meanwhile([&] {
    const Json one = opened();
    const Json other = opened();
    Listener listener(*this, other);
    (void)value(one, one["roots"]["document"], "cvSetDescription:", {"Words"});
    const std::string wanted = event(other["roots"]["document"], {"cvDescription"});
    EXPECT_THAT(listener.client.readUntil(wanted), HasSubstr(wanted));
  });
}

TEST_F(BridgeChangesThreadTest, ChangesOfWhatAClientHoldsAreHeardAndNoOthers) {
  const auto extra = QuiltMediaExtra::init();
  item()->addExtra(extra);
  Json session;
  Json media;
  std::unique_ptr<Listener> listener;
  meanwhile([&] {
    session = opened();
    listener = std::make_unique<Listener>(*this, session);
  });
  item()->setTitle("Nobody holds the item");
  meanwhile([&] { media = value(session, session["roots"]["document"], "cvMediaAtIndex:", {0}); });
  item()->setDescription("Somebody does");
  item()->removeExtra(extra);
  document()->setAuthor("Last");
  meanwhile([&] {
    const std::string heard = listener->client.readUntil("cvAuthor");
    EXPECT_THAT(heard, Not(HasSubstr("cvTitle")));
    EXPECT_THAT(heard, AllOf(HasSubstr("cvDescription"), HasSubstr("cvExtraCount")));
  });
}

TEST_F(BridgeChangesThreadTest, ChangesBeforeTheStreamBeginsAreNotLostAndManyAreOne) {
  Json session;
  meanwhile([&] { session = opened(); });
  for (int i = 0; i < 1000; ++i) document()->setTitle(std::to_string(i));
  document()->setAuthor("Ann");
  meanwhile([&] {
    HttpClient client(port());
    client.send(request("GET", path("conveyor/events?session=") + session["session"].get<std::string>(), callFields()));
    const std::string wanted = event(session["roots"]["document"], {"cvAuthor", "cvTitle"});
    EXPECT_THAT(client.readUntil(wanted), HasSubstr(wanted));
  });
}

TEST_F(BridgeChangesThreadTest, EveryAnswerThatCanChangeHasItsKey) {
  for (const ExposedClass& type : exposedClasses()) {
    std::set<std::string_view> told;
    for (const ChangedAccessors& changed : changedAccessors())
      if (changed.className == type.name) told.insert(changed.accessors.begin(), changed.accessors.end());
    for (const Accessor& accessor : type.accessors) {
      const bool canChange = accessor.answer != Answer::Nothing && accessor.name != "cvUUID";
      EXPECT_EQ(canChange, told.contains(accessor.name)) << type.name << ' ' << accessor.name;
      told.erase(accessor.name);
    }
    EXPECT_TRUE(told.empty()) << type.name << " has no " << *told.begin();
  }
}

TEST_F(BridgeChangesThreadTest, EditsOfTwoClientsRaceToOneConsistentEnd) {
  for (int i = 0; i < 40; ++i) item()->addExtra(QuiltMediaExtra::init());
  meanwhile([&] {
    const auto edit = [this](const std::string& name) {
      const Json session = opened();
      const Json media = value(session, session["roots"]["document"], "cvMediaAtIndex:", {0});
      for (int i = 0; i < 20; ++i) {
        (void)value(session, session["roots"]["document"], "cvSetTitle:", {name + std::to_string(i)});
        (void)value(session, media, "cvRemoveExtraAtIndex:", {0});
      }
    };
    std::jthread one(edit, "one ");
    edit("two ");
    one.join();
  });
  EXPECT_EQ(0U, item()->extraCount()) << "each removal removed one";
  EXPECT_THAT(*document()->title(), ::testing::AnyOf("one 19", "two 19"));
  EXPECT_EQ(document()->title(), readRecord(document()->propertiesPath()).string("Title"));
}

TEST_F(BridgeChangesThreadTest, ClientsReadAndListenWhileAWorkerChangesTheModel) {
  std::atomic<bool> isDone = false;
  std::jthread worker([&] {
    for (int i = 0; i < 200; ++i) {
      const auto added = QuiltMedia::init();
      document()->addMedia(added, 0);
      added->setTitle(std::to_string(i));
      document()->setTitle(std::to_string(i));
      document()->removeMedia(added);
    }
    isDone = true;
  });
  meanwhile([&] {
    const Json session = opened();
    Listener listener(*this, session);
    while (!isDone) {
      const auto answer = called(session, session["roots"]["document"], "cvMediaAtIndex:", {0});
      EXPECT_EQ(200, answer.status);
      const Json media = answer.json()["value"];
      const int status = called(session, media, "cvTitle").status;
      EXPECT_TRUE(status == 200 || status == 404) << status << " of an item that may have gone";
    }
  });
  worker.join();
  EXPECT_EQ(1U, document()->mediaCount());
}

}  // namespace
}  // namespace quilt::scripting
