// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "quilt/platform/base/PropertyList.h"
#include "tests/story/Material.h"

/// The simple model that stories are held against: what a library holds, as plain values. A story changes one as it
/// goes; another is read from the disk, or from the library's objects; both are compared as text.
namespace quilt::story {

struct Item {
  std::string title;
  std::string category;
  std::vector<const Material*> sources;  ///< null: a file that is no material, or is missing
  std::vector<const Material*> extras{};
  std::vector<const Material*> commentary{};  ///< none or one
  std::string uuid{};                         ///< empty until it was read
  std::string firstSource{};                  ///< its identity, likewise
};

struct Document {
  std::string title;
  std::string type;
  std::vector<Item> items{};
  std::string description{};
  std::optional<Rgba> poster{};  ///< the one colour of the poster that somebody set
  std::string theme{};           ///< the name of its bundle
  std::string uuid{};
};

inline bool hasItems(const Document& document) { return !document.items.empty(); }

struct Contents {
  std::vector<Document> documents{};
  /// What the pictures on disk and the files lack, in sentences; empty in what a story expects.
  std::vector<std::string> faults{};
};

/// One line a document, item and fault; documents by title. Identities are left out.
std::string describe(const Contents& contents);
std::string describe(const Document& document);

/// What lies in a library folder, by the records in it and the files that they name.
Contents readLibrary(const Path& library);
/// What lies in a package; `faults` is added to. With a record that is not (yet) in its properties file.
Document readPackage(const Path& package, std::vector<std::string>& faults);
Document readPackage(const Path& package, const platform::Dictionary& record);

/// Whether the pictures in a package show what the story put there; `expected` knows the colours. Adds to the faults.
void lookAtPictures(const Path& package, const Document& expected, std::vector<std::string>& faults);

/// Hidden files and folders below a folder, but for those that are there to stay: locks, and what was removed and can
/// be had back.
std::vector<std::string> leftovers(const Path& folder);

/// The link that stories add: not a file.
const Material* webPage();

}  // namespace quilt::story
