// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/Pasteboard.h"

#include <gmock/gmock.h>

namespace quilt::platform {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

/// Writes its name under each of its types.
class Named final : public PasteboardItem {
 public:
  Named(std::string name, std::vector<std::string> types) : _name(std::move(name)), _types(std::move(types)) {}

  std::vector<std::string> writableTypesForPasteboard(const Pasteboard&) const override { return _types; }
  unsigned writingOptionsForType(const std::string&, const Pasteboard&) const override { return kPasteboardNoOptions; }
  PropertyList pasteboardPropertyListForType(const std::string& type) const override { return _name + " as " + type; }

 private:
  std::string _name;
  std::vector<std::string> _types;
};

TEST(PasteboardTest, HoldsWhatEachObjectWritesUnderEachOfItsTypes) {
  Pasteboard pasteboard;
  EXPECT_THAT(pasteboard.types(), IsEmpty());
  pasteboard.writeObject(Named("one", {"a", "b"}));
  pasteboard.writeObject(Named("two", {"b"}));
  EXPECT_THAT(pasteboard.types(), ElementsAre("a", "b"));
  EXPECT_THAT(pasteboard.propertyListsForType("a"), ElementsAre(PropertyList("one as a")));
  EXPECT_THAT(pasteboard.propertyListsForType("b"), ElementsAre(PropertyList("one as b"), PropertyList("two as b")));
  EXPECT_THAT(pasteboard.propertyListsForType("c"), IsEmpty());
}

TEST(PasteboardTest, IsEmptyOnceItIsCleared) {
  Pasteboard pasteboard;
  pasteboard.writeObject(Named("one", {"a"}));
  pasteboard.clearContents();
  EXPECT_THAT(pasteboard.types(), IsEmpty());
  EXPECT_THAT(pasteboard.propertyListsForType("a"), IsEmpty());
}

}  // namespace
}  // namespace quilt::platform
