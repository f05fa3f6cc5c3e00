// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>

#include <algorithm>

#include "cli/ActingDelegate.h"
#include "cli/EntryJson.h"
#include "cli/LibrarySession.h"
#include "cli/Saving.h"
#include "cli/Text.h"
#include "quilt/platform/base/IndexSet.h"

namespace quilt::cli {

namespace {

/// Which items, and the gap of the list, counted before the move, that they go to.
struct Plan {
  FoundDocument document;
  platform::IndexSet indexes;
  std::size_t gap = 0;
};

/// The gap for a group that is to begin at `index` once it has moved.
std::size_t gapFor(const platform::IndexSet& indexes, std::size_t index, std::size_t count) {
  std::size_t gap = 0;
  for (std::size_t others = 0; gap < count && others < index; ++gap)
    if (!indexes.contains(gap)) ++others;
  return gap;
}

Plan check(const MoveRequest& request, const Catalogue& catalogue) {
  Plan plan{findDocument(catalogue, request.document), {}, 0};
  const std::vector<ItemEntry>& items = plan.document.document->items;
  for (const std::string& name : request.items) {
    const ItemEntry& item = findItem(*plan.document.document, name);
    plan.indexes.insert(static_cast<std::size_t>(&item - items.data()));
  }
  if (request.to > items.size())
    throw Failure(ExitCode::Usage, fmt::format("There is no place {}: the document {} has {} items", request.to,
                                               inQuotes(request.document), items.size()));
  plan.gap = gapFor(plan.indexes, request.to, items.size());
  return plan;
}

}  // namespace

void ActingDelegate::perform(const MoveRequest& request) {
  LibrarySession session(library(), _context);
  session.lock(check(request, session.catalogue()).document);
  const Plan plan = check(request, session.catalogue());
  const auto document = session.open(plan.document);
  const std::string cannot = "The items of " + inQuotes(document->title().value_or("")) + " cannot be moved";
  // An item that did not open would shift the places.
  if (document->mediaCount() != plan.document.document->items.size())
    throw Failure(ExitCode::Invalid, cannot + ": Some of them cannot be opened", document->path());
  _context.log.beginOperation();
  if (!changeAndSave(*document, [&] { document->moveMediaAtIndexes(plan.indexes, plan.gap); }))
    throw explain(cannot, _context.log, document->path(), document->path());
  _context.output.beginList();
  if (!_context.output.isJson()) return;
  for (const auto& item : document->media()) _context.output.item(toJson(*item), "");
}

void PreviewDelegate::perform(const MoveRequest& request) {
  const Catalogue catalogue = readCatalogue(library());
  const Plan plan = check(request, catalogue);
  const DocumentEntry& document = *plan.document.document;
  Json moved = Json::array();
  for (const std::size_t index : plan.indexes) moved.push_back(document.items[index].uuid);
  PreviewDelegate::plan(
      {{"action", "move"}, {"document", document.uuid}, {"items", moved}, {"to", request.to}},
      fmt::format("Would move {} item{} of the document {} to place {}", plan.indexes.size(),
                  plan.indexes.size() == 1 ? "" : "s", inQuotes(document.title, document.uuid), request.to));
}

}  // namespace quilt::cli
