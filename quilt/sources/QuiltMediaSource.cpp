// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/QuiltMediaSource.h"

#include <algorithm>
#include <utility>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/media/QuiltMedia.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/DocumentSave.h"
#include "quilt/sources/ModelFiles.h"
#include "quilt/sources/RecordNames.h"

namespace quilt {

using platform::FDYLogger;
using platform::services;
namespace types = platform::types;

namespace {

constexpr std::string_view kSourceKeys[] = {
    "UUID",     "ContentCategory", "Derivatives",          "Previews", "AudioSamples", "Title", "Description",
    "Timecode", "IsFlattened",     "TotalSizeInMegaBytes", "Dirty"};

constexpr const char* kImageTypes[] = {types::kJPEG, types::kJPEG2000, types::kTIFF, types::kGIF,
                                       types::kPNG,  types::kICNS,     types::kBMP};
constexpr const char* kDocumentTypes[] = {types::kPDF,
                                          types::kEPUBContainer,
                                          types::kEPUB,
                                          types::kTextDocument,
                                          types::kFlatTextDocument,
                                          types::kWordDoc,
                                          types::kWordML,
                                          types::kWordOpenXML,
                                          types::kPresentation,
                                          types::kFlatPresentation,
                                          types::kPowerPointPpt,
                                          types::kPowerPointOpenXML};

template <class Record, class List>
Array recordsOf(const List& list) {
  Array records;
  list.walk([&records](const std::shared_ptr<Record>& child) {
    records.emplace_back(child->dictionary());
    return true;
  });
  return records;
}

}  // namespace

QuiltMediaSource::QuiltMediaSource() { _uuid.initialize(platform::generateUUID()); }

std::shared_ptr<QuiltMediaSource> QuiltMediaSource::init() {
  struct Made final : QuiltMediaSource {};
  return std::make_shared<Made>();
}

std::shared_ptr<QuiltMediaSource> QuiltMediaSource::initWithURL(const Url& url) {
  auto source = init();
  return source->initializeWithURL(url) ? source : nullptr;
}

std::shared_ptr<QuiltMediaSource> QuiltMediaSource::initWithPath(const Path& path) {
  return initWithURL(Url::fileUrl(path));
}

std::shared_ptr<QuiltMediaSource> QuiltMediaSource::initWithDictionary(Dictionary dictionary,
                                                                       const std::shared_ptr<QuiltMedia>& andMedia) {
  auto source = init();
  return source->initializeWithDictionary(std::move(dictionary), andMedia) ? source : nullptr;
}

bool QuiltMediaSource::initializeWithURL(const Url& url) {
  const auto derivative = QuiltMediaDerivative::initWithURL(url);
  if (!derivative) return false;
  addDerivative(derivative);
  const Text category = contentCategory();
  if (!category) return false;
  if (category != kQuiltMediaContentCategoryDocument) addAudioSamplesForMainDerivative();
  return true;
}

bool QuiltMediaSource::initializeWithDictionary(Dictionary dictionary, const std::shared_ptr<QuiltMedia>& andMedia) {
  _mediaOwner.initialize(andMedia);
  if (Text uuid = dictionary.takeString("UUID")) {
    if (!isAcceptedName(*uuid, "media source")) return false;
    _uuid.initialize(*std::move(uuid));
  }
  const auto self = shared(this);
  if (Array* records = dictionary.array("Derivatives")) {
    for (auto& record : *records)
      if (auto* entry = record.as<Dictionary>())
        addDerivative(QuiltMediaDerivative::initWithDictionary(std::move(*entry), self));
  }
  if (Array* records = dictionary.array("Previews")) {
    for (auto& record : *records)
      if (auto* entry = record.as<Dictionary>())
        addPreview(QuiltMediaPreview::initWithDictionary(std::move(*entry), self));
  }
  if (Dictionary* record = dictionary.dictionary("AudioSamples"))
    addAudioSamples(QuiltMediaAudioSamples::initWithDictionary(std::move(*record), self));
  if (Text title = dictionary.takeString("Title")) setTitle(std::move(title));
  if (Text description = dictionary.takeString("Description")) setDescription(std::move(description));
  if (const auto timecode = dictionary.real("Timecode")) setTimecode(*timecode);
  _unknownEntries = platform::entriesBeyond(kSourceKeys, dictionary);
  // Last: a dirty source drops what was just read but its main derivative.
  if (const auto dirty = dictionary.boolean("Dirty")) setDirty(*dirty);
  return true;
}

Dictionary QuiltMediaSource::dictionary() const {
  Dictionary record;
  record.reserve(std::size(kSourceKeys));
  record.append("UUID", uuid());
  if (const Text category = contentCategory()) record.append("ContentCategory", *category);
  if (Array records = recordsOf<QuiltMediaDerivative>(_derivatives); !records.empty())
    record.append("Derivatives", std::move(records));
  if (Array records = recordsOf<QuiltMediaPreview>(_previews); !records.empty())
    record.append("Previews", std::move(records));
  if (const auto samples = audioSamples()) {
    const auto guard = samples->lock();
    record.append("AudioSamples", samples->dictionary());
  }
  const Text name = title();
  if (name) record.append("Title", *name);
  // The title stands under "Description" too: readers of released packages look there for a source's label.
  if (description() && name) record.append("Description", *name);
  if (timecode() != kNoTimecode) record.append("Timecode", timecode());
  record.append("IsFlattened", isFlattened());
  record.append("TotalSizeInMegaBytes", totalSizeInMegaBytes());
  record.append("Dirty", dirty());
  platform::appendAll(record, _unknownEntries);
  return record;
}

std::shared_ptr<QuiltDocument> QuiltMediaSource::document() const {
  const auto media = mediaOwner();
  return media ? media->documentOwner() : nullptr;
}

void QuiltMediaSource::updateDocumentUnlessProcessing() const { requestSave(document()); }

// ---- Places in the package

std::string QuiltMediaSource::folder() const {
  const auto media = mediaOwner();
  return media ? below(folderOf(*media), {"sources", uuid()}) : std::string();
}

Path QuiltMediaSource::derivativesFolderPath() const { return pathBelow(folder(), {"derivatives"}); }
Path QuiltMediaSource::previewsFolderPath() const { return pathBelow(folder(), {"previews"}); }
Path QuiltMediaSource::audioSamplesFolderPath() const { return pathBelow(folder(), {"audiosamples"}); }

// ---- Derived values

Text QuiltMediaSource::contentCategory() const {
  const auto main = mainDerivative();
  return main ? contentCategoryForContentType(main->contentType()) : std::nullopt;
}

Text QuiltMediaSource::contentCategoryForContentType(const Text& contentType) {
  if (!contentType) return std::nullopt;
  const auto conforms = [&contentType](std::string_view other) {
    return services().types->conformsTo(*contentType, other);
  };
  if (conforms(types::kMovie)) return kQuiltMediaContentCategoryMovie;
  if (conforms(types::kAudio)) return kQuiltMediaContentCategoryAudio;
  if (std::any_of(std::begin(kImageTypes), std::end(kImageTypes), conforms)) return kQuiltMediaContentCategoryImage;
  if (std::any_of(std::begin(kDocumentTypes), std::end(kDocumentTypes), conforms))
    return kQuiltMediaContentCategoryDocument;
  if (conforms(types::kURL)) return kQuiltMediaContentCategoryWeb;
  return std::nullopt;
}

double QuiltMediaSource::duration() const {
  const Text category = contentCategory();
  if (category != kQuiltMediaContentCategoryAudio && category != kQuiltMediaContentCategoryMovie &&
      category != kQuiltMediaContentCategoryDualSource)
    return 0;
  const auto guard = _derivatives.lock();
  const auto main = mainDerivative();
  return main ? main->duration() : 0;
}

double QuiltMediaSource::totalSizeInMegaBytes() const {
  double total = 0;
  const auto add = [&total](const auto& child) {
    total += child->totalSizeInMegaBytes();
    return true;
  };
  _derivatives.walk(add);
  _previews.walk(add);
  if (const auto samples = audioSamples()) {
    const auto guard = samples->lock();
    add(samples);
  }
  return total;
}

std::shared_ptr<ImageWrapper> QuiltMediaSource::thumbnailImage() {
  if (auto cached = _thumbnailImage.get()) return cached;
  const auto main = mainDerivative();
  if (!main) {
    FDYLogger::logWarning("Media thumbnail image cannot be previewed because there is no derivatives");
    return nullptr;
  }
  const auto url = main->url();
  const auto image = url ? platform::FDYThumbnailImageForURL(*url) : nullptr;
  if (!image) {
    FDYLogger::logWarning("Media thumbnail image cannot be previewed because URL \"%@\" is invalid", url);
    return nullptr;
  }
  setThumbnailImage(image);
  return image;
}

std::shared_ptr<ImageWrapper> QuiltMediaSource::posterImage() {
  if (auto cached = _posterImage.get()) return cached;
  const auto main = mainDerivative();
  if (!main) {
    FDYLogger::logWarning("Media poster image cannot be previewed because there is no derivatives");
    return nullptr;
  }
  const auto preview = previewCount() > 0 ? previewAtIndex(0) : nullptr;
  if (!preview) return nullptr;
  const auto picture = preview->image();
  const auto image = picture ? picture->convertToSD() : nullptr;
  if (!image) {
    FDYLogger::logWarning("Media poster image cannot be previewed because URL \"%@\" is invalid", main->url());
    return nullptr;
  }
  setPosterImage(image);
  return image;
}

std::optional<Url> QuiltMediaSource::previewItemURL() const {
  const auto main = mainDerivative();
  return main ? main->url() : std::nullopt;
}

// ---- Invalidation

void QuiltMediaSource::invalidateCaches() {
  const platform::Uninterrupted whole;
  invalidateThumbnailImage();
  invalidatePosterImage();
  const auto invalidate = [](const auto& child) {
    child->invalidateCaches();
    return true;
  };
  _derivatives.walk(invalidate);
  _previews.walk(invalidate);
  setPreviewsLeftOut({});
  if (const auto samples = audioSamples()) {
    const auto guard = samples->lock();
    samples->invalidateCaches();
  }
}

void QuiltMediaSource::invalidateAll() {
  const platform::Uninterrupted whole;
  const auto main = mainDerivative();
  for (const auto& derivative : _derivatives.copy())
    if (derivative != main) removeDerivative(derivative);
  removeAllPreviews();
  removeAllAudioSamples();
  invalidateThumbnailImage();
  invalidatePosterImage();
  invalidateCaches();
}

void QuiltMediaSource::setDirty(bool dirty) {
  const platform::Uninterrupted whole;
  if (dirty) {
    invalidateAll();
    if (const auto main = mainDerivative())
      main->setCompatibilityTags(std::vector<std::string>{kQuiltMediaDerivativeCompatibilityTagDesktop});
  }
  _dirty.set(dirty);
}

}  // namespace quilt
