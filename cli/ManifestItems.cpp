// SPDX-License-Identifier: Apache-2.0
#include "cli/ManifestItems.h"

#include <functional>

namespace quilt::cli {

namespace {

class ItemLooker {
 public:
  ItemLooker(const Manifest& manifest, std::vector<Failure>& problems) : _manifest(manifest), _problems(problems) {}

  NewItem look(const ManifestItem& from) {
    NewItem item;
    item.category = from.category;
    item.description = from.description;
    for (const ManifestSource& one : from.sources)
      at(one.place, [&] {
        NewSource source = lookAtSource(one);
        checkAlone(item, source);
        item.sources.push_back(std::move(source));
      });
    if (item.sources.size() == from.sources.size())
      at(from.place + (from.category ? ".sources" : ".source"), [&item] { checkSources(item); });
    for (const ManifestSource& one : from.extras) at(one.place, [&] { item.extras.push_back(lookAtSource(one)); });
    if (from.commentary)
      at(from.commentary->place, [&] {
        item.commentary = lookAtSource(*from.commentary);
        checkCommentary(*item.commentary);
      });
    if (from.title) {
      item.title = *from.title;
    } else if (!item.sources.empty()) {
      item.title = item.sources.front().title;
    }
    return item;
  }

 private:
  void at(const std::string& place, const std::function<void()>& action) {
    try {
      action();
    } catch (const Failure& failure) {
      _problems.push_back(manifestFailure(_manifest.path, place, failure));
    }
  }

  NewSource lookAtSource(const ManifestSource& from) const {
    NewSource source = lookAt(from.location, _manifest.path.parent_path());
    if (from.title) source.title = *from.title;
    source.description = from.description;
    if (from.timecode) source.timecode = *from.timecode;
    return source;
  }

  // What can be told of one source of a montage, so that the problem has its place.
  static void checkAlone(const NewItem& item, const NewSource& source) {
    if (item.category != kQuiltMediaContentCategoryMontage) return;
    NewItem alone;
    alone.category = item.category;
    alone.sources.push_back(source);
    checkSources(alone);
  }

  const Manifest& _manifest;
  std::vector<Failure>& _problems;
};

}  // namespace

std::vector<NewItem> lookAtItems(const Manifest& manifest, std::vector<Failure>& problems,
                                 const ProgressionBlock& block) {
  ItemLooker looker(manifest, problems);
  std::vector<NewItem> items;
  for (const ManifestItem& item : manifest.media) {
    if (!block(static_cast<double>(items.size()) * 100 / static_cast<double>(manifest.media.size()))) break;
    items.push_back(looker.look(item));
  }
  return items;
}

}  // namespace quilt::cli
