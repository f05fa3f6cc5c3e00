// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>

#include "cli/ActingDelegate.h"
#include "cli/LibrarySession.h"
#include "cli/Saving.h"
#include "cli/Text.h"

namespace quilt::cli {

namespace {

Json json(const std::string& uuid, const std::string& title, const std::string& type, const Path& path) {
  return {{"uuid", uuid}, {"title", title}, {"type", type}, {"path", path.native()}};
}

std::shared_ptr<QuiltDocument> makeDocument(const NewDocumentRequest& request, QuiltCollection& collection,
                                            const LogCollector& log) {
  const std::string cannot = "The document " + inQuotes(request.title) + " cannot be made";
  const auto document = collection.newDocumentWithType(request.type);
  if (!document) throw explain(cannot, log, collection.path(), collection.path());
  if (changeAndSave(*document, [&] { document->setTitle(request.title); })) return document;
  collection.removeDocument(document, true);
  throw explain(cannot, log, collection.path(), collection.path());
}

}  // namespace

void ActingDelegate::perform(const NewCollectionRequest& request) {
  LibrarySession session(library(), _context);
  const auto collection = session.makeCollection(request.title);
  _context.output.object(json(collection->uuid(), request.title, "Collection", collection->path()), collection->uuid());
}

void ActingDelegate::perform(const NewDocumentRequest& request) {
  LibrarySession session(library(), _context);
  const auto collection = session.collectionForNew(request.collection);
  const LibraryLock lock = session.lockForAMoment(collection->path());
  const auto document = makeDocument(request, *collection, _context.log);
  Json made = json(document->uuid(), request.title, request.type, document->path());
  made["collection"] = collection->uuid();
  _context.output.object(std::move(made), document->uuid());
}

void PreviewDelegate::perform(const NewCollectionRequest& request) {
  (void)readCatalogue(library());  // tells when no library can be there
  plan({{"action", "new"}, {"type", "Collection"}, {"title", request.title}},
       "Would make the collection " + inQuotes(request.title));
}

void PreviewDelegate::perform(const NewDocumentRequest& request) {
  const Catalogue catalogue = readCatalogue(library());
  const CollectionEntry* entry = collectionFor(catalogue, request.collection);
  const std::string title = entry ? entry->title : kDefaultCollectionTitle;
  plan({{"action", "new"},
        {"type", request.type},
        {"title", request.title},
        {"collection", title},
        {"makesCollection", !entry}},
       fmt::format("Would make the {} document {} in the {}collection {}", request.type, inQuotes(request.title),
                   entry ? "" : "new ", inQuotes(title)));
}

}  // namespace quilt::cli
