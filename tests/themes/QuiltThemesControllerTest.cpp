// SPDX-License-Identifier: Apache-2.0
#include "quilt/themes/QuiltThemesController.h"

#include <gmock/gmock.h>

#include <atomic>
#include <thread>

#include "quilt/platform/base/MainThread.h"
#include "quilt/platform/base/Worker.h"
#include "quilt/platform/bundles/FolderBundles.h"
#include "tests/support/Environment.h"
#include "tests/support/ModelFixture.h"

namespace quilt {
namespace {

using platform::ScopedService;
using platform::Services;
using support::critical;
using support::debug;
using support::Environment;
using support::Lines;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class QuiltThemesControllerTest : public support::ModelFixture {
 protected:
  using Call = std::pair<std::string, double>;  ///< the name of the theme, or "none", and the percentage

  /// A theme bundle in a library folder: "user", "local", "system", or "app", the application's own.
  Path makeTheme(const std::string& name, const std::string& identifier, const std::string& library = "user") const {
    const Path bundle = folder() / library / (library == "app" ? "Themes" : "quilt/Themes") / (name + ".qth");
    writeRecord(bundle / "Info.plist", {{platform::kBundleIdentifierKey, identifier},
                                        {platform::kBundleDisplayNameKey, name},
                                        {platform::kBundleShortVersionKey, "1.0"}});
    EXPECT_TRUE(picture(8, 8)->saveAsPNGAtURL(Url::fileUrl(bundle / "Preview.png")));
    return bundle;
  }
  Path makeTheme(const std::string& name) const { return makeTheme(name, "org.example." + name); }
  /// A bundle of a version that is not supported.
  Path makeWrongTheme(const std::string& name) const {
    const Path bundle = makeTheme(name);
    Dictionary record = readRecord(bundle / "Info.plist");
    record.set(platform::kBundleShortVersionKey, "1.1");
    writeRecord(bundle / "Info.plist", record);
    return bundle;
  }

  /// Loads; the block answers false from the call `until` on (0: never).
  bool load(std::size_t until = 0) {
    return controller->loadWithProgressionBlock([&](const std::shared_ptr<QuiltTheme>& theme, double percentage) {
      calls.emplace_back(theme ? theme->localizedName().value_or("unnamed") : "none", percentage);
      return until == 0 || calls.size() < until;
    });
  }
  std::vector<std::string> names() const {
    std::vector<std::string> all;
    for (const auto& theme : controller->themes()) all.push_back(theme->localizedName().value_or("unnamed"));
    return all;
  }

  const std::shared_ptr<QuiltThemesController> controller = QuiltThemesController::init();
  std::vector<Call> calls;

 private:
  const Environment _user{"XDG_DATA_HOME", (folder() / "user").c_str()};
  const Environment _shared{"XDG_DATA_DIRS",
                            ((folder() / "local").native() + ":" + (folder() / "system").native()).c_str()};
  const ScopedService<platform::Bundles> _bundles{&Services::bundles,
                                                  std::make_shared<platform::FolderBundles>(folder() / "app")};
};
/// What starts threads; run with the thread sanitizer too.
using QuiltThemesControllerThreadTest = QuiltThemesControllerTest;

using Call = std::pair<std::string, double>;
const support::Line kLoading = debug("Loading themes...");

TEST_F(QuiltThemesControllerTest, ANewControllerIsEmptyAndIdle) {
  EXPECT_FALSE(controller->loadingThemes());
  EXPECT_EQ(controller->themesCount(), 0u);
  EXPECT_THAT(controller->themes(), IsEmpty());
}

TEST_F(QuiltThemesControllerThreadTest, TheDefaultControllerIsTheSameOnEveryThread) {
  std::shared_ptr<QuiltThemesController> other;
  std::thread([&] { other = QuiltThemesController::defaultController(); }).join();
  EXPECT_TRUE(other);
  EXPECT_EQ(QuiltThemesController::defaultController(), other);
}

// Loading

TEST_F(QuiltThemesControllerTest, WithoutBundlesTheBlockIsNotCalledAndThereIsNoDefaultTheme) {
  EXPECT_TRUE(load());
  EXPECT_THAT(calls, IsEmpty());
  EXPECT_EQ(controller->themesCount(), 0u);
  EXPECT_EQ(controller->defaultTheme(), nullptr);
  EXPECT_FALSE(controller->loadingThemes());
  EXPECT_EQ(takeLines(), Lines{kLoading});
}

TEST_F(QuiltThemesControllerTest, AnInvalidBundleOfThreeIsReportedAsNoneAndTheRestLoads) {
  makeTheme("a");
  const Path wrong = makeWrongTheme("b");
  makeTheme("c");
  EXPECT_TRUE(load());
  EXPECT_THAT(calls, ElementsAre(Call{"a", 33.0}, Call{"none", 66.0}, Call{"c", 100.0}));
  EXPECT_THAT(names(), ElementsAre("a", "c"));
  EXPECT_FALSE(controller->loadingThemes());
  EXPECT_EQ(takeLines(), (Lines{kLoading, debug("Loaded theme \"a\""),
                                warning("Theme bundle \"" + wrong.native() + "\" version is unsupported."),
                                debug("Loaded theme \"c\"")}));
}

TEST_F(QuiltThemesControllerTest, AnEmptyBlockGoesOn) {
  makeTheme("a");
  EXPECT_TRUE(controller->loadWithProgressionBlock({}));
  EXPECT_THAT(names(), ElementsAre("a"));
}

TEST_F(QuiltThemesControllerTest, ABlockThatAnswersFalseAtItsFirstCallCancelsAndKeepsTheFirstTheme) {
  for (const char* name : {"a", "b", "c"}) makeTheme(name);
  EXPECT_FALSE(load(1));
  EXPECT_THAT(calls, ElementsAre(Call{"a", 33.0}));
  EXPECT_THAT(names(), ElementsAre("a"));
  EXPECT_FALSE(controller->loadingThemes());
  EXPECT_EQ(takeLines(), (Lines{kLoading, debug("Loaded theme \"a\""), critical("Loading themes has been cancelled")}));
}

TEST_F(QuiltThemesControllerTest, ABlockMayCancelAtAnInvalidBundleAndAtTheLastOne) {
  makeWrongTheme("a");
  makeTheme("b");
  EXPECT_FALSE(load(1));
  EXPECT_THAT(calls, ElementsAre(Call{"none", 50.0}));
  EXPECT_THAT(names(), IsEmpty());
  calls.clear();
  EXPECT_FALSE(load(2));
  EXPECT_THAT(calls, ElementsAre(Call{"none", 50.0}, Call{"b", 100.0}));
  EXPECT_THAT(names(), ElementsAre("b"));
}

TEST_F(QuiltThemesControllerTest, ALoadDuringALoadIsRefusedInSilence) {
  makeTheme("a");
  controller->setLoadingThemes(true);
  EXPECT_FALSE(load());
  EXPECT_THAT(calls, IsEmpty());
  EXPECT_THAT(takeLines(), IsEmpty());
  EXPECT_TRUE(controller->loadingThemes());
}

TEST_F(QuiltThemesControllerTest, TheLoadingFlagIsSetWhileTheBlockRuns) {
  makeTheme("a");
  bool wasLoading = false;
  bool inner = true;
  EXPECT_TRUE(controller->loadWithProgressionBlock([&](const auto&, double) {
    wasLoading = controller->loadingThemes();
    inner = load();
    return true;
  }));
  EXPECT_TRUE(wasLoading);
  EXPECT_FALSE(inner);
  EXPECT_THAT(names(), ElementsAre("a"));
}

TEST_F(QuiltThemesControllerTest, AReloadStartsFromAnEmptyListAndReadsTheDiskAnew) {
  const Path first = makeTheme("a");
  EXPECT_TRUE(load());
  const auto before = controller->themeAtIndex(0);
  std::filesystem::remove_all(first);
  makeTheme("b");
  EXPECT_TRUE(load());
  EXPECT_THAT(names(), ElementsAre("b"));
  EXPECT_EQ(before->localizedName(), "a") << "those who hold a theme keep it";
}

TEST_F(QuiltThemesControllerTest, ThemesAreThoseOfTheUserThenOfTheSystemThenOfTheApplication) {
  makeTheme("own", "org.example.own", "app");
  makeTheme("system", "org.example.system", "system");
  makeTheme("local", "org.example.local", "local");
  makeTheme("b");
  makeTheme("a");
  EXPECT_TRUE(load());
  EXPECT_THAT(names(), ElementsAre("a", "b", "local", "system", "own"));
  EXPECT_THAT(calls, ElementsAre(Call{"a", 20.0}, Call{"b", 40.0}, Call{"local", 60.0}, Call{"system", 80.0},
                                 Call{"own", 100.0}));
  EXPECT_FALSE(controller->themeWithIdentifier("org.example.a")->isKestrel());
  EXPECT_TRUE(controller->themeWithIdentifier("org.example.own")->isKestrel());
}

TEST_F(QuiltThemesControllerTest, EveryChangeOfTheListIsAnnounced) {
  makeTheme("a");
  makeTheme("b");
  std::vector<std::size_t> counts;
  const auto observation = controller->observe(
      "themes", [&](const platform::ChangeNotice&) { counts.push_back(controller->themesCount()); },
      platform::ObservationOptions::Prior);
  EXPECT_TRUE(load());
  // Before and after the list is emptied, and around each theme.
  EXPECT_THAT(counts, ElementsAre(0, 0, 0, 1, 1, 2));
}

TEST_F(QuiltThemesControllerThreadTest, AWorkersLoadChangesTheListOnTheMainThreadAndReportsOnItsOwn) {
  for (const char* name : {"a", "b", "c"}) makeTheme(name);
  const auto mainThread = std::this_thread::get_id();
  std::vector<std::thread::id> observed, called;
  const auto observation = controller->observe(
      "themes", [&](const platform::ChangeNotice&) { observed.push_back(std::this_thread::get_id()); });
  std::thread::id worker;
  platform::runOnWorker([&] {
    worker = std::this_thread::get_id();
    EXPECT_TRUE(controller->loadWithProgressionBlock([&](const auto&, double) {
      called.push_back(std::this_thread::get_id());
      return true;
    }));
  });
  EXPECT_THAT(observed, ElementsAre(mainThread, mainThread, mainThread, mainThread));
  EXPECT_THAT(called, ElementsAre(worker, worker, worker));
  EXPECT_NE(worker, mainThread);
}

TEST_F(QuiltThemesControllerThreadTest, ReadersSeeAWholeListWhileAWorkerLoadsAgainAndAgain) {
  for (const char* name : {"a", "b", "c"}) makeTheme(name);
  const auto observation = controller->observe("themes", [&](const platform::ChangeNotice&) {
    controller->performBlockOnThemes([](const auto& theme) { return theme != nullptr; });
  });
  std::atomic<bool> done = false;
  std::thread reader([&] {
    while (!done) {
      const auto theme = controller->defaultTheme();
      EXPECT_TRUE(!theme || theme->localizedName());
      EXPECT_LE(controller->themesCount(), 3u);
    }
  });
  platform::runOnWorker([&] {
    for (int i = 0; i < 20; ++i) EXPECT_TRUE(controller->loadWithProgressionBlock({}));
  });
  done = true;
  reader.join();
  EXPECT_THAT(names(), ElementsAre("a", "b", "c"));
}

TEST_F(QuiltThemesControllerThreadTest, OfTwoLoadsAtOnceOneIsRefused) {
  makeTheme("a");
  std::atomic<int> accepted = 0;
  platform::runOnWorker([&] {
    EXPECT_TRUE(controller->loadWithProgressionBlock([&](const auto&, double) {
      std::thread([&] { accepted += controller->loadWithProgressionBlock({}); }).join();
      return true;
    }));
  });
  EXPECT_EQ(accepted, 0);
}

// Look-ups

TEST_F(QuiltThemesControllerTest, LookUpsByIdentifierAndIndex) {
  makeTheme("a");
  makeTheme("b");
  EXPECT_TRUE(load());
  EXPECT_EQ(controller->themeWithIdentifier("org.example.b"), controller->themeAtIndex(1));
  EXPECT_EQ(controller->themeWithIdentifier("org.example.B"), nullptr);
  EXPECT_EQ(controller->themeWithIdentifier(""), nullptr);
  EXPECT_EQ(controller->themeAtIndex(2), nullptr);
  EXPECT_EQ(controller->themesCount(), 2u);
}

TEST_F(QuiltThemesControllerTest, OfTwoThemesWithOneIdentifierTheFirstFoundWins) {
  makeTheme("z", "org.example.same", "user");
  makeTheme("a", "org.example.same", "system");
  EXPECT_TRUE(load());
  EXPECT_THAT(names(), ElementsAre("z", "a"));
  EXPECT_EQ(controller->themeWithIdentifier("org.example.same"), controller->themeAtIndex(0));
}

TEST_F(QuiltThemesControllerTest, TheDefaultThemeHasTheFixedIdentifier) {
  makeTheme("a");
  makeTheme("b", "org.quilt.theme.olive", "app");
  EXPECT_TRUE(load());
  EXPECT_EQ(controller->defaultTheme(), controller->themeAtIndex(1));
}

TEST_F(QuiltThemesControllerTest, WithoutTheFixedIdentifierTheFirstThemeIsTheDefault) {
  makeTheme("b");
  makeTheme("a", "olive");
  EXPECT_TRUE(load());
  EXPECT_EQ(controller->defaultTheme()->localizedName(), "a");
}

TEST_F(QuiltThemesControllerTest, AVisitGoesInOrderAndStopsAtTheFirstFalse) {
  for (const char* name : {"a", "b", "c"}) makeTheme(name);
  EXPECT_TRUE(load());
  std::vector<std::string> visited;
  controller->performBlockOnThemes([&](const std::shared_ptr<QuiltTheme>& theme) {
    visited.push_back(*theme->localizedName());
    return visited.size() < 2;
  });
  EXPECT_THAT(visited, ElementsAre("a", "b"));
}

TEST_F(QuiltThemesControllerTest, TheListCanBeReplaced) {
  const auto theme = QuiltTheme::initWithPath(makeTheme("a"));
  controller->setThemes({theme});
  EXPECT_THAT(controller->themes(), ElementsAre(theme));
  EXPECT_EQ(controller->defaultTheme(), theme);
}

}  // namespace
}  // namespace quilt
