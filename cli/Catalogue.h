// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "quilt/platform/base/Date.h"
#include "quilt/platform/base/PropertyList.h"
#include "quilt/platform/base/Result.h"

namespace quilt::cli {

using Path = std::filesystem::path;

/// The folder of a library that holds its collections.
inline constexpr const char* kCollectionsFolder = "Collections";

/// A library as it lies on disk, read without opening it in the model: opening tidies up, and a command that only reads
/// must change nothing. What cannot be read is listed with the reason.

struct ItemEntry {
  std::string uuid;
  std::string title;     ///< may be empty
  std::string category;  ///< may be empty
};

struct DocumentEntry {
  std::string uuid;  ///< of the record; the package's name when that cannot be read
  std::string title;
  std::string type;
  Path path;
  std::optional<platform::Date> created;
  std::vector<ItemEntry> items;
  std::optional<platform::Error> damage;  ///< why it does not open
};

struct CollectionEntry {
  std::string uuid;
  std::string title;
  Path path;
  std::optional<platform::Date> created;
  std::vector<DocumentEntry> documents;  ///< oldest first
  std::optional<platform::Error> damage;
};

struct Catalogue {
  Path library;
  std::vector<CollectionEntry> collections;  ///< by title
};

/// The library given, else that of the environment. Absolute. Throws a Failure when none can be told.
Path libraryPath(const std::optional<std::string>& given);

/// A library that is not there yet is empty. Throws a Failure when the folder cannot be read.
Catalogue readCatalogue(const Path& library);

/// One collection with its documents. Throws a Failure when the folder cannot be read.
CollectionEntry readCollectionEntry(const Path& folder);

/// One package, wherever it lies.
DocumentEntry readDocumentEntry(const Path& package);

/// The record of a document or collection, whole; an error when the model would refuse it.
platform::Result<platform::Dictionary> readDocumentRecord(const Path& package);
platform::Result<platform::Dictionary> readCollectionRecord(const Path& folder);

/// A path as typed, absolute and without "." and "..". Throws a Failure when it is empty.
Path absolutePath(const std::string& typed);

}  // namespace quilt::cli
