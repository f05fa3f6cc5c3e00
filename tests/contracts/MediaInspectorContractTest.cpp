// SPDX-License-Identifier: Apache-2.0
// What every MediaInspector promises; each implementation's own test looks at the facts.
#include "quilt/platform/absent/Absent.h"
#include "quilt/platform/ffmpeg/FfmpegInspector.h"
#include "quilt/platform/inspection/CachedInspection.h"
#include "quilt/platform/inspection/InspectionByKind.h"
#include "quilt/platform/mupdf/MupdfInspector.h"
#include "quilt/platform/office/OfficeInspector.h"
#include "quilt/platform/vips/VipsInspector.h"
#include "tests/support/Candidate.h"
#include "tests/support/DocumentFixtures.h"
#include "tests/support/ImageFixtures.h"
#include "tests/support/MediaFixtures.h"

namespace quilt::platform {
namespace {

/// An inspector, and the extension of the files that it inspects; empty when it inspects none.
struct Inspector {
  const char* name;
  std::function<std::shared_ptr<MediaInspector>()> make;
  std::string extension;
};
void PrintTo(const Inspector& inspector, std::ostream* out) { *out << inspector.name; }

std::shared_ptr<MediaInspector> byKind() {
  return std::make_shared<InspectionByKind>(std::make_shared<FfmpegInspector>(), std::make_shared<VipsInspector>(),
                                            std::make_shared<MupdfInspector>(), std::make_shared<OfficeInspector>());
}

class MediaInspectorContract : public support::ModelFixture, public ::testing::WithParamInterface<Inspector> {
 protected:
  /// A whole file of the inspector's kind.
  Path medium() const {
    const std::string& extension = GetParam().extension;
    const Path file = folder() / ("medium." + extension);
    if (extension == "jpg") return support::writeFile(file, support::encode(support::quadrants(30, 20), {}));
    if (extension == "docx") {
      support::makeZip(file, {{"[Content_Types].xml", "<Types/>"}, {"word/document.xml", "<document/>"}});
      return file;
    }
    if (extension == "pdf") return writeFile(file, support::makePdf(support::onePage("/MediaBox [0 0 100 200]")));
    return support::makeMedia({.extension = extension});
  }

  const std::shared_ptr<MediaInspector> inspector = GetParam().make();
};
using MediaInspectorContractThreadTest = MediaInspectorContract;
const auto kInspectors = ::testing::Values(
    Inspector{"Ffmpeg", [] { return std::make_shared<FfmpegInspector>(); }, "mp4"},
    Inspector{"Vips", [] { return std::make_shared<VipsInspector>(); }, "jpg"},
    Inspector{"Mupdf", [] { return std::make_shared<MupdfInspector>(); }, "pdf"},
    Inspector{"Office", [] { return std::make_shared<OfficeInspector>(); }, "docx"},
    Inspector{"ByKindOfOfficeDocuments", byKind, "docx"}, Inspector{"ByKindOfMovies", byKind, "mp4"},
    Inspector{"ByKindOfImages", byKind, "jpg"}, Inspector{"ByKindOfDocuments", byKind, "pdf"},
    Inspector{"Cached", [] { return std::make_shared<CachedInspection>(byKind()); }, "mp4"},
    Inspector{"Absent", [] { return std::make_shared<AbsentInspector>("Inspection of anything"); }, ""});
INSTANTIATE_TEST_SUITE_P(Implementations, MediaInspectorContract, kInspectors, support::candidateName);
INSTANTIATE_TEST_SUITE_P(Implementations, MediaInspectorContractThreadTest, kInspectors, support::candidateName);

TEST_P(MediaInspectorContract, WhatIsNoMediumOfItsKindsIsRefusedWithItsFile) {
  for (const Path& file : {writeFile(folder() / "words.txt", "words"), writeFile(folder() / "empty.txt", ""),
                           folder() / "missing.txt", folder()})
    support::expectTellingError(inspector->inspect(file), file);
  const ErrorKind kind = inspector->inspect(folder() / "words.txt").error().kind;
  EXPECT_TRUE(kind == ErrorKind::Damaged || kind == ErrorKind::Unsupported);
}

TEST_P(MediaInspectorContract, TheFactsOfAFileAreTheSameEachTime) {
  if (GetParam().extension.empty()) return;
  const Path file = medium();
  const auto first = inspector->inspect(file), second = inspector->inspect(file);
  ASSERT_TRUE(first && second);
  EXPECT_EQ(first->width > 0, GetParam().extension != "docx") << "no size is told of an office document";
  EXPECT_TRUE(first->mimeType);
  EXPECT_EQ(first->width, second->width);
  EXPECT_EQ(first->mimeType, second->mimeType);
  EXPECT_EQ(first->details, second->details);
}

TEST_P(MediaInspectorContract, TheInstalledServiceAnswersAMediumOrNull) {
  const ScopedService<MediaInspector> installed(&Services::inspector, inspector);
  EXPECT_EQ(nullptr, FDYMedia::initWithPath(folder() / "missing.mp4"));
  if (GetParam().extension.empty()) return;
  const auto found = FDYMedia::initWithPath(medium());
  ASSERT_TRUE(found);
  EXPECT_EQ(found->facts().width, found->width());
}

TEST_P(MediaInspectorContractThreadTest, AnyThreadMayAsk) {
  const bool isAbsent = GetParam().extension.empty();
  const Path file = isAbsent ? folder() : medium();
  support::onThreads([&] {
    for (int i = 0; i < 3; ++i) EXPECT_EQ(!isAbsent, inspector->inspect(file).hasValue());
  });
}

}  // namespace
}  // namespace quilt::platform
