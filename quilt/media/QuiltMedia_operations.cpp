// SPDX-License-Identifier: Apache-2.0
#include <algorithm>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/media/QuiltMedia.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/sources/DocumentSave.h"
#include "quilt/sources/ModelFiles.h"

namespace quilt {

using platform::FDYLogger;
using platform::report;

namespace {

constexpr const char* kNoMediaFolder = "Failed to create intermediate directories for media at path \"%@\": \"%@\"";
constexpr const char* kNoSourcesFolder = "Failed to create intermediate directories for sources at path \"%@\": \"%@\"";
constexpr const char* kNoExtrasFolder = "Failed to create intermediate directories for extras at path \"%@\": \"%@\"";

/// Maps a child's percentage into its step of `total`; the step's start is an integer quotient. `isLate`: the child
/// came after the children were counted.
ProgressionBlock integerStep(const ProgressionBlock& block, std::size_t step, std::size_t total, bool isLate) {
  return [&block, start = platform::integerPercentage(step, total), total, isLate](double percentage) {
    return report(block, platform::percentageInStep(start, percentage, total, isLate));
  };
}

/// The same with the step's start computed in single precision; a step that was not counted is late.
ProgressionBlock realStep(const ProgressionBlock& block, std::size_t step, std::size_t total) {
  const bool isLate = step >= total;
  const float start =
      isLate ? (total == 0 ? 0.0F : 100.0F) : static_cast<float>(step) * 100.0F / static_cast<float>(total);
  return [&block, start = static_cast<double>(start), total, isLate](double percentage) {
    return report(block, platform::percentageInStep(start, percentage, total, isLate));
  };
}

}  // namespace

bool QuiltMedia::isFlattened() const {
  const auto flattened = [](const auto& child) { return child->isFlattened(); };
  if (!_sources.walk(flattened) || !_extras.walk(flattened)) return false;
  // The commentary alone decides when there is one, whatever the lists hold.
  if (const auto commentary = audioCommentarySource()) return commentary->isFlattened();
  return sourcesCount() > 0 || extraCount() > 0;
}

bool QuiltMedia::flattenWithProgressionBlock(const ProgressionBlock& withProgressionBlock) {
  const SaveDeferral deferral;
  FDYLogger::logDebug("Flattening media at path \"%@\"", path());
  if (flattenChildren(withProgressionBlock)) return true;
  FDYLogger::logCritical("Failed to flatten media files at path \"%@\"", path());
  return false;
}

bool QuiltMedia::flattenChildren(const ProgressionBlock& block) {
  if (!documentOwner()) {
    FDYLogger::logDebug("Failed to flatten media because it is not attached to a document");
    return false;
  }
  if (path().empty()) {
    FDYLogger::logDebug("Failed to flatten media because it does not have a path");
    return false;
  }
  const std::size_t sources = sourcesCount();
  const std::size_t extras = extraCount();
  const auto commentary = audioCommentarySource();
  report(block, 0);
  const auto document = documentOwner();
  if (!makeFolderInPackage(path(), document, kNoMediaFolder) ||
      !makeFolderInPackage(sourcesFolderPath(), document, kNoMediaFolder))
    return false;

  const std::size_t total = sources + extras + (commentary ? 1 : 0);
  const auto flatten = [&](QuiltMediaSource& child, std::size_t step, const char* failure) {
    if (child.flattenCopy(/*copy=*/true, integerStep(block, step, total, step >= total))) return true;
    FDYLogger::logDebug(failure, child.uuid());
    return false;
  };

  std::size_t position = 0;
  const bool sourcesDone = _sources.walk([&](const auto& source) {
    const std::size_t step = position++;
    return source->isFlattened() || flatten(*source, step, "Failed to flatten source \"%@\"");
  });
  if (!sourcesDone) return false;

  std::size_t step = sources;
  if (commentary) {
    if (!commentary->isFlattened() && !flatten(*commentary, step, "Failed to flatten source \"%@\"")) return false;
    ++step;
  }
  if (!makeFolderInPackage(extrasFolderPath(), document, kNoMediaFolder)) return false;
  // Unlike the sources, an extra that is flattened already takes no step.
  const bool extrasDone = _extras.walk([&](const auto& extra) {
    return extra->isFlattened() || flatten(*extra, step++, "Failed to flatten extra \"%@\"");
  });
  if (!extrasDone) return false;
  savePosterIfMissing();
  report(block, 100);
  return true;
}

bool QuiltMedia::finalizeWithProgressionBlock(const ProgressionBlock& withProgressionBlock) {
  const SaveDeferral deferral;
  FDYLogger::logDebug("Finalizing media at path \"%@\"", path());
  if (finalizeChildren(withProgressionBlock)) return true;
  // The line says source although it concerns the item.
  FDYLogger::logCritical("Failed to finalize source at path \"%@\"", path());
  return false;
}

bool QuiltMedia::finalizeChildren(const ProgressionBlock& block) {
  if (!documentOwner()) {
    FDYLogger::logDebug("Failed to finalize media because it is not attached to a document");
    return false;
  }
  if (path().empty()) {
    FDYLogger::logDebug("Failed to finalize media because it does not have a path");
    return false;
  }
  const auto commentary = audioCommentarySource();
  const std::size_t extras = extraCount();
  const std::size_t sources = sourcesCount();
  const std::size_t total = sources + extras + (commentary ? 1 : 0);
  report(block, 0);
  const auto document = documentOwner();
  if (!makeFolderInPackage(path(), document, kNoMediaFolder) ||
      !makeFolderInPackage(sourcesFolderPath(), document, kNoSourcesFolder) ||
      !makeFolderInPackage(extrasFolderPath(), document, kNoExtrasFolder))
    return false;
  posterImage();  // writes the poster into the package
  savePosterIfMissing();

  // Every source reports into the first step.
  std::size_t position = 0;
  const bool sourcesDone = _sources.walk([&](const auto& source) {
    if (source->finalizeWithProgressionBlock(integerStep(block, 0, total, position++ >= sources))) return true;
    FDYLogger::logDebug("Failed to finalize source \"%@\" during finalizing media at path \"%@\"", source->uuid(),
                        path());
    return false;
  });
  if (!sourcesDone) return false;

  std::size_t step = 0;
  const bool extrasDone = _extras.walk([&](const auto& extra) {
    const bool isLate = step++ >= extras;
    if (extra->finalizeWithProgressionBlock(integerStep(block, step, total, isLate))) return true;
    FDYLogger::logDebug("Failed to finalize extra \"%@\" during finalizing at \"%@\"", extra->uuid(), path());
    return false;
  });
  if (!extrasDone) return false;

  if (commentary && !commentary->finalizeWithProgressionBlock(integerStep(block, 1 + extras, total, false))) {
    FDYLogger::logDebug("Failed to finalize audio commentary source \"%@\" during finalizing media at path \"%@\"",
                        commentary->uuid(), path());
    return false;
  }
  report(block, 100);
  return true;
}

void QuiltMedia::flattenPreviews() {
  const auto flatten = [](const auto& child) {
    child->flattenPreviews();
    return true;
  };
  performBlockOnSources(flatten);
  performBlockOnExtra(flatten);
  if (const auto commentary = audioCommentarySource()) flatten(commentary);
}

bool QuiltMedia::convertToFormat(const std::string& format, const ProgressionBlock& withProgressionBlock,
                                 const std::vector<std::string>& followedBy) {
  const SaveDeferral deferral;
  const auto commentary = audioCommentarySource();
  // One more without a commentary, none with it: the scale that hosts know.
  const std::size_t total = sourcesCount() + extraCount() + (commentary ? 0 : 1);
  std::size_t next = 0;
  const auto convert = [&](const auto& child) {
    return child->convertToFormat(format, realStep(withProgressionBlock, next++, total), followedBy);
  };
  if (!performBlockOnSources(convert) || !performBlockOnExtra(convert)) return false;
  if (!commentary) return true;
  // The commentary shares the last child's step. Without other children there is no step to share: it has the whole.
  if (total == 0) return commentary->convertToFormat(format, withProgressionBlock, followedBy);
  return commentary->convertToFormat(format, realStep(withProgressionBlock, next == 0 ? 0 : next - 1, total),
                                     followedBy);
}

bool QuiltMedia::exportToPath(const Path& path, const std::string& withFormat,
                              const ProgressionBlock& withProgressionBlock) {
  report(withProgressionBlock, 0);
  const std::size_t steps = sourcesCount() + 3;
  const auto step = [&](std::size_t index) { return realStep(withProgressionBlock, index, steps); };
  const auto document = documentOwner();
  if (!document) return false;
  if (!document->isFlattened() && !document->flattenWithProgressionBlock(step(0))) return false;
  if (!document->convertToFormat(withFormat, step(1))) return false;
  if (!document->finalizeWithProgressionBlock(step(2))) return false;
  std::size_t exported = 0;
  const bool done = performBlockOnSources([&](const auto& source) {
    if (source->exportToPath(path, withFormat, step(exported + 3)).empty()) return false;
    ++exported;
    return true;
  });
  if (!done) return false;
  report(withProgressionBlock, 100);
  return true;
}

std::vector<std::string> QuiltMedia::availableFormats() const {
  const auto first = sourceAtIndex(0);
  std::vector<std::string> formats = first ? first->availableFormats() : std::vector<std::string>();
  const auto keepOffered = [&formats](const auto& child) {
    const std::vector<std::string> offered = child->availableFormats();
    std::erase_if(formats, [&offered](const std::string& format) {
      return std::find(offered.begin(), offered.end(), format) == offered.end();
    });
    return true;
  };
  performBlockOnSources(keepOffered);
  performBlockOnExtra(keepOffered);
  if (const auto commentary = audioCommentarySource()) keepOffered(commentary);
  return formats;
}

}  // namespace quilt
