// SPDX-License-Identifier: Apache-2.0
#include "quilt/media/QuiltMedia.h"

#include <utility>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/ModelFiles.h"
#include "quilt/sources/RecordNames.h"

namespace quilt {

namespace {

constexpr std::string_view kMediaKeys[] = {"UUID",
                                           "Title",
                                           "Description",
                                           "Sources",
                                           "Extras",
                                           "AudioCommentarySource",
                                           "IsFlattened",
                                           "TotalSizeInMegaBytes",
                                           "ContentCategory",
                                           "PosterImagePath",
                                           "PosterImageWidth",
                                           "PosterImageHeight"};

template <class List>
Array recordsOf(const List& list) {
  Array records;
  list.walk([&records](const auto& child) {
    records.emplace_back(child->dictionary());
    return true;
  });
  return records;
}

}  // namespace

QuiltMedia::QuiltMedia() { _uuid.initialize(platform::generateUUID()); }

std::shared_ptr<QuiltMedia> QuiltMedia::init() {
  struct Made final : QuiltMedia {};
  return std::make_shared<Made>();
}

std::shared_ptr<QuiltMedia> QuiltMedia::initWithDictionary(Dictionary dictionary,
                                                           const std::shared_ptr<QuiltDocument>& andDocument) {
  auto media = init();
  // First, so that the children find their places while they load.
  media->_documentOwner.initialize(andDocument);
  if (Text uuid = dictionary.takeString("UUID")) {
    if (!isAcceptedName(*uuid, "media item")) return nullptr;
    media->_uuid.initialize(*std::move(uuid));
  }
  if (Text title = dictionary.takeString("Title")) media->_title.initialize(std::move(title));
  if (Text description = dictionary.takeString("Description")) media->_description.initialize(std::move(description));
  if (Text category = dictionary.takeString("ContentCategory")) media->_contentCategory.initialize(std::move(category));
  if (Array* records = dictionary.array("Sources")) {
    for (auto& record : *records)
      if (auto* entry = record.as<Dictionary>())
        media->addSource(QuiltMediaSource::initWithDictionary(std::move(*entry), media));
  }
  if (Array* records = dictionary.array("Extras")) {
    for (auto& record : *records)
      if (auto* entry = record.as<Dictionary>())
        media->addExtra(QuiltMediaExtra::initWithDictionary(std::move(*entry), media));
  }
  if (Dictionary* record = dictionary.dictionary("AudioCommentarySource")) {
    if (const auto commentary = QuiltMediaSource::initWithDictionary(std::move(*record), media))
      media->setAudioCommentarySource(commentary);
  }
  media->_unknownEntries = platform::entriesBeyond(kMediaKeys, dictionary);
  return media;
}

Dictionary QuiltMedia::dictionary() {
  Dictionary record;
  record.reserve(std::size(kMediaKeys));
  record.append("UUID", uuid());
  if (const Text text = title()) record.append("Title", *text);
  if (const Text text = description()) record.append("Description", *text);
  {
    const OneLookAtEachFile untilAllIsAdded;
    if (Array records = recordsOf(_sources); !records.empty()) record.append("Sources", std::move(records));
    if (Array records = recordsOf(_extras); !records.empty()) record.append("Extras", std::move(records));
    if (const auto commentary = audioCommentarySource())
      record.append("AudioCommentarySource", commentary->dictionary());
    record.append("IsFlattened", isFlattened());
    record.append("TotalSizeInMegaBytes", totalSizeInMegaBytes());
  }
  if (const Text category = contentCategory()) record.append("ContentCategory", *category);
  const auto document = documentOwner();
  if (document)
    record.append("PosterImagePath",
                  platform::textRelativeTo(below(folderOf(*this), {"poster.jpg"}), document->folder()));
  record.append("PosterImageWidth", posterImageWidth());
  record.append("PosterImageHeight", posterImageHeight());
  platform::appendAll(record, _unknownEntries);
  return record;
}

Text QuiltMedia::contentCategory() const {
  if (Text category = _contentCategory.get()) return category;
  const auto guard = _sources.lock();
  if (_sources.count() != 1) return std::nullopt;
  Text category = _sources.at(0)->contentCategory();
  // Kept from now on, whatever becomes of the sources.
  if (category) _contentCategory.store(category);
  return category;
}

bool QuiltMedia::isComposed() const {
  const Text category = contentCategory();
  return category == kQuiltMediaContentCategoryDualSource || category == kQuiltMediaContentCategoryMontage;
}

Path QuiltMedia::path() const { return folderOf(*this); }
Path QuiltMedia::sourcesFolderPath() const { return pathBelow(folderOf(*this), {"sources"}); }
Path QuiltMedia::extrasFolderPath() const { return pathBelow(folderOf(*this), {"extras"}); }
Path QuiltMedia::posterImagePath() const { return pathBelow(folderOf(*this), {"poster.jpg"}); }

double QuiltMedia::duration() const {
  const auto guard = _sources.lock();
  const auto first = _sources.at(0);
  if (!first) return 0;
  const Text category = contentCategory();
  if (category == kQuiltMediaContentCategoryAudio || category == kQuiltMediaContentCategoryMovie ||
      category == kQuiltMediaContentCategoryDualSource)
    return first->duration();
  const auto commentary = category == kQuiltMediaContentCategoryMontage ? audioCommentarySource() : nullptr;
  return commentary ? commentary->duration() : 0;
}

double QuiltMedia::totalSizeInMegaBytes() const {
  double total = 0;
  const auto add = [&total](const auto& child) {
    total += child->totalSizeInMegaBytes();
    return true;
  };
  _sources.walk(add);
  _extras.walk(add);
  if (const auto commentary = audioCommentarySource()) add(commentary);
  return total;
}

void QuiltMedia::invalidateCaches() {
  const platform::Uninterrupted whole;
  setPosterImage(nullptr);
  const auto invalidate = [](const auto& child) {
    child->invalidateCaches();
    return true;
  };
  _sources.walk(invalidate);
  _extras.walk(invalidate);
  if (const auto commentary = audioCommentarySource()) commentary->invalidateCaches();
}

}  // namespace quilt
