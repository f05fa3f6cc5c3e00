// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>

#include "cli/ActingDelegate.h"
#include "cli/Interrupt.h"
#include "cli/Summary.h"
#include "cli/Text.h"
#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::cli {

namespace {

using platform::MediaFacts;
using platform::services;

// What inspection tells of a PDF's pages, which is told of every document here.
constexpr const char* kPagesDetail = "Pages";

/// Everything the library sees in a file.
struct Sight {
  Path path;
  std::uint64_t size = 0;  ///< bytes
  std::string contentType;
  std::string mimeType;
  std::string category;
  std::vector<std::string> tags;
  bool importable = false;
  std::optional<std::size_t> pages;  ///< of a document
  MediaFacts facts;
};

// Office documents are converted to be counted, which takes seconds.
std::size_t pageCount(const Path& file) {
  platform::FDYPreviewPrepareDocument(file, [] { return !Interrupt::isRequested(); });
  return Interrupt::isRequested() ? 0 : platform::FDYPreviewDocumentPagesCount(file);
}

// Throws a Failure, with the reason, when the file cannot be used.
Sight look(const std::string& name) {
  const std::string cannot = "Cannot use " + inQuotes(name);
  Sight sight;
  sight.path = absolutePath(name);
  const auto attributes = services().files->attributesOfItemAtPath(sight.path);
  if (!attributes) throw Failure(cannot, attributes.error());
  if (attributes->kind == platform::FileKind::Folder)
    throw Failure(ExitCode::Invalid, cannot + ": It is a folder, not a file", sight.path);
  sight.size = attributes->size;
  auto facts = services().inspector->inspect(sight.path);
  if (!facts) throw Failure(cannot, platform::Error{facts.error().kind, facts.error().text, sight.path});
  sight.facts = *std::move(facts);
  const Text type = platform::FDYTypePreferredIdentifier(sight.path);
  sight.contentType = type.value_or("");
  sight.category = QuiltMediaSource::contentCategoryForContentType(type).value_or("");
  sight.mimeType = sight.facts.mimeType ? *sight.facts.mimeType
                                        : (type ? services().types->mimeType(*type) : std::nullopt).value_or("");
  if (const auto derivative = QuiltMediaDerivative::initWithURL(Url::fileUrl(sight.path)))
    sight.tags = derivative->compatibilityTags().value_or(std::vector<std::string>());
  sight.importable = QuiltDocument::canImportFromPath(sight.path);
  if (sight.category == kQuiltMediaContentCategoryDocument) sight.pages = pageCount(sight.path);
  return sight;
}

Json orNull(const std::optional<std::string>& text) { return text ? Json(*text) : Json(); }

Json json(const Sight& sight) {
  const MediaFacts& facts = sight.facts;
  Json json{{"path", sight.path.native()},
            {"title", orNull(facts.metadataTitle)},
            {"category", sight.category},
            {"contentType", sight.contentType},
            {"mimeType", sight.mimeType},
            {"tags", sight.tags},
            {"importable", sight.importable},
            {"size", sight.size},
            {"hasVideo", facts.hasVideo},
            {"hasAudio", facts.hasAudio},
            {"videoCodec", facts.videoCodecName},
            {"audioCodec", facts.audioCodecName},
            {"width", facts.width},
            {"height", facts.height},
            {"duration", facts.duration},
            {"pages", sight.pages ? Json(*sight.pages) : Json()},
            {"information", orNull(facts.metadataInformation)},
            {"author", orNull(facts.metadataAuthor)},
            {"chapters", Json::array()},
            {"details", Json::object()}};
  for (const platform::Chapter& chapter : facts.chapters)
    json["chapters"].push_back({{"title", chapter.name}, {"start", chapter.start}});
  for (const auto& [name, text] : facts.details) json["details"][name] = text;
  return json;
}

std::string listed(const std::vector<std::string>& words) {
  std::string text;
  for (const std::string& word : words) text += (text.empty() ? "" : ", ") + word;
  return text;
}

std::string lines(const Sight& sight) {
  const MediaFacts& facts = sight.facts;
  Summary summary;
  summary.add("Type", sight.contentType);
  summary.add("MIME type", sight.mimeType);
  summary.add("Category", sight.category.empty() ? "none" : sight.category);
  summary.add("Suits", sight.tags.empty() ? "no format" : listed(sight.tags));
  summary.add("Size", sizeText(sight.size));
  summary.add("Video", facts.hasVideo ? facts.videoCodecName : "");
  summary.add("Audio", facts.hasAudio ? facts.audioCodecName : "");
  if (facts.width > 0 && facts.height > 0)
    summary.add("Pixels", fmt::format("{:.0f} × {:.0f}", facts.width, facts.height));
  if (facts.duration > 0) summary.add("Duration", durationText(facts.duration));
  summary.add("Title", facts.metadataTitle.value_or(""));
  summary.add("Information", facts.metadataInformation.value_or(""));
  summary.add("Author", facts.metadataAuthor.value_or(""));
  if (sight.pages) summary.add("Pages", std::to_string(*sight.pages));
  for (const auto& [name, text] : facts.details)
    if (name != kPagesDetail) summary.add(name, text);
  for (const platform::Chapter& chapter : facts.chapters)
    summary.add("Chapter", padded(durationText(chapter.start), 8) + chapter.name);
  return escaped(sight.path.native()) + "\n" + summary.text();
}

}  // namespace

void ActingDelegate::perform(const InfoRequest& request) {
  _context.output.beginList();
  std::vector<Failure> failures;
  std::size_t done = 0;
  for (const std::string& file : request.files) {
    std::optional<Sight> sight;
    try {
      if (!Interrupt::isRequested()) sight = look(file);
    } catch (const Failure& failure) {
      failures.push_back(failure);
    }
    if (Interrupt::isRequested())
      throw Interrupt::failure(fmt::format("{} of {} files were looked at", done, request.files.size()));
    if (!sight) continue;
    _context.output.item(json(*sight), lines(*sight));
    ++done;
  }
  throwIfAny(failures, done, "files cannot be used");
}

}  // namespace quilt::cli
