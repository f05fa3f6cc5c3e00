// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <numeric>

#include "cli/ActingDelegate.h"
#include "cli/Interrupt.h"
#include "cli/LibrarySession.h"
#include "cli/Saving.h"
#include "cli/Text.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/base/Worker.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::cli {

namespace {

using platform::services;

constexpr const char* kNotImported = "files could not be imported";

/// A file that can be imported.
struct ImportedFile {
  Path path;
  std::string title;         ///< the title in its metadata, else its name
  bool hasOwnTitle = false;  ///< the library will find the title itself
  std::uint64_t size = 0;    ///< bytes
};

std::vector<std::string> readList(char end) {
  std::string all;
  std::array<char, 65536> buffer{};
  for (;;) {
    const ssize_t count = ::read(STDIN_FILENO, buffer.data(), buffer.size());
    if (Interrupt::isRequested()) throw Interrupt::failure("Nothing was imported");
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) throw Failure(ExitCode::InputOutput, "The list of files cannot be read");
    if (count == 0) break;
    all.append(buffer.data(), static_cast<std::size_t>(count));
  }
  std::vector<std::string> files;
  for (std::size_t begin = 0; begin < all.size();) {
    const std::size_t at = std::min(all.find(end, begin), all.size());
    if (at > begin) files.push_back(all.substr(begin, at - begin));
    begin = at + 1;
  }
  return files;
}

std::vector<std::string> allFiles(const ImportRequest& request) {
  std::vector<std::string> files = request.files;
  if (request.filesFromInput)
    for (std::string& file : readList(request.nulSeparated ? '\0' : '\n')) files.push_back(std::move(file));
  if (files.empty()) throw Failure(ExitCode::Usage, "No file is named");
  return files;
}

// Looks at one file. Throws a Failure when it is nothing to import.
ImportedFile check(const std::string& name) {
  const std::string cannot = "Cannot import " + inQuotes(name);
  const Path path = absolutePath(name);
  const auto attributes = services().files->attributesOfItemAtPath(path);
  if (!attributes) throw Failure(cannot, attributes.error());
  if (attributes->kind == platform::FileKind::Folder)
    throw Failure(ExitCode::Invalid, cannot + ": It is a folder, not a file", path);
  if (!QuiltDocument::canImportFromPath(path)) {
    const auto type = platform::FDYTypePreferredIdentifier(path);
    throw Failure(ExitCode::Invalid,
                  cannot + ": " + (type ? "Files of type " + escaped(*type) : "Files of this kind") +
                      " make no document; movies, audio, PDF and EPUB do",
                  path);
  }
  const auto facts = services().inspector->inspect(path);
  if (!facts) throw Failure(cannot, platform::Error{facts.error().kind, facts.error().text, path});
  if (!QuiltMediaSource::initWithPath(path))
    throw Failure(ExitCode::Invalid, cannot + ": It suits none of the formats Desktop, 720p and 480p", path);
  const bool hasOwnTitle = facts->metadataTitle && !facts->metadataTitle->empty();
  return {path, hasOwnTitle ? *facts->metadataTitle : asTitle(path.stem().native()), hasOwnTitle, attributes->size};
}

// Looks at every file before anything is changed; what is wrong with one is added to the failures.
std::vector<ImportedFile> checkAll(const std::vector<std::string>& files, std::vector<Failure>& failures) {
  std::vector<ImportedFile> candidates;
  for (const std::string& file : files) {
    if (Interrupt::isRequested()) throw Interrupt::failure("Nothing was imported");
    try {
      candidates.push_back(check(file));
    } catch (const Failure& failure) {
      failures.push_back(failure);
    }
  }
  return candidates;
}

/// Imports files into one collection, one after the other.
class Import {
 public:
  Import(const Context& context, const LibrarySession& session, QuiltCollection& collection,
         std::vector<ImportedFile> candidates)
      : _context(context), _session(session), _collection(collection), _candidates(std::move(candidates)) {
    for (const ImportedFile& candidate : _candidates) _total += weight(candidate);
  }

  /// On a worker. Stops between two files, and inside one, when the user asks.
  void run() {
    for (const ImportedFile& candidate : _candidates) {
      if (Interrupt::isRequested()) return;
      _context.log.beginOperation();
      try {
        if (const auto document = importOne(candidate)) {
          ++_done;
          if (!_context.settings.quiet) _context.log.showWarnings();
          print(candidate, *document);
        }
      } catch (const Failure& failure) {  // of a lock
        if (!Interrupt::isRequested()) failures.push_back(failure);
      }
      _before += weight(candidate);
    }
  }

  [[nodiscard]] std::size_t done() const { return _done; }
  [[nodiscard]] bool isComplete() const { return _done + failures.size() == _candidates.size(); }

  std::vector<Failure> failures;

 private:
  // A small file takes its time, too.
  static double weight(const ImportedFile& candidate) { return static_cast<double>(candidate.size) + 1e6; }

  std::shared_ptr<QuiltDocument> importOne(const ImportedFile& candidate) {
    const std::string cannot = "Cannot import " + inQuotes(candidate.path.native());
    const std::string stage = "Importing " + candidate.path.filename().native();
    const auto block = [&](double percentage) {
      _context.progress.report(stage, (_before + weight(candidate) * percentage / 100) * 100 / _total);
      return !Interrupt::isRequested();
    };
    block(0);
    // Under an identity of our own, so that it can be locked from the first, and what a failure leaves can be found.
    const std::string uuid = platform::generateUUID();
    const LibraryLock lock =
        _session.lockNew(_collection.path() / platform::withExtension(uuid, kQuiltDocumentExtension));
    const auto document = _collection.importDocumentFromPath(candidate.path, uuid, block);
    if (!document) {
      removePackage(uuid);
      if (!Interrupt::isRequested())
        failures.push_back(explain(cannot, _context.log, candidate.path, _collection.path()));
      return nullptr;
    }
    if (candidate.hasOwnTitle || changeAndSave(*document, [&] { document->setTitle(candidate.title); }))
      return document;
    _collection.removeDocument(document, true);
    failures.push_back(explain(cannot, _context.log, candidate.path, _collection.path()));
    return nullptr;
  }

  void removePackage(const std::string& uuid) const {
    const Path package = _collection.path() / platform::withExtension(uuid, kQuiltDocumentExtension);
    if (services().files->fileExistsAtPath(package)) (void)services().files->removeItem(package, _collection.path());
  }

  void print(const ImportedFile& candidate, const QuiltDocument& document) {
    const std::string title = document.title().value_or("");
    const std::string type = document.type().value_or("");
    _context.output.item({{"uuid", document.uuid()},
                          {"title", title},
                          {"type", type},
                          {"path", document.path().native()},
                          {"collection", _collection.uuid()},
                          {"source", candidate.path.native()}},
                         document.uuid() + '\t' + escaped(type) + '\t' + escaped(title));
  }

  Context _context;
  const LibrarySession& _session;
  QuiltCollection& _collection;
  const std::vector<ImportedFile> _candidates;
  double _total = 0;
  double _before = 0;
  std::size_t _done = 0;
};

}  // namespace

void ActingDelegate::perform(const ImportRequest& request) {
  _context.output.beginList();
  std::vector<Failure> failures;
  const std::vector<ImportedFile> candidates = checkAll(allFiles(request), failures);
  if (candidates.empty()) throwIfAny(failures, 0, kNotImported);

  LibrarySession session(library(), _context);
  const auto collection = session.collectionForNew(request.collection);
  Import import(_context, session, *collection, candidates);
  platform::runOnWorker([&] { import.run(); });

  if (!import.isComplete())
    throw Interrupt::failure(
        fmt::format("{} of {} files were imported; there is nothing of the rest", import.done(), candidates.size()));
  failures.insert(failures.end(), import.failures.begin(), import.failures.end());
  throwIfAny(failures, import.done(), kNotImported);
}

void PreviewDelegate::perform(const ImportRequest& request) {
  _context.output.beginList();
  std::vector<Failure> failures;
  const std::vector<ImportedFile> candidates = checkAll(allFiles(request), failures);
  const Catalogue catalogue = readCatalogue(library());
  const CollectionEntry* entry = collectionFor(catalogue, request.collection);
  const std::string title = entry ? entry->title : kDefaultCollectionTitle;
  for (const ImportedFile& candidate : candidates)
    plan({{"action", "import"},
          {"source", candidate.path.native()},
          {"title", candidate.title},
          {"collection", title},
          {"makesCollection", !entry}},
         fmt::format("Would import {} as {} into the {}collection {}", inQuotes(candidate.path.native()),
                     inQuotes(candidate.title), entry ? "" : "new ", inQuotes(title)));
  throwIfAny(failures, candidates.size(), kNotImported);
}

void PreviewDelegate::plan(Json step, const std::string& line) { _context.output.item(std::move(step), line); }

}  // namespace quilt::cli
