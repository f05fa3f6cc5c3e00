// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include <map>

#include "quilt/platform/inspection/InspectionByKind.h"
#include "quilt/platform/interfaces/Services.h"
#include "tests/support/PlainFiles.h"
#include "tests/support/ScratchFolder.h"
#include "tests/support/SimpleFiles.h"

namespace quilt::platform {
namespace {

class NamedInspector final : public MediaInspector {
 public:
  explicit NamedInspector(std::string name) : _name(std::move(name)) {}
  [[nodiscard]] Result<MediaFacts> inspect(const std::filesystem::path&) const override {
    MediaFacts facts;
    facts.metadataTitle = _name;
    return facts;
  }

 private:
  std::string _name;
};

// Types by extension, each with one parent.
class SmallTypes final : public TypeIdentifiers {
 public:
  [[nodiscard]] std::optional<std::string> preferredIdentifier(const std::filesystem::path& path) const override {
    static const std::map<std::string, std::string> byExtension{
        {".mp4", types::kMPEG4}, {".mp3", types::kMP3},          {".jpg", types::kJPEG}, {".pdf", types::kPDF},
        {".epub", types::kEPUB}, {".docx", types::kWordOpenXML}, {".txt", types::kText}};
    const auto found = byExtension.find(path.extension());
    return found == byExtension.end() ? std::nullopt : std::optional(found->second);
  }
  [[nodiscard]] bool conformsTo(std::string_view identifier, std::string_view other) const override {
    static const std::map<std::string_view, std::string_view> parents{
        {types::kMPEG4, types::kMovie}, {types::kMP3, types::kAudio}, {types::kJPEG, types::kImage}};
    const auto parent = parents.find(identifier);
    return identifier == other || (parent != parents.end() && parent->second == other);
  }
  [[nodiscard]] std::optional<std::string> mimeType(std::string_view) const override { return std::nullopt; }
};

class InspectionByKindTest : public ::testing::Test {
 protected:
  std::filesystem::path file(const std::string& name) {
    support::writePlainly(_folder / name, "content");
    return _folder / name;
  }
  std::string inspectorOf(const std::string& name) {
    const Result<MediaFacts> facts = _inspection.inspect(file(name));
    return facts ? facts->metadataTitle.value_or("none") : facts.error().text;
  }

  support::ScratchFolder _folder;
  InspectionByKind _inspection{std::make_shared<NamedInspector>("movies"), std::make_shared<NamedInspector>("images"),
                               std::make_shared<NamedInspector>("documents"),
                               std::make_shared<NamedInspector>("office")};

 private:
  ScopedService<TypeIdentifiers> _types{&Services::types, std::make_shared<SmallTypes>()};
  ScopedService<FileManager> _files{&Services::files, std::make_shared<support::SimpleFiles>()};
};

TEST_F(InspectionByKindTest, EachKindGoesToItsInspector) {
  EXPECT_EQ(inspectorOf("a.mp4"), "movies");
  EXPECT_EQ(inspectorOf("a.mp3"), "movies");
  EXPECT_EQ(inspectorOf("a.jpg"), "images");
  EXPECT_EQ(inspectorOf("a.pdf"), "documents");
  EXPECT_EQ(inspectorOf("a.epub"), "documents");
  EXPECT_EQ(inspectorOf("a.docx"), "office");
}

TEST_F(InspectionByKindTest, OtherKindsAreUnsupported) {
  const Result<MediaFacts> text = _inspection.inspect(file("a.txt"));
  ASSERT_FALSE(text);
  EXPECT_EQ(text.error().kind, ErrorKind::Unsupported);
  EXPECT_EQ(text.error().text, "Files of the type \"public.plain-text\" are no media.");
  const Result<MediaFacts> unknown = _inspection.inspect(file("a.xyz"));
  ASSERT_FALSE(unknown);
  EXPECT_EQ(unknown.error().text, "The file's type is not known.");
}

TEST_F(InspectionByKindTest, AMissingFileIsNotFound) {
  const Result<MediaFacts> facts = _inspection.inspect(_folder / "missing.xyz");
  ASSERT_FALSE(facts);
  EXPECT_EQ(facts.error().kind, ErrorKind::NotFound);
}

}  // namespace
}  // namespace quilt::platform
