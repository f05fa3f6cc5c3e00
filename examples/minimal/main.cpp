// SPDX-License-Identifier: Apache-2.0
// The smallest host: imports a file into a library folder, which is made when missing, and exports what became of it.
#include <iostream>

#include "quilt/quilt.h"

// The library prints nothing: what went wrong is answered with none, and told to who listens to the log.
struct StandardError final : quilt::platform::LogSink {
  void write(quilt::platform::LogLevel level, const std::string& message) override {
    if (level != quilt::platform::LogLevel::Debug) std::cerr << message << '\n';
  }
};

int main(int count, char** arguments) {
  const std::vector<quilt::Path> paths(arguments + 1, arguments + count);
  if (paths.size() != 3) return std::cerr << "Usage: minimal LIBRARY FILE DESTINATION\n", 2;
  quilt::platform::install();
  quilt::platform::FDYLogger::addSink(std::make_shared<StandardError>());
  quilt::Path exported;
  quilt::platform::runOnWorker([&] {  // while the main thread runs what the worker queues for it
    const quilt::Path file = absolute(paths[1]);
    if (!quilt::QuiltDocument::canImportFromPath(file))
      return void(std::cerr << file.native() << " is not there, or is no movie, sound, PDF or EPUB\n");
    create_directories(absolute(paths[0]));
    // Nobody else changes the library meanwhile; who does so now is waited for.
    const auto lock = quilt::LibraryLock::ofLibrary(absolute(paths[0]), {std::chrono::seconds(10)});
    if (!lock) return void(std::cerr << paths[0].native() << ": " << lock.error().text << '\n');
    const auto library = quilt::QuiltCollectionsController::defaultController();
    if (!library->loadLibraryPath(absolute(paths[0]), {})) return;
    auto collection = library->collectionAtIndex(0);
    if (!collection) collection = library->newCollection();
    const auto document = collection ? collection->importDocumentFromPath(file, {}) : nullptr;
    if (!document) return;
    for (const auto& item : document->media())
      std::cout << item->contentCategory().value_or("File") << ", " << item->duration() << " s\n";
    exported = document->exportToPath(absolute(paths[2]), /*zipped=*/false, {"Desktop"}, {});
  });
  if (!exported.empty()) std::cout << "Exported to " << exported.native() << '\n';
  return exported.empty() ? 1 : 0;
}
