// SPDX-License-Identifier: Apache-2.0
#include "cli/Lookup.h"

#include <strings.h>

#include "cli/Failure.h"
#include "cli/Text.h"

namespace quilt::cli {

namespace {

/// One object that may be meant.
struct Candidate {
  Found found;
  std::string uuid;
  std::string title;
  Path path;  // empty for an item, which is not named by its path
  const char* kind;
};

bool beginsWith(const std::string& uuid, const std::string& prefix) {
  return prefix.size() <= uuid.size() && strncasecmp(uuid.c_str(), prefix.c_str(), prefix.size()) == 0;
}

std::vector<Candidate> candidates(const Catalogue& catalogue, Kinds kinds) {
  std::vector<Candidate> all;
  for (const CollectionEntry& collection : catalogue.collections) {
    if (kinds.collections)
      all.push_back({FoundCollection{&collection}, collection.uuid, collection.title, collection.path, "collection"});
    for (const DocumentEntry& document : collection.documents) {
      if (kinds.documents)
        all.push_back(
            {FoundDocument{&collection, &document}, document.uuid, document.title, document.path, "document"});
      if (!kinds.items) continue;
      for (const ItemEntry& item : document.items)
        all.push_back({FoundItem{&collection, &document, &item}, item.uuid, item.title, {}, "item"});
    }
  }
  return all;
}

template <class Test>
std::vector<Candidate> those(const std::vector<Candidate>& all, const Test& test) {
  std::vector<Candidate> matching;
  for (const Candidate& candidate : all)
    if (test(candidate)) matching.push_back(candidate);
  return matching;
}

std::string alternatives(const std::vector<std::string>& words) {
  std::string text;
  for (std::size_t i = 0; i < words.size(); ++i) {
    if (i > 0) text += i + 1 == words.size() ? " or " : ", ";
    text += words[i];
  }
  return text;
}

std::string describe(Kinds kinds) {
  std::vector<std::string> words;
  if (kinds.documents) words.emplace_back("document");
  if (kinds.collections) words.emplace_back("collection");
  if (kinds.items) words.emplace_back("item");
  return alternatives(words);
}

Failure ambiguous(const std::string& name, const std::vector<Candidate>& matching) {
  constexpr std::size_t kShown = 10;
  std::string message = inQuotes(name) + " may be any of these; name one by its UUID or path:";
  Json list = Json::array();
  for (std::size_t i = 0; i < matching.size(); ++i) {
    const Candidate& candidate = matching[i];
    list.push_back({{"uuid", candidate.uuid}, {"title", candidate.title}, {"kind", candidate.kind}});
    if (i < kShown)
      message += "\n  " + escaped(candidate.uuid) + "  " + candidate.kind + " " + inQuotes(candidate.title);
  }
  if (matching.size() > kShown) message += "\n  and " + std::to_string(matching.size() - kShown) + " more";
  Failure failure(ExitCode::Usage, message);
  failure.details = Json{{"candidates", list}};
  return failure;
}

Found choose(const std::vector<Candidate>& all, const std::string& name, Kinds kinds) {
  const Path path = absolutePath(name);
  std::error_code error;
  const bool isPath = std::filesystem::exists(path, error);
  std::vector<Candidate> matching = those(all, [&](const Candidate& candidate) {
    return candidate.uuid.size() == name.size() && beginsWith(candidate.uuid, name);
  });
  if (matching.empty())
    matching = those(all, [&](const Candidate& candidate) {
      if (candidate.path.empty()) return false;  // items have no names but their UUIDs
      return candidate.title == name || (isPath && std::filesystem::equivalent(candidate.path, path, error));
    });
  if (matching.empty())
    matching = those(all, [&](const Candidate& candidate) { return beginsWith(candidate.uuid, name); });
  if (matching.empty())
    throw Failure(ExitCode::NotFound, "There is no " + describe(kinds) + " " + inQuotes(name) + "; see \"quilt list\"");
  if (matching.size() > 1) throw ambiguous(name, matching);
  return matching.front().found;
}

}  // namespace

Found find(const Catalogue& catalogue, const std::string& name, Kinds kinds) {
  if (name.empty()) throw Failure(ExitCode::Usage, "An empty name stands for no " + describe(kinds));
  return choose(candidates(catalogue, kinds), name, kinds);
}

FoundCollection findCollection(const Catalogue& catalogue, const std::string& name) {
  return std::get<FoundCollection>(find(catalogue, name, {.collections = true}));
}

FoundDocument findDocument(const Catalogue& catalogue, const std::string& name) {
  return std::get<FoundDocument>(find(catalogue, name, {.documents = true}));
}

const ItemEntry& findItem(const DocumentEntry& document, const std::string& name) {
  std::vector<Candidate> items;
  for (const ItemEntry& item : document.items)
    items.push_back({FoundItem{nullptr, &document, &item}, item.uuid, item.title, {}, "item"});
  if (name.empty()) throw Failure(ExitCode::Usage, "An empty name stands for no item");
  return *std::get<FoundItem>(choose(items, name, {.items = true})).item;
}

}  // namespace quilt::cli
