// SPDX-License-Identifier: Apache-2.0
#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/DocumentSave.h"
#include "quilt/sources/ModelFiles.h"

namespace quilt {

using platform::services;

namespace {

bool hasFile(const std::shared_ptr<QuiltMediaDerivative>& derivative) {
  const auto url = derivative ? derivative->url() : std::nullopt;
  return url && services().files->fileExistsAtPath(url->relativePath());
}

/// A web link has no file to lose.
bool isIntact(const std::shared_ptr<QuiltMediaSource>& source) {
  const auto main = source->mainDerivative();
  return (main && main->contentType() == platform::types::kURL) || hasFile(main);
}

bool isBroken(const QuiltMedia& item) {
  if (item.contentCategory() == kQuiltMediaContentCategoryMontage) {
    const auto commentary = item.audioCommentarySource();
    if (!commentary || !hasFile(commentary->mainDerivative())) return true;
  }
  return !item.performBlockOnSources(isIntact);
}

}  // namespace

std::shared_ptr<QuiltMedia> QuiltDocument::mediaWithUUID(const std::string& uuid) const {
  return _media.first([&uuid](const auto& item) { return item->uuid() == uuid; });
}

bool QuiltDocument::performBlockOnMedia(const std::function<bool(const std::shared_ptr<QuiltMedia>&)>& block) const {
  return _media.walk(block);
}

void QuiltDocument::addMedia(const std::shared_ptr<QuiltMedia>& media) {
  if (!media) return;
  const platform::Uninterrupted whole;
  _media.append(media);
  requestSave(shared(this));
}

void QuiltDocument::addMedia(const std::shared_ptr<QuiltMedia>& media, std::size_t atIndex) {
  if (!media) return;
  const platform::Uninterrupted whole;
  _media.insert(media, atIndex);
  requestSave(shared(this));
}

void QuiltDocument::moveMediaAtIndexes(const IndexSet& indexes, std::size_t toIndex) {
  const platform::Uninterrupted whole;
  _media.move(indexes, toIndex);
  requestSave(shared(this));
}

void QuiltDocument::removeMedia(const std::shared_ptr<QuiltMedia>& media) {
  if (!media) return;
  const platform::Uninterrupted whole;
  {
    const auto guard = _media.lock();
    // The item's path leads through its owner, so its files go first.
    deleteFromPackage(media->path(), shared(this), "Failed to delete media at path \"%@\": \"%@\"");
    _media.remove(media);
  }
  requestSave(shared(this));
}

void QuiltDocument::removeAllMedia() {
  const platform::Uninterrupted whole;
  const auto guard = _media.lock();
  for (const auto& item : _media.copy()) removeMedia(item);
}

void QuiltDocument::removeAllEmptyMedia() {
  const platform::Uninterrupted whole;
  const auto guard = _media.lock();
  for (const auto& item : _media.copy())
    if (item->sourcesCount() == 0) removeMedia(item);
}

void QuiltDocument::removeAllBrokenMedia() {
  const platform::Uninterrupted whole;
  const auto guard = _media.lock();
  std::vector<std::shared_ptr<QuiltMedia>> broken;
  for (const auto& item : _media.copy())
    if (isBroken(*item)) broken.push_back(item);
  for (const auto& item : broken) removeMedia(item);
}

void QuiltDocument::removeAllBrokenMediaExtra() {
  const platform::Uninterrupted whole;
  const auto guard = _media.lock();
  // One list for the whole pass: each item is asked to remove every broken extra found so far.
  std::vector<std::shared_ptr<QuiltMediaExtra>> broken;
  for (const auto& item : _media.copy()) {
    item->performBlockOnExtra([&broken](const auto& extra) {
      if (!isIntact(extra)) broken.push_back(extra);
      return true;
    });
    for (const auto& extra : broken) item->removeExtra(extra);
  }
}

double QuiltDocument::duration() const {
  double total = 0;
  performBlockOnMedia([&total](const auto& item) {
    total += item->duration();
    return true;
  });
  return total;
}

}  // namespace quilt
