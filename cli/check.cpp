// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>

#include <cmath>
#include <set>

#include "cli/ActingDelegate.h"
#include "cli/Interrupt.h"
#include "cli/Lookup.h"
#include "cli/Text.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/base/TemporaryNames.h"
#include "quilt/platform/base/Url.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::cli {

namespace {

using platform::Array;
using platform::Dictionary;
using platform::FileKind;
using platform::services;

constexpr const char* kLeftover = "It was left by an operation that did not end";

/// Tells what killed operations left beside the documents and collections; answers how many.
std::size_t findLeftovers(const Catalogue& catalogue, Output& output) {
  std::size_t count = 0;
  const auto look = [&](const Path& folder, const std::string& uuid, const std::string& title) {
    const auto names = services().files->contentsOfDirectoryAtPath(folder);
    if (!names) return;
    for (const std::string& name : *names) {
      if (!platform::isHiddenTemporaryName(name)) continue;
      ++count;
      const std::string path = (folder / name).native();
      output.item({{"uuid", uuid},
                   {"title", title},
                   {"type", "Collection"},
                   {"path", path},
                   {"kind", "unreferenced"},
                   {"message", kLeftover}},
                  fmt::format("{}\tunreferenced\t{}\t{}", escaped(uuid), escaped(path), kLeftover));
    }
  };
  for (const CollectionEntry& collection : catalogue.collections)
    look(collection.path, collection.uuid, collection.title);
  if (!catalogue.collections.empty()) look(catalogue.collections.front().path.parent_path(), "", "");
  return count;
}

/// Looks through one package, and tells what is wrong with it.
class Check {
 public:
  Check(const DocumentEntry& document, Output& output) : _document(document), _output(output) {}

  /// How many findings it told.
  std::size_t run() {
    const auto record = readDocumentRecord(_document.path);
    if (!record) {
      tell("damaged", record.error().file.empty() ? _document.path : record.error().file, record.error().text);
      return _count;
    }
    each(*record, "Media", [this](const Dictionary& item) { checkItem(item); });
    findLeftovers(_document.path);
    findUnreferenced(_document.path / "media");
    return _count;
  }

 private:
  void tell(const char* kind, const Path& file, const std::string& what) {
    ++_count;
    _output.item({{"uuid", _document.uuid},
                  {"title", _document.title},
                  {"type", _document.type},
                  {"path", file.native()},
                  {"kind", kind},
                  {"message", what}},
                 fmt::format("{}\t{}\t{}\t{}", escaped(_document.uuid), kind, escaped(file.native()), escaped(what)));
  }

  template <class Visit>
  static void each(const Dictionary& record, const char* key, const Visit& visit) {
    const Array* array = record.array(key);
    if (!array) return;
    for (const platform::PropertyList& element : *array)
      if (const auto* dictionary = element.as<Dictionary>()) visit(*dictionary);
  }

  /// The folder that belongs to the record; empty, and told, when its identity names none.
  Path folderOf(const Dictionary& record, const Path& parent) {
    const std::string uuid = record.string("UUID").value_or("");
    if (parent.empty()) return {};
    if (!platform::isPlainComponent(uuid)) {
      tell("outside", parent, "The identity " + inQuotes(uuid) + " is no plain folder name");
      return {};
    }
    return parent / uuid;
  }

  void checkItem(const Dictionary& item) {
    const Path folder = folderOf(item, _document.path / "media");
    if (folder.empty()) return;
    _referenced.insert(folder / "poster.jpg");
    each(item, "Sources", [&](const Dictionary& source) { checkSource(source, folder / "sources"); });
    each(item, "Extras", [&](const Dictionary& extra) { checkSource(extra, folder / "extras"); });
    if (const Dictionary* commentary = item.dictionary("AudioCommentarySource"))
      checkSource(*commentary, folder / "sources");
  }

  void checkSource(const Dictionary& source, const Path& parent) {
    const Path folder = folderOf(source, parent);
    if (folder.empty()) return;
    each(source, "Derivatives", [&](const Dictionary& derivative) {
      if (derivative.string("Filename")) {
        checkFile(derivative, "Filename", folder / "derivatives");
      } else {
        checkOriginal(derivative);
      }
    });
    each(source, "Previews", [&](const Dictionary& preview) {
      const bool isWritten = preview.boolean("IsFlattened").value_or(false);
      if (isWritten && preview.string("Filename")) checkFile(preview, "Filename", folder / "previews");
    });
    if (const Dictionary* samples = source.dictionary("AudioSamples")) checkSamples(*samples, folder / "audiosamples");
  }

  /// A record that was read and written again no longer names the file; the model finds it by its identity.
  void checkSamples(const Dictionary& samples, const Path& folder) {
    if (samples.string("SampleFilename")) return checkFile(samples, "SampleFilename", folder);
    const std::string uuid = samples.string("UUID").value_or("");
    if (platform::isPlainComponent(uuid)) _referenced.insert(folder / (uuid + ".asc"));
  }

  void checkFile(const Dictionary& record, const char* key, const Path& folder) {
    const std::string name = record.string(key).value_or("");
    if (!platform::isPlainComponent(name))
      return tell("outside", folder, "The file name " + inQuotes(name) + " is no plain name");
    const Path file = folder / name;
    _referenced.insert(file);
    if (!services().files->isConfined(file, _document.path))
      return tell("outside", file, "It leads out of the package");
    const auto attributes = services().files->attributesOfItemAtPath(file);
    if (!attributes) return tell("missing", file, attributes.error().text);
    if (attributes->kind != FileKind::File) return tell("damaged", file, "It is no file");
    checkSize(record, file, attributes->size);
  }

  void checkSize(const Dictionary& record, const Path& file, std::uint64_t bytes) {
    const auto recorded = record.real("TotalSizeInMegaBytes");
    if (!recorded) return;
    constexpr double mega = 1024.0 * 1024.0;
    const double actual = static_cast<double>(bytes) / mega;
    constexpr double precision = 2e-7;  // sizes are recorded in single precision
    if (std::abs(*recorded - actual) <= precision * actual) return;
    tell("size", file, fmt::format("It has {} bytes, and not {:.0f} as recorded", bytes, *recorded * mega));
  }

  /// A file that was not copied into the package; web pages stay where they are.
  void checkOriginal(const Dictionary& derivative) {
    const auto url = platform::Url::parse(derivative.string("URL").value_or(""));
    if (!url || !url->isFileUrl()) return;
    tell("outside", url->relativePath(), "It was not copied into the package");
  }

  /// One level: below "media" every file is looked at, and what lies elsewhere is the theme's.
  void findLeftovers(const Path& folder) {
    const auto names = services().files->contentsOfDirectoryAtPath(folder);
    if (!names) return;
    for (const std::string& name : *names)
      if (platform::isHiddenTemporaryName(name)) tell("unreferenced", folder / name, kLeftover);
  }

  /// Sizes of previews are not recorded, nor are posters: they count as referenced when their place is known.
  void findUnreferenced(const Path& folder) {
    const auto names = services().files->contentsOfDirectoryAtPath(folder);
    if (!names) return;
    for (const std::string& name : *names) {
      const Path path = folder / name;
      if (platform::isHiddenTemporaryName(name)) {
        tell("unreferenced", path, kLeftover);
      } else if (services().files->kindOfItemAtPath(path) == FileKind::Folder) {
        findUnreferenced(path);
      } else if (!_referenced.contains(path)) {
        tell("unreferenced", path, "No record names it");
      }
    }
  }

  const DocumentEntry& _document;
  Output& _output;
  std::set<Path> _referenced;
  std::size_t _count = 0;
};

std::vector<const DocumentEntry*> documentsOf(const CheckRequest& request, const Catalogue& catalogue) {
  std::vector<const DocumentEntry*> documents;
  for (const std::string& name : request.documents) documents.push_back(findDocument(catalogue, name).document);
  if (!request.documents.empty()) return documents;
  for (const CollectionEntry& collection : catalogue.collections)
    for (const DocumentEntry& document : collection.documents) documents.push_back(&document);
  return documents;
}

}  // namespace

void ActingDelegate::perform(const CheckRequest& request) {
  _context.output.beginList();
  const Catalogue catalogue = readCatalogue(library());
  const std::vector<const DocumentEntry*> documents = documentsOf(request, catalogue);
  std::size_t findings = request.documents.empty() ? findLeftovers(catalogue, _context.output) : 0;
  std::size_t done = 0;
  for (const DocumentEntry* document : documents) {
    if (Interrupt::isRequested()) throw Interrupt::failure("The rest was not checked");
    _context.progress.report("Checking", static_cast<double>(done++) * 100 / static_cast<double>(documents.size()));
    findings += Check(*document, _context.output).run();
  }
  if (findings > 0)
    throw Failure(ExitCode::Invalid, fmt::format("{} finding{} in {} document{}", findings, findings == 1 ? "" : "s",
                                                 documents.size(), documents.size() == 1 ? "" : "s"));
}

}  // namespace quilt::cli
