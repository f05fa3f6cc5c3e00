// SPDX-License-Identifier: Apache-2.0
#include "quilt/documents/QuiltDocument.h"
#include "quilt/media/QuiltMedia.h"
#include "quilt/sources/DocumentSave.h"
#include "quilt/sources/ModelFiles.h"

namespace quilt {

void QuiltMedia::updateDocumentUnlessProcessing() const { requestSave(documentOwner()); }

template <class List, class Child>
void QuiltMedia::insertChild(List& list, const Child& child, std::size_t index) {
  if (!child) return;
  const platform::Uninterrupted whole;
  list.insert(child, index);
  updateDocumentUnlessProcessing();
}

template <class List, class Child>
void QuiltMedia::appendChild(List& list, const Child& child) {
  if (!child) return;
  const platform::Uninterrupted whole;
  list.append(child);
  updateDocumentUnlessProcessing();
}

template <class List>
void QuiltMedia::moveChildren(List& list, const IndexSet& indexes, std::size_t target) {
  const platform::Uninterrupted whole;
  list.move(indexes, target);
  updateDocumentUnlessProcessing();
}

template <class List, class Child>
void QuiltMedia::removeChild(List& list, const Child& child, const char* warning) {
  if (!child) return;
  const platform::Uninterrupted whole;
  {
    const auto guard = list.lock();
    // The child's path leads through its owner, so its files go first.
    deleteFromPackage(child->path(), documentOwner(), warning);
    list.remove(child);
  }
  updateDocumentUnlessProcessing();
}

// ---- Sources

std::shared_ptr<QuiltMediaSource> QuiltMedia::sourceWithUUID(const std::string& uuid) const {
  return _sources.first([&uuid](const auto& source) { return source->uuid() == uuid; });
}

bool QuiltMedia::performBlockOnSources(
    const std::function<bool(const std::shared_ptr<QuiltMediaSource>&)>& block) const {
  return _sources.walk(block);
}

void QuiltMedia::addSource(const std::shared_ptr<QuiltMediaSource>& source) { appendChild(_sources, source); }

void QuiltMedia::addSource(const std::shared_ptr<QuiltMediaSource>& source, std::size_t atIndex) {
  insertChild(_sources, source, atIndex);
}

void QuiltMedia::moveSourcesAtIndexes(const IndexSet& indexes, std::size_t toIndex) {
  moveChildren(_sources, indexes, toIndex);
}

void QuiltMedia::removeSource(const std::shared_ptr<QuiltMediaSource>& source) {
  removeChild(_sources, source, "Failed to delete source at path \"%@\": \"%@\"");
}

void QuiltMedia::removeAllSources() {
  const platform::Uninterrupted whole;
  // The lock is not held across: each removal saves the document, whose lock comes first.
  for (const auto& source : _sources.copy()) removeSource(source);
}

std::size_t QuiltMedia::totalSourcesPreviewsCount() const {
  std::size_t total = 0;
  performBlockOnSources([&total](const auto& source) {
    total += source->previewCount();
    return true;
  });
  return total;
}

std::shared_ptr<QuiltMediaPreview> QuiltMedia::sourcePreviewAtIndex(std::size_t index) const {
  const SaveDeferral deferral;
  std::shared_ptr<QuiltMediaPreview> found;
  performBlockOnSources([&](const auto& source) {
    const std::size_t count = source->previewCount();
    if (index >= count) {
      index -= count;
      return true;
    }
    found = source->previewAtIndex(index);
    return false;
  });
  return found;
}

// ---- Extras

bool QuiltMedia::performBlockOnExtra(const std::function<bool(const std::shared_ptr<QuiltMediaExtra>&)>& block) const {
  return _extras.walk(block);
}

void QuiltMedia::addExtra(const std::shared_ptr<QuiltMediaExtra>& extra) { appendChild(_extras, extra); }

void QuiltMedia::addExtra(const std::shared_ptr<QuiltMediaExtra>& extra, std::size_t atIndex) {
  insertChild(_extras, extra, atIndex);
}

void QuiltMedia::moveExtraAtIndexes(const IndexSet& indexes, std::size_t toIndex) {
  moveChildren(_extras, indexes, toIndex);
}

void QuiltMedia::removeExtra(const std::shared_ptr<QuiltMediaExtra>& extra) {
  removeChild(_extras, extra, "Failed to delete extra at path \"%@\": \"%@\"");
}

void QuiltMedia::removeAllExtras() {
  const platform::Uninterrupted whole;
  for (const auto& extra : _extras.copy()) removeExtra(extra);
}

// ---- Audio commentary

void QuiltMedia::setAudioCommentarySource(const std::shared_ptr<QuiltMediaSource>& source) {
  const platform::Uninterrupted whole;
  if (const auto current = audioCommentarySource()) current->setMediaOwner(nullptr);
  _audioCommentarySource.set(source);
  if (source) source->setMediaOwner(shared(this));
}

}  // namespace quilt
