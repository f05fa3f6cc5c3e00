// SPDX-License-Identifier: Apache-2.0
// A host's block or observer that throws, at the first, the second, … call of every operation that calls one.
#include <gmock/gmock.h>
#include <unistd.h>

#include <future>
#include <stdexcept>

#include "quilt/collections/QuiltCollectionsController.h"
#include "quilt/themes/QuiltThemesController.h"
#include "tests/support/DocumentFixture.h"
#include "tests/support/Environment.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/ScratchFolder.h"

namespace quilt {
namespace {

using ::testing::IsEmpty;

/// What a host throws.
struct HostError : std::runtime_error {
  HostError() : std::runtime_error("the host's own") {}
};

/// Throws at its nth call, once.
class Bomb {
 public:
  explicit Bomb(std::size_t n) : _n(n) {}

  void call() {
    if (++_calls == _n) throw HostError();
  }
  [[nodiscard]] bool wentOff() const { return _calls >= _n; }

  ProgressionBlock block() {
    return [this](double) {
      call();
      return true;
    };
  }
  /// Also for the two-argument blocks and those of the walks.
  auto any() {
    return [this](const auto&...) {
      call();
      return true;
    };
  }

 private:
  const std::size_t _n;
  std::size_t _calls = 0;
};

/// A library on disk with one document, as a host has it.
struct Library {
  Path root;
  Path bundle;
  Path file;  // a picture outside of the library
  std::shared_ptr<QuiltCollectionsController> controller = QuiltCollectionsController::init();
  std::shared_ptr<QuiltThemesController> themes = QuiltThemesController::init();
  std::shared_ptr<QuiltCollection> collection;
  std::shared_ptr<QuiltDocument> document;
  std::shared_ptr<QuiltMedia> item;  // a picture, a second one, and a picture as its extra
  std::shared_ptr<QuiltMediaSource> source;
  std::vector<platform::Observation> observations;

  [[nodiscard]] Path exports() const { return root / "exports"; }

  void observe(Bomb& bomb) {
    watch(*controller, {"libraryPath", "loadingCollections", "isUpdating", "collections"}, bomb);
    watch(*themes, {"loadingThemes", "themes"}, bomb);
    watch(*collection, {"documents", "title", "modifiedDate", "isLoading", "collectionControllerOwner", "posterImage"},
          bomb);
    watch(*document,
          {"uuid", "title", "modifiedDate", "creationDate", "posterImage", "posterImageVersion", "media", "theme",
           "isProcessing", "collectionOwner"},
          bomb);
    document->performBlockOnMedia([&](const auto& each) {
      watch(*each, {"title", "posterImage", "posterImageVersion", "sources", "extras", "documentOwner"}, bomb);
      each->performBlockOnSources([&](const auto& one) { return watchSource(*one, bomb); });
      each->performBlockOnExtra([&](const auto& one) { return watchSource(*one, bomb); });
      return true;
    });
  }

 private:
  void watch(platform::Object& object, std::initializer_list<const char*> keys, Bomb& bomb) {
    for (const char* key : keys)
      observations.push_back(object.observe(
          key, [&bomb](const auto&) { bomb.call(); }, platform::ObservationOptions::Prior));
  }
  bool watchSource(QuiltMediaSource& one, Bomb& bomb) {
    watch(one, {"title", "posterImage", "derivatives", "previews", "audioSamples", "mediaOwner", "dirty"}, bomb);
    one.performBlockOnDerivatives([&](const auto& each) {
      watch(*each, {"url", "isFlattened", "compatibilityTags", "sourceOwner"}, bomb);
      return true;
    });
    return true;
  }
};

struct Operation {
  const char* name;
  /// Gives the bomb's block to the operation, or an empty one when the observers throw.
  std::function<void(Library&, const ProgressionBlock&)> run;
};
void PrintTo(const Operation& operation, std::ostream* out) { *out << operation.name; }

template <class T>
ObjectProgressionBlock<T> withObject(const ProgressionBlock& block) {
  return [&block](const std::shared_ptr<T>&, double percentage) { return platform::report(block, percentage); };
}
template <class T>
std::function<bool(const std::shared_ptr<T>&)> onEach(const ProgressionBlock& block) {
  return [&block](const std::shared_ptr<T>&) { return platform::report(block, 0); };
}

const std::string kLower = kQuiltMediaDerivativeCompatibilityTag480p;

const Operation kWithBlocks[] = {
    {"DocumentFlatten", [](Library& l, const auto& block) { l.document->flattenWithProgressionBlock(block); }},
    {"DocumentFinalize",
     [](Library& l, const auto& block) {
       l.document->flattenWithProgressionBlock({});
       l.document->finalizeWithProgressionBlock(block);
     }},
    {"DocumentConvert",
     [](Library& l, const auto& block) {
       l.document->flattenWithProgressionBlock({});
       l.document->convertToFormat(kLower, block);
     }},
    {"DocumentExport", [](Library& l, const auto& block) { l.document->exportToPath(l.exports(), false, {}, block); }},
    {"DocumentExportZipped",
     [](Library& l, const auto& block) { l.document->exportToPath(l.exports(), true, {kLower}, block); }},
    {"DocumentApplyTheme",
     [](Library& l, const auto& block) { l.document->applyTheme(QuiltTheme::initWithPath(l.bundle), block); }},
    {"DocumentWalk", [](Library& l, const auto& block) { l.document->performBlockOnMedia(onEach<QuiltMedia>(block)); }},
    {"ItemFlatten", [](Library& l, const auto& block) { l.item->flattenWithProgressionBlock(block); }},
    {"ItemFinalize", [](Library& l, const auto& block) { l.item->finalizeWithProgressionBlock(block); }},
    {"ItemConvert", [](Library& l, const auto& block) { l.item->convertToFormat(kLower, block); }},
    {"ItemExport", [](Library& l, const auto& block) { l.item->exportToPath(l.exports(), kLower, block); }},
    {"ItemWalks",
     [](Library& l, const auto& block) {
       l.item->performBlockOnSources(onEach<QuiltMediaSource>(block));
       l.item->performBlockOnExtra(onEach<QuiltMediaExtra>(block));
     }},
    {"SourceFlatten", [](Library& l, const auto& block) { l.source->flattenCopy(true, block); }},
    {"SourceFinalize", [](Library& l, const auto& block) { l.source->finalizeWithProgressionBlock(block); }},
    {"SourceConvert", [](Library& l, const auto& block) { l.source->convertToFormat(kLower, block); }},
    {"SourceExport",
     [](Library& l, const auto& block) {
       l.source->exportToPath(l.exports(), kQuiltMediaDerivativeCompatibilityTagDesktop, block);
     }},
    {"SourcePreviews",
     [](Library& l, const auto& block) {
       l.source->previewWithProgressionBlock(withObject<QuiltMediaPreview>(block));
     }},
    {"SourceReload", [](Library& l, const auto& block) { l.source->reloadWithFileAtPath(l.file, block); }},
    {"SourceWalk",
     [](Library& l, const auto& block) { l.source->performBlockOnDerivatives(onEach<QuiltMediaDerivative>(block)); }},
    {"CollectionImport",
     [](Library& l, const auto& block) {
       l.collection->importDocumentFromPath(support::makeMedia(support::m4aSound()), block);
     }},
    {"CollectionWalk",
     [](Library& l, const auto& block) { l.collection->performBlockOnDocuments(onEach<QuiltDocument>(block)); }},
    {"ControllerLoad",
     [](Library& l, const auto& block) { l.controller->loadLibraryPath(l.root, withObject<QuiltCollection>(block)); }},
    {"ControllerWalk",
     [](Library& l, const auto& block) { l.controller->performBlockOnCollections(onEach<QuiltCollection>(block)); }},
    {"ThemesLoad",
     [](Library& l, const auto& block) { l.themes->loadWithProgressionBlock(withObject<QuiltTheme>(block)); }},
    {"ThemesWalk",
     [](Library& l, const auto& block) {
       l.themes->loadWithProgressionBlock({});
       l.themes->performBlockOnThemes(onEach<QuiltTheme>(block));
     }},
};

const Operation kWithoutBlocks[] = {
    {"DocumentSetTitle", [](Library& l, const auto&) { l.document->setTitle("Other"); }},
    {"DocumentUpdate", [](Library& l, const auto&) { l.document->update(); }},
    {"DocumentLoad",
     [](Library& l, const auto&) {
       l.document->setMedia({});
       l.document->loadDictionary();
     }},
    {"DocumentResetModifiedDate", [](Library& l, const auto&) { l.document->resetModifiedDate(); }},
    {"DocumentInvalidateCaches", [](Library& l, const auto&) { l.document->invalidateCaches(); }},
    {"DocumentAddMedia", [](Library& l, const auto&) { l.document->addMedia(QuiltMedia::init()); }},
    {"DocumentInsertMedia", [](Library& l, const auto&) { l.document->addMedia(QuiltMedia::init(), 0); }},
    {"DocumentMoveMedia", [](Library& l, const auto&) { l.document->moveMediaAtIndexes({0}, 2); }},
    {"DocumentRemoveMedia", [](Library& l, const auto&) { l.document->removeMedia(l.item); }},
    {"DocumentRemoveAllMedia", [](Library& l, const auto&) { l.document->removeAllMedia(); }},
    {"DocumentUpdatePoster",
     [](Library& l, const auto&) { l.document->updatePosterImage(ImageWrapper::imageWithPath(l.file)); }},
    {"DocumentMergeInto",
     [](Library& l, const auto&) {
       const auto other = QuiltDocument::initWithPath(l.root / "other.qpk");
       l.document->mergeIntoDocument(other, {}, {});
       EXPECT_EQ(2u, other->mediaCount());
     }},
    {"DocumentMergeFrom",
     [](Library& l, const auto&) { QuiltDocument::init()->mergeIntoDocument(l.document, {}, {}); }},
    {"ItemAddSource", [](Library& l, const auto&) { l.item->addSource(QuiltMediaSource::initWithPath(l.file)); }},
    {"ItemInsertSource", [](Library& l, const auto&) { l.item->addSource(QuiltMediaSource::init(), 0); }},
    {"ItemMoveSources", [](Library& l, const auto&) { l.item->moveSourcesAtIndexes({0}, 2); }},
    {"ItemRemoveSource", [](Library& l, const auto&) { l.item->removeSource(l.source); }},
    {"ItemRemoveAllSources", [](Library& l, const auto&) { l.item->removeAllSources(); }},
    {"ItemAddExtra", [](Library& l, const auto&) { l.item->addExtra(QuiltMediaExtra::initWithPath(l.file)); }},
    {"ItemRemoveAllExtras", [](Library& l, const auto&) { l.item->removeAllExtras(); }},
    {"ItemSetCommentary", [](Library& l, const auto&) { l.item->setAudioCommentarySource(QuiltMediaSource::init()); }},
    {"ItemPoster", [](Library& l, const auto&) { l.item->posterImage(); }},
    {"ItemInvalidatePoster", [](Library& l, const auto&) { l.item->invalidatePosterImage(); }},
    {"SourceAddDerivative",
     [](Library& l, const auto&) { l.source->addDerivative(QuiltMediaDerivative::initWithPath(l.file)); }},
    {"SourceRemoveAllDerivatives", [](Library& l, const auto&) { l.source->removeAllDerivatives(); }},
    {"SourcePreviewAtIndex", [](Library& l, const auto&) { l.source->previewAtIndex(0); }},
    {"SourceRemoveAllPreviews",
     [](Library& l, const auto&) {
       l.source->previewAtIndex(0);
       l.source->removeAllPreviews();
     }},
    {"SourceSetDirty", [](Library& l, const auto&) { l.source->setDirty(true); }},
    {"CollectionSetTitle", [](Library& l, const auto&) { l.collection->setTitle("Other"); }},
    {"CollectionUpdate", [](Library& l, const auto&) { l.collection->update(); }},
    {"CollectionLoad", [](Library& l, const auto&) { l.collection->loadDictionary(); }},
    {"CollectionSetPoster",
     [](Library& l, const auto&) { l.collection->setPosterImage(ImageWrapper::imageWithPath(l.file)); }},
    {"CollectionNewDocument",
     [](Library& l, const auto&) { l.collection->newDocumentWithType(kQuiltDocumentTypeInteractive); }},
    {"CollectionAddDocument",
     [](Library& l, const auto&) {
       const auto added = QuiltDocument::initWithPath(l.collection->path() / "added.qpk");
       EXPECT_TRUE(added->update());
       l.collection->addDocument(added);
     }},
    {"CollectionRemoveDocument", [](Library& l, const auto&) { l.collection->removeDocument(l.document, false); }},
    {"CollectionDeleteDocument", [](Library& l, const auto&) { l.collection->removeDocument(l.document, true); }},
    {"CollectionDeleteAll", [](Library& l, const auto&) { l.collection->removeAllDocumentsAndDelete(true); }},
    {"ControllerNewCollection", [](Library& l, const auto&) { l.controller->newCollection(); }},
    {"ControllerRemoveCollection", [](Library& l, const auto&) { l.controller->removeCollection(l.collection, true); }},
    {"ControllerUpdate", [](Library& l, const auto&) { l.controller->update(); }},
};

class ThrowingHostTest : public support::DocumentFixture, public ::testing::WithParamInterface<Operation> {
 protected:
  ThrowingHostTest() {
    const Path themes = _data / "quilt/Themes";
    std::filesystem::create_directories(themes);
    std::filesystem::copy(_bundle, themes / "Plain.qth", std::filesystem::copy_options::recursive);
  }

  std::unique_ptr<Library> library(std::size_t n) const {
    auto made = std::make_unique<Library>();
    made->root = _memory / std::to_string(n);
    made->bundle = _bundle;
    made->file = _file;
    std::filesystem::create_directories(made->exports());
    EXPECT_TRUE(made->controller->loadLibraryPath(made->root, {}));
    made->collection = made->controller->newCollection();
    made->document = made->collection->newDocumentWithType(kQuiltDocumentTypeInteractive);
    made->document->setTheme(QuiltTheme::initWithPath(made->bundle));
    made->item = QuiltMedia::init();
    made->source = QuiltMediaSource::initWithPath(made->file);
    made->item->addSource(made->source);
    made->item->addSource(QuiltMediaSource::initWithPath(made->file));
    made->item->addExtra(QuiltMediaExtra::initWithPath(made->file));
    made->document->addMedia(made->item);
    addWebItem(*made->document);
    return made;
  }

  /// Runs the operation until the bomb no longer goes off; it is the blocks that throw, or the observers.
  void throwAtEachCall(bool isBlock) const {
    for (std::size_t n = 1; n < 2000; ++n) {
      SCOPED_TRACE("call " + std::to_string(n) + (isBlock ? " of the block" : " of an observer"));
      const auto l = library(n);
      Bomb bomb(n);
      if (!isBlock) l->observe(bomb);
      bool hasThrown = false;
      try {
        GetParam().run(*l, isBlock ? bomb.block() : ProgressionBlock());
      } catch (const HostError&) {
        hasThrown = true;
      }
      EXPECT_EQ(bomb.wentOff(), hasThrown) << "what a host throws comes back to it";
      l->observations.clear();
      expectWhole(*l);
      std::filesystem::remove_all(l->root);
      if (HasFailure()) return;
      if (!bomb.wentOff()) {
        EXPECT_TRUE(!isBlock || n > 1) << "the block is never called";
        return;
      }
    }
    FAIL() << "the operation never ends";
  }

 private:
  const Path _data = folder() / "data";
  const Path _bundle = themeBundle();
  const Path _file = pictureFile(641, 2);  // small, and yet larger than the grade that it is converted to
  // In memory where that can be: there are thousands of saves, and what a disk does with them is not looked at here.
  const support::Environment _temporary{"TMPDIR", ::access("/dev/shm", W_OK) == 0 ? "/dev/shm" : "/tmp"};
  const support::ScratchFolder _memory;
  const support::Environment _dataHome{"XDG_DATA_HOME", _data.c_str()};

  /// Nothing is half made, nothing is busy, nothing is locked, and what is edited now is saved.
  static void expectWhole(Library& l) {
    expectUnlocked(l);
    EXPECT_FALSE(l.controller->loadingCollections());
    EXPECT_FALSE(l.controller->isUpdating());
    EXPECT_FALSE(l.themes->loadingThemes());
    EXPECT_FALSE(l.collection->isLoading());
    EXPECT_FALSE(l.document->isProcessing());
    EXPECT_THAT(hiddenIn(l.root), IsEmpty());
    for (const auto& collection : l.controller->collections()) {
      for (const auto& document : collection->documents()) EXPECT_TRUE(std::filesystem::exists(document->path()));
      for (const auto& entry : std::filesystem::directory_iterator(collection->path()))
        if (entry.is_directory()) {
          EXPECT_NE(nullptr, QuiltDocument::initWithPath(entry.path())) << entry.path();
        }
    }
    for (const auto& entry : std::filesystem::directory_iterator(l.exports())) {
      if (entry.path().extension() != ".qpk") continue;
      const auto exported = QuiltDocument::initWithPath(entry.path());
      ASSERT_NE(nullptr, exported);
      EXPECT_EQ(2u, exported->mediaCount()) << "a package under its final name is whole";
    }
    expectSaving(l);
    EXPECT_TRUE(l.controller->loadLibraryPath(l.root, {}));
    EXPECT_TRUE(l.controller->update());
    EXPECT_TRUE(l.themes->loadWithProgressionBlock({}));
  }

  static void expectUnlocked(Library& l) {
    auto walk = std::async(std::launch::async, [&l] {
      const auto goOn = [](const auto&) { return true; };
      l.controller->performBlockOnCollections(goOn);
      l.themes->performBlockOnThemes(goOn);
      l.collection->performBlockOnDocuments(goOn);
      l.document->performBlockOnMedia(goOn);
      l.item->performBlockOnSources(goOn);
      l.item->performBlockOnExtra(goOn);
      l.source->performBlockOnDerivatives(goOn);
      l.source->isPreviewed();
    });
    if (walk.wait_for(std::chrono::seconds(20)) != std::future_status::ready) {
      ADD_FAILURE() << "a list is locked for ever";
      std::abort();  // the walk would never end, and so neither would this
    }
  }

  static void expectSaving(Library& l) {
    if (std::filesystem::exists(l.collection->path())) {
      l.collection->setTitle("Later");
      EXPECT_EQ(Text("Later"), readRecord(l.collection->path() / "collection.plist").string("Title"));
    }
    if (!std::filesystem::exists(l.document->path())) return;
    l.document->setDescription("Later");
    EXPECT_EQ(Text("Later"), saved(*l.document).string("Description"));
    // A save that is asked for from below, which a deferral that never ended would hold back.
    const auto item = QuiltMedia::init();
    l.document->addMedia(item);
    item->addSource(webSource("https://example.org/later"));
    const auto reopenedDocument = reopened(*l.document);
    ASSERT_NE(nullptr, reopenedDocument);
    EXPECT_EQ(l.document->mediaCount(), reopenedDocument->mediaCount());
    const auto again = reopenedDocument->mediaWithUUID(item->uuid());
    EXPECT_TRUE(again && again->sourcesCount() == 1);
  }

  static std::vector<std::string> hiddenIn(const Path& root) {
    std::vector<std::string> hidden;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(root))
      if (entry.path().filename().native().starts_with(".")) hidden.push_back(entry.path());
    return hidden;
  }
};

std::string operationName(const ::testing::TestParamInfo<Operation>& info) { return info.param.name; }

using ThrowingBlockTest = ThrowingHostTest;
TEST_P(ThrowingBlockTest, LeavesNothingHalfMadeAndNothingBusy) { throwAtEachCall(true); }
INSTANTIATE_TEST_SUITE_P(Operations, ThrowingBlockTest, ::testing::ValuesIn(kWithBlocks), operationName);

using ThrowingObserverTest = ThrowingHostTest;
TEST_P(ThrowingObserverTest, LeavesNothingHalfMadeAndNothingBusy) { throwAtEachCall(false); }
INSTANTIATE_TEST_SUITE_P(LongOperations, ThrowingObserverTest, ::testing::ValuesIn(kWithBlocks), operationName);
INSTANTIATE_TEST_SUITE_P(ShortOperations, ThrowingObserverTest, ::testing::ValuesIn(kWithoutBlocks), operationName);

}  // namespace
}  // namespace quilt
