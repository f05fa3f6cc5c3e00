// SPDX-License-Identifier: Apache-2.0
#include "quilt/documents/QuiltDocument.h"
#include "quilt/media/QuiltMedia.h"
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

using platform::Error;
using platform::ErrorKind;
using platform::Result;

namespace {

using Preview = Result<std::shared_ptr<QuiltMediaPreview>>;

Error noSuchPreview() { return {ErrorKind::NotFound, "There is no such preview.", {}}; }

Preview previewOf(const Result<std::shared_ptr<ImageWrapper>>& image) {
  if (!image) return image.error();
  if (auto preview = QuiltMediaPreview::initWithImageWrapper(*image)) return preview;
  return Error{ErrorKind::Damaged, "The picture cannot be scaled.", {}};
}

Preview previewOfArtwork(const char* name, const char* type) {
  return previewOf(services().images->imageWithData(services().resources->artwork(name, type)));
}

std::string firstLine(const std::string& text) { return text.substr(0, text.find_first_of("\r\n")); }

Preview previewOfPage(const Path& file, std::size_t index) {
  std::optional<platform::DocumentPage> page;
  bool isPage = true;
  platform::performBlockOnMainThread([&] {
    page = platform::FDYPreviewDocumentPageAtIndex(file, index);
    if (!page) isPage = index < platform::FDYPreviewDocumentPagesCount(file);
  });
  if (!isPage) return noSuchPreview();
  if (!page) return Error{ErrorKind::Damaged, "The page cannot be read.", file};
  auto preview = previewOf(page->image);
  if (!preview) return preview;
  (*preview)->setTitle(firstLine(page->text));
  (*preview)->setContent(page->text);
  return preview;
}

std::unique_ptr<Movie> openMovie(const QuiltMediaDerivative& main) {
  const auto url = main.url();
  auto movie = services().movies->openMovie(url ? url->relativePath() : Path());
  if (movie) return *std::move(movie);
  FDYLogger::logWarning("Failed to preview movie derivative at URL \"%@\": \"%@\"", url, movie.error());
  return nullptr;
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

Preview previewOfMovie(Movie& movie, std::size_t index) {
  const auto& chapters = movie.chapters();
  if (!chapters.empty()) {
    if (index >= chapters.size()) return noSuchPreview();
    auto preview = previewOf(movie.frameAtTime(chapters[index].start));
    if (!preview) return preview;
    (*preview)->setTitle(chapters[index].name);
    (*preview)->setTimecode(chapters[index].start);
    return preview;
  }
  if (index != 0) return noSuchPreview();
  if (const auto artwork = movie.albumArtworkMovie()) return previewOf(artwork);
  return previewOf(movie.frameAtTime(posterTime(movie)));
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

  /// Whether a picture that was made is read anew from the file each time its pixels are needed.
  [[nodiscard]] bool isReadEachTime() const { return isDocument() || category == kQuiltMediaContentCategoryImage; }

  /// NotFound past the last, and for a movie that does not open, which was told.
  [[nodiscard]] Preview makePreview(std::size_t index) const {
    if (isMovie()) return movie ? previewOfMovie(*movie, index) : noSuchPreview();
    if (isDocument()) return previewOfPage(file(), index);
    if (index != 0) return noSuchPreview();
    if (category == kQuiltMediaContentCategoryAudio) return previewOfArtwork("AudioPreview", "png");
    if (category == kQuiltMediaContentCategoryWeb) return previewOfArtwork("WebPreview", "icns");
    if (category == kQuiltMediaContentCategoryImage) return previewOf(services().images->imageWithPath(file()));
    return noSuchPreview();
  }
};

std::size_t QuiltMediaSource::previewCount() const { return PreviewContent(*this).count(); }

std::shared_ptr<QuiltMediaPreview> QuiltMediaSource::existingPreview(std::size_t index) const {
  return _previews.first([index](const auto& preview) { return preview->index() == index; });
}

std::shared_ptr<QuiltMediaPreview> QuiltMediaSource::usablePreview(std::size_t index) {
  auto preview = existingPreview(index);
  if (!preview || preview->hasPicture()) return preview;
  // Recorded and never written, because the process ended before it could be; or its file is gone. It is made again.
  removePreview(preview);
  return nullptr;
}

void QuiltMediaSource::flattenPreviews() {
  for (const auto& preview : _previews.copy()) {
    if (const auto written = preview->writePicture(); !written && cannotBeDrawn(written.error()))
      leaveOutPreview(preview->index(), written.error());
  }
}

std::shared_ptr<QuiltMediaPreview> QuiltMediaSource::previewAtIndex(std::size_t index) {
  const SaveDeferral deferral;
  const auto guard = _previews.lock();
  if (auto existing = usablePreview(index)) return existing;
  return makePreview(PreviewContent(*this), index);
}

std::shared_ptr<QuiltMediaPreview> QuiltMediaSource::makePreview(const PreviewContent& content, std::size_t index) {
  if (_previewsLeftOut.contains(index)) return nullptr;
  const auto made = content.makePreview(index);
  if (!made) {
    if (cannotBeDrawn(made.error())) leaveOutPreview(index, made.error());
    return nullptr;
  }
  const auto& preview = *made;
  preview->setIndex(index);
  preview->setIsRenewable(true);
  // The file before the record that names it. Of a file outside, the picture is written with the copy of that file.
  if (content.main->isFlattened() && !folder().empty()) {
    preview->setSourceOwner(shared(this));
    if (const auto written = preview->writePicture(); !written && cannotBeDrawn(written.error())) {
      preview->setSourceOwner(nullptr);
      leaveOutPreview(index, written.error());
      return nullptr;
    }
  }
  addPreview(preview);
  return preview;
}

void QuiltMediaSource::leaveOutPreview(std::size_t index, const Error& error) {
  const SaveDeferral deferral;
  const auto guard = _previews.lock();
  if (_previewsLeftOut.insert(index).second) {
    const auto media = mediaOwner();
    const Text name = media && media->title() ? media->title() : title();
    FDYLogger::logWarning("Picture %ld of \"%@\" cannot be drawn and is left out: \"%@\" (file \"%@\")", index + 1,
                          name, error, previewItemURL());
  }
  if (const auto preview = existingPreview(index)) removePreview(preview);
}

std::set<std::size_t> QuiltMediaSource::previewsLeftOut() const {
  const auto guard = _previews.lock();
  return _previewsLeftOut;
}

void QuiltMediaSource::setPreviewsLeftOut(std::set<std::size_t> indexes) {
  const auto guard = _previews.lock();
  _previewsLeftOut = std::move(indexes);
}

void QuiltMediaSource::renewLostPreviews(const ContinueBlock& goesOn) {
  const SaveDeferral deferral;
  const auto guard = _previews.lock();
  std::optional<PreviewContent> content;  // opened for the first that is lost
  for (const auto& preview : _previews.copy()) {
    const bool isPending = preview->isRenewable() && preview->index() != kNoIndex && !preview->isFlattened();
    if (!isPending || preview->hasPicture()) continue;
    if (!content) content.emplace(*this, goesOn);
    if (!usablePreview(preview->index())) makePreview(*content, preview->index());
  }
}

void QuiltMediaSource::readPreviewsFromPackage() {
  const auto guard = _previews.lock();
  const auto isPending = [](const auto& preview) { return preview->isRenewable() && !preview->isFlattened(); };
  if (!_previews.first(isPending)) return;
  const PreviewContent content(*this);
  if (!content.isReadEachTime()) return;
  _previews.walk([&](const auto& preview) {
    if (!isPending(preview)) return true;
    if (const auto again = content.makePreview(preview->index())) preview->setImage((*again)->image());
    return true;
  });
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
  setPreviewsLeftOut({});
  for (const auto& preview : _previews.copy()) removePreview(preview);
}

}  // namespace quilt
