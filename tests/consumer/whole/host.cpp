// SPDX-License-Identifier: Apache-2.0
// Makes a library in the folder given, saves it and reads it back; and looks at what could go wrong between a program
// and a shared library: types, exceptions and the things that a process has once.
#include <quilt/quilt.h>
#include <quilt/scripting/bridge/Bridge.h>

#include <cstdio>
#include <cstdlib>
#include <stdexcept>
#include <string>
#include <thread>

// Ends the program with the line that does not hold.
#define EXPECT(condition)                                                                 \
  do {                                                                                    \
    if (!(condition)) {                                                                   \
      std::fprintf(stderr, "%s:%d: does not hold: %s\n", __FILE__, __LINE__, #condition); \
      std::exit(1);                                                                       \
    }                                                                                     \
  } while (false)

namespace {

using quilt::QuiltCollectionsController;
using quilt::QuiltDocument;
using quilt::QuiltMedia;
using quilt::QuiltMediaExtra;
using quilt::QuiltMediaSource;
namespace platform = quilt::platform;

class StoppedClock final : public platform::Clock {
 public:
  [[nodiscard]] platform::Date now() const override { return *platform::parseIso8601("2026-03-05T14:07:09Z"); }
};

class Lines final : public platform::LogSink {
 public:
  void write(platform::LogLevel, const std::string& message) override { text += message + "\n"; }
  std::string text;
};

struct HostError : std::runtime_error {
  using std::runtime_error::runtime_error;
};

quilt::Path makePicture(const quilt::Path& folder) {
  platform::Bitmap red{64, 48, {}};
  for (std::size_t i = 0; i < red.width * red.height; ++i) red.pixels.insert(red.pixels.end(), {200, 20, 20, 255});
  const auto image = platform::services().images->imageWithBitmap(std::move(red));
  EXPECT(image);
  const quilt::Path file = folder / "red.png";
  EXPECT((*image)->saveAsPNGAtURL(quilt::Url::fileUrl(file)));
  return file;
}

void makeLibrary(const quilt::Path& folder) {
  const auto library = QuiltCollectionsController::defaultController();
  EXPECT(library->loadLibraryPath(folder / "library", {}));
  const auto collection = library->newCollection();
  EXPECT(collection);
  const auto document = collection->newDocumentWithType(quilt::kQuiltDocumentTypeInteractive);
  EXPECT(document);
  const auto source = QuiltMediaSource::initWithPath(makePicture(folder));
  EXPECT(source);
  const auto media = QuiltMedia::init();
  media->addSource(source);
  document->addMedia(media);
  document->setTitle("Made by a host");
  EXPECT(document->flattenWithProgressionBlock({}));
  EXPECT(document->update());
}

void readLibraryBack(const quilt::Path& folder) {
  const auto library = QuiltCollectionsController::init();
  EXPECT(library->loadLibraryPath(folder / "library", {}));
  EXPECT(library->collectionsCount() == 1);
  const auto document = library->collectionAtIndex(0)->documentAtIndex(0);
  EXPECT(document);
  EXPECT(document->title() == "Made by a host");
  EXPECT(document->mediaCount() == 1);
  const auto media = document->mediaAtIndex(0);
  EXPECT(media->contentCategory() == quilt::kQuiltMediaContentCategoryImage);
  EXPECT(media->sourceAtIndex(0)->mainDerivative()->isFlattened());
  EXPECT(media->sourceAtIndex(0)->mainDerivative()->width() == 64);
}

// A type is one type on both sides.
void checkTypes() {
  const std::shared_ptr<platform::Object> extra = QuiltMediaExtra::init();
  EXPECT(std::dynamic_pointer_cast<QuiltMediaSource>(extra));
  EXPECT(!std::dynamic_pointer_cast<QuiltDocument>(extra));
  EXPECT(std::string(quilt::scripting::exposedClassOf(*extra)->name) == "QuiltMediaSource");
}

// What a process has once is what the library uses: the services, the logger and the main thread.
void checkSingletons() {
  const platform::ScopedService clock(&platform::Services::clock, std::make_shared<StoppedClock>());
  EXPECT(quilt::QuiltCollection::init()->creationDate() == StoppedClock().now());

  const auto lines = std::make_shared<Lines>();
  platform::FDYLogger::addSink(lines);
  QuiltDocument::init()->addMedia(QuiltMedia::init(), 7);
  platform::FDYLogger::removeSink(lines);
  EXPECT(lines->text.starts_with("Index 7 is beyond the 0 items of \"media\"\n"));

  EXPECT(platform::MainThread::isCurrent());
  const auto mainThread = std::this_thread::get_id();
  bool wasMain = false;
  bool wasCaught = false;
  platform::runOnWorker([&] {
    EXPECT(!platform::MainThread::isCurrent());
    platform::performBlockOnMainThread([&] { wasMain = std::this_thread::get_id() == mainThread; });
    try {
      platform::performBlockOnMainThread([] { throw HostError("through the library"); });
    } catch (const HostError& error) {
      wasCaught = std::string(error.what()) == "through the library";
    }
  });
  EXPECT(wasMain);
  EXPECT(wasCaught);
}

void checkBridge(const quilt::Path& folder) {
  const auto document = QuiltDocument::initWithPath(folder / "served.qpk");
  EXPECT(document);
  const auto bridge = quilt::scripting::Bridge::serve(document, {});
  EXPECT(bridge);
  EXPECT((*bridge)->port() != 0);
}

}  // namespace

int main(int count, char** arguments) {
  EXPECT(count == 2);
  static_assert(QUILT_VERSION_NUMBER >= QUILT_MAKE_VERSION(0, 1, 0));
  platform::install();
  makeLibrary(arguments[1]);
  readLibraryBack(arguments[1]);
  checkTypes();
  checkSingletons();
  checkBridge(arguments[1]);
  std::puts("host: made, saved and read back with Quilt " QUILT_VERSION);
}
