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

constexpr RecordKey kMediaKeys[] = {{"UUID", RecordKind::Told},
                                    {"Title", RecordKind::Text},
                                    {"Description", RecordKind::Text},
                                    {"Sources", RecordKind::List},
                                    {"Extras", RecordKind::List},
                                    {"AudioCommentarySource", RecordKind::Record},
                                    {"IsFlattened", RecordKind::Told},
                                    {"TotalSizeInMegaBytes", RecordKind::Told},
                                    {"ContentCategory", RecordKind::Text},
                                    {"PosterImagePath", RecordKind::Told},
                                    {"PosterImageWidth", RecordKind::Told},
                                    {"PosterImageHeight", RecordKind::Told}};

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
  return read(dictionary, andDocument);
}

std::shared_ptr<QuiltMedia> QuiltMedia::read(Dictionary& record, const std::shared_ptr<QuiltDocument>& andDocument) {
  if (!hasAcceptedIdentity(record, "media item")) return nullptr;
  auto media = init();
  // First, so that the children find their places while they load.
  media->_documentOwner.initialize(andDocument);
  if (Text uuid = record.takeString("UUID")) media->_uuid.initialize(*std::move(uuid));
  if (Text title = record.takeString("Title")) media->_title.initialize(std::move(title));
  if (Text description = record.takeString("Description")) media->_description.initialize(std::move(description));
  if (Text category = record.takeString("ContentCategory")) media->_contentCategory.initialize(std::move(category));
  UnusedEntries unused;
  readList(record, "Sources", unused, [&media](Dictionary& entry) {
    const auto source = QuiltMediaSource::read(entry, media);
    media->addSource(source);
    return source != nullptr;
  });
  readList(record, "Extras", unused, [&media](Dictionary& entry) {
    const auto extra = QuiltMediaExtra::read(entry, media);
    media->addExtra(extra);
    return extra != nullptr;
  });
  if (Dictionary* entry = record.dictionary("AudioCommentarySource")) {
    if (const auto commentary = QuiltMediaSource::read(*entry, media)) {
      media->setAudioCommentarySource(commentary);
    } else {
      unused.keep("AudioCommentarySource", std::move(*entry));
    }
  }
  unused.keepRest(kMediaKeys, record);
  media->_kept.take(std::move(unused));
  return media;
}

Dictionary QuiltMedia::dictionary() {
  // First: the poster may have to be drawn, and the previews that are made for it belong into the same record.
  const platform::PropertyList posterWidth = posterImageWidth();
  const platform::PropertyList posterHeight = posterImageHeight();
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
  record.append("PosterImageWidth", posterWidth);
  record.append("PosterImageHeight", posterHeight);
  _kept.writeInto(record);
  return record;
}

void QuiltMedia::setUuid(std::string uuid) {
  if (isAcceptedIdentity(uuid, "media item")) _uuid.set(std::move(uuid));
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
