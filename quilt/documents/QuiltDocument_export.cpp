// SPDX-License-Identifier: Apache-2.0
#include <algorithm>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/CleanUp.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/ModelFiles.h"

namespace quilt {

using platform::FDYLogger;
using platform::integerPercentage;
using platform::percentageInStep;
using platform::report;
using platform::services;

namespace {

constexpr const char* kZippedExtension = "qpk.zip";

// Where each stage's 0 to 100 lies in the export's. The numbers are those of single-precision sixths.
constexpr double kBandWidth = 16.66666603088379;
constexpr double kConvertBand = 16.666667938232422;
constexpr double kFinalizeBand = 33.333335876464844;
constexpr double kCopyBand = 50.0;  // merging and flattening the copy share it
constexpr double kFinalizeCopyBand = 66.66667175292969;
constexpr double kZipBand = 83.33332824707031;

ProgressionBlock band(const ProgressionBlock& block, double start) {
  return [&block, start](double percentage) { return report(block, percentage / 100 * kBandWidth + start); };
}

/// A hidden name in the folder that nothing has yet.
Path temporaryPath(const Path& folder, const char* extension) {
  Path path;
  do {
    path = folder / platform::withExtension("." + platform::generateUUID(), extension);
  } while (services().files->fileExistsAtPath(path));
  return path;
}

struct Moved {
  Path path;                       ///< the last name tried
  platform::Result<void> outcome;  ///< whether the item is there now
};

/// Moves an item to folder/base.extension, or to the first of base-2, base-3 … that is free.
Moved moveToUniqueName(const Path& item, const Path& folder, const std::string& base, const char* extension) {
  for (int counter = 1;; ++counter) {
    const std::string name = counter == 1 ? base : platform::formatMessage("%@-%ld", {base, counter});
    const Path path = folder / platform::withExtension(name, extension);
    if (services().files->fileExistsAtPath(path)) continue;
    auto moved = services().files->moveItem(item, path);
    // Somebody was faster: that name is theirs.
    if (!moved && moved.error().kind == platform::ErrorKind::AlreadyExists) continue;
    return {path, std::move(moved)};
  }
}

}  // namespace

bool QuiltDocument::isFlattened() const {
  const auto guard = _media.lock();
  return mediaCount() > 0 && _media.walk([](const auto& item) { return item->isFlattened(); });
}

std::vector<std::string> QuiltDocument::availableFormats() const {
  const auto first = mediaAtIndex(0);
  std::vector<std::string> formats = first ? first->availableFormats() : std::vector<std::string>();
  performBlockOnMedia([&formats](const auto& item) {
    const std::vector<std::string> offered = item->availableFormats();
    std::erase_if(formats, [&offered](const std::string& format) {
      return std::find(offered.begin(), offered.end(), format) == offered.end();
    });
    return true;
  });
  return formats;
}

bool QuiltDocument::convertToFormat(const std::string& format, const ProgressionBlock& withProgressionBlock,
                                    const std::vector<std::string>& followedBy) {
  const std::size_t total = mediaCount();
  std::size_t position = 0;
  return performBlockOnMedia([&](const auto& item) {
    const bool isLate = position >= total;
    const float start = isLate ? 100.0F : static_cast<float>(position) * 100.0F / static_cast<float>(total);
    ++position;
    const auto intoStep = [&](double percentage) {
      return report(withProgressionBlock, percentageInStep(static_cast<double>(start), percentage, total, isLate));
    };
    return item->convertToFormat(format, intoStep, followedBy);
  });
}

bool QuiltDocument::flattenWithProgressionBlock(const ProgressionBlock& withProgressionBlock) {
  constexpr const char* busy = "Failed to flattening document at path \"%@\": \"Document is already being processed\"";
  if (isBusy()) {
    FDYLogger::logCritical(busy, path());
    return false;
  }
  report(withProgressionBlock, 0);
  const std::optional<bool> flattened = whileProcessing([&] { return flattenAndSave(withProgressionBlock); });
  if (!flattened) FDYLogger::logCritical(busy, path());
  return flattened.value_or(false);
}

bool QuiltDocument::flattenAndSave(const ProgressionBlock& block) {
  Outcome outcome = flattenMedia(block);
  if (outcome == Outcome::Done && !writeProperties()) {
    FDYLogger::logDebug("Failed to update document at path \"%@\": \"Properties cannot be written\"", propertiesPath());
    outcome = Outcome::Failed;
  }
  switch (outcome) {
    case Outcome::Done:
      report(block, 100);
      return true;
    case Outcome::Failed:
      FDYLogger::logCritical("Failed to flatten document at path \"%@\"", path());
      return false;
    case Outcome::Cancelled:
      FDYLogger::logCritical("Flattening document at path \"%@\" has been cancelled", path());
      return false;
  }
  return false;
}

QuiltDocument::Outcome QuiltDocument::flattenMedia(const ProgressionBlock& block) {
  const Path folder = mediaFolderPath();
  if (const auto created = createDirectoryInPackage(folder, shared(this)); !created) {
    FDYLogger::logDebug("Failed to create intermediate directories for document at path \"%@\": \"%@\"", folder,
                        created.error());
    return Outcome::Failed;
  }
  const auto guard = _media.lock();
  const std::size_t total = mediaCount();
  Outcome outcome = Outcome::Done;
  std::size_t position = 0;
  _media.walk([&](const auto& item) {
    const bool isLate = position >= total;
    const double start = integerPercentage(position++, total);
    if (!report(block, start)) {
      outcome = Outcome::Cancelled;
      return false;
    }
    if (item->isFlattened()) return true;
    const bool done = item->flattenWithProgressionBlock(
        [&](double percentage) { return report(block, percentageInStep(start, percentage, total, isLate)); });
    if (!done) outcome = Outcome::Failed;
    return done;
  });
  return outcome;
}

Path QuiltDocument::exportToPath(const Path& path, bool zipped, const std::vector<std::string>& usingFormats,
                                 const ProgressionBlock& withProgressionBlock) {
  const bool isUntitled = !title();
  return platform::withCleanUp([&] { return exportCopy(path, zipped, usingFormats, withProgressionBlock); },
                               [&] {
                                 if (isUntitled) forgetFallBackTitle();
                               });
}

void QuiltDocument::forgetFallBackTitle() {
  if (isBusy()) return;
  const platform::Uninterrupted whole;
  const auto lock = _media.lock();  // another thread's save waits: it would give the title again
  if (isProcessing()) return;
  withoutSaving([this] {
    if (title() == untitledEpisode()) setTitle(std::nullopt);
  });
}

Path QuiltDocument::exportCopy(const Path& path, bool zipped, const std::vector<std::string>& usingFormats,
                               const ProgressionBlock& block) {
  report(block, 0);
  const std::string name = displayTitle();
  const std::string base = fileNameForTitle(name);
  // What a killed export left goes, and nobody takes for such what this one makes.
  sweepLevel(path);
  const auto hold = services().files->holdFolder(path);
  const Path temporary = temporaryPath(path, kQuiltDocumentExtension);
  const platform::OnException removeTemporary([&] { (void)services().files->removeItem(temporary, path); });
  const auto cleanUp = [&](const Path& final) {
    (void)services().files->removeItem(temporary, path);
    if (!final.empty()) (void)services().files->removeItem(final, path);
    return Path();
  };

  if (!isFlattened() && !flattenWithProgressionBlock(band(block, 0))) return cleanUp({});
  const double formats = static_cast<double>(usingFormats.size());
  for (auto format = usingFormats.begin(); format != usingFormats.end(); ++format) {
    // Each format runs through the same band again.
    const auto intoBand = [&](double percentage) { return report(block, percentage / formats / 6.0 + kConvertBand); };
    if (!convertToFormat(*format, intoBand, {std::next(format), usingFormats.end()})) return cleanUp({});
  }
  if (!finalizeWithProgressionBlock(band(block, kFinalizeBand))) return cleanUp({});

  {
    const auto copy = initWithPath(temporary);
    if (!copy) {
      FDYLogger::logWarning("Failed to create document \"%@\" at temporary path \"%@\"", name, temporary);
      return cleanUp({});
    }
    if (!mergeIntoDocument(copy, usingFormats, band(block, kCopyBand))) return cleanUp({});
    if (!copy->isFlattened() && !copy->flattenWithProgressionBlock(band(block, kCopyBand))) return cleanUp({});
    if (!copy->finalizeWithProgressionBlock(band(block, kFinalizeCopyBand))) return cleanUp({});
  }

  if (!zipped) {
    const Moved moved = moveToUniqueName(temporary, path, base, kQuiltDocumentExtension);
    if (!moved.outcome) {
      FDYLogger::logWarning("Failed to move temporary document copy \"%@\" from path \"%@\" to path \"%@\": \"%@\"",
                            name, temporary, moved.path, moved.outcome.error());
      return cleanUp(moved.path);
    }
    report(block, 100);
    return moved.path;
  }

  const Path archive = temporaryPath(path, kZippedExtension);
  const platform::OnException removeArchive([&] { (void)services().files->removeItem(archive, path); });
  // Unpacked, the package must not be hidden: inside the archive it has its final name.
  const std::string packageName = platform::withExtension(base, kQuiltDocumentExtension);
  platform::CarriedException thrown;
  const auto packed = services().archive->archiveFile(temporary, packageName, archive, [&](double percentage) {
    return thrown.ask([&] { return report(block, percentage / 100 * kBandWidth + kZipBand); });
  });
  thrown.rethrow();
  if (!packed) {
    FDYLogger::logWarning("Failed to archive temporary document copy of \"%@\" at path \"%@\" to path \"%@\"", name,
                          temporary, archive);
    return cleanUp({});
  }
  if (const auto removed = services().files->removeItem(temporary, path); !removed)
    // The path is deliberately absent.
    FDYLogger::logWarning("Failed to remove temporary document copy \"%@\" at path \"%@\": \"%@\"", name, std::nullopt,
                          removed.error());
  const Moved moved = moveToUniqueName(archive, path, base, kZippedExtension);
  if (!moved.outcome) {
    FDYLogger::logWarning("Failed to move temporary zipped document \"%@\" from path \"%@\" to path \"%@\": \"%@\"",
                          name, archive, moved.path, moved.outcome.error());
    return cleanUp(moved.path);
  }
  report(block, 100);
  return moved.path;
}

}  // namespace quilt
