// SPDX-License-Identifier: Apache-2.0
// Loads and saves a library of generated records beside what others make of the same files, in one run:
// `library [DOCUMENTS] [ITEMS]`, 2,000 documents of 10 items by default. Each item has one source with three
// derivatives and a still for each of its ten chapters, about 70 KB of record for a document. Loading is linear when
// the rate stays the same from a quarter of the library to all of it. Where libplist is not installed, its columns
// stay empty.
#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <nlohmann/json.hpp>
#include <pugixml.hpp>
#include <sstream>
#include <string>
#include <vector>

#ifdef QUILT_HAS_LIBPLIST
#include <plist/plist.h>
#endif

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

/// A property list as libplist holds it; nothing where that is not installed.
class Peer {
 public:
#ifdef QUILT_HAS_LIBPLIST
  static constexpr bool kIsThere = true;
  explicit Peer(const std::string& text) {
    plist_from_xml(text.data(), static_cast<std::uint32_t>(text.size()), &_root);
    if (!_root) std::printf("not parsed by libplist\n");
  }
  ~Peer() { plist_free(_root); }
  void write() const {
    char* text = nullptr;
    std::uint32_t size = 0;
    plist_to_xml(_root, &text, &size);
    std::free(text);
  }

 private:
  plist_t _root = nullptr;
#else
  static constexpr bool kIsThere = false;
  explicit Peer(const std::string&) {}
  void write() const {}
#endif
};

void printRatio(const char* of, double ours, double theirs, bool isThere = true) {
  if (isThere) std::printf("  %s %.3f ms, ratio %.2f", of, theirs, ours / theirs);
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

void peerAll(const fs::path& collection) {
  for (const auto& package : fs::directory_iterator(collection))
    if (const auto text = services().files->readFile(package.path() / "properties.plist", 1U << 30U)) Peer{*text};
}

void compareLoading(const fs::path& folder, int documents, int items) {
  const fs::path library = folder / ("library" + std::to_string(documents));
  const fs::path collection = makeLibrary(library, documents, items);
  std::size_t loaded = 0;
  double ours = 1e12;
  double parse = 1e12;
  double peer = 1e12;
  for (int run = 0; run < 3; ++run) {
    ours = std::min(ours, milliseconds([&] { loaded = load(library); }));
    parse = std::min(parse, milliseconds([&] { parseAll(collection); }));
    peer = std::min(peer, milliseconds([&] { peerAll(collection); }));
  }
  const double each = ours / static_cast<double>(std::max<std::size_t>(loaded, 1));
  std::printf("load %zu documents of %d items: %.3f ms each", loaded, items, each);
  printRatio("parse", each, parse / documents);
  printRatio("libplist", each, peer / documents, Peer::kIsThere);
  std::printf("\n");
  fs::remove_all(library);
}

/// Every job once in each turn, the best of each: what else the machine does meanwhile is shared.
std::vector<double> bestOfEach(int turns, const std::vector<std::function<void()>>& jobs) {
  std::vector<double> best(jobs.size(), 1e12);
  for (int turn = 0; turn < turns; ++turn)
    for (std::size_t i = 0; i < jobs.size(); ++i) best[i] = std::min(best[i], milliseconds(jobs[i]));
  return best;
}

void compareLargeRecord() {
  const std::string text = services().propertyLists->serialize(documentRecord(3000));
  const auto best = bestOfEach(5, {[&] { (void)services().propertyLists->parse(text); }, [&] { Peer{text}; }});
  std::printf("read a record of %.0f MB: %.1f ms", static_cast<double>(text.size()) / 1e6, best[0]);
  printRatio("libplist", best[0], best[1], Peer::kIsThere);
  std::printf("\n");
}

void compareSaving(const fs::path& folder, int items) {
  const fs::path package = makeLibrary(folder / "saving", 1, items);
  const fs::path file = fs::directory_iterator(package)->path();
  const fs::path document = fs::is_directory(file) ? file : std::next(fs::directory_iterator(package))->path();
  const auto opened = quilt::QuiltDocument::initWithPath(document);
  if (!opened) return;
  const Dictionary record = opened->dictionary();
  const std::string text = services().propertyLists->serialize(record);
  const Peer peer(text);
  pugi::xml_document xml;
  xml.load_string(text.c_str());
  const auto json = nlohmann::json::parse(services().json->toJSON(record));
  const auto best = bestOfEach(20, {[&] { (void)services().propertyLists->serialize(opened->dictionary()); },
                                    [&] { (void)services().propertyLists->serialize(record); }, [&] { peer.write(); },
                                    [&] {
                                      std::ostringstream out;
                                      xml.save(out);
                                    },
                                    [&] { (void)services().json->toJSON(record); }, [&] { (void)json.dump(); }});
  for (const std::size_t ours : {std::size_t{0}, std::size_t{1}}) {
    std::printf("%d items, %s to text: %.3f ms", items, ours == 0 ? "model" : "dictionary", best[ours]);
    printRatio("libplist", best[ours], best[2], Peer::kIsThere);
    printRatio("pugixml", best[ours], best[3]);
    std::printf("\n");
  }
  std::printf("%d items, dictionary to JSON: %.3f ms", items, best[4]);
  printRatio("nlohmann", best[4], best[5]);
  std::printf("\n%d items, save: %.3f ms\n", items, bestOfEach(5, {[&] { opened->update(); }})[0]);
}

}  // namespace

int main(int argumentCount, char** arguments) {
  const int documents = argumentCount > 1 ? std::atoi(arguments[1]) : 2000;
  const int items = argumentCount > 2 ? std::atoi(arguments[2]) : 10;
  quilt::platform::install();
  std::string pattern = (fs::temp_directory_path() / "quilt-bench-XXXXXX").string();
  if (mkdtemp(pattern.data()) == nullptr) return 1;
  for (const int part : {documents / 4, documents / 2, documents}) compareLoading(pattern, part, items);
  compareLargeRecord();
  compareSaving(fs::path(pattern) / "ten", 10);
  compareSaving(fs::path(pattern) / "thousand", 1000);
  fs::remove_all(pattern);
  return 0;
}
