// SPDX-License-Identifier: Apache-2.0
#include "cli/EntryJson.h"

namespace quilt::cli {

Json toJson(const DocumentEntry& document) {
  Json json{
      {"uuid", document.uuid}, {"title", document.title}, {"type", document.type}, {"path", document.path.native()}};
  if (document.damage) json["damage"] = document.damage->text;
  return json;
}

Json toJson(const CollectionEntry& collection) {
  Json json{{"uuid", collection.uuid},
            {"title", collection.title},
            {"type", "Collection"},
            {"path", collection.path.native()}};
  if (collection.damage) json["damage"] = collection.damage->text;
  json["documents"] = Json::array();
  for (const DocumentEntry& document : collection.documents) json["documents"].push_back(toJson(document));
  return json;
}

Json toJson(const QuiltMedia& item) {
  return {{"uuid", item.uuid()},
          {"title", item.title().value_or("")},
          {"category", item.contentCategory().value_or("")},
          {"path", item.path().native()}};
}

Json toJson(const QuiltMediaSource& source) {
  return {{"uuid", source.uuid()},
          {"title", source.title().value_or("")},
          {"category", source.contentCategory().value_or("")},
          {"path", source.path().native()}};
}

}  // namespace quilt::cli
