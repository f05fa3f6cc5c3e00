// SPDX-License-Identifier: Apache-2.0
#include "tests/support/RecordChecks.h"

#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/interfaces/Services.h"
#include "tests/support/PlainFiles.h"
#include "tests/support/PropertyListChecks.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::support {

using namespace platform;

namespace {

/// A clock that stands still, so that a record saved twice is the same.
class StandingClock final : public Clock {
 public:
  [[nodiscard]] Date now() const override { return *parseIso8601("2026-03-05T14:07:09Z"); }
};

std::string xmlOf(const Dictionary& record) { return services().propertyLists->serialize(record); }

void readSource(QuiltMediaSource& source) {
  static_cast<void>(source.path());
  static_cast<void>(source.contentCategory());
  for (const auto& derivative : source.derivatives()) {
    static_cast<void>(derivative->url());
    static_cast<void>(derivative->totalSizeInMegaBytes());
  }
  for (const auto& preview : source.previews()) static_cast<void>(preview->image());
  static_cast<void>(source.dictionary());
}

/// What a host reads to show a document.
void readEverything(QuiltDocument& document) {
  static_cast<void>(document.posterImagePath());
  static_cast<void>(document.isFlattened());
  static_cast<void>(services().json->toJSON(document.dictionary()));
  for (const auto& item : document.media()) {
    static_cast<void>(item->contentCategory());
    static_cast<void>(item->totalSizeInMegaBytes());
    for (const auto& source : item->sources()) readSource(*source);
    for (const auto& extra : item->extras()) readSource(*extra);
    if (const auto commentary = item->audioCommentarySource()) readSource(*commentary);
  }
}

}  // namespace

std::string problemWithRecord(std::string_view properties) {
  static const ScratchFolder scratch;
  const ScopedService clock(&Services::clock, std::make_shared<StandingClock>());
  const auto package = scratch / "package.qpk";
  const auto file = package / kQuiltDocumentPropertiesFilename;
  std::filesystem::remove_all(package);
  writePlainly(file, properties);

  const auto document = QuiltDocument::initWithPath(package);
  if (document) {
    readEverything(*document);
    if (!document->update()) return "It cannot be saved.";
    const std::string saved = readPlainly(file);
    if (xmlOf(document->dictionary()) != saved) return "What was saved is not what it holds.";
    const auto again = QuiltDocument::initWithPath(package);
    if (!again) return "What was saved cannot be opened.";
    if (xmlOf(again->dictionary()) != saved) return "What was saved reads as another record.";
    if (!again->update() || readPlainly(file) != saved) return "Saved again it is another record.";
    if (const auto value = services().propertyLists->parse(saved); !value || !problemWith(*value).empty())
      return "What was saved is no right property list.";
  } else if (readPlainly(file) != properties) {
    return "It was refused and changed.";
  }
  return namesIn(scratch.path()) == std::vector<std::string>{"package.qpk"} ? "" : "Something lies outside.";
}

}  // namespace quilt::support
