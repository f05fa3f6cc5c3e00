// SPDX-License-Identifier: Apache-2.0
#include "quilt/collections/QuiltCollection.h"
#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt {

using platform::services;

Dictionary QuiltDocument::jukeboxMetadata() const {
  const auto collection = collectionOwner();
  Dictionary metadata;
  if (const Text artist = author()) {
    metadata.append("artistName", *artist);
    metadata.append("sort-artist", *artist);
    metadata.append("sort-artist-status", 1);
  }
  if (const Text artist = collection ? collection->author() : std::nullopt; artist && !artist->empty()) {
    metadata.append("playlistArtistName", *artist);
    metadata.append("sort-album-artist", *artist);
    metadata.append("sort-album-artist-status", 1);
  }
  if (const Text text = description()) {
    metadata.append("description", *text);
    metadata.append("longDescription", *text);
  }
  const auto& strings = *services().resources;
  const Text itemTitle = title();
  const std::string item = itemTitle ? *itemTitle : strings.localizedString("Untitled Episode", "Untitled Episode");
  metadata.append("itemName", item);
  metadata.append("sort-name", item);
  metadata.append("sort-name-status", 1);
  const Text listTitle = collection ? collection->title() : std::nullopt;
  const std::string list = listTitle ? *listTitle : strings.localizedString("Untitled Podcast", "Untitled Podcast");
  metadata.append("playlistName", list);
  metadata.append("sort-album", list);
  metadata.append("sort-album-status", 1);
  if (const auto date = modifiedDate()) {
    metadata.append("releaseDate", services().dates->description(*date));
    metadata.append("year", services().dates->gregorianYear(*date));
  }
  metadata.append("genre", "Podcast");
  metadata.append("kind", "podcast");
  metadata.append("is-podcast", true);
  return {{"Metadata", std::move(metadata)}};
}

}  // namespace quilt
