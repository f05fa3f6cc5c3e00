// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/FfmpegMovieToolkit.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include "quilt/platform/ffmpeg/FrameFinder.h"
#include "quilt/platform/ffmpeg/FramePixels.h"
#include "quilt/platform/ffmpeg/Input.h"
#include "quilt/platform/ffmpeg/Limits.h"
#include "quilt/platform/ffmpeg/Outline.h"
#include "quilt/platform/ffmpeg/PosterTime.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::platform {

using namespace ffmpeg;

namespace {

class FfmpegMovie final : public Movie {
 public:
  FfmpegMovie(Input input, Outline outline)
      : _input(std::move(input)), _outline(std::move(outline)), _origin(startTime(_input)) {
    if (_outline.video != nullptr) _finder.emplace(_input, *_outline.video);
  }

  [[nodiscard]] std::optional<double> duration() const override {
    return _outline.duration > 0 ? std::optional(_outline.duration) : std::nullopt;
  }
  [[nodiscard]] std::optional<double> posterTime() const override { return ffmpeg::posterTime(_input); }
  [[nodiscard]] const std::vector<Chapter>& chapters() const override { return _outline.chapters; }

  [[nodiscard]] std::optional<double> keyFrameTimeAtOrBefore(double time) override {
    if (!_finder) return std::nullopt;
    _input.allow(kFrameSeconds);
    const std::optional<std::int64_t> ticks = _finder->keyFrameAtOrBefore(ticksAt(time));
    if (!ticks) return std::nullopt;
    return std::max(0.0, seconds(*ticks, _outline.video->time_base) - _origin);
  }

  [[nodiscard]] Result<std::shared_ptr<ImageWrapper>> frameAtTime(double time) override {
    if (!_finder) return Error{ErrorKind::Unsupported, "The file holds no video.", _input.path()};
    _input.allow(kFrameSeconds);
    Result<Frame> frame = _finder->frameAtOrBefore(ticksAt(time));
    if (!frame) return frame.error();
    const AVRational shape = av_guess_sample_aspect_ratio(_input.context(), _outline.video, frame->get());
    Result<Bitmap> bitmap = framePixels(**frame, shape, orientation(*_outline.video), _input.path());
    if (!bitmap) return bitmap.error();
    return services().images->imageWithBitmap(*std::move(bitmap));
  }

  [[nodiscard]] std::shared_ptr<ImageWrapper> albumArtworkMovie() override {
    const AVStream* stream = attachedPicture(_input);
    if (stream == nullptr) return nullptr;
    const AVPacket& picture = stream->attached_pic;
    const auto size = static_cast<std::size_t>(picture.size);
    if (size > kMaximumPictureFileBytes) return nullptr;
    Result<std::shared_ptr<ImageWrapper>> image = services().images->imageWithData({picture.data, size});
    return image ? *std::move(image) : nullptr;
  }

 private:
  // The tick that is current at a time; a time in a file's chapter may be a hair before the frame that it means.
  [[nodiscard]] std::int64_t ticksAt(double time) const {
    constexpr double hair = 1e-3;  // ticks
    constexpr double grace = 10;   // seconds; a header may promise a little less than there is
    const double latest = _outline.duration > 0 ? _outline.duration + grace : kMaximumDuration;
    const double inside = std::isnan(time) ? 0 : std::clamp(time, 0.0, latest);
    const AVRational base = _outline.video->time_base;
    return static_cast<std::int64_t>(std::floor((_origin + inside) * base.den / base.num + hair));
  }

  Input _input;
  Outline _outline;  // points into the input
  double _origin;    // the file's time at the start, in seconds
  std::optional<FrameFinder> _finder;
};

}  // namespace

Result<std::unique_ptr<Movie>> FfmpegMovieToolkit::openMovie(const std::filesystem::path& path) const {
  Result<Input> input = Input::open(path, kInspectionSeconds);
  if (!input) return input.error();
  Result<Outline> found = outline(*input);
  if (!found) return found.error();
  return std::unique_ptr<Movie>(std::make_unique<FfmpegMovie>(*std::move(input), *std::move(found)));
}

}  // namespace quilt::platform
