// SPDX-License-Identifier: Apache-2.0
#include "cli/Items.h"

#include <fmt/format.h>
#include <strings.h>

#include <algorithm>

#include "cli/Failure.h"
#include "cli/Saving.h"
#include "cli/Text.h"
#include "quilt/media/QuiltMediaExtra.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::cli {

namespace {

using platform::services;
using platform::Url;

NewSource lookAtPage(const std::string& typed) {
  const auto url = Url::parse(typed);
  // Whatever else has this form ("javascript://…") is nothing that a reader should follow.
  const bool isWeb = strncasecmp(typed.c_str(), "http://", 7) == 0 || strncasecmp(typed.c_str(), "https://", 8) == 0;
  if (!url || !isWeb) throw Failure(ExitCode::Invalid, "Cannot use " + inQuotes(typed) + ": It is no web address");
  return {*url, typed, kQuiltMediaContentCategoryWeb};
}

NewSource lookAtFile(const std::string& typed, const Path& base) {
  const std::string cannot = "Cannot use " + inQuotes(typed);
  const Path path = absolutePath(base.empty() || typed.empty() ? typed : (base / typed).native());
  const auto attributes = services().files->attributesOfItemAtPath(path);
  if (!attributes) throw Failure(cannot, attributes.error());
  if (attributes->kind == platform::FileKind::Folder)
    throw Failure(ExitCode::Invalid, cannot + ": It is a folder, not a file", path);
  const auto type = platform::FDYTypePreferredIdentifier(path);
  if (!QuiltMediaSource::contentCategoryForContentType(type))
    throw Failure(ExitCode::Invalid,
                  cannot + ": " + (type ? "Files of type " + escaped(*type) : "Files of this kind") +
                      " cannot be shown; movies, audio, images, PDF, EPUB and office documents can",
                  path);
  // Pictures are looked at by what loads them, and office documents when their pages are.
  const auto facts = services().inspector->inspect(path);
  const auto source = QuiltMediaSource::initWithPath(path);
  if (!source && !facts) throw Failure(cannot, platform::Error{facts.error().kind, facts.error().text, path});
  if (!source) throw Failure(ExitCode::Invalid, cannot + ": It suits none of the formats Desktop, 720p and 480p", path);
  const bool hasTitle = facts && facts->metadataTitle && !facts->metadataTitle->empty();
  return {Url::fileUrl(path), hasTitle ? *facts->metadataTitle : asTitle(path.stem().native()),
          source->contentCategory().value_or(""), attributes->size};
}

template <class Source>
std::shared_ptr<Source> makeSource(const NewSource& from) {
  const auto source = Source::initWithURL(from.url);
  if (!source) return nullptr;
  source->setTitle(from.title);
  source->setDescription(from.description);
  source->setTimecode(from.timecode);
  return source;
}

std::shared_ptr<QuiltMedia> makeItem(const NewItem& from) {
  auto item = QuiltMedia::init();
  item->setTitle(from.title);
  item->setDescription(from.description);
  if (from.category) item->setContentCategory(from.category);
  for (const NewSource& one : from.sources) {
    const auto source = makeSource<QuiltMediaSource>(one);
    if (!source) return nullptr;
    item->addSource(source);
  }
  for (const NewSource& one : from.extras) {
    const auto extra = makeSource<QuiltMediaExtra>(one);
    if (!extra) return nullptr;
    item->addExtra(extra);
  }
  if (from.commentary) {
    const auto commentary = makeSource<QuiltMediaSource>(*from.commentary);
    if (!commentary) return nullptr;
    item->setAudioCommentarySource(commentary);
  }
  return item;
}

/// Holds back the saves of a document while several changes belong together, and saves them at the end.
class Transaction {
 public:
  explicit Transaction(QuiltDocument& document) : _document(document) { _document.setIsProcessing(true); }
  Transaction(const Transaction&) = delete;
  Transaction& operator=(const Transaction&) = delete;
  ~Transaction() {
    if (_isOpen) _document.setIsProcessing(false);
  }

  /// False when the document could not be saved; further changes are part of no save.
  bool save() {
    _document.setIsProcessing(false);
    const bool saved = _document.update();
    _isOpen = !saved;
    if (!saved) _document.setIsProcessing(true);
    return saved;
  }

 private:
  QuiltDocument& _document;
  bool _isOpen = true;
};

}  // namespace

bool isWebAddress(const std::string& text) {
  const std::size_t colon = text.find("://");
  if (colon == std::string::npos || colon == 0) return false;
  const auto isSchemeCharacter = [](unsigned char c) { return std::isalnum(c) || c == '+' || c == '-' || c == '.'; };
  const auto end = text.begin() + static_cast<std::ptrdiff_t>(colon);
  return std::all_of(text.begin(), end, isSchemeCharacter) && text.substr(0, colon) != "file";
}

NewSource lookAt(const std::string& typed, const Path& base) {
  if (isWebAddress(typed)) return lookAtPage(typed);
  if (typed.starts_with("file://"))
    if (const auto url = Url::parse(typed)) return lookAtFile(url->relativePath().native(), {});
  return lookAtFile(typed, base);
}

void checkSources(const NewItem& item) {
  const auto all = [&item](auto... categories) {
    return std::all_of(item.sources.begin(), item.sources.end(),
                       [&](const NewSource& source) { return ((source.category == categories) || ...); });
  };
  if (item.category == kQuiltMediaContentCategoryMontage) {
    if (!all(kQuiltMediaContentCategoryImage))
      throw Failure(ExitCode::Invalid, "A montage is made of images; add other files by themselves");
  } else if (item.category == kQuiltMediaContentCategoryDualSource) {
    if (item.sources.size() != 2)
      throw Failure(ExitCode::Invalid,
                    fmt::format("A dual-source item is made of two files, and not of {}", item.sources.size()));
    if (!all(kQuiltMediaContentCategoryMovie, kQuiltMediaContentCategoryAudio))
      throw Failure(ExitCode::Invalid, "A dual-source item is made of two movies, or of audio and a movie");
  }
}

void checkCommentary(const NewSource& commentary) {
  if (commentary.category != kQuiltMediaContentCategoryAudio)
    throw Failure(ExitCode::Invalid,
                  "Cannot use " + inQuotes(commentary.title) + " as a commentary: It is no audio file",
                  commentary.url.relativePath());
}

double weightOf(const NewSource& source) {
  constexpr double kEach = 1e6;  // a small file takes its time, too
  return static_cast<double>(source.size) + kEach;
}

double weightOf(const NewItem& item) {
  double weight = item.commentary ? weightOf(*item.commentary) : 0;
  for (const NewSource& source : item.sources) weight += weightOf(source);
  for (const NewSource& extra : item.extras) weight += weightOf(extra);
  return weight;
}

std::shared_ptr<QuiltMedia> addItem(QuiltDocument& document, const NewItem& item, const ProgressionBlock& block,
                                    SaveTime time) {
  const auto media = makeItem(item);
  if (!media) return nullptr;
  Transaction transaction(document);
  document.addMedia(media);
  if (media->flattenWithProgressionBlock(block) && (time == SaveTime::Later || transaction.save())) return media;
  document.removeMedia(media);
  return nullptr;
}

std::shared_ptr<QuiltMediaExtra> addExtra(QuiltDocument& document, QuiltMedia& item, const NewSource& from,
                                          const ProgressionBlock& block) {
  const auto extra = makeSource<QuiltMediaExtra>(from);
  if (!extra) return nullptr;
  Transaction transaction(document);
  item.addExtra(extra);
  if (extra->flattenCopy(/*copy=*/true, block) && transaction.save()) return extra;
  item.removeExtra(extra);
  return nullptr;
}

std::shared_ptr<QuiltMediaSource> setCommentary(QuiltDocument& document, QuiltMedia& item, const NewSource& from,
                                                const ProgressionBlock& block) {
  const auto commentary = makeSource<QuiltMediaSource>(from);
  if (!commentary) return nullptr;
  const auto before = item.audioCommentarySource();
  const Path filesBefore = before ? before->path() : Path();
  const auto removeFiles = [&document](const Path& folder) {
    if (!folder.empty() && services().files->fileExistsAtPath(folder))
      document.removeItem(folder, "Failed to delete audio commentary at path \"%@\": \"%@\"");
  };
  Transaction transaction(document);
  item.setAudioCommentarySource(commentary);
  if (commentary->flattenCopy(/*copy=*/true, block)) {
    removeFiles(filesBefore);  // for good with the save, which brings them back when it fails
    if (transaction.save()) return commentary;
  }
  removeFiles(commentary->path());
  item.setAudioCommentarySource(before);
  return nullptr;
}

}  // namespace quilt::cli
