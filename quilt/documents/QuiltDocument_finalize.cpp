// SPDX-License-Identifier: Apache-2.0
#include "quilt/documents/DataScript.h"
#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt {

using platform::FDYLogger;
using platform::integerPercentage;
using platform::percentageInStep;
using platform::report;
using platform::services;

bool QuiltDocument::finalizeWithProgressionBlock(const ProgressionBlock& withProgressionBlock) {
  constexpr const char* busy = "Failed to finalize document at path \"%@\": \"Document is already being processed\"";
  if (isBusy()) {
    FDYLogger::logCritical(busy, path());
    return false;
  }
  report(withProgressionBlock, 0);
  const std::optional<bool> finalized = whileProcessing([&] { return finalizeAndSave(withProgressionBlock); });
  if (!finalized) FDYLogger::logCritical(busy, path());
  return finalized.value_or(false);
}

bool QuiltDocument::finalizeAndSave(const ProgressionBlock& block) {
  Outcome outcome = finalizeMedia(block);
  if (outcome == Outcome::Done && type() == kQuiltDocumentTypeInteractive && !finalizeInteractive())
    outcome = Outcome::Failed;
  if (outcome == Outcome::Done) {
    glanceUpdate();
    if (!writeProperties()) {
      FDYLogger::logDebug("Failed to update document at path \"%@\": \"Properties cannot be written\"",
                          propertiesPath());
      outcome = Outcome::Failed;
    }
  }

  switch (outcome) {
    case Outcome::Done:
      report(block, 100);
      return true;
    case Outcome::Failed:
      FDYLogger::logCritical("Failed to finalize document at path \"%@\"", path());
      return false;
    case Outcome::Cancelled:
      FDYLogger::logCritical("Finalizing document at path \"%@\" has been cancelled", path());
      return false;
  }
  return false;
}

QuiltDocument::Outcome QuiltDocument::finalizeMedia(const ProgressionBlock& block) {
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
    const bool done = item->finalizeWithProgressionBlock(
        [&](double percentage) { return report(block, percentageInStep(start, percentage, total, isLate)); });
    if (done) {
      item->flattenPreviews();
      return true;
    }
    FDYLogger::logDebug("Failed to finalize media \"%@\" during finalizing document at path \"%@\"", item->uuid(),
                        path());
    outcome = Outcome::Failed;
    return false;
  });
  return outcome;
}

bool QuiltDocument::finalizeInteractive() {
  const auto chosen = theme();
  if (!chosen) {
    FDYLogger::logCritical("Failed to finalize document at path \"%@\": \"No valid theme found\"", path());
    return false;
  }
  // A template that is not there takes nothing away: applyTheme() begins by removing the player that works.
  const Path folder = chosen->templatePath();
  if (const auto entries = services().files->contentsOfDirectoryAtPath(folder); !entries) {
    FDYLogger::logDebug("Failed to get content of theme at path \"%@\": \"%@\"", folder, entries.error());
    FDYLogger::logCritical("Failed to apply theme \"%@\" on document at path \"%@\": \"%@\"", chosen->localizedName(),
                           path(), entries.error());
    return false;
  }
  if (!applyTheme(chosen, [](double) { return true; })) return false;

  const auto poster = posterImage();
  const std::string script = dataScript(*this, poster != nullptr);
  if (poster && !poster->saveAsPNGAtURL(Url::fileUrl(jukeboxArtworkPath()))) {
    FDYLogger::logDebug("Failed to finalize document at path \"%@\": Failed to copy Jukebox Artwork into place.",
                        path());
    return false;
  }
  if (const auto written = writeDataScript(*this, script); !written) {
    FDYLogger::logDebug("Failed to finalize document at path \"%@\" with data controller: \"%@\"", path(),
                        written.error());
    return false;
  }
  if (!services().propertyLists->writeDictionary(jukeboxMetadata(), jukeboxMetadataPath())) {
    FDYLogger::logDebug("Failed to finalize document at path \"%@\" with Jukebox metadata", path());
    return false;
  }
  return true;
}

}  // namespace quilt
