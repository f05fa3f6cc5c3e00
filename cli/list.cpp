// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>

#include "cli/ActingDelegate.h"
#include "cli/EntryJson.h"
#include "cli/Lookup.h"
#include "cli/Text.h"

namespace quilt::cli {

namespace {

std::string nameOf(const std::string& title) { return title.empty() ? "(no title)" : escaped(title); }

std::string lines(const CollectionEntry& collection, const Output& output) {
  const std::string damage = collection.damage ? "  damaged: " + escaped(collection.damage->text) : "";
  std::string text = output.bold(nameOf(collection.title)) + "  " + output.dim(escaped(collection.uuid)) + damage;
  for (std::size_t i = 0; i < collection.documents.size(); ++i) {
    const DocumentEntry& document = collection.documents[i];
    const std::string what = document.damage ? "damaged: " + escaped(document.damage->text)
                                             : padded(escaped(document.type), 11) + "  " + nameOf(document.title);
    text += fmt::format("\n{} {}  {}", i + 1 == collection.documents.size() ? "└─" : "├─",
                        output.dim(escaped(document.uuid)), what);
  }
  return text;
}

}  // namespace

void ActingDelegate::perform(const ListRequest& request) {
  const Catalogue catalogue = readCatalogue(library());
  _context.output.beginList();
  const CollectionEntry* only =
      request.collection ? findCollection(catalogue, *request.collection).collection : nullptr;
  for (const CollectionEntry& collection : catalogue.collections)
    if (!only || &collection == only) _context.output.item(toJson(collection), lines(collection, _context.output));
}

}  // namespace quilt::cli
