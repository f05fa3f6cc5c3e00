// SPDX-License-Identifier: Apache-2.0
// A host without a toolkit: opens a library folder (made when missing), imports a file, prints what came out and
// exports it.
#include <iostream>

#include "quilt/collections/QuiltCollectionsController.h"
#include "quilt/platform/base/Worker.h"
#include "quilt/platform/install.h"

namespace {

// The library throws nothing and prints nothing: what went wrong is answered with none and told to the log.
struct StandardError final : quilt::platform::LogSink {
  void write(quilt::platform::LogLevel level, const std::string& message) override {
    if (level != quilt::platform::LogLevel::Debug) std::cerr << message << '\n';
  }
};

bool importAndExport(const quilt::Path& libraryFolder, const quilt::Path& file, const quilt::Path& destination) {
  // Asked first: of any other file the library makes an empty document.
  if (!quilt::QuiltDocument::canImportFromPath(file)) {
    std::cerr << file.native() << " is not there, or is no movie, sound, PDF or EPUB\n";
    return false;
  }
  const auto library = quilt::QuiltCollectionsController::defaultController();
  if (!library->loadLibraryPath(libraryFolder, {})) return false;
  auto collection = library->collectionAtIndex(0);
  if (!collection) collection = library->newCollection();
  const auto document = collection ? collection->importDocumentFromPath(file, {}) : nullptr;
  if (!document) return false;
  for (const auto& item : document->media())
    std::cout << document->type().value_or("File") << ", " << item->duration() << " s, " << item->totalSizeInMegaBytes()
              << " MB: " << document->path().native() << '\n';
  const quilt::Path exported = document->exportToPath(destination, /*zipped=*/false, {"Desktop"}, [](double percent) {
    std::cout << "Exporting: " << static_cast<int>(percent) << " %\r" << std::flush;
    return true;  // false would cancel
  });
  if (!exported.empty()) std::cout << "Exported to " << exported.native() << '\n';
  return !exported.empty();
}

}  // namespace

int main(int count, char** arguments) {
  if (count != 4) {
    std::cerr << "Usage: minimal LIBRARY FILE DESTINATION\n";
    return 2;
  }
  quilt::platform::install();
  quilt::platform::FDYLogger::addSink(std::make_shared<StandardError>());
  bool done = false;
  // A worker works; the main thread runs what it queues for it.
  quilt::platform::runOnWorker([&] {
    done = importAndExport(std::filesystem::absolute(arguments[1]), std::filesystem::absolute(arguments[2]),
                           std::filesystem::absolute(arguments[3]));
  });
  return done ? 0 : 1;
}
