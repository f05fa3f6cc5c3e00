// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <variant>

#include "cli/Catalogue.h"

namespace quilt::cli {

/// Where an object stands in the catalogue; valid while the catalogue lives.
struct FoundCollection {
  const CollectionEntry* collection = nullptr;
};
struct FoundDocument {
  const CollectionEntry* collection = nullptr;
  const DocumentEntry* document = nullptr;
};
struct FoundItem {
  const CollectionEntry* collection = nullptr;
  const DocumentEntry* document = nullptr;
  const ItemEntry* item = nullptr;
};
using Found = std::variant<FoundCollection, FoundDocument, FoundItem>;

/// Which kinds a name may stand for.
struct Kinds {
  bool collections = false;
  bool documents = false;
  bool items = false;
};

/// The one object of these kinds that the name stands for: the one with this UUID; else the one with this title, or at
/// this path; else the one whose UUID begins with it (letters of either case). Throws a Failure, NotFound when there is
/// none and Usage, with the candidates, when there are several.
Found find(const Catalogue& catalogue, const std::string& name, Kinds kinds);

FoundCollection findCollection(const Catalogue& catalogue, const std::string& name);
FoundDocument findDocument(const Catalogue& catalogue, const std::string& name);
/// An item of this document.
const ItemEntry& findItem(const DocumentEntry& document, const std::string& name);

}  // namespace quilt::cli
