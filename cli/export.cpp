// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>

#include "cli/ActingDelegate.h"
#include "cli/Interrupt.h"
#include "cli/LibrarySession.h"
#include "cli/Saving.h"
#include "cli/Text.h"
#include "cli/Themes.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/base/Worker.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::cli {

namespace {

using platform::services;

/// What to export where, checked.
struct Plan {
  FoundDocument found;
  Path folder;
  std::shared_ptr<QuiltTheme> theme;  ///< null: the document's own
};

std::string nameOf(const DocumentEntry& entry) { return inQuotes(entry.title.empty() ? entry.uuid : entry.title); }

bool liesIn(const Path& path, const Path& folder) {
  const Path relative =
      std::filesystem::weakly_canonical(path).lexically_relative(std::filesystem::weakly_canonical(folder));
  return !relative.empty() && *relative.begin() != "..";
}

// The path, or the closest of its parents that is there.
Path nearestExisting(Path path) {
  while (!std::filesystem::exists(std::filesystem::symlink_status(path)) && path.has_relative_path())
    path = path.parent_path();
  return path;
}

Plan check(const ExportRequest& request, const Catalogue& catalogue) {
  Plan plan{findDocument(catalogue, request.document), absolutePath(request.folder), nullptr};
  const DocumentEntry& entry = *plan.found.document;
  const std::string cannot = "The document " + nameOf(entry) + " cannot be exported";
  const auto record = readDocumentRecord(entry.path);
  if (!record) throw Failure(cannot, record.error());
  if (request.theme) plan.theme = findTheme(*request.theme);
  if (entry.type == kQuiltDocumentTypeInteractive && !plan.theme) {
    const Text theme = record->string("ThemePath");
    if (!theme) throw Failure(ExitCode::Usage, cannot + ": It has no theme; name one with --theme", entry.path);
    if (!QuiltTheme::initWithPath(*theme))
      throw Failure(ExitCode::NotFound,
                    cannot + ": Its theme " + inQuotes(*theme) + " is not there; name one with --theme", *theme);
  }
  const Path existing = nearestExisting(plan.folder);
  if (services().files->kindOfItemAtPath(existing) != platform::FileKind::Folder)
    throw Failure(ExitCode::Invalid, inQuotes(existing.native()) + " is a file, not a folder", existing);
  // A package there would become part of the library, or of another package.
  if (liesIn(plan.folder, catalogue.library))
    throw Failure(ExitCode::Usage, inQuotes(request.folder) + " lies in the library; export to a folder outside",
                  plan.folder);
  return plan;
}

/// The destination folder with the parents that had to be made; removes what it made and is empty when it is let go.
class Destination {
 public:
  explicit Destination(const Path& folder) {
    for (Path path = folder; !services().files->fileExistsAtPath(path) && path.has_relative_path();
         path = path.parent_path())
      _made.push_back(path);
    const auto made = services().files->createDirectoryAtPath(folder);
    if (!made) throw Failure("Cannot make the folder " + inQuotes(folder.native()), made.error());
  }
  Destination(const Destination&) = delete;
  Destination& operator=(const Destination&) = delete;
  ~Destination() {
    std::error_code stillInUse;
    for (const Path& folder : _made) std::filesystem::remove(folder, stillInUse);
  }

 private:
  std::vector<Path> _made;  // innermost first
};

Path run(QuiltDocument& document, const ExportRequest& request, const Plan& plan, Progress& progress) {
  ExportProgress bands(request.formats.size(), request.zip);
  Path exported;
  platform::runOnWorker([&] {
    exported = document.exportToPath(plan.folder, request.zip, request.formats, [&](double percentage) {
      const double shown = bands.percent(percentage);
      progress.report(bands.stage(), shown);
      return !Interrupt::isRequested();
    });
  });
  return exported;
}

// Items that lack a format are left out of a package without an error; such a package is no result.
void refuseIncomplete(const Path& exported, const Plan& plan, const LogCollector& log) {
  std::string cause = log.warning("Failed to import document");
  if (cause.empty()) cause = log.warning("Failed to create import");
  if (cause.empty()) return;
  (void)services().files->removeItem(exported, plan.folder);
  throw Failure(
      ExitCode::Invalid,
      fmt::format("The document {} cannot be exported in full: {}", nameOf(*plan.found.document), escaped(cause)),
      plan.found.document->path);
}

}  // namespace

void ActingDelegate::perform(const ExportRequest& request) {
  (void)check(request, readCatalogue(library()));
  LibrarySession session(library());
  const Plan plan = check(request, session.catalogue());
  const std::string cannot = "The document " + nameOf(*plan.found.document) + " cannot be exported";
  const Destination destination(plan.folder);
  const auto document = session.open(plan.found);
  _context.log.beginOperation();
  if (plan.theme && !changeAndSave(*document, [&] { document->setTheme(plan.theme); }))
    throw explain(cannot, _context.log, document->path(), document->path());
  const Path exported = run(*document, request, plan, _context.progress);
  if (exported.empty()) {
    if (Interrupt::isRequested()) throw Interrupt::failure("Nothing was exported");
    throw explain(cannot, _context.log, document->path(), plan.folder);
  }
  refuseIncomplete(exported, plan, _context.log);
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
  const Plan plan = check(request, catalogue);
  std::string formats;
  for (const std::string& format : request.formats) formats += (formats.empty() ? "" : ", ") + format;
  PreviewDelegate::plan({{"action", "export"},
                         {"uuid", plan.found.document->uuid},
                         {"title", plan.found.document->title},
                         {"path", plan.folder.native()},
                         {"formats", request.formats},
                         {"zip", request.zip},
                         {"theme", plan.theme ? Json(plan.theme->path().native()) : Json()}},
                        fmt::format("Would export the document {} to {} as {}, format {}", nameOf(*plan.found.document),
                                    inQuotes(plan.folder.native()), request.zip ? "an archive" : "a package", formats));
}

}  // namespace quilt::cli
