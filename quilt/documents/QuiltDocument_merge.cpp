// SPDX-License-Identifier: Apache-2.0
#include "quilt/collections/QuiltCollection.h"
#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/sources/DocumentSave.h"

namespace quilt {

using platform::FDYLogger;

namespace {

/// The two messages of a child that cannot be merged. Their wording and spacing differ, and hosts look for each as it
/// is.
struct MergeMessages {
  const char* noDerivative;  ///< the document's title, the format, the child's title
  const char* noPreviews;    ///< the document's title, the child's title
};

constexpr MergeMessages kSourceMessages = {
    "Failed to import document \"%@\" : \"Cannot retrieve derivative of format \"%@\" of media \"%@\"\"",
    "Failed to import document \"%@\" : \"Cannot retrieve previews of media \"%@\"\""};
constexpr MergeMessages kExtraMessages = {
    "Failed to create import \"%@\": \"Cannot retrieve derivative of format \"%@\" of extra \"%@\"\"",
    "Failed to import document \"%@\": \"Cannot retrieve previews of extra \"%@\"\""};
constexpr const char* kCommentaryMessage =
    "Failed to import document \"%@\" : Cannot retrieve derivative of format \"%@\" of audio commentary";

class Merger {
 public:
  Merger(const QuiltDocument& from, const std::vector<std::string>& formats)
      : _title(from.title()), _formats(formats) {}

  /// A copy of the item, or null when a child lacks a format or its previews cannot be made.
  [[nodiscard]] std::shared_ptr<QuiltMedia> copyOf(const QuiltMedia& item) const {
    auto copy = QuiltMedia::init();
    copy->setUuid(item.uuid());
    copy->setTitle(item.title());
    copy->setDescription(item.description());
    copy->setContentCategory(item.contentCategory());

    const bool sourcesCopied = item.performBlockOnSources([&](const auto& source) {
      const auto twin = QuiltMediaSource::init();
      if (!copyChild(*source, twin, kSourceMessages)) return false;
      copy->addSource(twin);
      return true;
    });
    if (!sourcesCopied) return nullptr;

    if (const auto commentary = item.audioCommentarySource()) {
      const auto twin = QuiltMediaSource::init();
      copyFields(*commentary, *twin);
      if (const Text missing = copyDerivatives(*commentary, *twin)) {
        FDYLogger::logWarning(kCommentaryMessage, _title, missing);
        return nullptr;
      }
      copy->setAudioCommentarySource(twin);
    }

    const bool extrasCopied = item.performBlockOnExtra([&](const auto& extra) {
      const auto twin = QuiltMediaExtra::init();
      if (!copyChild(*extra, twin, kExtraMessages)) return false;
      copy->addExtra(twin);
      return true;
    });
    return extrasCopied ? copy : nullptr;
  }

 private:
  bool copyChild(QuiltMediaSource& from, const std::shared_ptr<QuiltMediaSource>& to,
                 const MergeMessages& messages) const {
    copyFields(from, *to);
    if (const Text missing = copyDerivatives(from, *to)) {
      FDYLogger::logWarning(messages.noDerivative, _title, missing, from.title());
      return false;
    }
    if (!copyPreviews(from, to)) {
      FDYLogger::logWarning(messages.noPreviews, _title, from.title());
      return false;
    }
    return true;
  }

  static void copyFields(const QuiltMediaSource& from, QuiltMediaSource& to) {
    to.setUuid(from.uuid());
    to.setTitle(from.title());
    to.setDescription(from.description());
    to.setTimecode(from.timecode());
  }

  /// The first format of which there is no derivative, or none when all were copied.
  Text copyDerivatives(const QuiltMediaSource& from, QuiltMediaSource& to) const {
    for (const std::string& format : _formats) {
      const auto best = from.bestDerivativeForFormat(format);
      const auto url = best ? best->url() : std::nullopt;
      const auto twin = url ? QuiltMediaDerivative::initWithURL(*url) : nullptr;
      if (!twin) return format;
      twin->setUuid(best->uuid());
      to.addDerivative(twin);
    }
    return std::nullopt;
  }

  static bool copyPreviews(QuiltMediaSource& from, const std::shared_ptr<QuiltMediaSource>& to) {
    const bool walked =
        from.previewWithProgressionBlock([&to](const std::shared_ptr<QuiltMediaPreview>& preview, double) {
          const auto twin = preview ? QuiltMediaPreview::initWithImageWrapper(preview->image()) : nullptr;
          if (!twin) return true;
          twin->setUuid(preview->uuid());
          twin->setTitle(preview->title());
          twin->setContent(preview->content());
          twin->setIndex(preview->index());
          twin->setTimecode(preview->timecode());
          to->addPreview(twin);
          return true;
        });
    to->setPreviewsLeftOut(from.previewsLeftOut());
    return walked;
  }

  const Text _title;
  const std::vector<std::string>& _formats;
};

}  // namespace

bool QuiltDocument::mergeIntoDocument(const std::shared_ptr<QuiltDocument>& document,
                                      const std::vector<std::string>& withFormats,
                                      const ProgressionBlock& /*withProgressionBlock*/) {
  if (!document || document.get() == this) {
    FDYLogger::logCritical("Failed to import document \"%@\": \"There is no other document to import it into\"",
                           title());
    return true;
  }
  const platform::Uninterrupted whole;
  const SaveDeferral deferral;
  document->withoutSaving([&] {
    document->setUuid(uuid());
    document->setTitle(title());
    document->setDescription(description());
    document->setAuthor(author());
    document->setKeywords(keywords());
    document->setCategory(category());
    document->setAdvisoryLabel(advisoryLabel());
    document->setJukeboxOrder(jukeboxOrder());
    document->setTheme(theme());
    document->setCollectionOwner(collectionOwner());
    document->setCreationDate(creationDate());
    document->setModifiedDate(modifiedDate());
    document->setType(type());
    document->setLastPublishURL(lastPublishURL());
    document->updatePosterImage(posterImage());

    const Merger merger(*this, withFormats);
    performBlockOnMedia([&](const auto& item) {
      const auto copy = merger.copyOf(*item);
      if (!copy) return false;
      document->addMedia(copy);
      return true;
    });
  });
  return true;
}

}  // namespace quilt
