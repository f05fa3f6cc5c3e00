// SPDX-License-Identifier: Apache-2.0
#include "quilt/collections/LibraryLock.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>

#include "quilt/platform/base/TemporaryNames.h"
#include "quilt/platform/files/PosixFileManager.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/testing/FaultySystemCalls.h"
#include "tests/support/ModelFixture.h"
#include "tests/support/PlainFiles.h"
#include "tests/support/ScratchFolder.h"

namespace quilt {
namespace {

using platform::ErrorKind;
using platform::Result;
using support::namesIn;
using support::ScratchFolder;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;
using Taken = Result<LibraryLock>;
using Take = std::function<Taken()>;

/// A library with two documents in one collection, and one in another.
class LibraryLockTest : public support::ModelFixture {
 protected:
  LibraryLockTest() {
    for (const Path& package : {one, two, third}) std::filesystem::create_directories(package);
  }

  /// A process that holds the lock until it is killed, or for a time.
  static pid_t startHolder(const Take& take, std::chrono::milliseconds time = std::chrono::hours(1)) {
    int ready[2];
    EXPECT_EQ(0, pipe(ready));
    const pid_t child = fork();
    if (child == 0) {
      {
        const Taken lock = take();
        const char answer = lock ? 'y' : 'n';
        if (write(ready[1], &answer, 1) == 1) usleep(static_cast<useconds_t>(time.count() * 1000));
      }
      _exit(0);
    }
    char answer = 0;
    EXPECT_EQ(1, read(ready[0], &answer, 1));
    EXPECT_EQ('y', answer);
    close(ready[0]);
    close(ready[1]);
    return child;
  }
  static void kill(pid_t process) {
    ::kill(process, SIGKILL);
    waitpid(process, nullptr, 0);
  }
  static std::string textOf(const Taken& lock) { return lock ? "taken" : lock.error().text; }

  /// Which of all the locks can be had now, each by itself.
  [[nodiscard]] std::vector<std::string> free() const {
    std::vector<std::string> names;
    if (LibraryLock::ofLibrary(library)) names.emplace_back("library");
    if (LibraryLock::ofCollections(library)) names.emplace_back("collections");
    if (LibraryLock::ofWholeCollection(collection)) names.emplace_back("whole");
    if (LibraryLock::ofCollection(collection)) names.emplace_back("collection");
    if (LibraryLock::ofDocument(one)) names.emplace_back("one");
    if (LibraryLock::ofDocument(two)) names.emplace_back("two");
    if (LibraryLock::ofDocument(third)) names.emplace_back("third");
    return names;
  }

  const ScratchFolder scratch;
  const Path library = scratch / "library";
  const Path collection = library / "Collections/C";
  const Path one = collection / "one.qpk";
  const Path two = collection / "two.qpk";
  const Path third = library / "Collections/D/third.qpk";
};

TEST_F(LibraryLockTest, OfADocumentLeavesTheOthersFree) {
  const Taken lock = LibraryLock::ofDocument(one);
  ASSERT_TRUE(lock);
  EXPECT_THAT(free(), ElementsAre("collections", "collection", "two", "third"));
}

TEST_F(LibraryLockTest, OfACollectionsRecordLeavesItsDocumentsFree) {
  const Taken lock = LibraryLock::ofCollection(collection);
  ASSERT_TRUE(lock);
  EXPECT_THAT(free(), ElementsAre("collections", "one", "two", "third"));
}

TEST_F(LibraryLockTest, OfAWholeCollectionLeavesTheOthersFree) {
  const Taken lock = LibraryLock::ofWholeCollection(collection);
  ASSERT_TRUE(lock);
  EXPECT_THAT(free(), ElementsAre("collections", "third"));
}

TEST_F(LibraryLockTest, OfTheListOfCollectionsLeavesTheirDocumentsFree) {
  const Taken lock = LibraryLock::ofCollections(library);
  ASSERT_TRUE(lock);
  EXPECT_THAT(free(), ElementsAre("whole", "collection", "one", "two", "third"));
}

TEST_F(LibraryLockTest, OfALibraryShutsOutEverything) {
  const Taken lock = LibraryLock::ofLibrary(library);
  ASSERT_TRUE(lock);
  EXPECT_THAT(free(), IsEmpty());
}

TEST_F(LibraryLockTest, LeavesNothingBehind) {
  EXPECT_THAT(free(), ElementsAre("library", "collections", "whole", "collection", "one", "two", "third"));
  EXPECT_THAT(namesIn(library), ElementsAre("Collections"));
  EXPECT_THAT(namesIn(collection), UnorderedElementsAre("one.qpk", "two.qpk"));
  EXPECT_THAT(namesIn(one), IsEmpty());
}

TEST_F(LibraryLockTest, RefusalsNameTheHolder) {
  const pid_t holder = startHolder([this] { return LibraryLock::ofDocument(one); });
  const std::string process = "process " + std::to_string(holder) + " on ";
  EXPECT_THAT(textOf(LibraryLock::ofDocument(one)), HasSubstr("It is in use by " + process));
  EXPECT_THAT(textOf(LibraryLock::ofLibrary(library)), HasSubstr("A part of it is in use by " + process));
  EXPECT_THAT(textOf(LibraryLock::ofWholeCollection(collection)), HasSubstr("A part of it is in use by " + process));
  EXPECT_EQ(ErrorKind::Locked, LibraryLock::ofLibrary(library).error().kind);
  kill(holder);
}

TEST_F(LibraryLockTest, ADocumentOfALibraryInUseSaysThatItIsTheLibrary) {
  const pid_t holder = startHolder([this] { return LibraryLock::ofLibrary(library); });
  EXPECT_THAT(textOf(LibraryLock::ofDocument(one)),
              HasSubstr("Its library is in use by process " + std::to_string(holder) + " on "));
  kill(holder);
}

TEST_F(LibraryLockTest, AKilledHoldersLockIsTakenOverAndItsTemporariesGo) {
  kill(startHolder([this] { return LibraryLock::ofDocument(one); }));
  support::writePlainly(one / platform::hiddenNameBeside("film.mp4"), "half");
  support::writePlainly(one / "film.mp4", "whole");
  const Taken lock = LibraryLock::ofDocument(one);
  ASSERT_TRUE(lock);
  EXPECT_TRUE(lock->wasAbandoned());
  EXPECT_THAT(namesIn(one), ElementsAre("film.mp4"));
}

TEST_F(LibraryLockTest, WhateverIsLockedNextNothingOfAKilledHolderIsLeft) {
  for (const Take& take : {Take([this] { return LibraryLock::ofDocument(one); }),
                           Take([this] { return LibraryLock::ofCollection(collection); }),
                           Take([this] { return LibraryLock::ofLibrary(library); })}) {
    kill(startHolder(take));
    support::writePlainly(one / platform::hiddenNameBeside("film.mp4"), "half");
    EXPECT_TRUE(LibraryLock::ofDocument(third));
    EXPECT_THAT(namesIn(library), ElementsAre("Collections"));
    EXPECT_THAT(namesIn(collection), UnorderedElementsAre("one.qpk", "two.qpk"));
    EXPECT_THAT(namesIn(one), IsEmpty());
  }
}

TEST_F(LibraryLockTest, WhatALivingHolderIsMakingStays) {
  const pid_t holder = startHolder([this] { return LibraryLock::ofDocument(two); });
  support::writePlainly(two / platform::hiddenNameBeside("film.mp4"), "half");
  kill(startHolder([this] { return LibraryLock::ofDocument(one); }));
  EXPECT_TRUE(LibraryLock::ofDocument(one));
  EXPECT_EQ(1U, namesIn(two).size());
  kill(holder);
}

TEST_F(LibraryLockTest, WaitsUntilItsLimit) {
  const Taken held = LibraryLock::ofDocument(one);
  const auto begin = std::chrono::steady_clock::now();
  const Taken lock = LibraryLock::ofDocument(one, {std::chrono::milliseconds(150)});
  EXPECT_FALSE(lock);
  EXPECT_GE(std::chrono::steady_clock::now() - begin, std::chrono::milliseconds(150));
  EXPECT_EQ(ErrorKind::Locked, lock.error().kind);
}

TEST_F(LibraryLockTest, HasItAsSoonAsTheHolderEnds) {
  const pid_t holder = startHolder([this] { return LibraryLock::ofDocument(one); }, std::chrono::milliseconds(300));
  std::string asked;
  const Taken lock = LibraryLock::ofDocument(one, {std::chrono::minutes(1), [&](const platform::Error& refusal) {
                                                     asked = refusal.text;
                                                     return true;
                                                   }});
  EXPECT_TRUE(lock);
  EXPECT_THAT(asked, HasSubstr("process " + std::to_string(holder)));
  kill(holder);
}

TEST_F(LibraryLockTest, WaitingStopsWhenTheBlockSaysSo) {
  const Taken held = LibraryLock::ofLibrary(library);
  int calls = 0;
  const Taken lock =
      LibraryLock::ofDocument(one, {std::chrono::hours(1), [&calls](const auto&) { return ++calls < 3; }});
  ASSERT_FALSE(lock);
  EXPECT_EQ(ErrorKind::Cancelled, lock.error().kind);
  EXPECT_EQ(3, calls);
}

TEST_F(LibraryLockTest, IsTheSameHoweverThePathIsWritten) {
  std::filesystem::create_directory_symlink(library, scratch / "link");
  const Taken held = LibraryLock::ofDocument(scratch / "link/Collections/C/../C/one.qpk/");
  ASSERT_TRUE(held);
  EXPECT_FALSE(LibraryLock::ofDocument(one));
  EXPECT_FALSE(LibraryLock::ofLibrary(library));
  EXPECT_TRUE(LibraryLock::ofDocument(two));
}

TEST_F(LibraryLockTest, OfAPackageAnywhereLiesBesideItHoweverLongItsName) {
  for (const std::string& name : {std::string("talk.qpk"), std::string(251, 'n') + ".qpk"}) {
    std::filesystem::create_directories(scratch / "exports" / name);
    const Taken held = LibraryLock::ofDocument(scratch / "exports" / name);
    ASSERT_TRUE(held) << textOf(held);
    EXPECT_FALSE(LibraryLock::ofDocument(scratch / "exports" / name));
    EXPECT_THAT(namesIn(scratch / "exports" / name), IsEmpty());
  }
}

TEST_F(LibraryLockTest, AlsoOfADocumentThatIsStillToBeMade) {
  const Taken held = LibraryLock::ofDocument(collection / "new.qpk");
  ASSERT_TRUE(held);
  EXPECT_FALSE(LibraryLock::ofWholeCollection(collection));
  EXPECT_FALSE(std::filesystem::exists(collection / "new.qpk"));
}

TEST_F(LibraryLockTest, WhereItsFolderIsGoneThereIsNothingToLock) {
  std::filesystem::remove_all(collection);
  EXPECT_EQ(ErrorKind::NotFound, LibraryLock::ofDocument(one).error().kind);
  EXPECT_THAT(namesIn(library), ElementsAre("Collections"));
}

TEST_F(LibraryLockTest, GoesWithTheFolderThatItsHolderRemoves) {
  {
    const Taken lock = LibraryLock::ofWholeCollection(collection);
    ASSERT_TRUE(lock);
    std::filesystem::remove_all(collection);
  }
  EXPECT_THAT(namesIn(library / "Collections"), ElementsAre("D"));
  EXPECT_THAT(namesIn(library), ElementsAre("Collections"));
}

TEST_F(LibraryLockTest, WithoutLocksOnTheDiskItSaysSo) {
  const auto system = std::make_shared<platform::FaultySystemCalls>();
  system->failEvery(platform::FaultySystemCalls::Call::Lock, ENOLCK);
  const platform::ScopedService files(&platform::Services::files, std::make_shared<platform::PosixFileManager>(system));
  const Taken lock = LibraryLock::ofDocument(one);
  ASSERT_FALSE(lock);
  EXPECT_EQ(ErrorKind::Unsupported, lock.error().kind);
  EXPECT_THAT(namesIn(library), ElementsAre("Collections"));
}

TEST_F(LibraryLockTest, AForeignFileInItsPlaceIsRefusedAndKept) {
  support::writePlainly(collection / ".one.qpk.quilt-lock", "somebody's notes");
  EXPECT_EQ(ErrorKind::Unsafe, LibraryLock::ofDocument(one).error().kind);
  EXPECT_EQ("somebody's notes", support::readPlainly(collection / ".one.qpk.quilt-lock"));
}

}  // namespace
}  // namespace quilt
