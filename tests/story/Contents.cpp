// SPDX-License-Identifier: Apache-2.0
#include "tests/story/Contents.h"

#include <fmt/format.h>

#include <algorithm>

#include "quilt/platform/base/Url.h"
#include "quilt/platform/interfaces/Services.h"
#include "tests/support/MediaFixtures.h"

namespace quilt::story {

namespace {

namespace fs = std::filesystem;
using platform::Dictionary;

std::string names(const std::vector<const Material*>& materials) {
  std::string text;
  for (const Material* material : materials) {
    if (!text.empty()) text += " + ";
    text += material ? material->name : "a file that nobody put there, or none";
  }
  return text;
}

template <class Visit>
void each(const Dictionary& record, const char* key, const Visit& visit) {
  const platform::Array* array = record.array(key);
  if (!array) return;
  for (const platform::PropertyList& element : *array)
    if (const auto* dictionary = element.as<Dictionary>()) visit(*dictionary);
}

/// The material that a source was made of: that of its first derivative that has one.
const Material* materialOf(const Dictionary& source, const Path& package) {
  const Material* found = nullptr;
  each(source, "Derivatives", [&](const Dictionary& derivative) {
    if (found) return;
    Path file = package / derivative.string("RelativePath").value_or("/");
    if (const auto url = platform::Url::parse(derivative.string("URL").value_or(""))) {
      if (!url->isFileUrl()) {
        found = webPage();
        return;
      }
      file = url->relativePath();
    }
    if (fs::is_regular_file(file)) found = materialWith(support::readBytes(file));
  });
  return found;
}

Item readItem(const Dictionary& record, const Path& package) {
  Item item{record.string("Title").value_or(""), record.string("ContentCategory").value_or(""), {}};
  item.uuid = record.string("UUID").value_or("");
  each(record, "Sources", [&](const Dictionary& source) {
    if (item.sources.empty()) item.firstSource = source.string("UUID").value_or("");
    item.sources.push_back(materialOf(source, package));
  });
  each(record, "Extras", [&](const Dictionary& extra) { item.extras.push_back(materialOf(extra, package)); });
  if (const Dictionary* commentary = record.dictionary("AudioCommentarySource"))
    item.commentary.push_back(materialOf(*commentary, package));
  return item;
}

bool isHidden(const fs::directory_entry& entry) { return entry.path().filename().native().starts_with('.'); }

}  // namespace

const Material* webPage() {
  static const Material page{"https://example.org/", "Web", ""};
  return &page;
}

std::string describe(const Document& document) {
  std::string text = fmt::format("\"{}\" ({})", document.title, document.type);
  if (!document.description.empty()) text += ", about " + document.description;
  if (document.poster) text += fmt::format(", poster {}", fmt::join(*document.poster, " "));
  if (!document.theme.empty()) text += ", in " + document.theme;
  for (const Item& item : document.items) {
    text += fmt::format("\n  \"{}\" ({}): {}", item.title, item.category, names(item.sources));
    if (!item.extras.empty()) text += ", with " + names(item.extras);
    if (!item.commentary.empty()) text += ", spoken over by " + names(item.commentary);
  }
  return text + "\n";
}

std::string describe(const Contents& contents) {
  std::vector<std::string> lines;
  for (const Document& document : contents.documents) lines.push_back(describe(document));
  std::sort(lines.begin(), lines.end());
  for (const std::string& fault : contents.faults) lines.push_back("FAULT: " + fault + "\n");
  return fmt::format("{}", fmt::join(lines, ""));
}

Contents readLibrary(const Path& library) {
  Contents contents;
  if (!fs::exists(library / "Collections")) return contents;
  for (const auto& collection : fs::directory_iterator(library / "Collections")) {
    if (isHidden(collection)) continue;
    for (const auto& package : fs::directory_iterator(collection.path()))
      if (!isHidden(package) && package.path().extension() == ".qpk")
        contents.documents.push_back(readPackage(package.path(), contents.faults));
  }
  return contents;
}

Document readPackage(const Path& package, std::vector<std::string>& faults) {
  const auto record = platform::services().propertyLists->readDictionary(package / "properties.plist");
  if (record) return readPackage(package, *record);
  faults.push_back("A package without a record: " + record.error().text);
  return {};
}

Document readPackage(const Path& package, const Dictionary& record) {
  Document document{record.string("Title").value_or(""), record.string("Type").value_or("")};
  document.uuid = record.string("UUID").value_or("");
  document.description = record.string("Description").value_or("");
  document.theme = Path(record.string("ThemePath").value_or("")).filename();
  each(record, "Media", [&](const Dictionary& item) { document.items.push_back(readItem(item, package)); });
  if (fs::exists(package / "poster.png"))
    for (const Material& material : materials())
      if (!document.poster && !material.pages.empty() && shows(package / "poster.png", material.pages[0]))
        document.poster = material.pages[0];
  return document;
}

void lookAtPictures(const Path& package, const Document& expected, std::vector<std::string>& faults) {
  const auto look = [&](const Path& picture, const Item& item, const Rgba& colour) {
    if (!shows(picture, colour))
      faults.push_back(fmt::format("{} of \"{}\" does not show {}", picture.lexically_relative(package).native(),
                                   item.title, fmt::join(colour, " ")));
  };
  for (const Item& item : expected.items) {
    const Material* material = item.sources.size() == 1 ? item.sources[0] : nullptr;
    if (!material || material->pages.empty() || item.category == "Montage") continue;  // which is drawn
    const Path folder = package / "media" / item.uuid;
    if (fs::exists(folder / "poster.jpg")) look(folder / "poster.jpg", item, material->pages[0]);
    for (std::size_t page = 0; page < material->pages.size(); ++page) {
      const Path preview = folder / "sources" / item.firstSource / "previews" / fmt::format("{}.jpg", page);
      if (fs::exists(preview)) look(preview, item, material->pages[page]);
    }
  }
}

std::vector<std::string> leftovers(const Path& folder) {
  std::vector<std::string> found;
  if (!fs::exists(folder)) return found;
  for (auto entry = fs::recursive_directory_iterator(folder); entry != fs::recursive_directory_iterator(); ++entry) {
    const std::string name = entry->path().filename();
    if (!name.starts_with('.')) continue;
    const bool isToStay = name.find("lock") != std::string::npos || name.find("trash") != std::string::npos;
    if (!isToStay) found.push_back(entry->path().lexically_relative(folder));
    if (entry->is_directory()) entry.disable_recursion_pending();
  }
  return found;
}

}  // namespace quilt::story
