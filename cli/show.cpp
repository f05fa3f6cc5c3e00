// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>

#include "cli/ActingDelegate.h"
#include "cli/EntryJson.h"
#include "cli/Lookup.h"
#include "cli/PropertyListJson.h"
#include "cli/Summary.h"
#include "cli/Text.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::cli {

namespace {

using platform::Array;
using platform::Dictionary;

std::string textOf(const Dictionary& record, const char* key) { return record.string(key).value_or(""); }

std::string dateOf(const Dictionary& record, const char* key) {
  const auto date = record.date(key);
  return date ? dateText(*date) : "";
}

std::string megaBytes(const Dictionary& record) {
  return sizeText(
      static_cast<std::uint64_t>(std::max(record.real("TotalSizeInMegaBytes").value_or(0), 0.0) * 1024 * 1024));
}

std::string join(const Array& texts) {
  std::string joined;
  for (const platform::PropertyList& text : texts)
    if (const auto* word = text.as<std::string>()) joined += (joined.empty() ? "" : ", ") + *word;
  return joined;
}

template <class Visit>
void eachRecord(const Dictionary& record, const char* key, const Visit& visit) {
  const Array* array = record.array(key);
  if (!array) return;
  for (const platform::PropertyList& element : *array)
    if (const auto* dictionary = element.as<Dictionary>()) visit(*dictionary);
}

// What every kind of object has to say about itself, in the order of the records.
void describe(Summary& summary, const Dictionary& record) {
  for (const auto& [name, key] : {std::pair{"Description", "Description"},
                                  {"Author", "Author"},
                                  {"Copyright", "Copyright"},
                                  {"Keywords", "Keywords"},
                                  {"Category", "Category"},
                                  {"Advisory label", "AdvisoryLabel"}})
    summary.add(name, textOf(record, key));
}

std::string derivativeLine(const Dictionary& derivative) {
  const Array* tags = derivative.array("CompatibilityTags");
  std::string line = tags && !tags->empty() ? join(*tags) : "suits no format";
  if (const std::string mimetype = textOf(derivative, "MimeType"); !mimetype.empty()) line += "  " + mimetype;
  const double width = derivative.real("Width").value_or(0);
  const double height = derivative.real("Height").value_or(0);
  if (width > 0 && height > 0) line += fmt::format("  {:.0f} × {:.0f}", width, height);
  if (const double duration = derivative.real("Duration").value_or(0); duration > 0)
    line += "  " + durationText(duration);
  return line;
}

std::string sourceLines(const char* role, const Dictionary& source) {
  std::string heading = role;
  for (const char* key : {"ContentCategory", "Title"})
    if (const std::string text = textOf(source, key); !text.empty()) heading += "  " + text;
  std::string lines = fmt::format("\n      {}  {}", escaped(heading), megaBytes(source));
  eachRecord(source, "Derivatives",
             [&](const Dictionary& derivative) { lines += "\n        " + escaped(derivativeLine(derivative)); });
  if (const Array* previews = source.array("Previews"); previews && !previews->empty())
    lines += fmt::format("\n        {} preview{}", previews->size(), previews->size() == 1 ? "" : "s");
  return lines;
}

std::string itemLines(const Dictionary& item) {
  std::string lines =
      fmt::format("\n    {}  {}  {}  {}", escaped(textOf(item, "UUID")), escaped(textOf(item, "ContentCategory")),
                  inQuotes(textOf(item, "Title")), megaBytes(item));
  eachRecord(item, "Sources", [&](const Dictionary& source) { lines += sourceLines("source", source); });
  eachRecord(item, "Extras", [&](const Dictionary& extra) { lines += sourceLines("extra", extra); });
  if (const Dictionary* commentary = item.dictionary("AudioCommentarySource"))
    lines += sourceLines("commentary", *commentary);
  return lines;
}

std::string lines(const DocumentEntry& entry, const Dictionary& record, const CollectionEntry* owner) {
  Summary summary;
  summary.add("UUID", entry.uuid);
  summary.add("Type", entry.type);
  if (owner) summary.add("Collection", owner->title);
  describe(summary, record);
  summary.add("Order", record.integer("jukeboxOrder").value_or(0) == 0
                           ? ""
                           : std::to_string(record.integer("jukeboxOrder").value_or(0)));
  summary.add("Theme", textOf(record, "ThemePath"));
  summary.add("Created", dateOf(record, "CreationDate"));
  summary.add("Modified", dateOf(record, "ModifiedDate"));
  summary.add("Published at", textOf(record, "LastPublishURL"));
  summary.add("Duration", durationText(record.real("DocumentDuration").value_or(0)));
  summary.add("Path", entry.path.native());
  std::string text = escaped(entry.title) + "\n" + summary.text();
  if (!entry.items.empty()) text += "\n  Items";
  eachRecord(record, "Media", [&](const Dictionary& item) { text += itemLines(item); });
  return text;
}

std::string lines(const CollectionEntry& entry, const Dictionary& record) {
  Summary summary;
  summary.add("UUID", entry.uuid);
  describe(summary, record);
  summary.add("Preferred theme", textOf(record, "PreferredThemePath"));
  summary.add("Created", dateOf(record, "CreationDate"));
  summary.add("Modified", dateOf(record, "ModifiedDate"));
  summary.add("Published at", textOf(record, "LastPublishURL"));
  summary.add("Path", entry.path.native());
  std::string text = escaped(entry.title) + "\n" + summary.text();
  if (!entry.documents.empty()) text += "\n  Documents";
  for (const DocumentEntry& document : entry.documents)
    text += fmt::format("\n    {}  {}  {}", escaped(document.uuid), padded(escaped(document.type), 11),
                        document.damage ? "damaged: " + escaped(document.damage->text) : escaped(document.title));
  return text;
}

// The record's own keys beside the ones that every object has.
Json whole(const Json& entry, const Dictionary& record) {
  Json json = entry;
  for (const auto& [key, value] : record) json[key] = toJson(value);
  return json;
}

void showDocument(const DocumentEntry& entry, const CollectionEntry* owner, Output& output) {
  const auto record = readDocumentRecord(entry.path);
  if (!record) throw Failure("The document " + inQuotes(entry.path.native()) + " cannot be read", record.error());
  Json json = whole(toJson(entry), *record);
  json["collection"] = owner ? Json{{"uuid", owner->uuid}, {"title", owner->title}} : Json();
  output.object(std::move(json), lines(entry, *record, owner));
}

void showCollection(const CollectionEntry& entry, Output& output) {
  const auto record = readCollectionRecord(entry.path);
  if (!record) throw Failure("The collection " + inQuotes(entry.path.native()) + " cannot be read", record.error());
  output.object(whole(toJson(entry), *record), lines(entry, *record));
}

// A package outside the library, such as an exported one.
bool isPackage(const Path& path) { return platform::services().files->fileExistsAtPath(path / "properties.plist"); }

}  // namespace

void ActingDelegate::perform(const ShowRequest& request) {
  const Catalogue catalogue = readCatalogue(library());
  try {
    const Found found = find(catalogue, request.object, {.collections = true, .documents = true});
    if (const auto* document = std::get_if<FoundDocument>(&found)) {
      showDocument(*document->document, document->collection, _context.output);
    } else {
      showCollection(*std::get<FoundCollection>(found).collection, _context.output);
    }
  } catch (const Failure& failure) {
    if (failure.code != ExitCode::NotFound || !isPackage(absolutePath(request.object))) throw;
    showDocument(readDocumentEntry(absolutePath(request.object)), nullptr, _context.output);
  }
}

}  // namespace quilt::cli
