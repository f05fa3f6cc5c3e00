// SPDX-License-Identifier: Apache-2.0
#include <utility>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/CleanUp.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/base/TemporaryNames.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/ModelFiles.h"
#include "quilt/sources/QuiltMediaDerivative.h"
#include "quilt/sources/QuiltMediaSource.h"
#include "quilt/sources/RecordNames.h"

namespace quilt {

using platform::FDYLogger;
using platform::services;

namespace {

constexpr const char* kCannotBeSized = "Source derivative at path \"%@\" cannot be sized: \"%@\"";
constexpr const char* kCopyFailed = "Copy failed with error code (%d)";

bool copyInto(const Path& source, const Path& destination, const ProgressionBlock& block) {
  const auto attributes = services().files->attributesOfItemAtPath(source);
  if (!attributes) {
    FDYLogger::logWarning(kCannotBeSized, source, attributes.error());
    return false;
  }
  int result = copyReportingPercentage(source, destination, attributes->size, block);
  if (result >= 0) {
    // The next save of the document names the copy; from then on the original may go.
    result = services().files->syncItem(destination);
    if (result >= 0) return true;
    (void)services().files->removeItem(destination, destination.parent_path());
  }
  FDYLogger::logDebug(kCopyFailed, result);
  return false;
}

bool moveInto(const Url& source, const Url& destination) {
  const auto moved = services().files->moveItem(source.relativePath(), destination.relativePath());
  if (moved) return true;
  FDYLogger::logDebug("Failed to flatten source derivative moving \"%@\" to \"%@\": \"%@\"", source, destination,
                      moved.error());
  return false;
}

bool prepareFolder(const Path& folder, const std::shared_ptr<QuiltDocument>& document) {
  const auto created = createDirectoryInPackage(folder, document);
  if (created) return true;
  FDYLogger::logDebug("Failed to create intermediate directories for media derivative destination \"%@\": \"%@\"",
                      folder, created.error());
  return false;
}

/// The names under which a file is exported: folder/title.ext, then folder/"Title 2".ext and so on. The counted names
/// use the title as it is, so a title with "/" names a file in a subfolder.
class ExportNames {
 public:
  ExportNames(Path folder, std::string title, std::string extension)
      : _folder(std::move(folder)),
        _title(std::move(title)),
        _extension(std::move(extension)),
        _current(_folder / platform::withExtension(fileNameForTitle(_title), _extension)) {}

  /// The next one from here on that nothing has; empty when it would leave the folder.
  Path nextFree() {
    while (services().files->fileExistsAtPath(_current)) {
      const std::string name = _title + " " + std::to_string(_counter++);
      _current = Path(_folder.native() + "/" + platform::withExtension(name, _extension)).lexically_normal();
      const Path relative = _current.lexically_relative(_folder.lexically_normal());
      if (relative.empty() || *relative.begin() == "..") return {};
    }
    return _current;
  }

 private:
  const Path _folder;
  const std::string _title;
  const std::string _extension;
  Path _current;
  int _counter = 2;
};

/// Puts the hidden file under the first name that is free, with its name and content on the disk. Two that look for one
/// at once both find one: a rename never replaces. Empty when there is none, or none can be taken.
Path moveToFreeName(const Path& hidden, ExportNames& names) {
  for (;;) {
    const Path destination = names.nextFree();
    if (destination.empty()) return {};
    // For a counted name in a subfolder. Where there can be none, the move fails and says so.
    (void)createDirectoryIfMissing(destination.parent_path());
    const auto moved = services().files->moveItem(hidden, destination);
    if (moved) return destination;
    if (moved.error().kind == platform::ErrorKind::AlreadyExists) continue;
    FDYLogger::logDebug("Failed to move exported file \"%@\" to \"%@\": \"%@\"", hidden, destination, moved.error());
    return {};
  }
}

}  // namespace

bool QuiltMediaDerivative::flattenCopy(bool copy, const ProgressionBlock& withProgressionBlock) {
  if (isFlattened()) return true;
  const auto source = sourceOwner();
  const auto document = documentOf(source);
  if (!document) {
    FDYLogger::logCritical("Failed to flatten source derivative because it is not attached to a valid owner");
    return false;
  }
  const std::optional<Url> from = url();
  if (!from || !from->isFileUrl()) return true;

  const Path file = from->relativePath();
  const Path folder = source->derivativesFolderPath();
  const Url to = Url::fileUrl(folder / platform::withExtension(uuid(), platform::pathExtension(file)));
  const bool isPrepared = prepareFolder(folder, document);
  if (isPrepared) document->willMakeItem(to.relativePath());
  const bool done =
      isPrepared && (copy ? copyInto(file, to.relativePath(), withProgressionBlock) : moveInto(*from, to));
  if (!done) {
    FDYLogger::logCritical("Failed to flatten source derivative \"%@\" at \"%@\"", *from, to);
    return false;
  }
  {
    const platform::Uninterrupted whole;
    setUrl(to);
    setIsFlattened(true);
  }
  // Should the document's flatten not come to its end, its record names the file all the same.
  if (document->isBusy()) document->noteUnsavedChange();
  platform::report(withProgressionBlock, 100);
  return true;
}

Path QuiltMediaDerivative::exportToPath(const Path& path, const ProgressionBlock& withProgressionBlock) {
  const auto document = documentOf(sourceOwner());
  const std::optional<Url> from = url();
  if (!document || !from || !from->isFileUrl()) return {};

  const Path file = from->relativePath();
  const Text title = document->title();
  ExportNames names(path, title && !title->empty() ? *title : untitledEpisode(), platform::pathExtension(file));
  const Path wanted = names.nextFree();
  if (wanted.empty()) return {};

  const auto attributes = services().files->attributesOfItemAtPath(file);
  if (!attributes) {
    FDYLogger::logWarning(kCannotBeSized, file, attributes.error());
    return {};
  }
  sweepLevel(path);
  const auto hold = services().files->holdFolder(path);
  const Path hidden = path / platform::hiddenNameBeside(wanted.filename().native());
  const int result = copyReportingPercentage(file, hidden, attributes->size, withProgressionBlock);
  const int synced = result < 0 ? result : services().files->syncItem(hidden);
  if (synced < 0) FDYLogger::logDebug(kCopyFailed, synced);
  const Path destination = synced < 0 ? Path() : moveToFreeName(hidden, names);
  if (destination.empty()) {
    (void)services().files->removeItem(hidden, path);
    return {};
  }
  platform::report(withProgressionBlock, 100);
  return destination;
}

}  // namespace quilt
