// SPDX-License-Identifier: Apache-2.0
// Loads and saves a library of generated records beside bare parsing of the same files, in one run:
// `library [DOCUMENTS] [ITEMS]`, 2,000 documents of 10 items by default. Each item has one source with three
// derivatives and a still for each of its ten chapters, about 70 KB of record for a document. Loading is linear when
// the rate stays the same from a quarter of the library to all of it.
#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <pugixml.hpp>
#include <sstream>
#include <string>

#include "quilt/collections/QuiltCollectionsController.h"
#include "quilt/platform/install.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/interfaces/UuidGenerator.h"

namespace {

namespace fs = std::filesystem;
using quilt::Array;
using quilt::Dictionary;
using quilt::platform::services;

double milliseconds(const std::function<void()>& job) {
  const auto start = std::chrono::steady_clock::now();
  job();
  return std::chrono::duration<double, std::milli>(std::chrono::steady_clock::now() - start).count();
}

double bestOf(int runs, const std::function<void()>& job) {
  double best = 1e12;
  for (int run = 0; run < runs; ++run) best = std::min(best, milliseconds(job));
  return best;
}

std::string fresh() { return quilt::platform::generateUUID(); }

Dictionary derivativeRecord(const char* tag) {
  const std::string uuid = fresh();
  return {{"UUID", uuid},
          {"URL", "file:///library/lecture/" + uuid + ".m4v"},
          {"ContentType", "org.quilt.m4v-video"},
          {"CompatibilityTags", Array{tag}},
          {"MimeType", "video/x-m4v"},
          {"IsFlattened", false},
          {"Height", 720.0},
          {"Width", 1280.0},
          {"Duration", 1834.52}};
}

Dictionary sourceRecord() {
  Array previews;
  for (int chapter = 0; chapter < 10; ++chapter)
    previews.push_back(Dictionary{{"UUID", fresh()},
                                  {"Title", "Chapter " + std::to_string(chapter) + " & its \"examples\""},
                                  {"Timecode", 183.4 * chapter},
                                  {"Index", chapter},
                                  {"IsFlattened", false}});
  return {{"UUID", fresh()},
          {"Title", "Lecture recording"},
          {"Derivatives", Array{derivativeRecord("Desktop"), derivativeRecord("720p"), derivativeRecord("480p")}},
          {"Previews", previews}};
}

Dictionary documentRecord(int items) {
  Array media;
  for (int item = 0; item < items; ++item)
    media.push_back(Dictionary{{"UUID", fresh()},
                               {"Title", "Item " + std::to_string(item)},
                               {"Description", "What the item is about, in a sentence of ordinary length."},
                               {"Sources", Array{sourceRecord()}},
                               {"ContentCategory", "Movie"}});
  return {{"Version", "1.0"},
          {"UUID", fresh()},
          {"Title", "A document of the benchmark"},
          {"Description", "Generated."},
          {"Author", "Bench"},
          {"Type", "Interactive"},
          {"CreationDate", services().clock->now()},
          {"ModifiedDate", services().clock->now()},
          {"Media", media}};
}

fs::path makeLibrary(const fs::path& folder, int documents, int items) {
  const fs::path collection = folder / "Collections" / fresh();
  fs::create_directories(collection);
  (void)services().propertyLists->writeDictionary({{"UUID", collection.filename().native()}, {"Title", "Bench"}},
                                                  collection / "collection.plist");
  for (int i = 0; i < documents; ++i) {
    Dictionary record = documentRecord(items);
    const fs::path package = collection / (*record.string("UUID") + ".qpk");
    fs::create_directories(package);
    // Without the sync of a save, which would make this the longest part.
    const std::string text = services().propertyLists->serialize(record);
    std::FILE* file = std::fopen((package / "properties.plist").c_str(), "wb");
    if (!file || std::fwrite(text.data(), 1, text.size(), file) != text.size()) std::perror("write");
    if (file) std::fclose(file);
  }
  return collection;
}

std::size_t load(const fs::path& library) {
  const auto controller = quilt::QuiltCollectionsController::init();
  controller->loadLibraryPath(library, nullptr);
  return controller->collectionAtIndex(0) ? controller->collectionAtIndex(0)->documentsCount() : 0;
}

void parseAll(const fs::path& collection) {
  for (const auto& package : fs::directory_iterator(collection)) {
    const fs::path file = package.path() / "properties.plist";
    pugi::xml_document xml;
    if (fs::exists(file) && !xml.load_file(file.c_str())) std::printf("not parsed: %s\n", file.c_str());
  }
}

void compareLoading(const fs::path& folder, int documents, int items) {
  const fs::path library = folder / ("library" + std::to_string(documents));
  const fs::path collection = makeLibrary(library, documents, items);
  std::size_t loaded = 0;
  double ours = 1e12;
  double theirs = 1e12;
  for (int run = 0; run < 3; ++run) {
    ours = std::min(ours, milliseconds([&] { loaded = load(library); }));
    theirs = std::min(theirs, milliseconds([&] { parseAll(collection); }));
  }
  std::printf("load %5zu documents of %d items    ours %9.1f ms (%6.0f documents/s)  parse %9.1f ms  ratio %.2f\n",
              loaded, items, ours, static_cast<double>(loaded) * 1000 / ours, theirs, ours / theirs);
  fs::remove_all(library);
}

void compareSaving(const fs::path& folder, int items) {
  const fs::path package = makeLibrary(folder / "saving", 1, items);
  const fs::path file = fs::directory_iterator(package)->path();
  const fs::path document = fs::is_directory(file) ? file : std::next(fs::directory_iterator(package))->path();
  const auto opened = quilt::QuiltDocument::initWithPath(document);
  if (!opened) return;
  pugi::xml_document xml;
  xml.load_file((document / "properties.plist").c_str());
  const double text = bestOf(20, [&] { (void)services().propertyLists->serialize(opened->dictionary()); });
  const double peer = bestOf(20, [&] {
    std::ostringstream out;
    xml.save(out);
  });
  const Dictionary record = opened->dictionary();
  const double alone = bestOf(20, [&] { (void)services().propertyLists->serialize(record); });
  std::printf(
      "record of %5d items to text       ours %9.3f ms (%.3f from a dictionary)  pugixml %9.3f ms  ratio %.2f\n", items,
      text, alone, peer, alone / peer);
  std::printf("save it                            ours %9.3f ms\n", bestOf(5, [&] { opened->update(); }));
}

}  // namespace

int main(int argumentCount, char** arguments) {
  const int documents = argumentCount > 1 ? std::atoi(arguments[1]) : 2000;
  const int items = argumentCount > 2 ? std::atoi(arguments[2]) : 10;
  quilt::platform::install();
  std::string pattern = (fs::temp_directory_path() / "quilt-bench-XXXXXX").string();
  if (mkdtemp(pattern.data()) == nullptr) return 1;
  for (const int part : {documents / 4, documents / 2, documents}) compareLoading(pattern, part, items);
  compareSaving(fs::path(pattern) / "ten", 10);
  compareSaving(fs::path(pattern) / "thousand", 1000);
  fs::remove_all(pattern);
  return 0;
}
