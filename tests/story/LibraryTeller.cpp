// SPDX-License-Identifier: Apache-2.0
#include "tests/story/LibraryTeller.h"

#include <fmt/format.h>

#include <stdexcept>
#include <thread>

#include "quilt/platform/interfaces/ImageWrapper.h"
#include "quilt/themes/QuiltTheme.h"
#include "tests/story/Story.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/Program.h"

namespace quilt::story {

namespace {

namespace fs = std::filesystem;

Outcome doneIf(bool isDone, const std::string& complaint) {
  return isDone ? Outcome{} : Outcome{.isDone = false, .complaint = complaint};
}

Url urlOf(const std::string& source) {
  return source.find("://") == std::string::npos ? Url::fileUrl(source) : *Url::parse(source);
}

std::shared_ptr<QuiltMediaSource> sourceOf(const std::string& from) {
  auto source = QuiltMediaSource::initWithURL(urlOf(from));
  if (!source) throw std::runtime_error("no source is made of " + from);
  return source;
}

}  // namespace

LibraryTeller::LibraryTeller(Path library, const Path&) : _library(std::move(library)) {
  fs::create_directories(_library);
  open();
  _controller->newCollection()->setTitle("Stories");
}

void LibraryTeller::open() {
  _controller = QuiltCollectionsController::init();
  if (!_controller->loadLibraryPath(_library, {})) throw std::runtime_error("the library does not open");
}

std::shared_ptr<QuiltDocument> LibraryTeller::find(const Document& document) const {
  auto found = _controller->collectionAtIndex(0)->documentWithUUID(document.uuid);
  if (!found) throw std::runtime_error("there is no document " + document.title);
  return found;
}

std::shared_ptr<QuiltMedia> LibraryTeller::find(const Document& document, const Item& item) const {
  auto found = find(document)->mediaWithUUID(item.uuid);
  if (!found) throw std::runtime_error("there is no item " + item.title);
  return found;
}

Outcome LibraryTeller::newDocument(const std::string& title, const Path& theme) {
  const auto document = _controller->collectionAtIndex(0)->newDocumentWithType(kQuiltDocumentTypeInteractive);
  if (!document) return doneIf(false, "no document is made");
  document->setTitle(title);
  document->setTheme(QuiltTheme::initWithPath(theme));
  return {};
}

Outcome LibraryTeller::importFile(const Path& file) {
  const auto document = _controller->collectionAtIndex(0)->importDocumentFromPath(file, {});
  if (document) document->setTitle(file.stem());
  return doneIf(document != nullptr, "nothing is imported");
}

Outcome LibraryTeller::removeDocument(const Document& document) {
  _controller->collectionAtIndex(0)->removeDocument(find(document), true);
  return {};
}

Outcome LibraryTeller::setTitle(const Document& document, const std::string& title) {
  find(document)->setTitle(title);
  return {};
}

Outcome LibraryTeller::setDescription(const Document& document, const std::string& description) {
  find(document)->setDescription(description);
  return {};
}

Outcome LibraryTeller::setPoster(const Document& document, const Path& picture) {
  find(document)->updatePosterImage(ImageWrapper::imageWithPath(picture));
  return {};
}

Outcome LibraryTeller::convert(const Document& document, const std::string& format) {
  return doneIf(find(document)->convertToFormat(format, {}), "the conversion fails");
}

Outcome LibraryTeller::finalize(const Document& document) {
  return doneIf(find(document)->finalizeWithProgressionBlock({}), "finalize fails");
}

Outcome LibraryTeller::exportTo(const Document& document, const Path& folder, bool zipped, Path& made) {
  made = find(document)->exportToPath(folder, zipped, {"Desktop"}, {});
  return doneIf(!made.empty(), "the export fails");
}

Outcome LibraryTeller::addItems(const Document& document, const std::vector<std::string>& sources) {
  for (const std::string& source : sources) {
    const auto item = QuiltMedia::init();
    item->setTitle(source.find("://") == std::string::npos ? Path(source).stem().native() : source);
    item->addSource(sourceOf(source));
    find(document)->addMedia(item);
  }
  return {};
}

Outcome LibraryTeller::addComposition(const Document& document, const std::string& category, const std::string& title,
                                      const std::vector<Path>& files) {
  // As an editor does it: an empty item first, which then fills.
  const auto item = QuiltMedia::init();
  item->setTitle(title);
  item->setContentCategory(category);
  find(document)->addMedia(item);
  for (const Path& file : files) item->addSource(sourceOf(file));
  return {};
}

Outcome LibraryTeller::addExtra(const Document& document, const Item& item, const Path& file) {
  const auto extra = QuiltMediaExtra::initWithPath(file);
  find(document, item)->addExtra(extra);
  return doneIf(extra != nullptr, "no extra is made");
}

Outcome LibraryTeller::setCommentary(const Document& document, const Item& item, const Path& file) {
  const auto media = find(document, item);
  const auto before = media->audioCommentarySource();
  const Path files = before ? before->path() : Path();
  media->setAudioCommentarySource(sourceOf(file));
  const bool isSaved = find(document)->update();
  if (!files.empty()) fs::remove_all(files);  // the host's to do: files stay
  return doneIf(isSaved, "the document is not saved");
}

Outcome LibraryTeller::setItemTitle(const Document& document, const Item& item, const std::string& title) {
  find(document, item)->setTitle(title);
  return doneIf(find(document)->update(), "the document is not saved");
}

Outcome LibraryTeller::removeItem(const Document& document, const Item& item) {
  find(document)->removeMedia(find(document, item));
  return {};
}

Outcome LibraryTeller::moveItem(const Document& document, std::size_t from, std::size_t to) {
  find(document)->moveMediaAtIndexes({from}, to > from ? to + 1 : to);  // counted before the move
  return {};
}

Outcome LibraryTeller::bringEverythingIn() {
  std::string complaint;
  _controller->collectionAtIndex(0)->performBlockOnDocuments([&](const auto& document) {
    if (document->mediaCount() == 0 || document->isFlattened()) return true;
    if (!document->flattenWithProgressionBlock({}))
      complaint += "\"" + document->title().value_or("") + "\" is not flattened ";
    return true;
  });
  return doneIf(complaint.empty(), complaint);
}

Contents LibraryTeller::look() {
  Contents contents = readLibrary(_library);
  Contents objects;
  _controller->collectionAtIndex(0)->performBlockOnDocuments([&](const auto& document) {
    objects.documents.push_back(readPackage(document->path(), document->dictionary()));
    lookAtPictures(document->path(), objects.documents.back(), contents.faults);
    if (document->isProcessing()) contents.faults.push_back("\"" + document->title().value_or("") + "\" is busy");
    return true;
  });
  if (describe(objects) != describe(contents))
    contents.faults.push_back("The objects hold something else:\n" + describe(objects));
  for (const std::string& name : leftovers(_library)) contents.faults.push_back("Left behind: " + name);
  const auto checked = support::runProgram({QUILT_PROGRAM, "--library", _library, "check"});
  for (std::size_t start = 0; checked.status == 4 && start < checked.output.size();) {
    const std::size_t end = checked.output.find('\n', start);
    const std::string line = checked.output.substr(start, end - start);
    const bool isAFinding = line.find('\t') != std::string::npos;
    if (isAFinding && line.find("\toutside\t") == std::string::npos) contents.faults.push_back("check: " + line);
    start = end == std::string::npos ? end : end + 1;
  }
  if (checked.status != 0 && checked.status != 4) contents.faults.push_back("check: " + checked.output);
  return contents;
}

// What can happen to a host alone.
namespace {

/// A title of any document, and what the pictures of its items must show.
bool lookAtAPicture(Story& story,
                    const std::function<std::shared_ptr<QuiltMedia>(const Document&, const Item&)>& find) {
  Document* document = story.anyDocument(hasItems);
  if (!document) return false;
  const Item& item = story.dice.anyOf(document->items);
  const std::vector<Rgba> none;
  const bool isKnown = item.sources.size() == 1 && item.sources[0] && item.category != "Montage";
  const std::vector<Rgba>& pages = isKnown ? item.sources[0]->pages : none;
  story.step(item.title, [&]() -> Outcome {
    const auto media = find(*document, item);
    const Path drawn = story.freshFolder() / "picture.png";
    const auto check = [&](const std::shared_ptr<ImageWrapper>& picture, const Rgba& colour) {
      return picture && picture->saveAsPNGAtURL(Url::fileUrl(drawn)) && shows(drawn, colour);
    };
    if (pages.empty()) {
      (void)media->posterImage();
      return {};
    }
    const std::size_t page = story.dice.below(pages.size());
    const auto preview = media->sourceAtIndex(0)->previewAtIndex(page);
    if (!preview || !check(preview->image(), pages[page])) return doneIf(false, "its preview shows something else");
    const auto past = media->sourceAtIndex(0)->previewAtIndex(pages.size() + 7);
    if (past && past->image()) return doneIf(false, "there is a preview past the last");
    return doneIf(check(media->posterImage(), pages[0]), "its poster shows something else");
  });
  return true;
}

/// Merged into a fresh package, which must then stand alone.
bool mergeIntoAFreshPackage(Story& story, const std::function<std::shared_ptr<QuiltDocument>(const Document&)>& find) {
  Document* document = story.anyDocument(hasItems);
  if (!document) return false;
  const Path package = story.freshFolder() / "copy.qpk";
  story.step(document->title, [&]() -> Outcome {
    const auto copy = QuiltDocument::initWithPath(package);
    if (!find(*document)->mergeIntoDocument(copy, {"Desktop"}, {})) return doneIf(false, "the merge fails");
    if (!copy->flattenWithProgressionBlock({})) return doneIf(false, "the copy is not flattened");
    return doneIf(copy->finalizeWithProgressionBlock({}), "the copy is not finalized");
  });
  story.expectPackage(package, *document);
  return true;
}

}  // namespace

std::vector<Operation> LibraryTeller::ownOperations() {
  const auto document = [this](const Document& one) { return find(one); };
  const auto item = [this](const Document& one, const Item& other) { return find(one, other); };

  const auto reopen = [this](Story& story) {
    // Loading clears away a classic document that has lost its items.
    if (story.anyDocument([](const Document& one) { return one.type != "Interactive" && one.items.empty(); }))
      return false;
    story.step("", [this] { return open(), Outcome{}; });
    return true;
  };
  const auto save = [this](Story& story) {
    story.step("", [this] { return doneIf(_controller->update(), "the library is not saved"); });
    return true;
  };
  const auto flatten = [document](Story& story) {
    Document* one = story.anyDocument(hasItems);
    if (!one) return false;
    story.step(one->title, [&] { return doneIf(document(*one)->flattenWithProgressionBlock({}), "flatten fails"); });
    return true;
  };
  const auto mergeIntoItself = [document](Story& story) {
    Document* one = story.anyDocument();
    if (!one) return false;
    story.step(one->title, [&]() -> Outcome {
      const auto self = document(*one);
      (void)self->mergeIntoDocument(self, {"Desktop"}, {});
      (void)self->mergeIntoDocument(nullptr, {"Desktop"}, {});
      return {};
    });
    return true;
  };
  const auto throwing = [document](Story& story) {
    Document* one = story.anyDocument(hasItems);
    if (!one) return false;
    std::size_t calls = story.dice.below(4);
    const auto block = [&calls](double) -> bool {
      if (calls-- == 0) throw std::runtime_error("a host's block throws");
      return true;
    };
    const Path folder = story.freshFolder();
    const std::size_t which = story.dice.below(3);
    story.step(one->title, [&]() -> Outcome {
      try {
        if (which == 0) (void)document(*one)->flattenWithProgressionBlock(block);
        if (which == 1) (void)document(*one)->finalizeWithProgressionBlock(block);
        if (which == 2) (void)document(*one)->exportToPath(folder, false, {"Desktop"}, block);
      } catch (const std::runtime_error&) {
      }
      return {};
    });
    for (const std::string& name : leftovers(folder)) story.complain("Left behind by an export that threw: " + name);
    return true;
  };
  const auto firstExtraMeanwhile = [this, item](Story& story) {
    Document* one =
        story.anyDocument([](const Document& any) { return hasItems(any) && any.items.back().extras.empty(); });
    if (!one) return false;
    const Document before = *one;
    const Material& material = story.anyMaterial([](const Material& any) { return any.category == "Image"; });
    const Path file = story.outside(material);
    one->items.back().extras.push_back(&material);
    story.step(file.filename().native() + " to " + before.items.back().title, [&]() -> Outcome {
      const auto media = item(before, before.items.back());
      const auto extra = QuiltMediaExtra::initWithPath(file);
      bool isAdded = false;
      const auto block = [&](double) {
        if (!isAdded) media->addExtra(extra);
        return isAdded = true;
      };
      const bool isDone = media->finalizeWithProgressionBlock(block) && find(before)->update();
      return doneIf(isDone && isAdded, "the item is not finalized");
    });
    return true;
  };
  const auto twoExportsAtOnce = [item](Story& story) {
    Document* one = story.anyDocument([](const Document& any) {
      return any.items.size() > 1 && any.items[0].category != "Web" && any.items[1].category != "Web";
    });
    if (!one) return false;
    const Path folder = story.freshFolder();
    story.step(one->title, [&]() -> Outcome {
      Path made[2];
      const auto exportOne = [&](std::size_t index) {
        made[index] = item(*one, one->items[index])->sourceAtIndex(0)->mainDerivative()->exportToPath(folder, {});
      };
      std::thread other(exportOne, 1);
      exportOne(0);
      other.join();
      for (const std::size_t index : {std::size_t{0}, std::size_t{1}})
        if (!fs::is_regular_file(made[index]) ||
            materialWith(support::readBytes(made[index])) != one->items[index].sources[0])
          return doneIf(false, "they write over each other");
      return {};
    });
    return true;
  };
  const auto removeAGrade = [item](Story& story) {
    Document* one = story.anyDocument([](const Document& any) {
      return hasItems(any) && any.items[0].sources.size() == 1 && any.items[0].category == "Image";
    });
    if (!one) return false;
    story.step(one->items[0].title, [&]() -> Outcome {
      const auto source = item(*one, one->items[0])->sourceAtIndex(0);
      if (source->derivativeCount() > 1) source->removeDerivative(source->derivatives().back());
      return {};
    });
    return true;
  };

  return {
      {"look at a picture", 5, [item](Story& story) { return lookAtAPicture(story, item); }},
      {"reopen", 4, reopen},
      {"save", 1, save},
      {"flatten", 2, flatten},
      {"merge", 2, [document](Story& story) { return mergeIntoAFreshPackage(story, document); }},
      {"merge into itself and into nothing", 1, mergeIntoItself},
      {"a block throws", 2, throwing},
      {"add a first extra while an item is finalized", 1, firstExtraMeanwhile},
      {"export two files at once", 1, twoExportsAtOnce},
      {"remove a grade", 1, removeAGrade},
  };
}

}  // namespace quilt::story
