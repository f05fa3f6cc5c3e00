// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "cli/Catalogue.h"
#include "quilt/sources/ModelTypes.h"

namespace quilt::cli {

struct Failure;

/// A package as an author writes it down (schema/manifest.schema.json). Files and addresses are as they were typed;
/// nothing was looked at but the manifest itself.

struct ManifestSource {
  std::string location;  ///< a file or a web address; never empty
  std::string place;     ///< where it stands: "media[2].sources[0].file"
  Text title;
  Text description;
  std::optional<double> timecode;  ///< seconds
};

struct ManifestItem {
  std::string place;  ///< "media[2]"
  Text title;
  Text description;
  Text category;                        ///< "Montage" or "DualSource"; none: that of the one source
  std::vector<ManifestSource> sources;  ///< never empty
  std::vector<ManifestSource> extras;
  std::optional<ManifestSource> commentary;
};

struct ManifestCollection {
  std::string title;
  Text description;
  Text author;
};

struct Manifest {
  Path path;  ///< relative names are meant from its folder
  Text title, author, description, keywords, category;
  Text theme;                        ///< an identifier or a path
  Text poster;                       ///< a file
  std::vector<std::string> formats;  ///< may be empty
  std::optional<ManifestCollection> collection;
  std::vector<ManifestItem> media;  ///< never empty
};

/// Reads a manifest. Throws a Failure: NotFound, InputOutput, or Invalid with everything that is wrong in it.
Manifest readManifest(const std::string& typed);

/// The same for its bytes; `path` is only remembered.
Manifest parseManifest(std::string_view bytes, const Path& path);

/// What is wrong at a place in the manifest: its name, the place, the sentence; the place also stands in the JSON.
Failure manifestFailure(const Path& manifest, const std::string& place, const Failure& problem);

/// Throws what the problems amount to; nothing when there are none.
void throwProblems(const Path& manifest, const std::vector<Failure>& problems);

}  // namespace quilt::cli
