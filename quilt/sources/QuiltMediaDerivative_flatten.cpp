// SPDX-License-Identifier: Apache-2.0
#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/CleanUp.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/Paths.h"
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

/// folder/title.ext, or, while something is there, folder/"Title 2".ext and so on. The counted names use the title as
/// it is, so a title with "/" names a file in a subfolder. Empty when that would leave the folder.
Path uniqueExportPath(const Path& folder, const std::string& title, const std::string& extension) {
  Path candidate = folder / platform::withExtension(fileNameForTitle(title), extension);
  for (int counter = 2; services().files->fileExistsAtPath(candidate); ++counter) {
    const std::string name = title + " " + std::to_string(counter);
    candidate = Path(folder.native() + "/" + platform::withExtension(name, extension)).lexically_normal();
    const Path relative = candidate.lexically_relative(folder.lexically_normal());
    if (relative.empty() || *relative.begin() == "..") return {};
  }
  return candidate;
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
  const bool done = prepareFolder(folder, document) &&
                    (copy ? copyInto(file, to.relativePath(), withProgressionBlock) : moveInto(*from, to));
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
  const Path destination =
      uniqueExportPath(path, title && !title->empty() ? *title : untitledEpisode(), platform::pathExtension(file));
  if (destination.empty()) return {};

  const auto attributes = services().files->attributesOfItemAtPath(file);
  if (!attributes) {
    FDYLogger::logWarning(kCannotBeSized, file, attributes.error());
    return {};
  }
  // For a counted name in a subfolder. Where there can be none, the copy fails and says so.
  (void)createDirectoryIfMissing(destination.parent_path());
  const int result = copyReportingPercentage(file, destination, attributes->size, withProgressionBlock);
  if (result < 0) {
    FDYLogger::logDebug(kCopyFailed, result);
    // The copy removes what it wrote; this takes away what an interrupted one may have left.
    (void)services().files->removeItem(destination, path);
    return {};
  }
  platform::report(withProgressionBlock, 100);
  return destination;
}

}  // namespace quilt
