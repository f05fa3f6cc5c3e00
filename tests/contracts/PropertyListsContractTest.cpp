// SPDX-License-Identifier: Apache-2.0
// What every PropertyLists promises; tests/platform/plist looks at the forms themselves.
#include <gmock/gmock.h>

#include "quilt/platform/plist/XmlPropertyLists.h"
#include "tests/support/Candidate.h"
#include "tests/support/PlistByPython.h"
#include "tests/support/SimpleFiles.h"

namespace quilt::platform {
namespace {

using support::expectTellingError;
using ::testing::ElementsAre;

class PropertyListsContract : public support::ContractTest<PropertyLists> {
 protected:
  const Dictionary record{{"b", 1}, {"a", Array{true, 0.5, "text", Data{1}, *parseIso8601("2010-05-01T12:00:00Z")}}};
  const Path file = folder() / "record.plist";
};
using PropertyListsContractThreadTest = PropertyListsContract;
const auto kPropertyLists =
    ::testing::Values(support::Candidate<PropertyLists>{"Xml", [] { return std::make_shared<XmlPropertyLists>(); }});
INSTANTIATE_TEST_SUITE_P(Implementations, PropertyListsContract, kPropertyLists, support::candidateName);
INSTANTIATE_TEST_SUITE_P(Implementations, PropertyListsContractThreadTest, kPropertyLists, support::candidateName);

TEST_P(PropertyListsContract, WhatIsSerializedReadsBackWithItsKeysInOrder) {
  const auto value = service->parse(service->serialize(record));
  ASSERT_TRUE(value);
  EXPECT_EQ(PropertyList(record), *value);
}

TEST_P(PropertyListsContract, BothFormsAreRead) {
  ASSERT_TRUE(service->writeDictionary(record, file));
  ASSERT_TRUE(support::writeBinaryByPython(file, folder() / "binary.plist"));
  EXPECT_EQ(record, *service->readDictionary(file));
  EXPECT_EQ(record, *service->readDictionary(folder() / "binary.plist"));
}

TEST_P(PropertyListsContract, AnythingElseIsDamaged) {
  for (const char* text : {"", "x", "{\"json\": 1}", "bplist00"}) {
    const auto value = service->parse(text);
    expectTellingError(value, {});
    EXPECT_EQ(ErrorKind::Damaged, value.error().kind);
  }
}

TEST_P(PropertyListsContract, AFileThatCannotBeReadIsNamed) {
  expectTellingError(service->readDictionary(file), file);
  EXPECT_EQ(ErrorKind::NotFound, service->readDictionary(file).error().kind);
  writeFile(file, "x");
  expectTellingError(service->readDictionary(file), file);
  EXPECT_EQ(ErrorKind::Damaged, service->readDictionary(file).error().kind);
  writeFile(file, service->serialize(Array{1}));
  expectTellingError(service->readDictionary(file), file);
  EXPECT_EQ(ErrorKind::Damaged, service->readDictionary(file).error().kind);
}

TEST_P(PropertyListsContract, AFileIsReplacedWholeOrKept) {
  ASSERT_TRUE(service->writeDictionary(record, file));
  ASSERT_TRUE(service->writeDictionary({{"new", true}}, file));
  EXPECT_EQ((Dictionary{{"new", true}}), *service->readDictionary(file));
  {
    const auto failing = std::make_shared<support::SimpleFiles>();
    failing->failWrites = Error{ErrorKind::NoSpace, "The disk is full", file};
    const ScopedService<FileManager> files(&Services::files, failing);
    const auto written = service->writeDictionary(record, file);
    expectTellingError(written, file);
    EXPECT_EQ(ErrorKind::NoSpace, written.error().kind);
  }
  EXPECT_EQ((Dictionary{{"new", true}}), *service->readDictionary(file));
  EXPECT_THAT(namesIn(folder()), ElementsAre("record.plist"));
}

TEST_P(PropertyListsContractThreadTest, ReadersSeeOneWholeRecordWhileItIsReplaced) {
  const Dictionary other{{"b", 2}, {"a", Array(500, "another text")}};
  ASSERT_TRUE(service->writeDictionary(record, file));
  support::onThreads([&] {
    for (int i = 0; i < 20; ++i) {
      EXPECT_TRUE(service->writeDictionary(i % 2 ? record : other, file));
      const auto read = service->readDictionary(file);
      ASSERT_TRUE(read);
      EXPECT_TRUE(*read == record || *read == other);
    }
  });
}

}  // namespace
}  // namespace quilt::platform
