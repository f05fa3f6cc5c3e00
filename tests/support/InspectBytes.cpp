// SPDX-License-Identifier: Apache-2.0
#include "tests/support/InspectBytes.h"

#include <stdexcept>
#include <string>

#include "quilt/platform/ffmpeg/FfmpegAudioPreview.h"
#include "quilt/platform/ffmpeg/FfmpegInspector.h"
#include "quilt/platform/ffmpeg/FfmpegMovieToolkit.h"
#include "quilt/platform/interfaces/Services.h"
#include "tests/support/MemoryFile.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::support {

using namespace platform;

namespace {

// Checks that bitmaps are whole; makes no images.
class NoImages final : public Images {
 public:
  [[nodiscard]] Result<std::shared_ptr<ImageWrapper>> imageWithPath(const std::filesystem::path& path) const override {
    return Error{ErrorKind::Unsupported, "No images are made.", path};
  }
  [[nodiscard]] Result<std::shared_ptr<ImageWrapper>> imageWithData(std::span<const unsigned char>) const override {
    return Error{ErrorKind::Unsupported, "No images are made.", {}};
  }
  [[nodiscard]] Result<std::shared_ptr<ImageWrapper>> imageWithBitmap(Bitmap bitmap) const override {
    if (bitmap.pixels.size() != bitmap.width * bitmap.height * 4) throw std::logic_error("a bitmap of the wrong size");
    return Error{ErrorKind::Unsupported, "No images are made.", {}};
  }
};

}  // namespace

void inspectBytes(std::span<const std::uint8_t> bytes) {
  const ScopedService images(&Services::images, std::make_shared<NoImages>());
  const MemoryFile file(bytes);
  const Result<MediaFacts> facts = FfmpegInspector().inspect(file.path());
  if (facts && !facts->hasAudio && !facts->hasVideo) throw std::logic_error("facts of nothing");
  if (Result<std::unique_ptr<Movie>> movie = FfmpegMovieToolkit().openMovie(file.path())) {
    const double end = (*movie)->duration().value_or(1);
    for (const Chapter& chapter : (*movie)->chapters()) {
      if (chapter.start < 0 || chapter.start > end) throw std::logic_error("a chapter outside");
    }
    static_cast<void>((*movie)->posterTime());
    static_cast<void>((*movie)->albumArtworkMovie());
    static_cast<void>((*movie)->keyFrameTimeAtOrBefore(end / 2));
    static_cast<void>((*movie)->frameAtTime(end / 2));
    static_cast<void>((*movie)->frameAtTime(end));
  }
  const ScratchFolder folder;
  static_cast<void>(FfmpegAudioPreview().extractAudioSamplesFromAssetURL(Url::fileUrl(file.path()),
                                                                         Url::fileUrl(folder / "samples.asc"), {}));
}

}  // namespace quilt::support
