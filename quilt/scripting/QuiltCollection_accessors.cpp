// SPDX-License-Identifier: Apache-2.0
#include "quilt/collections/QuiltCollection.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/scripting/AccessorTable.h"
#include "quilt/scripting/CreationDate.h"

namespace quilt::scripting::table {

using platform::FDYLogger;

std::span<const Accessor> ofCollection() {
  using Self = QuiltCollection;
  static const Accessor accessors[] = {
      getter<Self>("cvUUID", "Its identity.",
                   [](const Self& collection) {
                     FDYLogger::logDebug("Conveyor is getting collection \"%@\" uuid", collection.uuid());
                     return collection.uuid();
                   }),
      getter<Self>("cvTitle", "Its title.",
                   [](const Self& collection) {
                     FDYLogger::logDebug("Conveyor is getting collection \"%@\" title \"%@\"", collection.uuid(),
                                         collection.title());
                     return collection.title();
                   }),
      getter<Self>("cvDescription", "Its description.",
                   [](const Self& collection) {
                     FDYLogger::logDebug("Conveyor is getting collection \"%@\" description \"%@\"", collection.uuid(),
                                         collection.description());
                     return collection.description();
                   }),
      getter<Self>("cvAuthor", "Its author.",
                   [](const Self& collection) {
                     FDYLogger::logDebug("Conveyor is getting collection \"%@\" author \"%@\"", collection.uuid(),
                                         collection.author());
                     return collection.author();
                   }),
      getter<Self>("cvCopyright", "Its copyright notice.",
                   [](const Self& collection) {
                     FDYLogger::logDebug("Conveyor is getting collection \"%@\" copyright \"%@\"", collection.uuid(),
                                         collection.copyright());
                     return collection.copyright();
                   }),
      getter<Self>("cvKeywords", "Its keywords, as one text.",
                   [](const Self& collection) {
                     FDYLogger::logDebug("Conveyor is getting collection \"%@\" keywords \"%@\"", collection.uuid(),
                                         collection.keywords());
                     return collection.keywords();
                   }),
      getter<Self>("cvCreationDate", "The day on which it was made, in the user's language: \"March 5, 2024\".",
                   [](const Self& collection) { return creationDateOf(collection.uuid(), collection.creationDate()); }),
  };
  return accessors;
}

}  // namespace quilt::scripting::table
