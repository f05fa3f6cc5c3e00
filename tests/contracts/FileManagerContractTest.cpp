// SPDX-License-Identifier: Apache-2.0
// What every FileManager promises, asked of the real one and of the doubles that tests put in its place.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/xattr.h>

#include <cerrno>
#include <functional>

#include "quilt/platform/files/PosixFileManager.h"
#include "quilt/platform/testing/FailNthFileManager.h"
#include "quilt/platform/testing/FaultySystemCalls.h"
#include "quilt/platform/testing/ForwardingFileManager.h"
#include "tests/support/PlainFiles.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::platform {
namespace {

using support::namesIn;
using support::readPlainly;
using support::ScratchFolder;
using support::writePlainly;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;
namespace fs = std::filesystem;

// An old kernel, or a file system without the newer calls.
std::shared_ptr<FileManager> posixOnAnOldKernel() {
  const auto system = std::make_shared<FaultySystemCalls>();
  system->failEvery(FaultySystemCalls::Call::OpenBeneath, ENOSYS);
  system->failEvery(FaultySystemCalls::Call::CloneFile, EOPNOTSUPP);
  system->failEvery(FaultySystemCalls::Call::CopyFileRange, ENOSYS);
  system->failEvery(FaultySystemCalls::Call::RenameIfFree, EINVAL);
  return std::make_shared<PosixFileManager>(system);
}

struct Candidate {
  const char* name;
  std::function<std::shared_ptr<FileManager>()> make;
};

void PrintTo(const Candidate& candidate, std::ostream* out) { *out << candidate.name; }

class FileManagerContract : public ::testing::TestWithParam<Candidate> {
 protected:
  const std::shared_ptr<FileManager> files = GetParam().make();
  const ScratchFolder scratch;
};

INSTANTIATE_TEST_SUITE_P(
    Implementations, FileManagerContract,
    ::testing::Values(
        Candidate{"Posix", [] { return std::make_shared<PosixFileManager>(); }},
        Candidate{"PosixOnAnOldKernel", posixOnAnOldKernel},
        Candidate{"FailNthUnasked",
                  [] { return std::make_shared<FailNthFileManager>(std::make_shared<PosixFileManager>()); }},
        Candidate{"Forwarding",
                  [] { return std::make_shared<ForwardingFileManager>(std::make_shared<PosixFileManager>()); }}),
    [](const auto& info) { return std::string(info.param.name); });

template <class T>
ErrorKind kindOf(const Result<T>& result) {
  EXPECT_FALSE(result.hasValue());
  return result ? ErrorKind::Damaged : result.error().kind;
}

TEST_P(FileManagerContract, TellsFilesFoldersAndOthersApart) {
  writePlainly(scratch / "file", "x");
  fs::create_directory(scratch / "folder");
  fs::create_symlink("file", scratch / "link");
  fs::create_symlink("nowhere", scratch / "dangling");
  ASSERT_EQ(0, mkfifo((scratch / "pipe").c_str(), 0600));
  EXPECT_EQ(FileKind::File, files->kindOfItemAtPath(scratch / "file"));
  EXPECT_EQ(FileKind::Folder, files->kindOfItemAtPath(scratch / "folder"));
  EXPECT_EQ(FileKind::File, files->kindOfItemAtPath(scratch / "link"));
  EXPECT_EQ(FileKind::Missing, files->kindOfItemAtPath(scratch / "dangling"));
  EXPECT_EQ(FileKind::Other, files->kindOfItemAtPath(scratch / "pipe"));
  EXPECT_EQ(FileKind::Missing, files->kindOfItemAtPath(scratch / "file/below"));
  EXPECT_TRUE(files->fileExistsAtPath(scratch / "folder"));
  EXPECT_FALSE(files->fileExistsAtPath(scratch / "none"));
}

TEST_P(FileManagerContract, AnswersSizeTimeAndIdentity) {
  writePlainly(scratch / "a", "12345");
  writePlainly(scratch / "b", "12345");
  const auto first = files->attributesOfItemAtPath(scratch / "a");
  ASSERT_TRUE(first);
  EXPECT_EQ(FileKind::File, first->kind);
  EXPECT_EQ(5U, first->size);
  EXPECT_LT(std::chrono::abs(std::chrono::system_clock::now() - first->modified), std::chrono::minutes(1));
  EXPECT_EQ(first->identity, files->attributesOfItemAtPath(scratch / "a")->identity);
  EXPECT_FALSE(first->identity == files->attributesOfItemAtPath(scratch / "b")->identity);
  writePlainly(scratch / "a", "123456");
  EXPECT_FALSE(first->identity == files->attributesOfItemAtPath(scratch / "a")->identity);
  EXPECT_EQ(ErrorKind::NotFound, kindOf(files->attributesOfItemAtPath(scratch / "none")));
}

TEST_P(FileManagerContract, ErrorsCarryTheFileAndASentence) {
  const auto missing = files->readFile(scratch / "none", 10);
  ASSERT_FALSE(missing);
  EXPECT_EQ("There is no such file or folder", missing.error().text);
  EXPECT_EQ(scratch / "none", missing.error().file);
}

TEST_P(FileManagerContract, CreatesAFolderWithItsParents) {
  EXPECT_TRUE(files->createDirectoryAtPath(scratch / "a/b/c"));
  EXPECT_TRUE(fs::is_directory(scratch / "a/b/c"));
  EXPECT_TRUE(files->createDirectoryAtPath(scratch / "a/b/c"));
  EXPECT_TRUE(files->createDirectoryAtPath(scratch / "a/b/d/"));
  EXPECT_TRUE(fs::is_directory(scratch / "a/b/d"));
}

TEST_P(FileManagerContract, RefusesAFolderInThePlaceOfAFile) {
  writePlainly(scratch / "file", "kept");
  EXPECT_EQ(ErrorKind::AlreadyExists, kindOf(files->createDirectoryAtPath(scratch / "file")));
  EXPECT_EQ(ErrorKind::NotFound, kindOf(files->createDirectoryAtPath(scratch / "file/below/it")));
  EXPECT_EQ("kept", readPlainly(scratch / "file"));
}

TEST_P(FileManagerContract, ListsOneLevel) {
  writePlainly(scratch / "one", "");
  writePlainly(scratch / ".hidden", "");
  writePlainly(scratch / "two/three", "");
  const auto names = files->contentsOfDirectoryAtPath(scratch.path());
  ASSERT_TRUE(names);
  EXPECT_THAT(*names, UnorderedElementsAre("one", ".hidden", "two"));
  EXPECT_EQ(ErrorKind::NotFound, kindOf(files->contentsOfDirectoryAtPath(scratch / "none")));
  EXPECT_EQ(ErrorKind::NotFound, kindOf(files->contentsOfDirectoryAtPath(scratch / "one")));
}

TEST_P(FileManagerContract, ReadsUpToTheMaximum) {
  writePlainly(scratch / "file", std::string(100000, 'x') + '\0' + "end");
  const auto whole = files->readFile(scratch / "file", 100004);
  ASSERT_TRUE(whole);
  EXPECT_EQ(readPlainly(scratch / "file"), *whole);
  const auto tooLong = files->readFile(scratch / "file", 100003);
  ASSERT_FALSE(tooLong);
  EXPECT_EQ(ErrorKind::Damaged, tooLong.error().kind);
  EXPECT_EQ("The file is longer than 100003 bytes", tooLong.error().text);
  writePlainly(scratch / "empty", "");
  const auto empty = files->readFile(scratch / "empty", 0);
  ASSERT_TRUE(empty);
  EXPECT_EQ("", *empty);
}

TEST_P(FileManagerContract, ReadsFilesWhoseSizeIsNotKnownBefore) {
  const auto text = files->readFile("/proc/self/status", 1 << 20);
  ASSERT_TRUE(text);
  EXPECT_THAT(*text, HasSubstr("Name:"));
  EXPECT_EQ(ErrorKind::Damaged, kindOf(files->readFile("/proc/self/status", 10)));
}

TEST_P(FileManagerContract, ReadsNoFolderAndWaitsForNoPipe) {
  ASSERT_EQ(0, mkfifo((scratch / "pipe").c_str(), 0600));
  EXPECT_EQ(ErrorKind::Unsupported, kindOf(files->readFile(scratch / "pipe", 10)));
  EXPECT_EQ(ErrorKind::AlreadyExists, kindOf(files->readFile(scratch.path(), 10)));
}

TEST_P(FileManagerContract, WritesAndReplacesWhole) {
  ASSERT_TRUE(files->writeAtomically(scratch / "file", "first, long"));
  EXPECT_EQ("first, long", readPlainly(scratch / "file"));
  ASSERT_TRUE(files->writeAtomically(scratch / "file", "second"));
  EXPECT_EQ("second", readPlainly(scratch / "file"));
  EXPECT_THAT(namesIn(scratch.path()), ElementsAre("file"));
}

TEST_P(FileManagerContract, WritingKeepsThePermissionsOfTheOldFile) {
  writePlainly(scratch / "file", "old");
  ASSERT_EQ(0, chmod((scratch / "file").c_str(), 0640));
  ASSERT_TRUE(files->writeAtomically(scratch / "file", "new"));
  EXPECT_EQ(fs::perms{0640}, fs::status(scratch / "file").permissions());
}

TEST_P(FileManagerContract, WritingFollowsNoLink) {
  writePlainly(scratch / "outside", "kept");
  fs::create_symlink("outside", scratch / "link");
  ASSERT_TRUE(files->writeAtomically(scratch / "link", "new"));
  EXPECT_EQ("kept", readPlainly(scratch / "outside"));
  EXPECT_TRUE(fs::is_regular_file(fs::symlink_status(scratch / "link")));
}

TEST_P(FileManagerContract, WritingWhereAFolderIsFailsAndLeavesNothing) {
  writePlainly(scratch / "folder/inside", "kept");
  EXPECT_EQ(ErrorKind::AlreadyExists, kindOf(files->writeAtomically(scratch / "folder", "x")));
  EXPECT_EQ(ErrorKind::NotFound, kindOf(files->writeAtomically(scratch / "none/file", "x")));
  EXPECT_THAT(namesIn(scratch.path()), ElementsAre("folder"));
  EXPECT_EQ("kept", readPlainly(scratch / "folder/inside"));
}

TEST_P(FileManagerContract, CopiesAFolderWithLinksAsLinks) {
  writePlainly(scratch / "from/deep/file", "data");
  fs::create_symlink("/etc/passwd", scratch / "from/link");
  ASSERT_TRUE(files->copyItem(scratch / "from", scratch / "to"));
  EXPECT_EQ("data", readPlainly(scratch / "to/deep/file"));
  EXPECT_EQ("/etc/passwd", fs::read_symlink(scratch / "to/link"));
  ASSERT_TRUE(files->copyItem(scratch / "from/link", scratch / "link"));
  EXPECT_EQ("/etc/passwd", fs::read_symlink(scratch / "link"));
}

TEST_P(FileManagerContract, CopiesNothingOverAnything) {
  writePlainly(scratch / "from", "new");
  writePlainly(scratch / "to", "kept");
  fs::create_symlink("nowhere", scratch / "dangling");
  EXPECT_EQ(ErrorKind::AlreadyExists, kindOf(files->copyItem(scratch / "from", scratch / "to")));
  EXPECT_EQ(ErrorKind::AlreadyExists, kindOf(files->copyItem(scratch / "from", scratch / "dangling")));
  EXPECT_EQ("kept", readPlainly(scratch / "to"));
  EXPECT_EQ(ErrorKind::NotFound, kindOf(files->copyItem(scratch / "none", scratch / "new")));
  EXPECT_THAT(namesIn(scratch.path()), UnorderedElementsAre("from", "to", "dangling"));
}

TEST_P(FileManagerContract, CopiesNoFolderIntoItself) {
  writePlainly(scratch / "folder/file", "x");
  EXPECT_EQ(ErrorKind::Unsupported, kindOf(files->copyItem(scratch / "folder", scratch / "folder/copy")));
  EXPECT_THAT(namesIn(scratch / "folder"), ElementsAre("file"));
}

TEST_P(FileManagerContract, CopyingRefusesPipesByName) {
  writePlainly(scratch / "from/a", "x");
  ASSERT_EQ(0, mkfifo((scratch / "from/pipe").c_str(), 0600));
  const auto copied = files->copyItem(scratch / "from", scratch / "to");
  ASSERT_FALSE(copied);
  EXPECT_EQ(ErrorKind::Unsupported, copied.error().kind);
  EXPECT_EQ(scratch / "from/pipe", copied.error().file);
  EXPECT_THAT(namesIn(scratch.path()), ElementsAre("from"));
}

TEST_P(FileManagerContract, MovesFilesAndFolders) {
  writePlainly(scratch / "file", "data");
  writePlainly(scratch / "folder/inside", "more");
  ASSERT_TRUE(files->moveItem(scratch / "file", scratch / "folder/file"));
  ASSERT_TRUE(files->moveItem(scratch / "folder", scratch / "moved"));
  EXPECT_EQ("data", readPlainly(scratch / "moved/file"));
  EXPECT_EQ("more", readPlainly(scratch / "moved/inside"));
  EXPECT_THAT(namesIn(scratch.path()), ElementsAre("moved"));
}

TEST_P(FileManagerContract, MovesNothingOverAnything) {
  writePlainly(scratch / "from", "new");
  writePlainly(scratch / "to", "kept");
  fs::create_directory(scratch / "empty");
  EXPECT_EQ(ErrorKind::AlreadyExists, kindOf(files->moveItem(scratch / "from", scratch / "to")));
  EXPECT_EQ(ErrorKind::AlreadyExists, kindOf(files->moveItem(scratch / "from", scratch / "empty")));
  EXPECT_EQ(ErrorKind::NotFound, kindOf(files->moveItem(scratch / "none", scratch / "new")));
  EXPECT_EQ("new", readPlainly(scratch / "from"));
  EXPECT_EQ("kept", readPlainly(scratch / "to"));
}

TEST_P(FileManagerContract, MovesNoFolderIntoItself) {
  writePlainly(scratch / "folder/file", "x");
  EXPECT_EQ(ErrorKind::Unsupported, kindOf(files->moveItem(scratch / "folder", scratch / "folder/in")));
  EXPECT_EQ("x", readPlainly(scratch / "folder/file"));
}

TEST_P(FileManagerContract, RemovesFilesFoldersAndLinksThemselves) {
  writePlainly(scratch / "in/folder/deep/file", "x");
  writePlainly(scratch / "in/file", "x");
  writePlainly(scratch / "outside/file", "kept");
  fs::create_directory_symlink(scratch / "outside", scratch / "in/folder/link");
  fs::create_directory_symlink(scratch / "outside", scratch / "in/link");
  EXPECT_TRUE(files->removeItem(scratch / "in/folder", scratch / "in"));
  EXPECT_TRUE(files->removeItem(scratch / "in/file", scratch / "in"));
  EXPECT_TRUE(files->removeItem(scratch / "in/link", scratch / "in"));
  EXPECT_THAT(namesIn(scratch / "in"), IsEmpty());
  EXPECT_EQ("kept", readPlainly(scratch / "outside/file"));
  EXPECT_EQ(ErrorKind::NotFound, kindOf(files->removeItem(scratch / "in/file", scratch / "in")));
}

TEST_P(FileManagerContract, RemovesNothingOutsideTheFolder) {
  writePlainly(scratch / "in/file", "kept");
  writePlainly(scratch / "outside/file", "kept");
  fs::create_directory_symlink(scratch / "outside", scratch / "in/link");
  for (const fs::path& path : {scratch / "outside/file", scratch / "in/../outside/file", scratch / "in",
                               scratch / "in/", scratch / "in/.", scratch / "in/link/file", scratch / "inside"})
    EXPECT_EQ(ErrorKind::Unsafe, kindOf(files->removeItem(path, scratch / "in"))) << path;
  EXPECT_EQ("kept", readPlainly(scratch / "in/file"));
  EXPECT_EQ("kept", readPlainly(scratch / "outside/file"));
}

TEST_P(FileManagerContract, KnowsWhatIsConfined) {
  writePlainly(scratch / "in/folder/file", "x");
  writePlainly(scratch / "outside/file", "x");
  fs::create_directory_symlink(scratch / "outside", scratch / "in/middle");
  fs::create_symlink(scratch / "in/folder/file", scratch / "in/end");
  fs::create_symlink("nowhere", scratch / "in/dangling");
  const fs::path root = scratch / "in";
  for (const char* name : {"folder/file", "folder", "folder/", "./folder//file", "folder/new", "new/deep/file",
                           "folder/file/below", "name\nline", "-i", "$(x)", "..."})
    EXPECT_TRUE(files->isConfined(root / name, root)) << name;
  for (const char* name : {"", ".", "..", "../outside/file", "folder/../../outside/file", "folder/../folder/file",
                           "middle/file", "middle", "end", "dangling", "dangling/x"})
    EXPECT_FALSE(files->isConfined(root / name, root)) << name;
  EXPECT_FALSE(files->isConfined(scratch / "outside/file", root));
  EXPECT_FALSE(files->isConfined(scratch / "inside", root));
  EXPECT_FALSE(files->isConfined(root / std::string("folder/fi\0le", 12), root));
}

struct Recorder {
  std::vector<std::pair<CopyStage, std::int64_t>> calls;
  CopyStage quitAt = CopyStage::Error;

  static CopyAnswer record(int what, CopyStage stage, const CopyState& state, const fs::path&, const fs::path&,
                           void* context) {
    EXPECT_EQ(0, what);
    auto& self = *static_cast<Recorder*>(context);
    self.calls.emplace_back(stage, state.copiedBytes);
    return stage == self.quitAt ? CopyAnswer::Quit : CopyAnswer::Continue;
  }
};

TEST_P(FileManagerContract, CopyfileReportsAndReplaces) {
  writePlainly(scratch / "from", "12345");
  writePlainly(scratch / "to", "something longer");
  Recorder recorder;
  EXPECT_EQ(0, files->copyfile(scratch / "from", scratch / "to", &Recorder::record, &recorder));
  EXPECT_EQ("12345", readPlainly(scratch / "to"));
  EXPECT_THAT(recorder.calls, ElementsAre(std::pair(CopyStage::Start, 0), std::pair(CopyStage::Progress, 5),
                                          std::pair(CopyStage::Finish, 5)));
}

TEST_P(FileManagerContract, CopyfileOfAnEmptyFileReportsNoProgress) {
  writePlainly(scratch / "from", "");
  Recorder recorder;
  EXPECT_EQ(0, files->copyfile(scratch / "from", scratch / "to", &Recorder::record, &recorder));
  EXPECT_TRUE(fs::exists(scratch / "to"));
  EXPECT_THAT(recorder.calls, ElementsAre(std::pair(CopyStage::Start, 0), std::pair(CopyStage::Finish, 0)));
}

TEST_P(FileManagerContract, CopyfileStopsAtEveryStage) {
  writePlainly(scratch / "from", "12345");
  for (const CopyStage stage : {CopyStage::Start, CopyStage::Progress, CopyStage::Finish}) {
    Recorder recorder;
    recorder.quitAt = stage;
    EXPECT_LT(files->copyfile(scratch / "from", scratch / "to", &Recorder::record, &recorder), 0);
    EXPECT_EQ(stage, recorder.calls.back().first);
    EXPECT_THAT(namesIn(scratch.path()), ElementsAre("from"));
  }
}

TEST_P(FileManagerContract, CopyfileStoppedKeepsTheFileThatWasThere) {
  writePlainly(scratch / "from", "12345");
  writePlainly(scratch / "to", "kept");
  Recorder recorder;
  recorder.quitAt = CopyStage::Finish;
  EXPECT_LT(files->copyfile(scratch / "from", scratch / "to", &Recorder::record, &recorder), 0);
  EXPECT_EQ("kept", readPlainly(scratch / "to"));
}

TEST_P(FileManagerContract, CopyfileReportsAnErrorOnce) {
  Recorder recorder;
  EXPECT_LT(files->copyfile(scratch / "none", scratch / "to", &Recorder::record, &recorder), 0);
  EXPECT_THAT(recorder.calls, ElementsAre(std::pair(CopyStage::Start, 0), std::pair(CopyStage::Error, 0)));
  EXPECT_THAT(namesIn(scratch.path()), IsEmpty());
}

TEST_P(FileManagerContract, CopyfileNeedsNoCallback) {
  writePlainly(scratch / "from", "x");
  EXPECT_EQ(0, files->copyfile(scratch / "from", scratch / "to", nullptr, nullptr));
  EXPECT_EQ("x", readPlainly(scratch / "to"));
}

TEST_P(FileManagerContract, CopyfileCopiesAFolderBetweenOneStartAndOneFinish) {
  writePlainly(scratch / "from/a", "12");
  writePlainly(scratch / "from/sub/b", "345");
  Recorder recorder;
  EXPECT_EQ(0, files->copyfile(scratch / "from", scratch / "to", &Recorder::record, &recorder));
  EXPECT_EQ("12", readPlainly(scratch / "to/a"));
  EXPECT_EQ("345", readPlainly(scratch / "to/sub/b"));
  ASSERT_EQ(4U, recorder.calls.size());
  EXPECT_EQ(std::pair(CopyStage::Start, std::int64_t{0}), recorder.calls.front());
  EXPECT_EQ(std::pair(CopyStage::Progress, std::int64_t{5}), recorder.calls[2]);
  EXPECT_EQ(std::pair(CopyStage::Finish, std::int64_t{5}), recorder.calls.back());
  EXPECT_LT(files->copyfile(scratch / "from", scratch / "to", nullptr, nullptr), 0);
}

TEST_P(FileManagerContract, CopyfileKeepsPermissionsTimesAndAttributes) {
  writePlainly(scratch / "from/file", "x");
  const timespec times[2] = {{1'000'000'000, 123'456'789}, {1'100'000'000, 987'654'321}};
  for (const fs::path& path : {scratch / "from/file", scratch / "from"}) {
    if (setxattr(path.c_str(), "user.quilt.note", "kept", 4, 0) != 0) GTEST_SKIP() << "no extended attributes here";
    ASSERT_EQ(0, utimensat(AT_FDCWD, path.c_str(), times, 0));
    ASSERT_EQ(0, chmod(path.c_str(), 0510));
  }
  EXPECT_EQ(0, files->copyfile(scratch / "from", scratch / "to", nullptr, nullptr));
  for (const fs::path& path : {scratch / "to/file", scratch / "to"}) {
    struct stat status {};
    ASSERT_EQ(0, stat(path.c_str(), &status));
    EXPECT_EQ(0510U, status.st_mode & 07777);
    EXPECT_EQ(1'100'000'000, status.st_mtim.tv_sec) << path;
    EXPECT_EQ(987'654'321, status.st_mtim.tv_nsec) << path;
    char value[8] = {};
    EXPECT_EQ(4, getxattr(path.c_str(), "user.quilt.note", value, sizeof value));
    EXPECT_STREQ("kept", value);
  }
  EXPECT_TRUE(files->removeItem(scratch / "from", scratch.path()));
  EXPECT_TRUE(files->removeItem(scratch / "to", scratch.path()));
}

TEST_P(FileManagerContract, ALockShutsOutTheNextUntilItEnds) {
  auto lock = files->lockFile(scratch / "lock", "pid 123 on host");
  ASSERT_TRUE(lock);
  const auto second = files->lockFile(scratch / "lock", "pid 4 on other");
  ASSERT_FALSE(second);
  EXPECT_EQ(ErrorKind::Locked, second.error().kind);
  EXPECT_THAT(second.error().text, HasSubstr("pid 123 on host"));
  EXPECT_THAT(readPlainly(scratch / "lock"), HasSubstr("pid 123 on host"));
  lock->reset();
  const auto third = files->lockFile(scratch / "lock", "me");
  ASSERT_TRUE(third);
  EXPECT_THAT(readPlainly(scratch / "lock"), HasSubstr("me"));
}

TEST_P(FileManagerContract, ASharedLockShutsOutWhoWantsItAloneUntilTheLastEnds) {
  auto one = files->shareLockFile(scratch / "lock", nullptr);
  auto other = files->shareLockFile(scratch / "lock", nullptr);
  ASSERT_TRUE(one && other);
  one->reset();
  EXPECT_EQ(ErrorKind::Locked, files->lockFile(scratch / "lock", "me").error().kind);
  other->reset();
  EXPECT_TRUE(files->lockFile(scratch / "lock", "me"));
}

TEST_P(FileManagerContract, OddNamesAreOnlyNames) {
  for (const std::string& name :
       {std::string("-i"), std::string("$(x)"), std::string("|x"), std::string("concat:a"), std::string("a\nb"),
        std::string("http:"), std::string("ü ñ"), std::string("\xff\xfe"), std::string(255, 'n'),
        std::string(124, 'n') + "\xc3\xbc" + std::string(129, 'n')}) {
    ASSERT_TRUE(files->writeAtomically(scratch / name, name)) << name;
    const auto bytes = files->readFile(scratch / name, 1000);
    ASSERT_TRUE(bytes) << name;
    EXPECT_EQ(name, *bytes);
    ASSERT_EQ(0, files->copyfile(scratch / name, scratch / "copy", nullptr, nullptr));
    ASSERT_TRUE(files->removeItem(scratch / name, scratch.path()));
    ASSERT_TRUE(files->moveItem(scratch / "copy", scratch / name));
    EXPECT_EQ(name, readPlainly(scratch / name));
    ASSERT_TRUE(files->removeItem(scratch / name, scratch.path()));
    EXPECT_THAT(namesIn(scratch.path()), IsEmpty());
  }
  EXPECT_EQ(ErrorKind::Unsupported, kindOf(files->writeAtomically(scratch / std::string(256, 'n'), "")));
}

TEST_P(FileManagerContract, NamesWithNulReachNothing) {
  writePlainly(scratch / "file", "kept");
  const fs::path path = scratch / std::string("file\0.x", 7);
  EXPECT_EQ(FileKind::Missing, files->kindOfItemAtPath(path));
  EXPECT_FALSE(files->attributesOfItemAtPath(path));
  EXPECT_FALSE(files->readFile(path, 10));
  EXPECT_FALSE(files->contentsOfDirectoryAtPath(path));
  EXPECT_FALSE(files->writeAtomically(path, "x"));
  EXPECT_FALSE(files->createDirectoryAtPath(path));
  EXPECT_FALSE(files->copyItem(path, scratch / "copy"));
  EXPECT_FALSE(files->moveItem(path, scratch / "moved"));
  EXPECT_FALSE(files->removeItem(path, scratch.path()));
  EXPECT_FALSE(files->lockFile(path, "x"));
  EXPECT_LT(files->copyfile(path, scratch / "copy", nullptr, nullptr), 0);
  EXPECT_THAT(namesIn(scratch.path()), ElementsAre("file"));
  EXPECT_EQ("kept", readPlainly(scratch / "file"));
}

}  // namespace
}  // namespace quilt::platform
