// SPDX-License-Identifier: Apache-2.0
#include "quilt/documents/PackageChanges.h"

#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/TemporaryNames.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt {

using platform::FDYLogger;
using platform::services;

namespace {

/// Collects the places that a record names.
class Places {
 public:
  std::set<std::string> all;

  void addItem(const Dictionary& item) {
    const std::string folder = add("media", item.string("UUID"));
    if (folder.empty()) return;
    each(item, "Sources", [&](const Dictionary& source) { addSource(source, folder + "/sources"); });
    each(item, "Extras", [&](const Dictionary& extra) { addSource(extra, folder + "/extras"); });
    if (const Dictionary* commentary = item.dictionary("AudioCommentarySource"))
      addSource(*commentary, folder + "/sources");
  }

  template <class Visit>
  static void each(const Dictionary& record, const char* key, const Visit& visit) {
    const Array* array = record.array(key);
    if (!array) return;
    for (const platform::PropertyList& element : *array)
      if (const auto* dictionary = element.as<Dictionary>()) visit(*dictionary);
  }

 private:
  void addSource(const Dictionary& source, const std::string& parent) {
    const std::string folder = add(parent, source.string("UUID"));
    if (folder.empty()) return;
    all.insert(parent);
    each(source, "Derivatives",
         [&](const Dictionary& derivative) { add(folder + "/derivatives", derivative.string("Filename")); });
    each(source, "Previews", [&](const Dictionary& preview) {
      if (preview.boolean("IsFlattened").value_or(false)) add(folder + "/previews", preview.string("Filename"));
    });
    const Dictionary* samples = source.dictionary("AudioSamples");
    if (!samples) return;
    add(folder + "/audiosamples", samples->string("SampleFilename"));
    if (const Text uuid = samples->string("UUID")) add(folder + "/audiosamples", *uuid + ".asc");
  }

  std::string add(const std::string& parent, const Text& name) {
    if (!name || name->empty()) return {};
    all.insert(parent);
    return *all.insert(parent + "/" + *name).first;
  }
};

bool isThere(const Path& path) { return services().files->fileExistsAtPath(path); }

/// The part of the path below the package; empty when it lies elsewhere or not below the media folder.
Path partBelow(const Path& package, const Path& item) {
  const Path part = item.lexically_relative(package);
  return !part.empty() && *part.begin() == "media" && std::next(part.begin()) != part.end() ? part : Path();
}

// A package that is hidden itself is cleared away whole when it is not finished.
bool isHidden(const Path& package) { return platform::isHiddenTemporaryName(package.filename().native()); }

}  // namespace

std::set<std::string> placesNamedBy(const Dictionary& record) {
  Places places;
  Places::each(record, "Media", [&places](const Dictionary& item) { places.addItem(item); });
  return std::move(places.all);
}

void PackageChanges::beginNew() {
  const std::lock_guard guard(_mutex);
  _hasBegun = true;
}

void PackageChanges::begin(const Path& package) {
  const std::lock_guard guard(_mutex);
  sweepOnce(package);
}

void PackageChanges::sweepOnce(const Path& package) {
  if (_hasBegun || package.empty()) return;
  _hasBegun = true;
  if (isHidden(package)) return;
  // The record is read only when something is found for which it matters.
  std::optional<platform::Result<Dictionary>> record;
  std::set<std::string> places;
  const auto isRecorded = [&](const Path& item) -> std::optional<bool> {
    if (!record) {
      record = services().propertyLists->readDictionary(package / kQuiltDocumentPropertiesFilename);
      if (*record) places = placesNamedBy(**record);
    }
    if (!*record) return std::nullopt;
    return places.contains(item.lexically_relative(package).native());
  };
  (void)services().files->sweepFolder(package, platform::SweepDepth::Tree, isRecorded);
}

void PackageChanges::hold(const Path& package) {
  if (!_hold) _hold = services().files->holdFolder(package);
}

void PackageChanges::willMake(const Path& package, const Path& item) {
  const Path part = package.empty() ? Path() : partBelow(package, item);
  if (part.empty() || isHidden(package)) return;
  const std::lock_guard guard(_mutex);
  sweepOnce(package);
  if (platform::isHiddenTemporaryName(item.filename().native())) {
    hold(package);
    _made.emplace(item, Path());
    return;
  }
  // The first part that is missing takes with it what is made below. Records name every second part of a path: "media",
  // "sources", "derivatives" and their like are there whatever a record says.
  Path missing = package;
  bool isNamedByRecords = true;
  for (const Path& component : part) {
    isNamedByRecords = !isNamedByRecords;
    const Path parent = missing;
    missing /= component;
    if (!isNamedByRecords || isThere(missing)) continue;
    hold(package);
    if (_made.contains(missing) || (!isThere(parent) && !services().files->createDirectoryAtPath(parent))) return;
    // Without a mark, what a killed process leaves is only found by a look through the package.
    if (auto mark = services().files->markUnfinished(missing)) _made.emplace(missing, *std::move(mark));
    return;
  }
}

void PackageChanges::remove(const Path& package, const Path& item, const char* warning) {
  platform::FileManager& files = *services().files;
  const auto removeNow = [&] {
    if (const auto removed = files.removeItem(item, package); !removed)
      FDYLogger::logWarning(warning, item, removed.error());
  };
  if (package.empty() || isHidden(package) || partBelow(package, item).empty()) return removeNow();
  const std::lock_guard guard(_mutex);
  sweepOnce(package);
  if (const auto made = _made.find(item); made != _made.end()) {
    removeNow();  // no record ever named it
    if (!made->second.empty() && !isThere(item)) (void)files.removeItem(made->second, package);
    _made.erase(made);
    return;
  }
  const auto aside = files.setAside(item, package, /*forGood=*/false);
  if (aside) {
    hold(package);
    _removed.push_back({item, *aside, warning});
    return;
  }
  const platform::ErrorKind kind = aside.error().kind;
  if (kind == platform::ErrorKind::Unsupported) return removeNow();
  // What the disk refuses once goes from its own place when the record is saved.
  const bool isTrouble = kind == platform::ErrorKind::NoSpace || kind == platform::ErrorKind::InputOutput;
  if (isTrouble) {
    _removed.push_back({item, item, warning});
  } else {
    FDYLogger::logWarning(warning, item, aside.error());
  }
}

void PackageChanges::recorded(const Path& package, const Dictionary& record) {
  const std::lock_guard guard(_mutex);
  if (_made.empty() && _removed.empty()) return;
  platform::FileManager& files = *services().files;
  const std::set<std::string> places = placesNamedBy(record);
  const auto isNamed = [&](const Path& item) { return places.contains(item.lexically_relative(package).native()); };
  for (auto made = _made.begin(); made != _made.end();) {
    const bool isSettled = isNamed(made->first) || !isThere(made->first);
    if (isSettled && !made->second.empty()) (void)files.removeItem(made->second, package);
    made = isSettled ? _made.erase(made) : std::next(made);
  }
  std::erase_if(_removed, [&](const Removal& removal) {
    const bool isBack = removal.aside == removal.item;
    if (isNamed(removal.item) && (isBack || !isThere(removal.item))) return isBack;
    const auto removed = files.removeItem(removal.aside, package);
    if (!removed && removed.error().kind != platform::ErrorKind::NotFound)
      FDYLogger::logWarning(removal.warning, removal.item, removed.error());
    return true;
  });
  if (_made.empty() && _removed.empty()) _hold = nullptr;
}

void PackageChanges::notRecorded(const Path& package) {
  const std::lock_guard guard(_mutex);
  for (Removal& removal : _removed)
    if (removal.aside != removal.item && !isThere(removal.item) &&
        services().files->isConfined(removal.aside, package) && services().files->moveItem(removal.aside, removal.item))
      removal.aside = removal.item;
}

}  // namespace quilt
