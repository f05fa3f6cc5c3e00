// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>

#include <charconv>
#include <map>

#include "cli/ActingDelegate.h"
#include "cli/LibrarySession.h"
#include "cli/Saving.h"
#include "cli/Text.h"
#include "cli/ThemeLookup.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::cli {

namespace {

using platform::services;

/// What to set, checked: nothing in it can be refused by the object that it is meant for.
struct Changes {
  std::map<std::string, Text> texts;
  std::optional<std::int64_t> order;
  std::optional<std::shared_ptr<QuiltTheme>> theme;     ///< null clears
  std::optional<std::shared_ptr<ImageWrapper>> poster;  ///< null clears
};

struct KindOfObject {
  const char* name;
  std::vector<std::string> textKeys;
  std::vector<std::string> otherKeys;
};

const KindOfObject& kindOf(const Found& found) {
  static const KindOfObject collection{
      "collection",
      {"title", "description", "author", "copyright", "keywords", "category", "advisoryLabel"},
      {"theme", "poster"}};
  static const KindOfObject document{"document",
                                     {"title", "description", "author", "keywords", "category", "advisoryLabel"},
                                     {"jukeboxOrder", "theme", "poster"}};
  static const KindOfObject item{"item", {"title", "description"}, {}};
  return std::holds_alternative<FoundCollection>(found) ? collection
         : std::holds_alternative<FoundDocument>(found) ? document
                                                        : item;
}

bool contains(const std::vector<std::string>& words, const std::string& word) {
  return std::find(words.begin(), words.end(), word) != words.end();
}

std::int64_t readOrder(const std::string& value) {
  std::int64_t order = 0;
  if (value.empty()) return order;
  const auto [end, error] = std::from_chars(value.data(), value.data() + value.size(), order);
  if (error != std::errc() || end != value.data() + value.size())
    throw Failure(ExitCode::Usage, "jukeboxOrder is a whole number, not " + inQuotes(value));
  return order;
}

std::shared_ptr<ImageWrapper> readPoster(const std::string& value) {
  if (value.empty()) return nullptr;
  const Path path = absolutePath(value);
  auto image = services().images->imageWithPath(path);
  if (!image) throw Failure("Cannot use the poster " + inQuotes(value), image.error());
  return *std::move(image);
}

Changes check(const SetRequest& request, const Found& found) {
  const KindOfObject& kind = kindOf(found);
  Changes changes;
  for (const auto& [key, value] : request.values) {
    if (contains(kind.textKeys, key)) {
      changes.texts[key] = value.empty() ? Text() : Text(value);
    } else if (!contains(kind.otherKeys, key)) {
      throw Failure(ExitCode::Usage, fmt::format("{} cannot be set on {} {}; see \"quilt help set\"", inQuotes(key),
                                                 *kind.name == 'i' ? "an" : "a", kind.name));
    } else if (key == "jukeboxOrder") {
      changes.order = readOrder(value);
    } else if (key == "theme") {
      changes.theme = value.empty() ? nullptr : findTheme(value);
    } else {
      changes.poster = readPoster(value);
    }
  }
  return changes;
}

Found findObject(const Catalogue& catalogue, const std::string& name) {
  return find(catalogue, name, {.collections = true, .documents = true, .items = true});
}

// The same property of each kind of object, by its key.
template <class Object>
void setTexts(Object& object, const std::map<std::string, Text>& texts) {
  for (const auto& [key, text] : texts) {
    if (key == "title") object.setTitle(text);
    if (key == "description") object.setDescription(text);
    if constexpr (!std::is_same_v<Object, QuiltMedia>) {
      if (key == "author") object.setAuthor(text);
      if (key == "keywords") object.setKeywords(text);
      if (key == "category") object.setCategory(text);
      if (key == "advisoryLabel") object.setAdvisoryLabel(text);
    }
    if constexpr (std::is_same_v<Object, QuiltCollection>)
      if (key == "copyright") object.setCopyright(text);
  }
}

std::optional<platform::FileIdentity> identityOf(const Path& file) {
  const auto attributes = services().files->attributesOfItemAtPath(file);
  return attributes ? std::optional(attributes->identity) : std::nullopt;
}

void setPoster(QuiltDocument& document, const std::shared_ptr<ImageWrapper>& poster) {
  const Path file = document.posterImagePath();
  const auto before = identityOf(file);
  document.updatePosterImage(poster);
  if (!poster && before) (void)services().files->removeItem(file, document.path());
  // The document does not tell whether the file was written.
  if (poster ? identityOf(file) == before : identityOf(file).has_value())
    throw Failure(ExitCode::InputOutput, "The poster " + inQuotes(file.native()) + " cannot be changed", file);
}

void setPoster(QuiltCollection& collection, const std::shared_ptr<ImageWrapper>& poster) {
  const Path file = collection._posterImageFilepath();
  const auto before = identityOf(file);
  collection.setPosterImage(poster);
  if (poster ? identityOf(file) == before : identityOf(file).has_value())
    throw Failure(ExitCode::InputOutput, "The poster " + inQuotes(file.native()) + " cannot be changed", file);
}

template <class Object>
void save(Object& object, const LogCollector& log, const std::function<void()>& change) {
  if (!changeAndSave(object, change))
    throw explain(inQuotes(object.title().value_or("")) + " cannot be saved", log, object.path(), object.path());
}

Json result(const std::string& uuid, const Text& title, const char* kind, const Text& type, const Path& path) {
  return {{"uuid", uuid}, {"title", title.value_or("")}, {kind, type.value_or("")}, {"path", path.native()}};
}

Json apply(const Changes& changes, QuiltCollection& collection, const LogCollector& log) {
  save(collection, log, [&] {
    setTexts(collection, changes.texts);
    if (changes.theme) collection.setPreferredTheme(*changes.theme);
  });
  if (changes.poster) setPoster(collection, *changes.poster);
  return result(collection.uuid(), collection.title(), "type", "Collection", collection.path());
}

Json apply(const Changes& changes, QuiltDocument& document, const LogCollector& log) {
  save(document, log, [&] {
    setTexts(document, changes.texts);
    if (changes.order) document.setJukeboxOrder(*changes.order);
    if (changes.theme) document.setTheme(*changes.theme);
  });
  if (changes.poster) setPoster(document, *changes.poster);
  return result(document.uuid(), document.title(), "type", document.type(), document.path());
}

Json apply(const Changes& changes, QuiltDocument& document, const std::string& item, const LogCollector& log) {
  const auto media = document.mediaWithUUID(item);
  if (!media) throw Failure(ExitCode::Invalid, "The item " + inQuotes(item) + " cannot be opened", document.path());
  save(document, log, [&] { setTexts(*media, changes.texts); });
  return result(media->uuid(), media->title(), "category", media->contentCategory(), media->path());
}

Json apply(const Changes& changes, const Found& found, LibrarySession& session, const LogCollector& log) {
  if (const auto* collection = std::get_if<FoundCollection>(&found))
    return apply(changes, *session.open(*collection->collection), log);
  if (const auto* document = std::get_if<FoundDocument>(&found)) return apply(changes, *session.open(*document), log);
  const auto& item = std::get<FoundItem>(found);
  return apply(changes, *session.open(FoundDocument{item.collection, item.document}), item.item->uuid, log);
}

void lock(const Found& found, LibrarySession& session) {
  if (const auto* collection = std::get_if<FoundCollection>(&found)) return session.lock(*collection);
  if (const auto* document = std::get_if<FoundDocument>(&found)) return session.lock(*document);
  const auto& item = std::get<FoundItem>(found);
  session.lock(FoundDocument{item.collection, item.document});
}

}  // namespace

void ActingDelegate::perform(const SetRequest& request) {
  LibrarySession session(library(), _context);
  {
    const Found before = findObject(session.catalogue(), request.object);
    (void)check(request, before);
    lock(before, session);
  }
  const Found found = findObject(session.catalogue(), request.object);
  _context.output.object(apply(check(request, found), found, session, _context.log), "");
}

void PreviewDelegate::perform(const SetRequest& request) {
  _context.output.beginList();
  const Catalogue catalogue = readCatalogue(library());
  const Found found = findObject(catalogue, request.object);
  (void)check(request, found);
  for (const auto& [key, value] : request.values)
    plan({{"action", "set"}, {"object", request.object}, {"key", key}, {"value", value.empty() ? Json() : Json(value)}},
         value.empty() ? fmt::format("Would clear {} of the {} {}", key, kindOf(found).name, inQuotes(request.object))
                       : fmt::format("Would set {} of the {} {} to {}", key, kindOf(found).name,
                                     inQuotes(request.object), inQuotes(value)));
}

}  // namespace quilt::cli
