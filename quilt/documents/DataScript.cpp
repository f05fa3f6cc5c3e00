// SPDX-License-Identifier: Apache-2.0
#include "quilt/documents/DataScript.h"

#include "quilt/collections/QuiltCollection.h"
#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/ModelFiles.h"

namespace quilt {

using platform::services;

namespace {

/// What the template learns of the collection: the pairs up to the first that has no value.
Dictionary ownerRecord(const std::shared_ptr<QuiltCollection>& collection) {
  Dictionary record;
  if (!collection) return record;
  record.append("UUID", collection->uuid());
  const Text title = collection->title();
  if (!title) return record;
  record.append("Title", *title);
  const Text description = collection->description();
  if (!description) return record;
  record.append("Description", *description);
  if (const auto date = collection->creationDate()) record.append("CreationDate", *date);
  return record;
}

}  // namespace

std::string dataScript(QuiltDocument& document, bool hasPoster) {
  const OnlyUsableEntries ofThePage;
  Dictionary data = document.dictionary();
  data.remove("ThemePath");
  if (hasPoster)
    data.set("PosterImagePath", platform::pathRelativeTo(document.posterImagePath(), document.path()).native());
  data.set("CollectionOwner", ownerRecord(document.collectionOwner()));
  return platform::formatMessage("var appData = %@;", {services().json->toJSON(data)});
}

platform::Result<void> writeDataScript(QuiltDocument& document, const std::string& script) {
  const auto self = std::static_pointer_cast<QuiltDocument>(document.shared_from_this());
  const Path file = document.dataControllerPath();
  if (auto made = createDirectoryInPackage(file.parent_path(), self); !made) return made;
  return services().files->writeAtomically(file, script);
}

platform::Result<void> refreshFinalizedTexts(QuiltDocument& document) {
  if (!services().files->fileExistsAtPath(document.dataControllerPath())) return {};
  const bool hasPoster = document.posterImage() != nullptr;
  if (auto written = writeDataScript(document, dataScript(document, hasPoster)); !written) return written;
  return services().propertyLists->writeDictionary(document.jukeboxMetadata(), document.jukeboxMetadataPath());
}

}  // namespace quilt
