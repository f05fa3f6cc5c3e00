// SPDX-License-Identifier: Apache-2.0
#include <atomic>
#include <thread>

#include "cli/ActingDelegate.h"
#include "cli/Browser.h"
#include "cli/Interrupt.h"
#include "cli/LibrarySession.h"
#include "cli/Saving.h"
#include "cli/Text.h"
#include "cli/ThemeLookup.h"
#include "quilt/platform/base/Worker.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/scripting/bridge/Bridge.h"

namespace quilt::cli {

namespace {

using platform::services;

// The document that the request names, with what it takes to be shown.
FoundDocument check(const ServeRequest& request, const Catalogue& catalogue) {
  const FoundDocument found = findDocument(catalogue, request.document);
  const DocumentEntry& entry = *found.document;
  const std::string cannot = "The document " + inQuotes(entry.title, entry.uuid) + " cannot be served";
  checkTheme(entry, cannot, "set one with \"quilt set\"");
  if (entry.type != kQuiltDocumentTypeInteractive)
    throw Failure(ExitCode::Usage, cannot + ": It is no Interactive document and has no page", entry.path);
  return found;
}

std::optional<platform::Date> modified(const Path& file) {
  const auto attributes = services().files->attributesOfItemAtPath(file);
  if (!attributes) return std::nullopt;
  return attributes->modified;
}

// Whether the page shows less than the document holds. Records tell their time to the second, so what was saved in the
// second in which the page's data was written counts as newer.
bool isStale(const QuiltDocument& document) {
  const auto written = modified(document.dataControllerPath());
  if (!written || !modified(document.path() / "index.html")) return true;
  const auto saved = document.modifiedDate();
  if (saved && *saved >= std::chrono::floor<std::chrono::seconds>(*written)) return true;
  const auto theme = document.theme();
  const auto changed = theme ? modified(theme->templatePath() / "index.html") : std::nullopt;
  return changed && *changed > *written;
}

void finalize(QuiltDocument& document, const DocumentEntry& entry, const Context& context) {
  context.log.beginOperation();
  bool finalized = false;
  platform::runOnWorker([&] {
    finalized = document.finalizeWithProgressionBlock([&](double percentage) {
      context.progress.report("Finalizing", percentage);
      return !Interrupt::isRequested();
    });
  });
  if (finalized) return;
  if (Interrupt::isRequested()) throw Interrupt::failure("The document is not served");
  throw explain("The document " + inQuotes(entry.title, entry.uuid) + " cannot be finalized", context.log,
                document.path(), document.path());
}

// Turns the main loop until the user asks to stop.
void waitForInterrupt() {
  std::thread watcher([] {
    constexpr std::chrono::milliseconds kSoon{50};
    while (!Interrupt::isRequested()) std::this_thread::sleep_for(kSoon);
    services().runLoop->wake();
  });
  services().runLoop->runUntil([] { return Interrupt::isRequested(); });
  watcher.join();
}

}  // namespace

void ActingDelegate::perform(const ServeRequest& request) {
  LibrarySession session(library(), _context);
  session.lock(check(request, session.catalogue()));
  const FoundDocument found = check(request, session.catalogue());
  const auto document = session.open(found);
  if (isStale(*document)) finalize(*document, *found.document, _context);
  auto bridge = scripting::Bridge::serve(document, {.port = request.port});
  if (!bridge)
    throw Failure("The document " + inQuotes(found.document->title, found.document->uuid) + " cannot be served",
                  bridge.error());
  const std::string address = (*bridge)->address();
  _context.progress.finish();
  _context.output.object({{"uuid", document->uuid()},
                          {"title", document->title().value_or("")},
                          {"type", document->type().value_or("")},
                          {"path", document->path().native()},
                          {"address", address}},
                         address);
  _context.output.publish();
  std::optional<Browser> browser;
  if (request.open && !browser.emplace(address).hasStarted())
    _context.messages.warning("There is no \"xdg-open\" to open the address with; open it in a browser");
  _context.messages.note("Serving " + inQuotes(found.document->title, found.document->uuid) + " until Ctrl-C");
  waitForInterrupt();
  if (!(*bridge)->settle())
    throw explain(
        "The last edits of the document " + inQuotes(found.document->title, found.document->uuid) + " cannot be saved",
        _context.log, document->propertiesPath(), document->path());
  _context.messages.note("Stopped. Every edit is saved");
  throw Failure(Interrupt::exitCode(), "");  // which is how serving ends, and no mishap
}

void PreviewDelegate::perform(const ServeRequest& request) {
  const Catalogue catalogue = readCatalogue(library());
  const DocumentEntry& entry = *check(request, catalogue).document;
  plan({{"action", "serve"}, {"uuid", entry.uuid}, {"title", entry.title}, {"path", entry.path.native()}},
       "Would finalize the document " + inQuotes(entry.title, entry.uuid) + " if it is stale, and serve it");
}

}  // namespace quilt::cli
