// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>

#include "cli/ActingDelegate.h"
#include "cli/Exporting.h"
#include "cli/LibrarySession.h"
#include "cli/Saving.h"
#include "cli/Text.h"
#include "cli/ThemeLookup.h"

namespace quilt::cli {

namespace {

/// What to export where, checked.
struct ExportPlan {
  FoundDocument found;
  Path folder;
  std::shared_ptr<QuiltTheme> theme;  ///< null: the document's own
};

ExportPlan check(const ExportRequest& request, const Catalogue& catalogue) {
  ExportPlan plan{findDocument(catalogue, request.document), absolutePath(request.folder), nullptr};
  const DocumentEntry& entry = *plan.found.document;
  const std::string cannot = "The document " + inQuotes(entry.title, entry.uuid) + " cannot be exported";
  if (request.theme) {
    if (const auto record = readDocumentRecord(entry.path); !record) throw Failure(cannot, record.error());
    plan.theme = findTheme(*request.theme);
  } else {
    checkTheme(entry, cannot, "name one with --theme");
  }
  checkDestination(plan.folder, catalogue.library);
  return plan;
}

}  // namespace

void ActingDelegate::perform(const ExportRequest& request) {
  LibrarySession session(library(), _context);
  session.lock(check(request, session.catalogue()).found);
  const ExportPlan plan = check(request, session.catalogue());
  const std::string cannot =
      "The document " + inQuotes(plan.found.document->title, plan.found.document->uuid) + " cannot be exported";
  const Destination destination(plan.folder);
  const auto document = session.open(plan.found);
  _context.log.beginOperation();
  if (plan.theme && !changeAndSave(*document, [&] { document->setTheme(plan.theme); }))
    throw explain(cannot, _context.log, document->path(), document->path());
  const Path exported = exportPackage(*document, inQuotes(plan.found.document->title, plan.found.document->uuid),
                                      {plan.folder, request.zip, request.formats}, _context);
  _context.output.object({{"uuid", document->uuid()},
                          {"title", document->title().value_or("")},
                          {"type", document->type().value_or("")},
                          {"path", exported.native()},
                          {"formats", request.formats},
                          {"zip", request.zip}},
                         _context.output.shown(exported));
}

void PreviewDelegate::perform(const ExportRequest& request) {
  const Catalogue catalogue = readCatalogue(library());
  const ExportPlan plan = check(request, catalogue);
  std::string formats;
  for (const std::string& format : request.formats) formats += (formats.empty() ? "" : ", ") + format;
  PreviewDelegate::plan({{"action", "export"},
                         {"uuid", plan.found.document->uuid},
                         {"title", plan.found.document->title},
                         {"path", plan.folder.native()},
                         {"formats", request.formats},
                         {"zip", request.zip},
                         {"theme", plan.theme ? Json(plan.theme->path().native()) : Json()}},
                        fmt::format("Would export the document {} to {} as {}, format {}",
                                    inQuotes(plan.found.document->title, plan.found.document->uuid),
                                    inQuotes(plan.folder.native()), request.zip ? "an archive" : "a package", formats));
}

}  // namespace quilt::cli
