// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>

#include <algorithm>

#include "cli/ActingDelegate.h"
#include "cli/EntryJson.h"
#include "cli/Exporting.h"
#include "cli/Interrupt.h"
#include "cli/LibrarySession.h"
#include "cli/Manifest.h"
#include "cli/ManifestItems.h"
#include "cli/Saving.h"
#include "cli/Text.h"
#include "cli/ThemeLookup.h"
#include "quilt/platform/base/TemporaryNames.h"
#include "quilt/platform/base/Worker.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::cli {

namespace {

using platform::services;

// Shares of the bar: looking at the files, copying them into the package, and, for the rest, exporting.
constexpr double kLooked = 3;
constexpr double kCopied = 30;

/// What to build, looked at before anything is made.
struct BuildPlan {
  Manifest manifest;
  ExportTarget target;
  std::shared_ptr<QuiltTheme> theme;
  std::shared_ptr<ImageWrapper> poster;  ///< null: none is named
  std::vector<NewItem> items;
};

std::string nameOf(const Manifest& manifest) {
  return inQuotes(manifest.title.value_or(manifest.path.filename().native()));
}

std::shared_ptr<QuiltTheme> chooseTheme(const BuildRequest& request, const Manifest& manifest,
                                        std::vector<Failure>& problems) {
  if (request.theme) return findTheme(*request.theme);
  if (manifest.theme) {
    try {
      return findTheme(*manifest.theme, manifest.path.parent_path());
    } catch (const Failure& failure) {
      problems.push_back(manifestFailure(manifest.path, "theme", failure));
      return nullptr;
    }
  }
  auto theme = defaultTheme();
  if (!theme) throw Failure(ExitCode::NotFound, "No theme is installed; name the path of one with --theme");
  return theme;
}

std::shared_ptr<ImageWrapper> readPoster(const Manifest& manifest, std::vector<Failure>& problems) {
  if (!manifest.poster) return nullptr;
  const Path path = absolutePath((manifest.path.parent_path() / *manifest.poster).native());
  auto image = services().images->imageWithPath(path);
  if (image) return *std::move(image);
  const Failure failure("Cannot use the poster " + inQuotes(*manifest.poster),
                        platform::Error{image.error().kind, image.error().text, path});
  problems.push_back(manifestFailure(manifest.path, "poster", failure));
  return nullptr;
}

BuildPlan look(const BuildRequest& request, const Context& context) {
  BuildPlan plan{
      readManifest(request.manifest), {absolutePath(request.output), request.zip, request.formats}, {}, {}, {}};
  if (plan.target.formats.empty()) plan.target.formats = plan.manifest.formats;
  if (plan.target.formats.empty()) plan.target.formats = {kQuiltMediaDerivativeCompatibilityTagDesktop};
  checkDestination(plan.target.folder, context.settings.library ? absolutePath(*context.settings.library) : Path());
  std::vector<Failure> problems;
  plan.theme = chooseTheme(request, plan.manifest, problems);
  plan.poster = readPoster(plan.manifest, problems);
  plan.items = lookAtItems(plan.manifest, problems, [&context](double percentage) {
    context.progress.report("Looking at the files", percentage * kLooked / 100);
    return !Interrupt::isRequested();
  });
  if (Interrupt::isRequested()) throw Interrupt::failure("Nothing was exported");
  throwProblems(plan.manifest.path, problems);
  return plan;
}

/// A folder that is removed with all that is in it.
class TemporaryFolder {
 public:
  explicit TemporaryFolder(const Path& in) : _in(in), _path(in / platform::hiddenNameBeside("build")) {}
  TemporaryFolder(const TemporaryFolder&) = delete;
  TemporaryFolder& operator=(const TemporaryFolder&) = delete;
  ~TemporaryFolder() { (void)services().files->removeItem(_path, _in); }

  [[nodiscard]] const Path& path() const { return _path; }

 private:
  const Path _in;
  const Path _path;
};

/// A document in a library that goes again, with the collection that was made for it, unless it is kept.
class NewDocument {
 public:
  NewDocument(LibrarySession& session, const Manifest& manifest, const LogCollector& log) {
    const std::string title = manifest.collection ? manifest.collection->title : kDefaultCollectionTitle;
    _collection = session.collectionTitled(title);
    if (session.hasMadeCollection()) describe(title, manifest);
    const LibraryLock moment = session.lockForAMoment(_collection->path());
    _document = _collection->newDocumentWithType(kQuiltDocumentTypeInteractive);
    if (_document) {
      _lock.emplace(session.lockNew(_document->path(), moment));
      return;
    }
    throw explain("The package " + nameOf(manifest) + " cannot be made", log, _collection->path(), _collection->path());
  }
  NewDocument(const NewDocument&) = delete;
  NewDocument& operator=(const NewDocument&) = delete;
  ~NewDocument() {
    if (!_isKept) giveUp();
  }

  [[nodiscard]] QuiltDocument& operator*() const { return *_document; }
  void keep() { _isKept = true; }

 private:
  void describe(const std::string& title, const Manifest& manifest) {
    if (!manifest.collection) return;
    const ManifestCollection& described = *manifest.collection;
    const bool saved = changeAndSave(*_collection, [&] {
      if (described.author) _collection->setAuthor(described.author);
      if (described.description) _collection->setDescription(described.description);
    });
    if (saved) return;
    throw Failure(ExitCode::InputOutput, "The collection " + inQuotes(title) + " cannot be saved", _collection->path());
  }

  void giveUp() {
    if (!_document) return;
    // Also when somebody else holds the collection: nobody else knows the document.
    const auto moment = LibraryLock::ofCollection(_collection->path(), {std::chrono::seconds(5)});
    _collection->removeDocument(_document, true);
  }

  std::shared_ptr<QuiltCollection> _collection;
  std::shared_ptr<QuiltDocument> _document;
  std::optional<LibraryLock> _lock;
  bool _isKept = false;
};

void describe(QuiltDocument& document, const BuildPlan& plan, const LogCollector& log) {
  const Manifest& manifest = plan.manifest;
  const std::string cannot = "The package " + nameOf(manifest) + " cannot be made";
  const bool saved = changeAndSave(document, [&] {
    if (manifest.title) document.setTitle(manifest.title);
    if (manifest.author) document.setAuthor(manifest.author);
    document.setDescription(manifest.description);
    document.setKeywords(manifest.keywords);
    document.setCategory(manifest.category);
    document.setTheme(plan.theme);
  });
  if (!saved) throw explain(cannot, log, document.path(), document.path());
  if (!plan.poster) return;
  document.updatePosterImage(plan.poster);
  if (!services().files->fileExistsAtPath(document.posterImagePath()))
    throw explain(cannot + ": Its poster cannot be written", log, document.posterImagePath(), document.path());
}

// The package is built where nobody looks: what is said of its files is said of those that they are copies of.
void knowOriginals(const QuiltMedia& made, const NewItem& item, LogCollector& log) {
  const auto know = [&log](const QuiltMediaSource& source, const NewSource& original) {
    for (const auto& derivative : source.derivatives())
      if (const auto url = derivative->url(); url && url->isFileUrl())
        log.know(url->relativePath().filename(), original.url.relativePath());
  };
  const auto sources = made.sources();
  for (std::size_t i = 0; i < std::min(sources.size(), item.sources.size()); ++i) know(*sources[i], item.sources[i]);
  const auto extras = made.extras();
  for (std::size_t i = 0; i < std::min(extras.size(), item.extras.size()); ++i) know(*extras[i], item.extras[i]);
  if (const auto commentary = made.audioCommentarySource(); commentary && item.commentary)
    know(*commentary, *item.commentary);
}

void addItems(QuiltDocument& document, const BuildPlan& plan, const Context& context) {
  double total = 0;
  for (const NewItem& item : plan.items) total += weightOf(item);
  double before = 0;
  std::size_t added = 0;
  platform::runOnWorker([&] {
    for (; added < plan.items.size() && !Interrupt::isRequested(); ++added) {
      const NewItem& item = plan.items[added];
      context.log.beginOperation();
      const double weight = weightOf(item);
      const auto made = addItem(
          document, item,
          [&](double percentage) {
            const double share = (before + weight * percentage / 100) / total;
            context.progress.report("Adding " + item.title, kLooked + share * (kCopied - kLooked));
            return !Interrupt::isRequested();
          },
          SaveTime::Later);
      if (!made) return;
      knowOriginals(*made, item, context.log);
      if (!context.settings.quiet) context.log.showWarnings();
      before += weight;
    }
  });
  if (Interrupt::isRequested()) throw Interrupt::failure("Nothing was exported");
  if (added < plan.items.size())
    throw manifestFailure(
        plan.manifest.path, plan.manifest.media[added].place,
        explain("Cannot add " + inQuotes(plan.items[added].title), context.log, document.path(), document.path()));
  if (!document.update())
    throw explain("The document " + nameOf(plan.manifest) + " cannot be saved", context.log, document.path(),
                  document.path());
  context.log.beginOperation();
}

Json itemsOf(const QuiltDocument& document) {
  Json items = Json::array();
  for (const auto& item : document.media())
    items.push_back({{"uuid", item->uuid()},
                     {"title", item->title().value_or("")},
                     {"category", item->contentCategory().value_or("")}});
  return items;
}

}  // namespace

void ActingDelegate::perform(const BuildRequest& request) {
  const BuildPlan plan = look(request, _context);
  const Destination destination(plan.target.folder);
  // Beside the package, where there is as much space, and moving costs nothing.
  std::optional<TemporaryFolder> temporary;
  if (!_context.settings.library) temporary.emplace(plan.target.folder);
  LibrarySession session(temporary ? temporary->path() : library(), _context);
  NewDocument made(session, plan.manifest, _context.log);
  QuiltDocument& document = *made;
  if (temporary && !plan.manifest.collection) document.setCollectionOwner(nullptr);  // the author named none
  _context.log.beginOperation();
  describe(document, plan, _context.log);
  addItems(document, plan, _context);
  const Path exported = exportPackage(document, nameOf(plan.manifest), plan.target, _context, kCopied);
  if (!temporary) made.keep();
  _context.output.object({{"uuid", document.uuid()},
                          {"title", document.title().value_or("")},
                          {"type", document.type().value_or("")},
                          {"path", exported.native()},
                          {"formats", plan.target.formats},
                          {"zip", plan.target.zip},
                          {"theme", plan.theme->identifier().value_or("")},
                          {"items", itemsOf(document)}},
                         _context.output.shown(exported));
}

void PreviewDelegate::perform(const BuildRequest& request) {
  _context.output.beginList();
  const BuildPlan plan = look(request, _context);
  for (const NewItem& item : plan.items) {
    const std::string category = item.category.value_or(item.sources.front().category);
    Json sources = Json::array();
    for (const NewSource& source : item.sources) sources.push_back(source.url.absoluteString());
    PreviewDelegate::plan({{"action", "add"}, {"title", item.title}, {"category", category}, {"sources", sources}},
                          fmt::format("Would add the {} item {}", category, inQuotes(item.title)));
  }
  std::string formats;
  for (const std::string& format : plan.target.formats) formats += (formats.empty() ? "" : ", ") + format;
  PreviewDelegate::plan({{"action", "export"},
                         {"title", plan.manifest.title.value_or("")},
                         {"path", plan.target.folder.native()},
                         {"formats", plan.target.formats},
                         {"zip", plan.target.zip},
                         {"theme", plan.theme->identifier().value_or("")}},
                        fmt::format("Would export {} to {} as {}, format {}, theme {}", nameOf(plan.manifest),
                                    inQuotes(plan.target.folder.native()), plan.target.zip ? "an archive" : "a package",
                                    formats, escaped(plan.theme->localizedName().value_or(""))));
}

}  // namespace quilt::cli
