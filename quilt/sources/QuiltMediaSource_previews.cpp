// SPDX-License-Identifier: Apache-2.0
#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/DocumentSave.h"
#include "quilt/sources/ModelFiles.h"
#include "quilt/sources/QuiltMediaSource.h"
#include "quilt/sources/RepeatedReport.h"

namespace quilt {

using platform::FDYLogger;
using platform::Movie;
using platform::services;

namespace {

std::shared_ptr<QuiltMediaPreview> previewOfArtwork(const char* name, const char* type) {
  const auto image = services().images->imageWithData(services().resources->artwork(name, type));
  return image ? QuiltMediaPreview::initWithImageWrapper(*image) : nullptr;
}

std::string firstLine(const std::string& text) { return text.substr(0, text.find_first_of("\r\n")); }

std::shared_ptr<QuiltMediaPreview> previewOfPage(const Path& file, std::size_t index) {
  std::optional<platform::DocumentPage> page;
  platform::performBlockOnMainThread([&] { page = platform::FDYPreviewDocumentPageAtIndex(file, index); });
  auto preview = page ? QuiltMediaPreview::initWithImageWrapper(page->image) : nullptr;
  if (!preview) return nullptr;
  preview->setTitle(firstLine(page->text));
  preview->setContent(page->text);
  return preview;
}

std::unique_ptr<Movie> openMovie(const QuiltMediaDerivative& main) {
  const auto url = main.url();
  auto movie = services().movies->openMovie(url ? url->relativePath() : Path());
  if (movie) return *std::move(movie);
  FDYLogger::logWarning("Failed to preview movie derivative at URL \"%@\": \"%@\"", url, movie.error());
  return nullptr;
}

std::shared_ptr<QuiltMediaPreview> previewOfFrame(Movie& movie, double time) {
  const auto frame = movie.frameAtTime(time);
  return frame ? QuiltMediaPreview::initWithImageWrapper(*frame) : nullptr;
}

// The author's choice, else 10 seconds into a long movie and the middle of a short one; moved to a key frame.
double posterTime(Movie& movie) {
  const auto chosen = movie.posterTime();
  const auto duration = movie.duration();
  double time = 0;
  if (chosen && *chosen != 0) {
    time = *chosen;
  } else if (duration) {
    time = *duration > 20 ? 10 : *duration / 2;
  }
  const auto keyFrame = movie.keyFrameTimeAtOrBefore(time);
  return keyFrame && *keyFrame != 0 ? *keyFrame : time;
}

std::shared_ptr<QuiltMediaPreview> previewOfMovie(Movie& movie, std::size_t index) {
  const auto& chapters = movie.chapters();
  if (!chapters.empty()) {
    if (index >= chapters.size()) return nullptr;
    auto preview = previewOfFrame(movie, chapters[index].start);
    if (!preview) return nullptr;
    preview->setTitle(chapters[index].name);
    preview->setTimecode(chapters[index].start);
    return preview;
  }
  if (index != 0) return nullptr;
  if (const auto artwork = movie.albumArtworkMovie()) return QuiltMediaPreview::initWithImageWrapper(artwork);
  return previewOfFrame(movie, posterTime(movie));
}

std::size_t previewCountOfMovie(const Movie* movie) {
  if (!movie) return 0;
  return movie->chapters().empty() ? 1 : movie->chapters().size();
}

}  // namespace

/// The content behind a source's previews, opened once for a walk over them.
struct QuiltMediaSource::PreviewContent {
  Text category;
  std::shared_ptr<QuiltMediaDerivative> main;
  std::unique_ptr<Movie> movie;

  explicit PreviewContent(const QuiltMediaSource& source, const ContinueBlock& goesOn = {})
      : category(source.contentCategory()), main(source.mainDerivative()) {
    if (isMovie()) movie = openMovie(*main);
    // Here rather than on the main thread, which would stand still while an office document is converted.
    if (isDocument()) platform::FDYPreviewPrepareDocument(file(), goesOn);
  }

  [[nodiscard]] bool isMovie() const { return category == kQuiltMediaContentCategoryMovie; }
  [[nodiscard]] bool isDocument() const { return category == kQuiltMediaContentCategoryDocument; }

  [[nodiscard]] Path file() const {
    const auto url = main ? main->url() : std::nullopt;
    return url ? url->relativePath() : Path();
  }

  [[nodiscard]] std::size_t count() const {
    if (isMovie()) return previewCountOfMovie(movie.get());
    if (category == kQuiltMediaContentCategoryAudio || category == kQuiltMediaContentCategoryImage ||
        category == kQuiltMediaContentCategoryWeb)
      return 1;
    std::size_t pages = 0;
    if (isDocument())
      platform::performBlockOnMainThread([&] { pages = platform::FDYPreviewDocumentPagesCount(file()); });
    return pages;
  }

  [[nodiscard]] std::shared_ptr<QuiltMediaPreview> makePreview(std::size_t index) const {
    if (isMovie()) return movie ? previewOfMovie(*movie, index) : nullptr;
    if (category == kQuiltMediaContentCategoryAudio) return previewOfArtwork("AudioPreview", "png");
    if (category == kQuiltMediaContentCategoryWeb) return previewOfArtwork("WebPreview", "icns");
    if (category == kQuiltMediaContentCategoryImage)
      return QuiltMediaPreview::initWithImageWrapper(ImageWrapper::imageWithPath(file()));
    if (isDocument()) return previewOfPage(file(), index);
    return nullptr;
  }
};

std::size_t QuiltMediaSource::previewCount() const { return PreviewContent(*this).count(); }

std::shared_ptr<QuiltMediaPreview> QuiltMediaSource::existingPreview(std::size_t index) const {
  return _previews.first([index](const auto& preview) { return preview->index() == index; });
}

std::shared_ptr<QuiltMediaPreview> QuiltMediaSource::usablePreview(std::size_t index) {
  auto preview = existingPreview(index);
  if (!preview || preview->hasPicture()) return preview;
  // Recorded, but never written: the process ended before it could be. It is made again.
  removePreview(preview);
  return nullptr;
}

void QuiltMediaSource::flattenPreviews() {
  _previews.walk([](const auto& preview) {
    preview->flatten();
    return true;
  });
}

std::shared_ptr<QuiltMediaPreview> QuiltMediaSource::previewAtIndex(std::size_t index) {
  const SaveDeferral deferral;
  const auto guard = _previews.lock();
  if (auto existing = usablePreview(index)) return existing;
  return makePreview(PreviewContent(*this), index);
}

std::shared_ptr<QuiltMediaPreview> QuiltMediaSource::makePreview(const PreviewContent& content, std::size_t index) {
  auto preview = content.makePreview(index);
  if (!preview) return nullptr;
  preview->setIndex(index);
  addPreview(preview);
  return preview;
}

bool QuiltMediaSource::previewWithProgressionBlock(
    const ObjectProgressionBlock<QuiltMediaPreview>& withProgressionBlock) {
  const Path folder = previewsFolderPath();
  if (const auto created = createDirectoryInPackage(folder, document()); !created) {
    FDYLogger::logDebug("Failed to create intermediate directories for source at path \"%@\": \"%@\"", folder,
                        created.error());
    FDYLogger::logCritical("Failed to preview media at URL \"%@\" has been cancelled", previewItemURL());
    return false;
  }
  const ProgressionBlock beforeTheFirst = [&](double percentage) {
    return platform::report<QuiltMediaPreview>(withProgressionBlock, nullptr, percentage);
  };
  RepeatedReport waiting(beforeTheFirst);
  const PreviewContent content(*this, waiting.continueBlock());
  const auto cancelled = [this] {
    FDYLogger::logCritical("Previewing media at URL \"%@\" has been cancelled", previewItemURL());
    return false;
  };
  if (waiting.wasCancelled()) return cancelled();
  const std::size_t count = content.count();
  if (count == 0) {
    platform::report<QuiltMediaPreview>(withProgressionBlock, nullptr, 100);
    return true;
  }
  for (std::size_t i = 0; i < count; ++i) {
    std::shared_ptr<QuiltMediaPreview> preview;
    {
      const SaveDeferral deferral;
      const auto guard = _previews.lock();
      preview = usablePreview(i);
      if (!preview) preview = makePreview(content, i);
    }
    if (!platform::report(withProgressionBlock, preview, platform::integerPercentage(i + 1, count))) return cancelled();
  }
  return true;
}

bool QuiltMediaSource::isPreviewed() const {
  const std::size_t count = previewCount();
  for (std::size_t i = 0; i < count; ++i)
    if (!existingPreview(i)) return false;
  return true;
}

void QuiltMediaSource::setPreviews(std::vector<std::shared_ptr<QuiltMediaPreview>> previews) {
  _previews.assign(std::move(previews));
}

void QuiltMediaSource::addPreview(const std::shared_ptr<QuiltMediaPreview>& preview) {
  if (!preview) return;
  const platform::Uninterrupted whole;
  _previews.append(preview);
  updateDocumentUnlessProcessing();
}

void QuiltMediaSource::removePreview(const std::shared_ptr<QuiltMediaPreview>& preview) {
  if (!preview) return;
  const platform::Uninterrupted whole;
  {
    const auto guard = _previews.lock();
    deleteFromPackage(preview->path(), document(), "Failed to delete preview at path \"%@\": \"%@\"");
    _previews.remove(preview);
  }
  updateDocumentUnlessProcessing();
}

void QuiltMediaSource::removeAllPreviews() {
  const platform::Uninterrupted whole;
  for (const auto& preview : _previews.copy()) removePreview(preview);
}

}  // namespace quilt
