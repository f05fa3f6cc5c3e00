// SPDX-License-Identifier: Apache-2.0
#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/sources/DocumentSave.h"
#include "quilt/sources/ModelFiles.h"
#include "quilt/sources/QuiltMediaSource.h"
#include "quilt/sources/RepeatedReport.h"

namespace quilt {

using platform::FDYLogger;
using platform::integerPercentage;
using platform::percentageInStep;
using platform::report;

namespace {

constexpr const char* kNoSourceFolder = "Failed to create intermediate directories for source at path \"%@\": \"%@\"";
constexpr const char* kNoSamplesFolder =
    "Failed to create intermediate directories for audioSamples at path \"%@\": \"%@\"";

enum class Outcome { Done, Failed, Cancelled };

}  // namespace

bool QuiltMediaSource::isFlattened() const {
  {
    const auto guard = _derivatives.lock();
    if (_derivatives.count() == 0) return false;
    if (!_derivatives.walk([](const auto& derivative) { return derivative->isFlattened(); })) return false;
  }
  const auto samples = audioSamples();
  if (!samples) return false;
  const auto guard = samples->lock();
  return samples->isFlattened();
}

bool QuiltMediaSource::flattenCopy(bool copy, const ProgressionBlock& withProgressionBlock) {
  const SaveDeferral deferral;
  RepeatedReport progress(withProgressionBlock);
  FDYLogger::logDebug("Flattening source at path \"%@\"", path());

  const auto flattenChildren = [&]() -> Outcome {
    if (!document()) {
      FDYLogger::logDebug("Failed to flatten source because it is not attached to a valid owner");
      return Outcome::Failed;
    }
    if (path().empty()) {
      FDYLogger::logDebug("Failed to flatten source because it does not have a path");
      return Outcome::Failed;
    }
    renewLostPreviews(progress.continueBlock());
    const std::size_t total = derivativeCount() + _previews.count();
    if (!makeFolderInPackage(path(), document(), kNoSourceFolder) ||
        !makeFolderInPackage(derivativesFolderPath(), document(), kNoSourceFolder) ||
        !makeFolderInPackage(audioSamplesFolderPath(), document(), kNoSamplesFolder))
      return Outcome::Failed;

    std::size_t step = 0;
    const bool copied = _derivatives.walk([&](const auto& derivative) {
      const bool isLate = step >= total;
      const double start = integerPercentage(step++, total);
      if (derivative->isFlattened()) return true;
      const auto url = derivative->url();
      const bool done = derivative->flattenCopy(
          copy, [&](double percentage) { return progress.report(percentageInStep(start, percentage, total, isLate)); });
      if (!done)
        FDYLogger::logDebug("Failed to flatten source derivative \"%@\" during flattening at path \"%@\"", url, path());
      return done;
    });
    if (!copied) return Outcome::Failed;

    readPreviewsFromPackage();
    Outcome outcome = Outcome::Done;
    step = derivativeCount();
    std::vector<std::pair<std::size_t, platform::Error>> leftOut;
    _previews.walk([&](const auto& preview) {
      if (preview->isFlattened()) return true;
      const auto written = preview->writePicture();
      if (!written && cannotBeDrawn(written.error())) {
        leftOut.emplace_back(preview->index(), written.error());
      } else if (!written) {
        FDYLogger::logDebug("Failed to flatten source preview \"%@\" during flattening at path \"%@\"", preview->uuid(),
                            path());
        outcome = Outcome::Failed;
        return false;
      }
      if (progress.report(integerPercentage(step++, total))) return true;
      outcome = Outcome::Cancelled;
      return false;
    });
    for (const auto& [index, error] : leftOut) leaveOutPreview(index, error);
    // Made from what the package now has a copy of.
    _thumbnailImage.store(nullptr);
    _posterImage.store(nullptr);
    if (outcome != Outcome::Done || contentCategory() == kQuiltMediaContentCategoryDocument) return outcome;
    addAudioSamplesForMainDerivative(progress.continueBlock());
    return progress.wasCancelled() ? Outcome::Cancelled : Outcome::Done;
  };

  switch (flattenChildren()) {
    case Outcome::Failed:
      FDYLogger::logCritical("Failed to flatten source at path \"%@\"", path());
      return false;
    case Outcome::Cancelled:
      FDYLogger::logCritical("Flattening has been cancelled");
      return false;
    case Outcome::Done:
      break;
  }
  progress.report(100);
  return true;
}

bool QuiltMediaSource::finalizeWithProgressionBlock(const ProgressionBlock& withProgressionBlock) {
  FDYLogger::logDebug("Finalizing source at path \"%@\"", path());

  const auto finalize = [&] {
    if (!document()) {
      FDYLogger::logDebug("Failed to finalize source because it is not attached to a valid owner");
      return false;
    }
    if (path().empty()) {
      FDYLogger::logDebug("Failed to finalize source because it does not have a path");
      return false;
    }
    report(withProgressionBlock, 0);
    if (!makeFolderInPackage(path(), document(), kNoSourceFolder) ||
        !makeFolderInPackage(previewsFolderPath(), document(), kNoSourceFolder))
      return false;
    const bool previewed = previewWithProgressionBlock(
        [&](const auto& /*preview*/, double percentage) { return report(withProgressionBlock, percentage); });
    if (!previewed) FDYLogger::logDebug("Failed to generate previews for source during finalizing at \"%@\"", path());
    return previewed;
  };

  if (!finalize()) {
    FDYLogger::logCritical("Failed to finalize source at path \"%@\"", path());
    return false;
  }
  report(withProgressionBlock, 100);
  return true;
}

Path QuiltMediaSource::exportToPath(const Path& path, const std::string& withFormat,
                                    const ProgressionBlock& withProgressionBlock) {
  const auto derivative = bestDerivativeForFormat(withFormat);
  if (!derivative) return {};
  return derivative->exportToPath(path, [&](double percentage) { return report(withProgressionBlock, percentage); });
}

void QuiltMediaSource::reloadWithFileAtPath(const Path& path, const ProgressionBlock& withProgressionBlock) {
  RepeatedReport progress(withProgressionBlock);
  progress.report(0);
  removeAllDerivatives();
  removeAllPreviews();
  removeAllAudioSamples();
  invalidateThumbnailImage();
  invalidatePosterImage();
  invalidateCaches();
  progress.report(10);
  const auto derivative = QuiltMediaDerivative::initWithURL(Url::fileUrl(path));
  progress.report(20);
  if (derivative) {
    addDerivative(derivative);
    derivative->flattenCopy(
        /*copy=*/true, [&](double percentage) { return progress.report(percentage * 8.0 / 10.0 + 20.0); });
    if (contentCategory() != kQuiltMediaContentCategoryDocument)
      addAudioSamplesForMainDerivative(progress.continueBlock());
  }
  if (const auto owner = document()) owner->update();
  progress.report(100);
}

}  // namespace quilt
