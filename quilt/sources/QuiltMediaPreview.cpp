// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/QuiltMediaPreview.h"

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

constexpr std::string_view kPreviewKeys[] = {"UUID",  "Title",  "Content",     "Index",    "Timecode",
                                             "Width", "Height", "IsFlattened", "Filename", "RelativePath"};

}  // namespace

QuiltMediaPreview::QuiltMediaPreview(std::string uuid) { _uuid.initialize(std::move(uuid)); }

std::shared_ptr<QuiltMediaPreview> QuiltMediaPreview::make(std::string uuid) {
  struct Made final : QuiltMediaPreview {
    explicit Made(std::string uuid) : QuiltMediaPreview(std::move(uuid)) {}
  };
  return std::make_shared<Made>(std::move(uuid));
}

std::shared_ptr<QuiltMediaPreview> QuiltMediaPreview::init() { return make(platform::generateUUID()); }

std::shared_ptr<QuiltMediaPreview> QuiltMediaPreview::initWithImageWrapper(
    const std::shared_ptr<ImageWrapper>& imageWrapper) {
  const auto scaled = imageWrapper ? imageWrapper->convertToHD() : nullptr;
  if (!scaled) return nullptr;
  auto preview = init();
  preview->adopt(scaled);
  return preview;
}

std::shared_ptr<QuiltMediaPreview> QuiltMediaPreview::initWithDictionary(
    Dictionary dictionary, const std::shared_ptr<QuiltMediaSource>& andMediaSource) {
  Text uuid = dictionary.takeString("UUID");
  if (uuid && !isAcceptedName(*uuid, "source preview")) return nullptr;
  auto preview = uuid ? make(*std::move(uuid)) : init();
  preview->_sourceOwner.initialize(andMediaSource);
  if (Text title = dictionary.takeString("Title")) preview->_title.initialize(std::move(title));
  if (Text content = dictionary.takeString("Content")) preview->_content.initialize(std::move(content));
  if (const auto index = dictionary.integer("Index")) preview->_index.initialize(static_cast<std::size_t>(*index));
  if (const auto timecode = dictionary.real("Timecode")) preview->_timecode.initialize(*timecode);
  if (const auto flattened = dictionary.boolean("IsFlattened")) preview->_isFlattened.initialize(*flattened);
  preview->_isRenewable.initialize(true);
  preview->_recordedWidth = dictionary.real("Width");
  preview->_recordedHeight = dictionary.real("Height");
  preview->_unknownEntries = platform::entriesBeyond(kPreviewKeys, dictionary);
  return preview;
}

Dictionary QuiltMediaPreview::dictionary() const {
  const auto source = sourceOwner();
  const std::string file = pathIn(source);
  Dictionary record;
  record.reserve(std::size(kPreviewKeys));
  record.append("UUID", uuid());
  if (const Text text = title()) record.append("Title", *text);
  if (const Text text = content()) record.append("Content", *text);
  // Signed, as every integer of a record: no index is written as -1 and read back as the largest unsigned value.
  record.append("Index", static_cast<std::int64_t>(index()));
  record.append("Timecode", timecode());
  const auto wide = width();
  const auto high = height();
  if (const auto pixels = wide ? wide : _recordedWidth) record.append("Width", *pixels);
  if (const auto pixels = high ? high : _recordedHeight) record.append("Height", *pixels);
  record.append("IsFlattened", isFlattened());
  if (!file.empty()) {
    record.append("Filename", file.substr(file.rfind('/') + 1));
    record.append("RelativePath", platform::textRelativeTo(file, documentOf(source)->folder()));
  }
  platform::appendAll(record, _unknownEntries);
  return record;
}

void QuiltMediaPreview::adopt(const std::shared_ptr<ImageWrapper>& image) {
  const platform::Uninterrupted whole;
  setImage(image);
  setWidth(static_cast<double>(static_cast<float>(image->size().width)));
  setHeight(static_cast<double>(static_cast<float>(image->size().height)));
}

std::shared_ptr<ImageWrapper> QuiltMediaPreview::image() {
  if (auto loaded = _image.get()) return loaded;
  const Path file = path();
  if (file.empty()) return nullptr;
  if (!services().files->fileExistsAtPath(file)) {
    FDYLogger::logWarning("Media source preview path \"%@\" does not exist", file);
    return nullptr;
  }
  const bool isInside = isInsidePackage(file, documentOf(sourceOwner()), "source preview");
  const auto loaded = isInside ? ImageWrapper::imageWithPath(file) : nullptr;
  if (!loaded) {
    FDYLogger::logWarning("Media source preview path \"%@\" is not a valid image", file);
    return nullptr;
  }
  adopt(loaded);
  return loaded;
}

Path QuiltMediaPreview::path() const { return pathIn(sourceOwner()); }

std::string QuiltMediaPreview::pathIn(const std::shared_ptr<QuiltMediaSource>& source) const {
  if (!source) return {};
  const std::size_t position = index();
  return below(source->folder(),
               {"previews", platform::withExtension(position == kNoIndex ? uuid() : std::to_string(position), "jpg")});
}

bool QuiltMediaPreview::hasPicture() const {
  const Path file = path();
  if (file.empty()) return isFlattened() || _image.get();
  // An image in memory that was read from the package is worth no more than its file.
  return (!isFlattened() && _image.get()) || services().files->fileExistsAtPath(file);
}

platform::Result<void> QuiltMediaPreview::writePicture() {
  using platform::Error;
  using platform::ErrorKind;
  if (isFlattened()) return {};
  const Path file = path();
  if (file.empty()) return Error{ErrorKind::NotFound, "The preview has no place in a document.", {}};
  const auto picture = image();
  if (!picture) {
    FDYLogger::logCritical("Failed to flatten media source preview because image is unavailable");
    return Error{ErrorKind::NotFound, "The preview has no picture.", file};
  }
  const auto document = documentOf(sourceOwner());
  if (auto created = createDirectoryInPackage(file.parent_path(), document); !created) {
    FDYLogger::logCritical("Failed to flatten intermediate directories for media preview at path \"%@\": \"%@\"",
                           file.parent_path(), created.error());
    return created;
  }
  if (!isInsidePackage(file, document, "source preview"))
    return Error{ErrorKind::Unsafe, "The file leads out of the document.", file};
  if (document) document->willMakeItem(file);
  if (auto saved = picture->saveAsJPGAtPath(file); !saved) {
    if (!cannotBeDrawn(saved.error()))
      FDYLogger::logCritical("Failed to write media source preview at path \"%@\": \"%@\"", file, saved.error());
    return saved;
  }
  setIsFlattened(true);
  _image.store(nullptr);
  return {};
}

bool QuiltMediaPreview::flatten() {
  const auto written = writePicture();
  if (!written && cannotBeDrawn(written.error()))
    FDYLogger::logWarning("Media source preview at path \"%@\" cannot be drawn: \"%@\"", path(), written.error());
  return written.hasValue();
}

double QuiltMediaPreview::totalSizeInMegaBytes() const {
  if (!isFlattened()) return 0;
  const Path file = path();
  if (file.empty()) return 0;
  const auto size = megaBytesOfFile(file);
  if (size) return *size;
  FDYLogger::logWarning("Source preview at path \"%@\" cannot be sized: \"%@\"", file, size.error());
  return 0;
}

}  // namespace quilt
