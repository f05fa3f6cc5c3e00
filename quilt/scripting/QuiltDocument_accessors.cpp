// SPDX-License-Identifier: Apache-2.0
#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/scripting/AccessorTable.h"
#include "quilt/scripting/CreationDate.h"
#include "quilt/sources/ModelFiles.h"

namespace quilt::scripting::table {

using platform::FDYLogger;

namespace {

/// What a page shows where a description will be; never stored.
constexpr const char* kPlaceholder =
    "Lorem ipsum dolor sit amet, consectetur adipiscing elit. In id laoreet arcu. Sed luctus velit ac lorem tincidunt "
    "tincidunt. Pellentesque vitae diam vitae leo cursus sodales. Sed non tortor eget libero malesuada elementum eu "
    "non elit. Quisque malesuada pellentesque porttitor.";

std::string orElse(const Text& text, const std::string& fallback) { return text && !text->empty() ? *text : fallback; }

}  // namespace

std::span<const Accessor> ofDocument() {
  using Self = QuiltDocument;
  static const Accessor accessors[] = {
      getter<Self>("cvUUID", "Its identity.",
                   [](const Self& document) {
                     FDYLogger::logDebug("Conveyor is getting document \"%@\" uuid", document.uuid());
                     return document.uuid();
                   }),
      getterWithStandIn<Self>(
          "cvTitle", "Its title; a localised \"Untitled Episode\" when it has none.",
          [](const Self& document) {
            FDYLogger::logDebug("Conveyor is getting document \"%@\" title \"%@\"", document.uuid(), document.title());
            return orElse(document.title(), untitledEpisode());
          },
          [](const Self& document) { return document.title(); }),
      setter<Self>("cvSetTitle:", "Changes the title.",
                   [](Self& document, const Text& title) {
                     FDYLogger::logDebug("Conveyor is setting document \"%@\" title to \"%@\"", document.uuid(), title);
                     document.setTitle(title);
                   }),
      getterWithStandIn<Self>(
          "cvDescription", "Its description; a placeholder text when it has none.",
          [](const Self& document) {
            FDYLogger::logDebug("Conveyor is getting document \"%@\" description \"%@\"", document.uuid(),
                                document.description());
            return orElse(document.description(), kPlaceholder);
          },
          [](const Self& document) { return document.description(); }),
      setter<Self>("cvSetDescription:", "Changes the description.",
                   [](Self& document, const Text& description) {
                     FDYLogger::logDebug("Conveyor is setting document \"%@\" description to \"%@\"", document.uuid(),
                                         description);
                     document.setDescription(description);
                   }),
      getter<Self>("cvAuthor", "Its author.",
                   [](const Self& document) {
                     FDYLogger::logDebug("Conveyor is getting document \"%@\" author \"%@\"", document.uuid(),
                                         document.author());
                     return document.author();
                   }),
      setter<Self>("cvSetAuthor:", "Changes the author.",
                   [](Self& document, const Text& author) {
                     FDYLogger::logDebug("Conveyor is setting document \"%@\" author to \"%@\"", document.uuid(),
                                         author);
                     document.setAuthor(author);
                   }),
      getter<Self>("cvCreationDate", "The day on which it was made, in the user's language: \"March 5, 2024\".",
                   [](const Self& document) { return creationDateOf(document.uuid(), document.creationDate()); }),
      getter<Self>("cvMediaCount", "How many items it has.",
                   [](const Self& document) {
                     const std::int32_t count = countOf(document.mediaCount());
                     FDYLogger::logDebug("Conveyor is getting document \"%@\" media count \"%@\"", document.uuid(),
                                         count);
                     return count;
                   }),
      indexGetter<Self>("cvMediaAtIndex:", "The item at an index, or none.",
                        [](const Self& document, std::int64_t index) {
                          const auto item = document.mediaAtIndex(positionOf(index));
                          FDYLogger::logDebug("Conveyor is getting document \"%@\" media \"%@\" at index \"%ld\"",
                                              document.uuid(), identityOf(item), index);
                          return item;
                        }),
  };
  return accessors;
}

}  // namespace quilt::scripting::table
