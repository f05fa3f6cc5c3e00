// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/Outline.h"

#include "quilt/platform/ffmpeg/Duration.h"
#include "quilt/platform/ffmpeg/Limits.h"
#include "quilt/platform/ffmpeg/Metadata.h"

namespace quilt::platform::ffmpeg {

Result<Outline> outline(Input& input) {
  if (Result<void> completed = completeStreams(input); !completed) return completed.error();
  Outline result{.video = mainVideo(input), .audio = mainAudio(input), .duration = 0, .chapters = {}};
  if (result.video == nullptr && result.audio == nullptr) {
    return Error{ErrorKind::Unsupported, "The file holds neither video nor audio.", input.path()};
  }
  if (endsBeforeItsMedia(input)) {
    return Error{ErrorKind::Damaged, "The file ends before its first picture or sound.", input.path()};
  }
  if (result.video != nullptr &&
      (result.video->codecpar->width > kMaximumPictureSide || result.video->codecpar->height > kMaximumPictureSide)) {
    return Error{ErrorKind::Damaged, "The movie's pictures are larger than any that can be shown.", input.path()};
  }
  result.duration = trustedDuration(input);
  result.chapters = chapters(input, result.duration);
  return result;
}

PictureSize shownSize(const Input& input, AVStream& video) {
  const PictureSize stored{video.codecpar->width, video.codecpar->height};
  if (stored.width <= 0 || stored.height <= 0) return {};
  const AVRational shape = av_guess_sample_aspect_ratio(input.context(), &video, nullptr);
  return turned(withSquarePixels(stored, shape), orientation(video));
}

}  // namespace quilt::platform::ffmpeg
