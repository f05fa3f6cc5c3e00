// SPDX-License-Identifier: Apache-2.0
// What every Bundles promises; FolderBundlesTest tries layouts and environments.
#include <gmock/gmock.h>

#include "quilt/platform/bundles/FolderBundles.h"
#include "tests/support/Candidate.h"
#include "tests/support/Environment.h"

namespace quilt::platform {
namespace {

using ::testing::ElementsAre;

class BundlesContract : public support::ContractTest<Bundles> {
 protected:
  /// A theme bundle in the user's library.
  Path addBundle(const std::string& name) const {
    const Path bundle = folder() / "quilt/Themes" / name;
    writeRecord(bundle / "Info.plist", {{kBundleIdentifierKey, "org.example." + name}});
    return bundle;
  }

  const support::Environment user{"XDG_DATA_HOME", folder().c_str()};
  const support::Environment shared{"XDG_DATA_DIRS", "/nowhere"};
};
using BundlesContractThreadTest = BundlesContract;
const auto kBundles = ::testing::Values(
    support::Candidate<Bundles>{"Folder", [] { return std::make_shared<FolderBundles>(Path("/nowhere")); }});
INSTANTIATE_TEST_SUITE_P(Implementations, BundlesContract, kBundles, support::candidateName);
INSTANTIATE_TEST_SUITE_P(Implementations, BundlesContractThreadTest, kBundles, support::candidateName);

TEST_P(BundlesContract, OnlyAFolderIsABundle) {
  const Path bundle = addBundle("a.qth");
  ASSERT_TRUE(service->bundleWithPath(bundle));
  EXPECT_EQ(bundle, service->bundleWithPath(bundle)->path());
  EXPECT_EQ(nullptr, service->bundleWithPath(folder() / "missing"));
  EXPECT_EQ(nullptr, service->bundleWithPath(bundle / "Info.plist"));
}

TEST_P(BundlesContract, WhatABundleLacksIsNoneOrEmpty) {
  const auto bundle = service->bundleWithPath(addBundle("a.qth"));
  EXPECT_EQ(PropertyList("org.example.a.qth"), bundle->infoDictionaryNoCacheValueForKey(kBundleIdentifierKey));
  EXPECT_EQ(std::nullopt, bundle->infoDictionaryNoCacheValueForKey(kBundleDisplayNameKey));
  EXPECT_EQ(Path(), bundle->pathForResource("Preview", "png"));
}

TEST_P(BundlesContract, TheLibraryIsSearchedByFolderAndExtensionInOrderOfNames) {
  const Path second = addBundle("b.qth"), first = addBundle("a.qth");
  addBundle("c.other");
  EXPECT_THAT(service->findAllLibraryBundlePaths("Themes", "qth", true), ElementsAre(first, second));
  EXPECT_THAT(service->findAllLibraryBundlePaths("Others", "qth", true), ElementsAre());
}

TEST_P(BundlesContractThreadTest, AnyThreadMayAsk) {
  const Path path = addBundle("a.qth");
  const auto bundle = service->bundleWithPath(path);
  support::onThreads([&] {
    for (int i = 0; i < 20; ++i) {
      EXPECT_THAT(service->findAllLibraryBundlePaths("Themes", "qth", true), ElementsAre(path));
      EXPECT_TRUE(bundle->infoDictionaryNoCacheValueForKey(kBundleIdentifierKey));
    }
  });
}

}  // namespace
}  // namespace quilt::platform
