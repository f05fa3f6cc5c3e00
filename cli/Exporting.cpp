// SPDX-License-Identifier: Apache-2.0
#include "cli/Exporting.h"

#include <fmt/format.h>

#include "cli/Interrupt.h"
#include "cli/Saving.h"
#include "cli/Text.h"
#include "quilt/platform/base/Worker.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::cli {

namespace {

using platform::services;

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

// Items that lack a format are left out of a package without an error; such a package is no result.
void refuseIncomplete(const Path& exported, const QuiltDocument& document, const std::string& name,
                      const ExportTarget& target, const LogCollector& log) {
  std::string cause = log.warning("Failed to import document");
  if (cause.empty()) cause = log.warning("Failed to create import");
  if (cause.empty()) return;
  (void)services().files->removeItem(exported, target.folder);
  throw Failure(ExitCode::Invalid, fmt::format("The document {} cannot be exported in full: {}", name, escaped(cause)),
                document.path());
}

}  // namespace

void checkDestination(const Path& folder, const Path& library) {
  const Path existing = nearestExisting(folder);
  if (services().files->kindOfItemAtPath(existing) != platform::FileKind::Folder)
    throw Failure(ExitCode::Invalid, inQuotes(existing.native()) + " is a file, not a folder", existing);
  if (!library.empty() && liesIn(folder, library))
    throw Failure(ExitCode::Usage, inQuotes(folder.native()) + " lies in the library; export to a folder outside",
                  folder);
}

Destination::Destination(const Path& folder) {
  for (Path path = folder; !services().files->fileExistsAtPath(path) && path.has_relative_path();
       path = path.parent_path())
    _made.push_back(path);
  const auto made = services().files->createDirectoryAtPath(folder);
  if (!made) throw Failure("Cannot make the folder " + inQuotes(folder.native()), made.error());
}

Destination::~Destination() {
  std::error_code stillInUse;
  for (const Path& folder : _made) std::filesystem::remove(folder, stillInUse);
}

Path exportPackage(QuiltDocument& document, const std::string& name, const ExportTarget& target, const Context& context,
                   double startPercent) {
  ExportProgress bands(target.formats.size(), target.zip);
  Path exported;
  platform::runOnWorker([&] {
    exported = document.exportToPath(target.folder, target.zip, target.formats, [&](double percentage) {
      const double shown = bands.percent(percentage);
      context.progress.report(bands.stage(), startPercent + shown * (100 - startPercent) / 100);
      return !Interrupt::isRequested();
    });
  });
  if (exported.empty()) {
    if (Interrupt::isRequested()) throw Interrupt::failure("Nothing was exported");
    throw explain("The document " + name + " cannot be exported", context.log, document.path(), target.folder);
  }
  refuseIncomplete(exported, document, name, target, context.log);
  return exported;
}

}  // namespace quilt::cli
