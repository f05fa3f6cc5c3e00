// SPDX-License-Identifier: Apache-2.0
// What can happen in every story. Each operation changes what must be there, and has the teller do the same.
#include <fmt/format.h>

#include <algorithm>

#include "tests/story/Story.h"

namespace quilt::story {

namespace {

/// A page needs a theme.
bool canBeFinished(const Document& document) {
  return hasItems(document) && (document.type != "Interactive" || !document.theme.empty());
}
bool isPicture(const Material& material) { return material.category == "Image"; }
bool isSound(const Material& material) { return material.category == "Audio"; }
bool isMovie(const Material& material) { return material.category == "Movie"; }

std::string titleOf(const Path& file) { return file.stem(); }

bool makeADocument(Story& story, Teller& teller) {
  const std::string title = story.freshTitle("Story");
  story.contents.documents.push_back({title, "Interactive"});
  story.mayAlsoBe(story.contents);
  story.contents.documents.back().theme = story.theme().filename();
  story.step(title, [&] { return teller.newDocument(title, story.theme()); });
  return true;
}

bool importAFile(Story& story, Teller& teller) {
  const Material& material = story.anyMaterial([](const Material& one) { return !one.importsAs.empty(); });
  const Path file = story.outside(material);
  story.contents.documents.push_back({titleOf(file), material.importsAs, {{"", material.category, {&material}}}});
  story.step(file.filename(), [&] { return teller.importFile(file); });
  return true;
}

bool addFiles(Story& story, Teller& teller) {
  Document* document = story.anyDocument();
  if (!document) return false;
  const Document target = *document;
  std::vector<std::string> sources;
  std::string what;
  for (std::size_t i = 0, count = 1 + story.dice.below(3); i < count; ++i) {
    if (i > 0) story.mayAlsoBe(story.contents);
    const Material& material =
        story.anyMaterial([](const Material& one) { return !one.importsAs.empty() || !one.pages.empty(); });
    const Path file = story.outside(material);
    sources.push_back(file);
    document->items.push_back({titleOf(file), material.category, {&material}});
    what += file.filename().native() + " ";
  }
  story.step(what + "to " + target.title, [&] { return teller.addItems(target, sources); });
  return true;
}

bool addALink(Story& story, Teller& teller) {
  Document* document = story.anyDocument();
  if (!document) return false;
  const Document target = *document;
  const std::string address = webPage()->name + story.freshTitle("#").substr(2);
  document->items.push_back({address, "Web", {webPage()}});
  story.step("to " + target.title, [&] { return teller.addItems(target, {address}); });
  return true;
}

bool addAComposition(Story& story, Teller& teller, const std::string& category,
                     const std::vector<const Material*>& parts) {
  Document* document = story.anyDocument();
  if (!document) return false;
  const Document target = *document;
  const std::string title = story.freshTitle(category);
  std::vector<Path> files;
  for (const Material* part : parts) files.push_back(story.outside(*part));
  document->items.push_back({title, category, parts});
  story.step("to " + target.title, [&] { return teller.addComposition(target, category, title, files); });
  return true;
}

bool addAMontage(Story& story, Teller& teller) {
  std::vector<const Material*> parts;
  for (std::size_t i = 0, count = 1 + story.dice.below(5); i < count; ++i)
    parts.push_back(&story.anyMaterial(isPicture));
  return addAComposition(story, teller, "Montage", parts);
}

bool addTwoSidesByEachOther(Story& story, Teller& teller) {
  const Material& first = story.anyMaterial([](const Material& one) { return isSound(one) || isMovie(one); });
  return addAComposition(story, teller, "DualSource", {&first, &story.anyMaterial(isMovie)});
}

bool addAnExtra(Story& story, Teller& teller) {
  Document* document = story.anyDocument(hasItems);
  if (!document) return false;
  const Document target = *document;
  Item& item = story.dice.anyOf(document->items);
  const Item before = item;
  const Material& material = story.anyMaterial([](const Material&) { return true; });
  const Path file = story.outside(material);
  item.extras.push_back(&material);
  story.step(file.filename().native() + " to " + item.title, [&] { return teller.addExtra(target, before, file); });
  return true;
}

bool speakOver(Story& story, Teller& teller) {
  Document* document = story.anyDocument(hasItems);
  if (!document) return false;
  const Document target = *document;
  Item& item = story.dice.anyOf(document->items);
  const Item before = item;
  const Material& material = story.anyMaterial(isSound);
  const Path file = story.outside(material);
  item.commentary = {&material};
  story.step(item.title, [&] { return teller.setCommentary(target, before, file); });
  return true;
}

bool removeAnItem(Story& story, Teller& teller) {
  Document* document = story.anyDocument(hasItems);
  if (!document) return false;
  const Document target = *document;
  const std::size_t place = story.dice.below(document->items.size());
  document->items.erase(document->items.begin() + static_cast<std::ptrdiff_t>(place));
  story.step(target.items[place].title + " of " + target.title,
             [&] { return teller.removeItem(target, target.items[place]); });
  return true;
}

bool removeADocument(Story& story, Teller& teller) {
  Document* document = story.anyDocument();
  if (!document || story.contents.documents.size() < 3) return false;
  const Document target = *document;
  std::erase_if(story.contents.documents, [&](const Document& one) { return one.uuid == target.uuid; });
  story.step(target.title, [&] { return teller.removeDocument(target); });
  return true;
}

bool moveAnItem(Story& story, Teller& teller) {
  Document* document = story.anyDocument([](const Document& one) { return one.items.size() > 1; });
  if (!document) return false;
  const Document target = *document;
  const std::size_t from = story.dice.below(target.items.size());
  const std::size_t to = story.dice.below(target.items.size());
  document->items.erase(document->items.begin() + static_cast<std::ptrdiff_t>(from));
  document->items.insert(document->items.begin() + static_cast<std::ptrdiff_t>(to), target.items[from]);
  story.step(fmt::format("{} to {} in {}", from, to, target.title), [&] { return teller.moveItem(target, from, to); });
  return true;
}

bool setATitle(Story& story, Teller& teller) {
  Document* document = story.anyDocument();
  if (!document) return false;
  const Document target = *document;
  document->title = story.freshTitle("Renamed");
  const std::string title = document->title;
  story.step(target.title + " to " + title, [&] { return teller.setTitle(target, title); });
  return true;
}

bool setADescription(Story& story, Teller& teller) {
  Document* document = story.anyDocument();
  if (!document) return false;
  document->description = story.freshTitle("the sea & <its> \"waves\"");
  const Document target = *document;
  story.step(target.title, [&] { return teller.setDescription(target, target.description); });
  return true;
}

bool nameAnItem(Story& story, Teller& teller) {
  Document* document = story.anyDocument(hasItems);
  if (!document) return false;
  const Document target = *document;
  Item& item = story.dice.anyOf(document->items);
  const Item before = item;
  item.title = story.freshTitle("Chapter");
  const std::string title = item.title;
  story.step(title, [&] { return teller.setItemTitle(target, before, title); });
  return true;
}

bool setAPoster(Story& story, Teller& teller) {
  Document* document = story.anyDocument();
  if (!document) return false;
  const Material& material =
      story.anyMaterial([](const Material& one) { return isPicture(one) && !one.pages.empty(); });
  const Path file = story.outside(material);
  document->poster = material.pages[0];
  const Document target = *document;
  story.step(file.filename().native() + " of " + target.title, [&] { return teller.setPoster(target, file); });
  return true;
}

bool convertADocument(Story& story, Teller& teller) {
  Document* document = story.anyDocument(hasItems);
  if (!document) return false;
  const std::string format = story.dice.isLucky(3) ? "720p" : "480p";
  story.step(document->title + " to " + format, [&] { return teller.convert(*document, format); });
  return true;
}

bool finalizeADocument(Story& story, Teller& teller) {
  Document* document = story.anyDocument(canBeFinished);
  if (!document) return false;
  story.step(document->title, [&] { return teller.finalize(*document); });
  return true;
}

bool exportADocument(Story& story, Teller& teller) {
  Document* document = story.anyDocument(canBeFinished);
  if (!document) return false;
  const Document target = *document;
  const Path folder = story.freshFolder();
  const bool isZipped = story.dice.isLucky(3);
  const auto once = [&] {
    Path made;
    story.step(target.title + (isZipped ? ", zipped" : ""),
               [&] { return teller.exportTo(target, folder, isZipped, made); });
    if (!made.empty()) story.expectPackage(made, target);
  };
  once();
  if (story.wasStopped()) once();  // the next one puts in order what the first has left
  return true;
}

bool loseTheOriginals(Story& story, Teller& teller) {
  story.step("", [&] { return teller.bringEverythingIn(); });
  story.loseTheOriginals();
  return true;
}

}  // namespace

std::vector<Operation> commonOperations(Teller& teller) {
  const auto operation = [&teller](const char* name, std::size_t weight, bool (*tell)(Story&, Teller&)) {
    return Operation{name, weight, [&teller, tell](Story& story) { return tell(story, teller); }};
  };
  return {
      operation("new", 4, makeADocument),
      operation("import", 3, importAFile),
      operation("add", 7, addFiles),
      operation("add a link", 1, addALink),
      operation("add a montage", 2, addAMontage),
      operation("add a dual source", 1, addTwoSidesByEachOther),
      operation("add an extra", 2, addAnExtra),
      operation("set the commentary", 1, speakOver),
      operation("remove an item", 3, removeAnItem),
      operation("remove a document", 1, removeADocument),
      operation("move", 3, moveAnItem),
      operation("set the title", 2, setATitle),
      operation("set the description", 2, setADescription),
      operation("name an item", 2, nameAnItem),
      operation("set the poster", 2, setAPoster),
      operation("convert", 2, convertADocument),
      operation("finalize", 2, finalizeADocument),
      operation("export", 5, exportADocument),
      operation("lose the originals", 4, loseTheOriginals),
  };
}

}  // namespace quilt::story
