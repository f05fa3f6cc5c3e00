// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/glance/GlanceServices.h"

#include <algorithm>
#include <string>

#include "quilt/platform/glance/PageImage.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::platform {

namespace {

constexpr double kPosterTime = 10;  // seconds; where an intro is usually over

std::shared_ptr<ImageWrapper> drawing(std::string_view name, std::string_view type) {
  const Result<std::shared_ptr<ImageWrapper>> image =
      services().images->imageWithData(services().resources->artwork(name, type));
  return image ? *image : nullptr;
}

// The author's choice, else 10 seconds or the middle of a short movie; at a key frame, which needs no other to show.
double standingTime(Movie& movie) {
  double time = movie.posterTime().value_or(0);
  if (time == 0) time = std::min(kPosterTime, movie.duration().value_or(0) / 2);
  const double keyFrame = movie.keyFrameTimeAtOrBefore(time).value_or(0);
  return keyFrame != 0 ? keyFrame : time;
}

std::shared_ptr<ImageWrapper> artworkOf(const std::filesystem::path& path) {
  const Result<std::unique_ptr<Movie>> movie = services().movies->openMovie(path);
  return movie ? (*movie)->albumArtworkMovie() : nullptr;
}

std::shared_ptr<ImageWrapper> pictureOfMovie(const std::filesystem::path& path) {
  const Result<std::unique_ptr<Movie>> movie = services().movies->openMovie(path);
  if (!movie) return nullptr;
  if (std::shared_ptr<ImageWrapper> artwork = (*movie)->albumArtworkMovie()) return artwork;
  const Result<std::shared_ptr<ImageWrapper>> frame = (*movie)->frameAtTime(standingTime(**movie));
  if (frame) return *frame;
  // A movie file may hold sound alone.
  const std::shared_ptr<const FDYMedia> media = FDYMedia::initWithPath(path);
  return media && media->hasAudio() && !media->hasVideo() ? drawing("AudioPreview", "png") : nullptr;
}

std::shared_ptr<ImageWrapper> pictureOfSound(const std::filesystem::path& path) {
  const std::shared_ptr<ImageWrapper> artwork = artworkOf(path);
  return artwork ? artwork : drawing("AudioPreview", "png");
}

bool isDocument(const std::filesystem::path& path) {
  const std::optional<std::string> type = FDYTypePreferredIdentifier(path);
  return type && types::isPagedDocument(*services().types, *type);
}

}  // namespace

GlanceServices::GlanceServices() : _documents(std::make_shared<OpenDocuments>()) {}

std::shared_ptr<ImageWrapper> GlanceServices::pictureOf(const Url& url) const {
  if (!url.isFileUrl()) {
    const std::string& text = url.absoluteString();
    const bool isWeb = text.starts_with("http:") || text.starts_with("https:");
    return isWeb ? drawing("WebPreview", "icns") : nullptr;
  }
  const std::filesystem::path path = url.relativePath();
  const std::optional<std::string> type = FDYTypePreferredIdentifier(path);
  if (!type) return nullptr;
  const auto isOf = [&](const char* family) { return services().types->conformsTo(*type, family); };
  if (isOf(types::kImage)) return ImageWrapper::imageWithPath(path);
  if (isOf(types::kMovie)) return pictureOfMovie(path);
  if (isOf(types::kAudio)) return pictureOfSound(path);
  if (types::isPagedDocument(*services().types, *type)) return pictureOfPage(path, 0);
  return nullptr;
}

std::shared_ptr<ImageWrapper> GlanceServices::thumbnailImageForURL(const Url& url) const {
  const std::shared_ptr<ImageWrapper> picture = pictureOf(url);
  return picture ? picture->convertToSD() : nullptr;
}

std::shared_ptr<ImageWrapper> GlanceServices::pictureOfPage(const std::filesystem::path& path,
                                                            std::size_t index) const {
  const Result<OpenDocuments::Found> found = _documents->open(path);
  if (!found) return nullptr;
  const Result<Size> points = found->document->sizeOfPage(index);
  if (points) return std::make_shared<PageImage>(PageImage::Page{_documents, path, found->identity, index}, *points);
  if (points.error().kind != ErrorKind::NotFound) _documents->warn(path, found->identity, points.error());
  return nullptr;
}

void GlanceServices::prepareDocument(const std::filesystem::path& path, const ContinueBlock& goesOn) const {
  if (isDocument(path)) (void)_documents->open(path, goesOn);
}

std::size_t GlanceServices::documentPagesCount(const std::filesystem::path& path) const {
  if (!isDocument(path)) return 0;
  const Result<std::size_t> count = _documents->pageCount(path);
  return count ? *count : 0;
}

std::optional<DocumentPage> GlanceServices::documentPageAtIndex(const std::filesystem::path& path,
                                                                std::size_t index) const {
  if (!isDocument(path)) return std::nullopt;
  const std::shared_ptr<ImageWrapper> image = pictureOfPage(path, index);
  if (!image) return std::nullopt;
  const Result<OpenDocuments::Found> found = _documents->open(path);
  if (!found) return std::nullopt;
  // A page whose text cannot be read is shown without it.
  const Result<std::string> text = found->document->textOfPage(index);
  if (!text) _documents->warn(path, found->identity, text.error());
  return DocumentPage{image, text ? *text : std::string()};
}

}  // namespace quilt::platform
