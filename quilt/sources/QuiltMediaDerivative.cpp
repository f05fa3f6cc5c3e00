// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/QuiltMediaDerivative.h"

#include <algorithm>
#include <utility>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/media/QuiltMedia.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/Grades.h"
#include "quilt/sources/ModelFiles.h"
#include "quilt/sources/QuiltMediaSource.h"
#include "quilt/sources/RecordNames.h"

namespace quilt {

using platform::FDYLogger;
using platform::FDYMedia;
using platform::FDYTypePreferredIdentifier;
using platform::services;
namespace types = platform::types;

namespace {

constexpr std::string_view kDerivativeKeys[] = {
    "UUID",        "Filename", "URL",   "ContentType", "CompatibilityTags", "MimeType",
    "IsFlattened", "Height",   "Width", "Duration",    "RelativePath",      "TotalSizeInMegaBytes"};

bool conforms(const Text& identifier, std::string_view other) {
  return identifier && services().types->conformsTo(*identifier, other);
}

bool fileConformsToAny(const Url& url, const std::vector<std::string>& identifiers) {
  const Text identifier = FDYTypePreferredIdentifier(url.relativePath());
  return std::any_of(identifiers.begin(), identifiers.end(),
                     [&identifier](const std::string& other) { return conforms(identifier, other); });
}

/// The smallest class that holds width × height pixels.
const char* tagForSize(double width, double height) {
  if (width <= 640 && height <= 480) return k480p;
  if (width <= 1280 && height <= 720) return k720p;
  return kDesktop;
}

std::vector<std::string> tagsForAudio(const Url& url) {
  const auto file = FDYMedia::initWithPath(url.relativePath());
  if (!file || !file->hasAudio() || file->hasVideo()) return {};
  if (file->audioCodecName() == "AAC") return {kDesktop, k720p, k480p};
  return {kDesktop};
}

std::vector<std::string> tagsForMovie(const Url& url) {
  const auto file = FDYMedia::initWithPath(url.relativePath());
  if (!file) return {};
  const bool soundFits =
      !file->hasAudio() || file->audioCodecName() == "AAC" || file->audioCodecName() == "Kestrel Lossless";
  if (file->videoCodecName() == "H.264" && soundFits) return {tagForSize(file->width(), file->height())};
  return {kDesktop};
}

std::vector<std::string> tagsForImage(const Url& url) {
  const Text identifier = FDYTypePreferredIdentifier(url.relativePath());
  if (identifier != types::kPNG && identifier != types::kJPEG) return {kDesktop};
  const auto image = ImageWrapper::imageWithURL(url);
  if (!image) return {};
  return {tagForSize(image->size().width, image->size().height)};
}

std::string joined(const std::vector<std::string>& texts) {
  std::string out;
  for (const std::string& text : texts) out.append(out.empty() ? "" : ",").append(text);
  return out;
}

/// Sizes and durations pass through single precision when they are read.
double narrowed(double value) { return static_cast<double>(static_cast<float>(value)); }

}  // namespace

QuiltMediaDerivative::QuiltMediaDerivative(std::string uuid) { _uuid.initialize(std::move(uuid)); }

std::shared_ptr<QuiltMediaDerivative> QuiltMediaDerivative::make(std::string uuid) {
  struct Made final : QuiltMediaDerivative {
    explicit Made(std::string uuid) : QuiltMediaDerivative(std::move(uuid)) {}
  };
  return std::make_shared<Made>(std::move(uuid));
}

std::shared_ptr<QuiltMediaDerivative> QuiltMediaDerivative::init() { return make(platform::generateUUID()); }

std::shared_ptr<QuiltMediaDerivative> QuiltMediaDerivative::initWithURL(const Url& url) {
  auto derivative = init();
  return derivative->classify(url) ? derivative : nullptr;
}

std::shared_ptr<QuiltMediaDerivative> QuiltMediaDerivative::initWithPath(const Path& path) {
  return initWithURL(Url::fileUrl(path));
}

bool QuiltMediaDerivative::classify(const Url& url) {
  std::vector<std::string> tags;
  if (!url.isFileUrl()) {
    setContentType(types::kURL);
    setIsFlattened(true);
    tags = compatibilityTagsForURL(url, QuiltMediaSource::contentCategoryForContentType(contentType()));
  } else if (canInitWithURL(url)) {
    const Path file = url.relativePath();
    // What cannot be opened can be shown to no one.
    if (const auto media = FDYMedia::initWithPath(file)) {
      Text type = FDYTypePreferredIdentifier(file);
      if (conforms(type, types::kMovie) && media->hasAudio() && !media->hasVideo()) {
        type = types::kAudio;
      } else if (conforms(type, types::kAudio) && media->hasAudio() && media->hasVideo()) {
        type = types::kVideo;
      }
      setMimetype(media->mimeType());
      setHeight(media->height());
      setWidth(media->width());
      setDuration(media->duration());
      tags = compatibilityTagsForURL(url, QuiltMediaSource::contentCategoryForContentType(type));
      setContentType(std::move(type));
    }
  }
  if (tags.empty()) {
    FDYLogger::logDebug("Failed to create source derivative for url \"%@\": \"Not a compatible file\"", url);
    return false;
  }
  setCompatibilityTags(std::move(tags));
  setUrl(url);
  return true;
}

std::shared_ptr<QuiltMediaDerivative> QuiltMediaDerivative::initWithDictionary(
    Dictionary dictionary, const std::shared_ptr<QuiltMediaSource>& andMediaSource) {
  Text uuid = dictionary.takeString("UUID");
  if (uuid && !isAcceptedName(*uuid, "source derivative")) return nullptr;
  auto derivative = uuid ? make(*std::move(uuid)) : init();
  derivative->_sourceOwner.initialize(andMediaSource);
  if (const Text filename = dictionary.string("Filename")) {
    if (!isAcceptedName(*filename, "source derivative")) return nullptr;
    const Path folder = andMediaSource ? andMediaSource->derivativesFolderPath() : Path();
    if (!folder.empty()) {
      if (!isInsidePackage(folder / *filename, documentOf(andMediaSource), "source derivative")) return nullptr;
      derivative->_url.initialize(Url::fileUrl(folder / *filename));
    }
  } else if (const Text url = dictionary.string("URL")) {
    derivative->_url.initialize(Url::parse(*url));
  }
  if (Text type = dictionary.takeString("ContentType")) derivative->_contentType.initialize(std::move(type));
  if (Array* array = dictionary.array("CompatibilityTags")) {
    std::vector<std::string> tags;
    for (auto& element : *array)
      if (auto* tag = element.as<std::string>()) tags.push_back(std::move(*tag));
    derivative->_compatibilityTags.initialize(std::move(tags));
  }
  if (Text type = dictionary.takeString("MimeType")) derivative->_mimetype.initialize(std::move(type));
  if (const auto width = dictionary.real("Width")) derivative->_width.initialize(narrowed(*width));
  if (const auto height = dictionary.real("Height")) derivative->_height.initialize(narrowed(*height));
  if (const auto duration = dictionary.real("Duration")) derivative->_duration.initialize(narrowed(*duration));
  if (const auto flattened = dictionary.boolean("IsFlattened")) derivative->_isFlattened.initialize(*flattened);
  derivative->_unknownEntries = platform::entriesBeyond(kDerivativeKeys, dictionary);
  return derivative;
}

Dictionary QuiltMediaDerivative::dictionary() const {
  Dictionary record;
  record.reserve(std::size(kDerivativeKeys));
  record.append("UUID", uuid());
  const std::optional<Url> location = url();
  const bool isFile = location && location->isFileUrl();
  const std::string file = isFile ? location->relativePathText() : std::string();
  if (isFile && isFlattened()) {
    record.append("Filename", file.substr(file.rfind('/') + 1));
  } else if (location) {
    record.append("URL", location->absoluteString());
  }
  if (const Text type = contentType()) record.append("ContentType", *type);
  if (const auto tags = compatibilityTags()) record.append("CompatibilityTags", Array(tags->begin(), tags->end()));
  if (const Text type = mimetype()) record.append("MimeType", *type);
  record.append("IsFlattened", isFlattened());
  record.append("TotalSizeInMegaBytes", totalSizeInMegaBytes());
  record.append("Height", height());
  record.append("Width", width());
  record.append("Duration", duration());
  if (isFile) {
    const auto document = documentOf(sourceOwner());
    record.append("RelativePath", platform::textRelativeTo(file, document ? document->folder() : std::string()));
  }
  platform::appendAll(record, _unknownEntries);
  return record;
}

bool QuiltMediaDerivative::hasTag(const std::string& tag) const {
  const auto tags = compatibilityTags();
  return tags && std::find(tags->begin(), tags->end(), tag) != tags->end();
}

double QuiltMediaDerivative::totalSizeInMegaBytes() const {
  const std::optional<Url> location = url();
  if (!location || !location->isFileUrl()) return 0;
  const auto size = megaBytesOfFile(location->relativePath());
  if (size) return *size;
  FDYLogger::logWarning("Source derivative at path \"%@\" cannot be sized: \"%@\"", location->relativePath(),
                        size.error());
  return 0;
}

bool QuiltMediaDerivative::canInitWithURL(const Url& url) {
  return !url.isFileUrl() || fileConformsToAny(url, allSupportedUTIs());
}

bool QuiltMediaDerivative::canInitWithURLForClassic(const Url& url) {
  return !url.isFileUrl() || fileConformsToAny(url, classicSupportedUTIs());
}

bool QuiltMediaDerivative::canInitWithURLOfTypeDocument(const Url& url) {
  return !url.isFileUrl() || fileConformsToAny(url, documentSupportedUTIs());
}

const std::vector<std::string>& QuiltMediaDerivative::classicSupportedUTIs() {
  static const std::vector<std::string> list = {types::kAIFF,
                                                types::kAIFC,
                                                types::kM4A,
                                                types::kMP3,
                                                types::kMPEG4Audio,
                                                types::kProtectedMPEG4Audio,
                                                types::kMovieContainer,
                                                types::kMPEG4,
                                                types::kMPEG,
                                                types::kProtectedMPEG4Video,
                                                types::kM4V,
                                                types::k3GPP};
  return list;
}

const std::vector<std::string>& QuiltMediaDerivative::documentSupportedUTIs() {
  static const std::vector<std::string> list = {types::kPDF,
                                                types::kEPUBContainer,
                                                types::kEPUB,
                                                types::kPresentation,
                                                types::kFlatPresentation,
                                                types::kPowerPointPpt,
                                                types::kPowerPointOpenXML,
                                                types::kTextDocument,
                                                types::kFlatTextDocument,
                                                types::kWordDoc,
                                                types::kWordML,
                                                types::kWordOpenXML,
                                                types::kJPEG,
                                                types::kJPEG2000,
                                                types::kTIFF,
                                                types::kGIF,
                                                types::kPNG,
                                                types::kICNS,
                                                types::kBMP,
                                                types::kM4A};
  return list;
}

const std::vector<std::string>& QuiltMediaDerivative::allSupportedUTIs() {
  // The classic types, then the document types without the audio type that ends their list.
  static const std::vector<std::string> list = [] {
    std::vector<std::string> all = classicSupportedUTIs();
    all.insert(all.end(), documentSupportedUTIs().begin(), documentSupportedUTIs().end() - 1);
    return all;
  }();
  return list;
}

std::vector<std::string> QuiltMediaDerivative::compatibilityTagsForURL(const Url& url, const Text& andContentCategory) {
  const Text& category = andContentCategory;
  std::vector<std::string> tags;
  if (category == kQuiltMediaContentCategoryAudio) {
    tags = tagsForAudio(url);
  } else if (category == kQuiltMediaContentCategoryMovie) {
    tags = tagsForMovie(url);
  } else if (category == kQuiltMediaContentCategoryImage) {
    tags = tagsForImage(url);
  } else if (category == kQuiltMediaContentCategoryDocument || category == kQuiltMediaContentCategoryWeb) {
    tags = {kDesktop, k720p, k480p};
  }
  FDYLogger::logDebug("Derivative at URL \"%@\" as \"%@\" is compatible with \"%@\"", url, category, joined(tags));
  return tags;
}

}  // namespace quilt
