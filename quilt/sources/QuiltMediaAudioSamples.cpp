// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/QuiltMediaAudioSamples.h"

#include <utility>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/ModelFiles.h"
#include "quilt/sources/QuiltMediaSource.h"
#include "quilt/sources/RecordNames.h"

namespace quilt {

using platform::FDYLogger;
using platform::services;

namespace {

constexpr std::string_view kAudioSamplesKeys[] = {"UUID",      "SampleFilename", "SampleURL",
                                                  "SourceURL", "IsFlattened",    "TotalSizeInMegaBytes"};

}  // namespace

std::shared_ptr<QuiltMediaAudioSamples> QuiltMediaAudioSamples::init() {
  struct Made final : QuiltMediaAudioSamples {};
  return std::make_shared<Made>();
}

std::shared_ptr<QuiltMediaAudioSamples> QuiltMediaAudioSamples::initWithURL(const Url& url, const Text& uuid) {
  auto samples = init();
  if (!url.isFileUrl()) {
    FDYLogger::logDebug("Cannot audio to generate audio samples with non-file url \"%@\"", url);
    return nullptr;
  }
  const auto media = platform::FDYMedia::initWithPath(url.relativePath());
  if (!media || !media->hasAudio()) return nullptr;
  samples->setUuid(uuid);
  samples->setSourceURL(url);
  return samples;
}

std::shared_ptr<QuiltMediaAudioSamples> QuiltMediaAudioSamples::initWithDictionary(
    Dictionary dictionary, const std::shared_ptr<QuiltMediaSource>& andMediaSource) {
  auto samples = init();
  samples->setSourceOwner(andMediaSource);
  if (Text uuid = dictionary.takeString("UUID")) {
    if (!isAcceptedName(*uuid, "samples file")) return nullptr;
    samples->setUuid(std::move(uuid));
  }
  // The key only marks that there were samples; where they lie follows from the identity.
  if (dictionary.string("SampleURL") && andMediaSource) {
    const Path folder = andMediaSource->audioSamplesFolderPath();
    if (!folder.empty()) samples->setSampleURL(Url::fileUrl(folder / samples->uuid().value_or("")));
  }
  if (const Text url = dictionary.string("SourceURL")) samples->setSourceURL(Url::parse(*url));
  if (const auto flattened = dictionary.boolean("IsFlattened")) samples->setIsFlattened(*flattened);
  samples->_unknownEntries = platform::entriesBeyond(kAudioSamplesKeys, dictionary);
  return samples;
}

std::shared_ptr<QuiltMediaAudioSamples> QuiltMediaAudioSamples::copy() const {
  auto twin = init();
  twin->setUuid(uuid());
  twin->setSampleURL(sampleURL());
  twin->setSourceURL(sourceURL());
  twin->setIsFlattened(isFlattened());
  twin->setSourceOwner(sourceOwner());
  twin->_unknownEntries = _unknownEntries;
  return twin;
}

Dictionary QuiltMediaAudioSamples::dictionary() const {
  Dictionary record;
  if (const Text identity = uuid()) record.append("UUID", *identity);
  if (const auto sample = sampleURL()) {
    if (sample->isFileUrl() && isFlattened()) {
      record.append("SampleFilename", sample->relativePath().filename().native());
    } else {
      record.append("SampleURL", sample->absoluteString());
    }
  }
  if (const auto source = sourceURL()) record.append("SourceURL", source->absoluteString());
  record.append("IsFlattened", isFlattened());
  record.append("TotalSizeInMegaBytes", totalSizeInMegaBytes());
  platform::appendAll(record, _unknownEntries);
  return record;
}

Path QuiltMediaAudioSamples::path() const {
  const auto source = sourceOwner();
  const Path folder = source ? source->audioSamplesFolderPath() : Path();
  const Text identity = uuid();
  if (folder.empty() || !identity) return {};
  return folder / platform::withExtension(*identity, "asc");
}

bool QuiltMediaAudioSamples::flatten(const ContinueBlock& goesOn) {
  if (isFlattened()) return true;
  const Path file = path();
  if (file.empty()) return false;
  // The second placeholder has no error to print: nothing failed, the place is not as it should be.
  const Path folder = file.parent_path();
  if (services().files->kindOfItemAtPath(folder) != platform::FileKind::Folder ||
      !isInsidePackage(folder, documentOf(sourceOwner()), "samples file")) {
    FDYLogger::logCritical("Expected audio samples folder at path \"%@\": \"%@\"", folder, std::nullopt);
    return false;
  }
  if (services().files->fileExistsAtPath(file)) {
    FDYLogger::logCritical("Didn't expect audio samples file at path \"%@\": \"%@\"", file, std::nullopt);
    return false;
  }
  if (const auto document = documentOf(sourceOwner())) document->willMakeItem(file);
  const Url destination = Url::fileUrl(file);
  const auto source = sourceURL();
  if (!source || !services().audioPreview->extractAudioSamplesFromAssetURL(*source, destination, goesOn)) {
    FDYLogger::logCritical("Failed to extract audio samples file at path \"%@\": \"%@\"", file, std::nullopt);
    return false;
  }
  const platform::Uninterrupted whole;
  setSampleURL(destination);
  setIsFlattened(true);
  return true;
}

double QuiltMediaAudioSamples::totalSizeInMegaBytes() const {
  const Path file = path();
  if (!isFlattened() || file.empty()) return 0;
  const auto size = megaBytesOfFile(file);
  if (size) return *size;
  FDYLogger::logWarning("Audio samples at path \"%@\" cannot be sized: \"%@\"", file, size.error());
  return 0;
}

}  // namespace quilt
