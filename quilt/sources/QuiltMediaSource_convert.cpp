// SPDX-License-Identifier: Apache-2.0
#include <algorithm>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/media/QuiltMedia.h"
#include "quilt/platform/base/CleanUp.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/DocumentSave.h"
#include "quilt/sources/Grades.h"
#include "quilt/sources/ModelFiles.h"
#include "quilt/sources/QuiltMediaSource.h"

namespace quilt {

using platform::FDYLogger;
using platform::services;

namespace {

/// The transcoder is stopped when the block answers false or throws; `thrown` keeps what it threw.
platform::TranscoderProgressBlock stopWhenCancelled(const ProgressionBlock& block, platform::CarriedException& thrown) {
  return [&block, &thrown](float progress, bool& stop) {
    if (!thrown.ask([&] { return platform::report(block, static_cast<double>(progress)); })) stop = true;
  };
}

/// Whether the main derivative is of a better grade than the one asked for.
bool isBetter(const QuiltMediaDerivative& main, const std::string& format) {
  return main.hasTag(kDesktop) || (format == k480p && main.hasTag(k720p));
}

void logNothingBetter(const std::string& format, const std::shared_ptr<QuiltMedia>& media) {
  const Text uuid = media ? Text(media->uuid()) : std::nullopt;
  if (format == k720p) {
    FDYLogger::logDebug(
        "Framework was asked to convert media with UUID \"%@\" to HD format but no higher quality source is available",
        uuid);
  } else {
    FDYLogger::logDebug(
        "Framework was asked to convert media with UUID \"%@\" to SD format but no higher quality source is available",
        uuid);
  }
}

}  // namespace

std::vector<std::string> QuiltMediaSource::availableFormats() const {
  std::vector<std::string> formats;
  performBlockOnDerivatives([&formats](const auto& derivative) {
    for (const std::string& tag : derivative->compatibilityTags().value_or(std::vector<std::string>()))
      if (std::find(formats.begin(), formats.end(), tag) == formats.end()) formats.push_back(tag);
    return true;
  });
  return formats;
}

bool QuiltMediaSource::convertToFormat(const std::string& format, const ProgressionBlock& withProgressionBlock,
                                       const std::vector<std::string>& followedBy) {
  const SaveDeferral deferral;  // a record names what was made under its final name
  platform::report(withProgressionBlock, 0);
  bool done = !dirty() && derivativeWithFormat(format);
  if (!done) {
    const Text category = contentCategory();
    if (category == kQuiltMediaContentCategoryDocument || category == kQuiltMediaContentCategoryWeb) {
      done = true;
    } else if (category == kQuiltMediaContentCategoryImage) {
      done = convertImage(format);
    } else if (category == kQuiltMediaContentCategoryAudio) {
      done = convertAudio(format, withProgressionBlock);
    } else if (category == kQuiltMediaContentCategoryMovie) {
      done = convertMovie(format, withProgressionBlock, followedBy);
    } else {
      FDYLogger::logWarning("Trying to convert a media with an invalid content category");
      return false;
    }
  }
  if (!done) {
    platform::report(withProgressionBlock, 0);
    return false;
  }
  setDirty(false);
  return platform::report(withProgressionBlock, 100);
}

bool QuiltMediaSource::convertImage(const std::string& format) {
  if (format == kDesktop) return true;
  if (format != k720p && format != k480p) return false;
  const auto main = mainDerivative();
  if (!isBetter(*main, format)) {
    logNothingBetter(format, mediaOwner());
    return true;
  }
  const auto url = main->url();
  const auto image = url ? ImageWrapper::imageWithURL(*url) : nullptr;
  if (!image) {
    FDYLogger::logCritical("Failed to load image at path \"%@\"", url);
    return false;
  }
  const auto scaled = format == k720p ? image->convertToHD() : image->convertToSD();
  if (!scaled) {
    if (format == k720p) {
      FDYLogger::logCritical("Failed to convert image at path \"%@\" to HD.", url);
    } else {
      FDYLogger::logCritical("Failed to convert image at URL \"%@\" to SD.", url);
    }
    return false;
  }
  constexpr const char* notWritten = "Failed to write converted image of \"%@\": \"%@\"";
  const auto file = newHiddenFile("png");
  if (!file) {
    FDYLogger::logCritical(notWritten, url, file.error());
    return false;
  }
  const auto saved = scaled->saveAsPNGAtURL(Url::fileUrl(*file));
  if (saved) return adoptConverted(*file, format);
  if (!cannotBeDrawn(saved.error())) {
    FDYLogger::logCritical(notWritten, url, saved.error());
    return false;
  }
  // There is no smaller picture of what cannot be drawn: the file itself has to do for every format.
  leaveOutPreview(0, saved.error());
  auto tags = main->compatibilityTags().value_or(std::vector<std::string>());
  tags.push_back(format);
  main->setCompatibilityTags(std::move(tags));
  return true;
}

bool QuiltMediaSource::convertAudio(const std::string& format, const ProgressionBlock& block) {
  const auto url = previewItemURL();
  if (!url) return false;
  const auto file = newHiddenFile("m4a");
  platform::CarriedException thrown;
  const auto made = file ? services().transcoder->transcodeToAudio(*url, Url::fileUrl(*file), stopWhenCancelled(block, thrown))
                         : platform::Result<void>(file.error());
  thrown.rethrow();
  if (made) return adoptConverted(*file, format);
  FDYLogger::logCritical("Failed to convert file at URL \"%@\" to audio: \"%@\"", url, made.error());
  return false;
}

bool QuiltMediaSource::convertMovie(const std::string& format, const ProgressionBlock& block,
                                    const std::vector<std::string>& followedBy) {
  if (format == kDesktop) return true;
  if (format != k720p && format != k480p) return false;
  const auto main = mainDerivative();
  if (!dirty() && !isBetter(*main, format)) {
    logNothingBetter(format, mediaOwner());
    return true;
  }
  const auto url = main->url();
  if (!url) return false;
  // The line names HD for both sizes.
  constexpr const char* notConverted = "Failed to convert video at URL \"%@\" to HD: \"%@\"";
  const auto file = newHiddenFile("m4v");
  if (!file) {
    FDYLogger::logCritical(notConverted, url, file.error());
    return false;
  }
  auto& transcoder = *services().transcoder;
  const Url destination = Url::fileUrl(*file);

  // Decoding a movie once for both grades takes a good deal less time than twice.
  const std::string other = format == k720p ? k480p : k720p;
  const bool isOtherNext = std::find(followedBy.begin(), followedBy.end(), other) != followedBy.end();
  Path otherFile;
  if (isOtherNext && !derivativeWithFormat(other) && isBetter(*main, other))
    if (const auto second = newHiddenFile("m4v")) otherFile = *second;

  platform::CarriedException thrown;
  const auto transcode = [&, stop = stopWhenCancelled(block, thrown)] {
    const bool isHigh = format == k720p;
    if (otherFile.empty())
      return isHigh ? transcoder.transcodeToHD(*url, destination, stop)
                    : transcoder.transcodeToSD(*url, destination, stop);
    const Url otherDestination = Url::fileUrl(otherFile);
    return transcoder.transcodeToHDAndSD(*url, isHigh ? destination : otherDestination,
                                         isHigh ? otherDestination : destination, stop);
  };
  const auto made = transcode();
  thrown.rethrow();
  if (!made) {
    FDYLogger::logCritical(notConverted, url, made.error());
    return false;
  }
  if (!adoptConverted(*file, format)) return false;
  // Whoever asks for the other one then learns whether it is there.
  if (!otherFile.empty()) adoptConverted(otherFile, other);
  return true;
}

bool QuiltMediaSource::adoptConverted(const Path& file, const std::string& format) {
  const auto derivative = QuiltMediaDerivative::initWithPath(file);
  if (!derivative) {
    FDYLogger::logCritical("Failed to use the converted file at path \"%@\": \"It cannot be read\"", file);
    return false;
  }
  if (!derivative) return false;
  const platform::Uninterrupted whole;
  auto tags = derivative->compatibilityTags().value_or(std::vector<std::string>());
  tags.push_back(format);
  derivative->setCompatibilityTags(std::move(tags));
  addDerivative(derivative);
  if (derivative->flattenCopy(/*copy=*/false, [](double) { return true; })) return true;
  removeDerivative(derivative);  // no record is to name a hidden file
  return false;
}

platform::Result<Path> QuiltMediaSource::newHiddenFile(const std::string& extension) const {
  const Path folder = derivativesFolderPath();
  if (folder.empty()) return platform::Error{platform::ErrorKind::NotFound, "The source is not in a document.", {}};
  if (const auto created = createDirectoryInPackage(folder, document()); !created) return created.error();
  Path file;
  do {
    file = folder / platform::withExtension("." + platform::generateUUID(), extension);
  } while (services().files->fileExistsAtPath(file));
  document()->willMakeItem(file);
  return file;
}

}  // namespace quilt
