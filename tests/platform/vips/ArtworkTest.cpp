// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include <algorithm>

#include "quilt/platform/vips/VipsImages.h"
#include "quilt/resources/EmbeddedFiles.h"

namespace quilt::platform {
namespace {

// The drawings that are compiled into the library are images that this library reads.
TEST(ArtworkTest, EveryDrawingIsAnImageOfItsSize) {
  const std::pair<const char*, Size> drawings[] = {{"artwork/PlaceholderPoster.png", {1280, 960}},
                                                   {"artwork/AudioPreview.png", {1280, 720}},
                                                   {"artwork/WebPreview.icns", {512, 512}}};
  for (const auto& [path, size] : drawings) {
    const auto files = resources::embeddedFiles();
    const auto file = std::find_if(files.begin(), files.end(), [path = path](const auto& f) { return f.path == path; });
    ASSERT_NE(file, files.end()) << path;
    const Result<std::shared_ptr<ImageWrapper>> image = VipsImages().imageWithData(file->bytes);
    ASSERT_TRUE(image) << image.error().text;
    EXPECT_EQ((*image)->size(), size);
    EXPECT_TRUE((*image)->convertToSD()->bitmap());
  }
}

}  // namespace
}  // namespace quilt::platform
