// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/SharedIdentity.h"

#include "quilt/documents/QuiltDocument.h"
#include "quilt/media/QuiltMedia.h"
#include "quilt/sources/QuiltMediaSource.h"
#include "quilt/sources/RecordNames.h"

namespace quilt {

namespace {

/// Calls `visit` on every source, extra and commentary of the item until it answers true.
template <class Visit>
bool anySource(const QuiltMedia& item, const Visit& visit) {
  const auto isNone = [&visit](const auto& source) { return !visit(*source); };
  if (!item.performBlockOnSources(isNone) || !item.performBlockOnExtra(isNone)) return true;
  const auto commentary = item.audioCommentarySource();
  return commentary && visit(*commentary);
}

}  // namespace

bool sharesFolder(const QuiltMedia& item) {
  const auto document = item.documentOwner();
  const std::string identity = item.uuid();
  return document && !document->performBlockOnMedia(
                         [&](const auto& other) { return other.get() == &item || other->uuid() != identity; });
}

bool sharesFolder(const QuiltMediaSource& source) {
  const auto media = source.mediaOwner();
  const auto document = media ? media->documentOwner() : nullptr;
  const std::string folder = source.folder();
  if (!document || folder.empty()) return false;
  const std::string identity = media->uuid();
  const auto hasFolder = [&](const QuiltMediaSource& other) { return &other != &source && other.folder() == folder; };
  return !document->performBlockOnMedia(
      [&](const auto& item) { return item->uuid() != identity || !anySource(*item, hasFolder); });
}

bool sharesFile(const QuiltMediaDerivative& derivative) {
  const auto owner = derivative.sourceOwner();
  const auto file = derivative.url();
  if (!owner || !file) return false;
  const auto hasFile = [&](const QuiltMediaSource& source) {
    return !source.performBlockOnDerivatives(
        [&](const auto& other) { return other.get() == &derivative || !other->isFlattened() || other->url() != file; });
  };
  const auto document = documentOf(owner);
  if (!document) return hasFile(*owner);
  return !document->performBlockOnMedia([&](const auto& item) { return !anySource(*item, hasFile); });
}

}  // namespace quilt
