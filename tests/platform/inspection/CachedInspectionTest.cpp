// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include <map>
#include <thread>
#include <vector>

#include "quilt/platform/inspection/CachedInspection.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/testing/ForwardingFileManager.h"
#include "tests/support/SimpleFiles.h"

namespace quilt::platform {
namespace {

// Counts the looks; answers the path as the title, or the error that is set.
class CountingInspector final : public MediaInspector {
 public:
  [[nodiscard]] Result<MediaFacts> inspect(const std::filesystem::path& path) const override {
    const std::lock_guard lock(_mutex);
    ++looks;
    if (failure) return Error{*failure, "That went wrong.", path};
    MediaFacts facts;
    facts.metadataTitle = path.string();
    return facts;
  }

  mutable int looks = 0;
  std::optional<ErrorKind> failure;

 private:
  mutable std::mutex _mutex;
};

// Files that exist only as identities.
class IdentityFiles final : public ForwardingFileManager {
 public:
  IdentityFiles() : ForwardingFileManager(std::make_shared<support::SimpleFiles>()) {}
  [[nodiscard]] Result<FileAttributes> attributesOfItemAtPath(const std::filesystem::path& path) const override {
    const auto found = identities.find(path);
    if (found == identities.end()) return Error{ErrorKind::NotFound, "There is no such file.", path};
    FileAttributes attributes;
    attributes.kind = FileKind::File;
    attributes.identity = found->second;
    return attributes;
  }
  std::map<std::filesystem::path, FileIdentity> identities;
};

class CachedInspectionTest : public ::testing::Test {
 protected:
  std::shared_ptr<CountingInspector> _inspector = std::make_shared<CountingInspector>();
  std::shared_ptr<IdentityFiles> _files = std::make_shared<IdentityFiles>();
  CachedInspection _cache{_inspector, 3};

 private:
  ScopedService<FileManager> _service{&Services::files, _files};
};
/// What starts threads; run with the thread sanitizer too.
using CachedInspectionThreadTest = CachedInspectionTest;

TEST_F(CachedInspectionTest, AFileIsLookedIntoOnce) {
  _files->identities["/a.mp4"] = {1, 10, 100, 1000};
  EXPECT_EQ(_cache.inspect("/a.mp4")->metadataTitle, "/a.mp4");
  EXPECT_EQ(_cache.inspect("/a.mp4")->metadataTitle, "/a.mp4");
  EXPECT_EQ(_inspector->looks, 1);
}

TEST_F(CachedInspectionTest, AMovedFileIsKnownAgain) {
  _files->identities["/a.mp4"] = {1, 10, 100, 1000};
  _files->identities["/folder/b.mp4"] = {1, 10, 100, 1000};
  EXPECT_TRUE(_cache.inspect("/a.mp4"));
  EXPECT_TRUE(_cache.inspect("/folder/b.mp4"));
  EXPECT_EQ(_inspector->looks, 1);
}

TEST_F(CachedInspectionTest, EveryPartOfTheIdentityCounts) {
  const FileIdentity first{1, 10, 100, 1000};
  for (const FileIdentity& identity : {first, FileIdentity{2, 10, 100, 1000}, FileIdentity{1, 11, 100, 1000},
                                       FileIdentity{1, 10, 101, 1000}, FileIdentity{1, 10, 100, 1001}}) {
    _files->identities["/a.mp4"] = identity;
    EXPECT_TRUE(_cache.inspect("/a.mp4"));
  }
  EXPECT_EQ(_inspector->looks, 5);
}

TEST_F(CachedInspectionTest, AnotherExtensionIsAnotherQuestion) {
  _files->identities["/a.mp4"] = _files->identities["/a.m4a"] = {1, 10, 100, 1000};
  EXPECT_TRUE(_cache.inspect("/a.mp4"));
  EXPECT_TRUE(_cache.inspect("/a.m4a"));
  EXPECT_EQ(_inspector->looks, 2);
}

TEST_F(CachedInspectionTest, TheLeastRecentlyUsedMakesRoom) {
  for (std::uint64_t i = 0; i < 4; ++i) _files->identities["/" + std::to_string(i)] = {1, i, 100, 1000};
  for (const char* path : {"/0", "/1", "/2", "/0", "/3"}) EXPECT_TRUE(_cache.inspect(path));  // 1 makes room for 3
  EXPECT_EQ(_inspector->looks, 4);
  EXPECT_TRUE(_cache.inspect("/0"));
  EXPECT_EQ(_inspector->looks, 4);
  EXPECT_TRUE(_cache.inspect("/1"));
  EXPECT_EQ(_inspector->looks, 5);
}

TEST_F(CachedInspectionTest, DamageIsRememberedAndNamesTheFileAskedAbout) {
  _files->identities["/a.mp4"] = _files->identities["/b.mp4"] = {1, 10, 100, 1000};
  _inspector->failure = ErrorKind::Damaged;
  EXPECT_EQ(_cache.inspect("/a.mp4").error().file, "/a.mp4");
  const Result<MediaFacts> again = _cache.inspect("/b.mp4");
  EXPECT_EQ(again.error().text, "That went wrong.");
  EXPECT_EQ(again.error().file, "/b.mp4");
  EXPECT_EQ(_inspector->looks, 1);
}

TEST_F(CachedInspectionTest, FailuresThatMayPassAreNotRemembered) {
  _files->identities["/a.mp4"] = {1, 10, 100, 1000};
  for (const ErrorKind kind : {ErrorKind::InputOutput, ErrorKind::PermissionDenied, ErrorKind::NotFound}) {
    _inspector->failure = kind;
    EXPECT_FALSE(_cache.inspect("/a.mp4"));
  }
  EXPECT_EQ(_inspector->looks, 3);
}

TEST_F(CachedInspectionTest, AFileChangedJustNowIsLookedIntoAgain) {
  const auto now = std::chrono::system_clock::now().time_since_epoch();
  _files->identities["/a.mp4"] = {1, 10, 100, std::chrono::duration_cast<std::chrono::nanoseconds>(now).count()};
  EXPECT_TRUE(_cache.inspect("/a.mp4"));
  std::this_thread::sleep_for(std::chrono::milliseconds(50));
  EXPECT_TRUE(_cache.inspect("/a.mp4"));
  EXPECT_EQ(_inspector->looks, 2);
  EXPECT_TRUE(_cache.inspect("/a.mp4"));
  EXPECT_EQ(_inspector->looks, 2);
}

TEST_F(CachedInspectionTest, AMissingFileIsLeftToTheInspector) {
  _inspector->failure = ErrorKind::NotFound;
  EXPECT_EQ(_cache.inspect("/missing").error().kind, ErrorKind::NotFound);
  EXPECT_EQ(_inspector->looks, 1);
}

TEST_F(CachedInspectionThreadTest, ThreadsMayAskAtOnce) {
  for (std::uint64_t i = 0; i < 8; ++i) _files->identities["/" + std::to_string(i)] = {1, i, 100, 1000};
  std::vector<std::thread> threads;
  for (int thread = 0; thread < 4; ++thread) {
    threads.emplace_back([this] {
      for (int i = 0; i < 2000; ++i) {
        const std::string path = "/" + std::to_string(i % 8);
        ASSERT_TRUE(_cache.inspect(path));
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
}

}  // namespace
}  // namespace quilt::platform
