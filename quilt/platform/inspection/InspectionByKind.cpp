// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/inspection/InspectionByKind.h"

#include <array>
#include <optional>
#include <string>
#include <utility>

#include "quilt/platform/interfaces/Services.h"

namespace quilt::platform {

namespace {

constexpr std::array kMovieKinds{types::kMovie, types::kVideo, types::kAudio, types::kAudiovisual};
constexpr std::array kImageKinds{types::kImage};

template <class Kinds>
bool isOneOf(const std::string& identifier, const Kinds& kinds) {
  return types::isOneOf(*services().types, identifier, kinds);
}

}  // namespace

InspectionByKind::InspectionByKind(std::shared_ptr<const MediaInspector> movies,
                                   std::shared_ptr<const MediaInspector> images,
                                   std::shared_ptr<const MediaInspector> documents,
                                   std::shared_ptr<const MediaInspector> office)
    : _movies(std::move(movies)),
      _images(std::move(images)),
      _documents(std::move(documents)),
      _office(std::move(office)) {}

Result<MediaFacts> InspectionByKind::inspect(const std::filesystem::path& path) const {
  const std::optional<std::string> identifier = FDYTypePreferredIdentifier(path);
  if (!identifier) {
    if (!services().files->fileExistsAtPath(path)) return Error{ErrorKind::NotFound, "There is no such file.", path};
    return Error{ErrorKind::Unsupported, "The file's type is not known.", path};
  }
  if (isOneOf(*identifier, kMovieKinds)) return _movies->inspect(path);
  if (isOneOf(*identifier, kImageKinds)) return _images->inspect(path);
  if (isOneOf(*identifier, types::kPagedDocuments)) return _documents->inspect(path);
  if (isOneOf(*identifier, types::kOfficeDocuments)) return _office->inspect(path);
  return Error{ErrorKind::Unsupported, "Files of the type \"" + *identifier + "\" are no media.", path};
}

}  // namespace quilt::platform
