// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/QuiltMediaSource.h"

#include "quilt/platform/base/FDYLogger.h"
#include "quilt/scripting/AccessorTable.h"

namespace quilt::scripting::table {

using platform::FDYLogger;

std::span<const Accessor> ofSource() {
  using Self = QuiltMediaSource;
  static const Accessor accessors[] = {
      getter<Self>("cvUUID", "Its identity.",
                   [](const Self& source) {
                     FDYLogger::logDebug("Conveyor is getting source \"%@\" uuid", source.uuid());
                     return source.uuid();
                   }),
      getter<Self>("cvTitle", "Its title.",
                   [](const Self& source) {
                     FDYLogger::logDebug("Conveyor is getting source \"%@\" title \"%@\"", source.uuid(),
                                         source.title());
                     return source.title();
                   }),
      setter<Self>("cvSetTitle:", "Changes the title.",
                   [](Self& source, const Text& title) {
                     FDYLogger::logDebug("Conveyor is setting source \"%@\" title to \"%@\"", source.uuid(), title);
                     source.setTitle(title);
                   }),
      getter<Self>("cvDescription", "Its description.",
                   [](const Self& source) {
                     FDYLogger::logDebug("Conveyor is getting source \"%@\" description \"%@\"", source.uuid(),
                                         source.description());
                     return source.description();
                   }),
      setter<Self>(
          "cvSetDescription:", "Changes the description, until the record is read again: it keeps the title instead.",
          [](Self& source, const Text& description) {
            FDYLogger::logDebug("Conveyor is setting source \"%@\" description to \"%@\"", source.uuid(), description);
            source.setDescription(description);
          }),
      getter<Self>("cvTimeCode", "Seconds from the start of its item; 0 when it has no time code.",
                   [](const Self& source) {
                     const double timecode = source.timecode();
                     const double seconds = timecode == kNoTimecode ? 0.0 : timecode;
                     FDYLogger::logDebug("Conveyor is getting source \"%@\" timecode \"%@\"", source.uuid(), seconds);
                     return seconds;
                   }),
      getter<Self>("cvContentCategory", "\"Movie\", \"Audio\", \"Image\", \"Document\" or \"Web\".",
                   [](const Self& source) {
                     FDYLogger::logDebug("Conveyor is getting source \"%@\" content category \"%@\"", source.uuid(),
                                         source.contentCategory());
                     return source.contentCategory();
                   }),
      getter<Self>("cvMainDerivative", "Its best file, or none.",
                   [](const Self& source) {
                     const auto main = source.mainDerivative();
                     FDYLogger::logDebug("Conveyor is getting source \"%@\" main derivative \"%@\"", source.uuid(),
                                         identityOf(main));
                     return main;
                   }),
      getter<Self>("cvDerivativeCount", "How many files it has.",
                   [](const Self& source) {
                     const std::int32_t count = countOf(source.derivativeCount());
                     FDYLogger::logDebug("Conveyor is getting source \"%@\" derivative count \"%@\"", source.uuid(),
                                         count);
                     return count;
                   }),
      indexGetter<Self>("cvDerivativeAtIndex:", "The file at an index, or none.",
                        [](const Self& source, std::int64_t index) {
                          const auto derivative = source.derivativeAtIndex(positionOf(index));
                          FDYLogger::logDebug("Conveyor is getting source \"%@\" derivative at index \"%ld\": \"%@\"",
                                              source.uuid(), index, identityOf(derivative));
                          return derivative;
                        }),
      getter<Self>("cvPreviewCount", "How many stills it has: chapters, pages, or one.",
                   [](const Self& source) {
                     const std::int32_t count = countOf(source.previewCount());
                     FDYLogger::logDebug("Conveyor is getting source \"%@\" previews count \"%@\"", source.uuid(),
                                         count);
                     return count;
                   }),
      indexGetter<Self>("cvPreviewAtIndex:", "The still at an index, made when it is missing, or none.",
                        [](Self& source, std::int64_t index) {
                          const auto preview = source.previewAtIndex(positionOf(index));
                          FDYLogger::logDebug("Conveyor is getting source \"%@\" preview at index \"%ld\": \"%@\"",
                                              source.uuid(), index, identityOf(preview));
                          return preview;
                        }),
  };
  return accessors;
}

}  // namespace quilt::scripting::table
