// SPDX-License-Identifier: Apache-2.0
#include "quilt/media/QuiltMedia.h"

#include "quilt/platform/base/FDYLogger.h"
#include "quilt/scripting/AccessorTable.h"

namespace quilt::scripting::table {

using platform::FDYLogger;

namespace {

/// An integer 0 when the item has no poster.
Number pixels(const platform::PropertyList& number) {
  const auto* real = number.as<double>();
  return real ? Number(*real) : Number(std::int64_t{0});
}

}  // namespace

std::span<const Accessor> ofMedia() {
  using Self = QuiltMedia;
  static const Accessor accessors[] = {
      getter<Self>("cvUUID", "Its identity.",
                   [](const Self& media) {
                     FDYLogger::logDebug("Conveyor is getting media \"%@\" uuid", media.uuid());
                     return media.uuid();
                   }),
      getter<Self>("cvTitle", "Its title.",
                   [](const Self& media) {
                     FDYLogger::logDebug("Conveyor is getting media \"%@\" title \"%@\"", media.uuid(), media.title());
                     return media.title();
                   }),
      setter<Self>("cvSetTitle:", "Changes the title.",
                   [](Self& media, const Text& title) {
                     FDYLogger::logDebug("Conveyor is setting media \"%@\" title to \"%@\"", media.uuid(), title);
                     media.setTitle(title);
                   }),
      getter<Self>("cvDescription", "Its description.",
                   [](const Self& media) {
                     // The line's spelling is what readers of the log look for.
                     FDYLogger::logDebug("Conveyor is getting media \"%@\" descripion \"%@\"", media.uuid(),
                                         media.description());
                     return media.description();
                   }),
      setter<Self>("cvSetDescription:", "Changes the description.",
                   [](Self& media, const Text& description) {
                     FDYLogger::logDebug("Conveyor is setting media \"%@\" description to \"%@\"", media.uuid(),
                                         description);
                     media.setDescription(description);
                   }),
      getter<Self>("cvContentCategory",
                   "\"Movie\", \"Audio\", \"Image\", \"Document\", \"Web\", \"Montage\" or "
                   "\"DualSource\".",
                   [](const Self& media) {
                     FDYLogger::logDebug("Conveyor is getting media \"%@\" content category \"%@\"", media.uuid(),
                                         media.contentCategory());
                     return media.contentCategory();
                   }),
      getter<Self>("cvPosterImagePath", "Where its poster lies; an empty text when it has none.",
                   [](Self& media) {
                     const std::string path = media.posterImage() ? media.posterImagePath().native() : std::string();
                     FDYLogger::logDebug("Conveyor is getting media \"%@\" poster image path \"%@\"", media.uuid(),
                                         path);
                     return path;
                   }),
      getter<Self>("cvPosterImageWidth", "Pixels; 0 when it has no poster.",
                   [](Self& media) {
                     FDYLogger::logDebug("Conveyor is getting width of poster image for media \"%@\"", media.uuid());
                     return pixels(media.posterImageWidth());
                   }),
      getter<Self>("cvPosterImageHeight", "Pixels; 0 when it has no poster.",
                   [](Self& media) {
                     FDYLogger::logDebug("Conveyor is getting height of poster image for media \"%@\"", media.uuid());
                     return pixels(media.posterImageHeight());
                   }),
      getter<Self>("cvSourcesCount", "How many sources it has.",
                   [](const Self& media) {
                     const std::int32_t count = countOf(media.sourcesCount());
                     FDYLogger::logDebug("Conveyor is getting media \"%@\" sources count \"%@\"", media.uuid(), count);
                     return count;
                   }),
      indexGetter<Self>("cvSourceAtIndex:", "The source at an index, or none.",
                        [](const Self& media, std::int64_t index) {
                          const auto source = media.sourceAtIndex(positionOf(index));
                          FDYLogger::logDebug("Conveyor is getting media \"%@\" source \"%@\" at index \"%ld\"",
                                              media.uuid(), identityOf(source), index);
                          return source;
                        }),
      getter<Self>("cvAudioCommentarySource", "Its audio commentary, or none.",
                   [](const Self& media) {
                     const auto commentary = media.audioCommentarySource();
                     FDYLogger::logDebug("Conveyor is getting media \"%@\" audio commentary source \"%@\"",
                                         media.uuid(), identityOf(commentary));
                     return commentary;
                   }),
      // The lines of the extras call the item a source.
      getter<Self>("cvExtraCount", "How many extras it has.",
                   [](const Self& media) {
                     const std::int32_t count = countOf(media.extraCount());
                     FDYLogger::logDebug("Conveyor is getting source \"%@\" extra count \"%@\"", media.uuid(), count);
                     return count;
                   }),
      indexGetter<Self>("cvExtraAtIndex:", "The extra at an index, or none.",
                        [](const Self& media, std::int64_t index) {
                          const auto extra = media.extraAtIndex(positionOf(index));
                          FDYLogger::logDebug("Conveyor is getting source \"%@\" extra at index \"%ld\": \"%@\"",
                                              media.uuid(), index, identityOf(extra));
                          return extra;
                        }),
      indexAction<Self>("cvRemoveExtraAtIndex:", "Removes the extra at an index, with its files.",
                        [](Self& media, std::int64_t index) {
                          const auto extra = media.extraAtIndex(positionOf(index));
                          media.removeExtra(extra);
                          FDYLogger::logDebug("Conveyor is removing source \"%@\" extra at index \"%ld\": \"%@\"",
                                              media.uuid(), index, identityOf(extra));
                        }),
  };
  return accessors;
}

}  // namespace quilt::scripting::table
