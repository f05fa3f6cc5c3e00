// SPDX-License-Identifier: Apache-2.0
#include "cli/Catalogue.h"

#include <pwd.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <tuple>

#include "cli/Failure.h"
#include "cli/Text.h"
#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::cli {

namespace {

using platform::Array;
using platform::Dictionary;
using platform::Error;
using platform::ErrorKind;
using platform::FileKind;
using platform::Result;
using platform::services;

constexpr const char* kCollectionFilename = "collection.plist";
constexpr const char* kFormatVersion = "1.0";

const char* environment(const char* name) {
  const char* value = std::getenv(name);
  return value && *value ? value : nullptr;
}

Path homeFolder() {
  if (const char* home = environment("HOME")) return home;
  const passwd* user = getpwuid(getuid());
  return user && user->pw_dir ? Path(user->pw_dir) : Path();
}

// The names in a folder that the library looks at.
std::vector<std::string> visibleNames(const Path& folder) {
  Result<std::vector<std::string>> names = services().files->contentsOfDirectoryAtPath(folder);
  if (!names) throw Failure("Cannot read the folder " + inQuotes(folder.native()), names.error());
  std::erase_if(*names, [](const std::string& name) { return name.starts_with('.'); });
  std::sort(names->begin(), names->end());
  return *std::move(names);
}

bool isFolder(const Path& path) { return services().files->kindOfItemAtPath(path) == FileKind::Folder; }

ItemEntry itemEntry(const Dictionary& record) {
  return {record.string("UUID").value_or(""), record.string("Title").value_or(""),
          record.string("ContentCategory").value_or("")};
}

}  // namespace

CollectionEntry readCollectionEntry(const Path& folder) {
  CollectionEntry entry;
  entry.path = folder;
  entry.uuid = folder.filename().native();
  if (const Result<Dictionary> record = readCollectionRecord(folder)) {
    entry.uuid = record->string("UUID").value_or(entry.uuid);
    entry.title = record->string("Title").value_or("");
    entry.created = record->date("CreationDate");
  } else {
    entry.damage = record.error();
  }
  for (const std::string& name : visibleNames(folder)) {
    const Path path = folder / name;
    if (!isFolder(path)) continue;
    // Other folders are nobody's documents.
    if (path.extension() != std::string(".") + kQuiltDocumentExtension &&
        !services().files->fileExistsAtPath(path / kQuiltDocumentPropertiesFilename))
      continue;
    entry.documents.push_back(readDocumentEntry(path));
  }
  std::stable_sort(entry.documents.begin(), entry.documents.end(), [](const auto& a, const auto& b) {
    return std::tie(a.created, a.title, a.uuid) < std::tie(b.created, b.title, b.uuid);
  });
  return entry;
}

Path absolutePath(const std::string& typed) {
  if (typed.empty()) throw Failure(ExitCode::NotFound, "An empty name stands for no file");
  std::error_code error;
  Path path = std::filesystem::absolute(typed, error);
  if (error) throw Failure(ExitCode::InputOutput, "The working folder cannot be found");
  path = path.lexically_normal();
  return path.has_filename() || path == path.root_path() ? path : path.parent_path();
}

Path libraryPath(const std::optional<std::string>& given) {
  if (given) return absolutePath(*given);
  if (const char* library = environment("QUILT_LIBRARY")) return absolutePath(library);
  const char* data = environment("XDG_DATA_HOME");
  if (data && Path(data).is_absolute()) return absolutePath(data) / "quilt" / "Library";
  const Path home = homeFolder();
  if (home.empty()) throw Failure(ExitCode::Usage, "There is no home folder; name the library with --library DIR");
  return absolutePath(home) / ".local" / "share" / "quilt" / "Library";
}

Result<Dictionary> readDocumentRecord(const Path& package) {
  const Path file = package / kQuiltDocumentPropertiesFilename;
  if (!services().files->fileExistsAtPath(file)) return Error{ErrorKind::Damaged, "It has no properties file", file};
  Result<Dictionary> record = services().propertyLists->readDictionary(file);
  if (!record) return record;
  const std::optional<std::string> version = record->string("Version");
  if (version != kFormatVersion)
    return Error{
        ErrorKind::Unsupported,
        version ? "Its format version is " + inQuotes(*version) + ", and not \"1.0\"" : "It has no format version",
        file};
  if (record->contains("Media") && !record->array("Media"))
    return Error{ErrorKind::Damaged, "Its media list is no list", file};
  return record;
}

Result<Dictionary> readCollectionRecord(const Path& folder) {
  const Path file = folder / kCollectionFilename;
  if (!services().files->fileExistsAtPath(file)) return Error{ErrorKind::Damaged, "It has no collection file", file};
  return services().propertyLists->readDictionary(file);
}

DocumentEntry readDocumentEntry(const Path& package) {
  DocumentEntry entry;
  entry.path = package;
  entry.uuid = package.stem().native();
  const Result<Dictionary> record = readDocumentRecord(package);
  if (!record) {
    entry.damage = record.error();
    return entry;
  }
  entry.uuid = record->string("UUID").value_or(entry.uuid);
  entry.title = record->string("Title").value_or("");
  entry.type = record->string("Type").value_or("");
  entry.created = record->date("CreationDate");
  if (const Array* media = record->array("Media"))
    for (const platform::PropertyList& item : *media)
      if (const auto* dictionary = item.as<Dictionary>()) entry.items.push_back(itemEntry(*dictionary));
  return entry;
}

Catalogue readCatalogue(const Path& library) {
  Catalogue catalogue{library, {}};
  const FileKind kind = services().files->kindOfItemAtPath(library);
  if (kind == FileKind::File || kind == FileKind::Other)
    throw Failure(ExitCode::Invalid, "The library " + inQuotes(library.native()) + " is a file, not a folder", library);
  const Path folder = library / kCollectionsFolder;
  if (!services().files->fileExistsAtPath(folder)) return catalogue;
  for (const std::string& name : visibleNames(folder))
    if (isFolder(folder / name)) catalogue.collections.push_back(readCollectionEntry(folder / name));
  std::stable_sort(catalogue.collections.begin(), catalogue.collections.end(), [](const auto& a, const auto& b) {
    return std::tie(a.title, a.created, a.uuid) < std::tie(b.title, b.created, b.uuid);
  });
  return catalogue;
}

}  // namespace quilt::cli
