// SPDX-License-Identifier: Apache-2.0
#include "cli/Manifest.h"

#include <fmt/format.h>

#include <algorithm>
#include <cmath>
#include <set>
#include <utility>

#include "cli/Failure.h"
#include "cli/Text.h"
#include "quilt/media/QuiltMedia.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::cli {

namespace {

using platform::services;

constexpr std::uint64_t kLongest = std::uint64_t{16} << 20;
constexpr int kDeepest = 32;

std::string placeIn(const std::string& place, const std::string& key) {
  return place.empty() ? escaped(key) : place + "." + escaped(key);
}
std::string placeIn(const std::string& place, std::size_t index) { return fmt::format("{}[{}]", place, index); }

const char* kindName(const Json& value) {
  switch (value.type()) {
    case Json::value_t::object:
      return "an object";
    case Json::value_t::array:
      return "an array";
    case Json::value_t::string:
      return "a text";
    case Json::value_t::boolean:
      return "a boolean";
    case Json::value_t::number_integer:
    case Json::value_t::number_unsigned:
    case Json::value_t::number_float:
      return "a number";
    case Json::value_t::null:
    case Json::value_t::binary:
    case Json::value_t::discarded:
      break;
  }
  return "null";
}

/// Everything that is wrong in one manifest.
class Problems {
 public:
  explicit Problems(const Path& manifest) : _manifest(manifest) {}

  void add(const std::string& place, const std::string& text) {
    _all.push_back(manifestFailure(_manifest, place, Failure(ExitCode::Invalid, text)));
  }
  [[nodiscard]] const std::vector<Failure>& all() const { return _all; }

 private:
  const Path& _manifest;
  std::vector<Failure> _all;
};

bool isKind(const Json& value, const char* wanted, const std::string& place, Problems& problems) {
  if (std::string_view(kindName(value)) == wanted) return true;
  problems.add(place, fmt::format("This is {}, and should be {}", kindName(value), wanted));
  return false;
}

Text readText(const Json& value, const std::string& place, Problems& problems) {
  if (!isKind(value, "a text", place, problems)) return std::nullopt;
  const auto& text = value.get_ref<const std::string&>();
  if (isText(text)) return text;
  problems.add(place, "The text has control characters");
  return std::nullopt;
}

/// The members of one object, taken out by their keys; what is not taken is a problem.
class ObjectReader {
 public:
  ObjectReader(const Json& object, std::string place, Problems& problems)
      : _object(object), _place(std::move(place)), _problems(problems) {}

  [[nodiscard]] std::string placeOf(const char* key) const { return placeIn(_place, key); }

  const Json* member(const char* key) {
    _known.emplace_back(key);
    const auto found = _object.find(key);
    return found == _object.end() ? nullptr : &*found;
  }

  /// The text; an empty one counts as none.
  Text text(const char* key) {
    const Json* value = member(key);
    Text text = value ? readText(*value, placeOf(key), _problems) : std::nullopt;
    return text && text->empty() ? std::nullopt : text;
  }

  /// The elements of an array. Absent and empty are alike, unless it must not be so.
  std::vector<const Json*> array(const char* key, bool isRequired = false) {
    std::vector<const Json*> elements;
    const Json* value = member(key);
    if (value && !isKind(*value, "an array", placeOf(key), _problems)) return elements;
    if (value)
      for (const Json& element : *value) elements.push_back(&element);
    if (isRequired && elements.empty()) _problems.add(placeOf(key), value ? "This is empty" : "This is missing");
    return elements;
  }

  void finish() {
    std::string known;
    for (const char* key : _known) known += (known.empty() ? "" : ", ") + std::string(key);
    for (const auto& [key, value] : _object.items())
      if (std::none_of(_known.begin(), _known.end(), [&name = key](const char* other) { return name == other; }))
        _problems.add(placeIn(_place, key), "This key is unknown here; known are " + known);
  }

 private:
  const Json& _object;
  const std::string _place;
  Problems& _problems;
  std::vector<const char*> _known;
};

std::optional<std::string> readLocation(const Json& value, const std::string& place, Problems& problems) {
  if (!isKind(value, "a text", place, problems)) return std::nullopt;
  const auto& text = value.get_ref<const std::string&>();
  if (!text.empty() && text.find('\0') == std::string::npos) return text;
  problems.add(place, "This names no file");
  return std::nullopt;
}

std::optional<double> readSeconds(const Json& value, const std::string& place, Problems& problems) {
  if (!isKind(value, "a number", place, problems)) return std::nullopt;
  const auto seconds = value.get<double>();
  if (std::isfinite(seconds) && seconds >= 0) return seconds;
  problems.add(place, "This should be a number of seconds, 0 or more");
  return std::nullopt;
}

/// "a.jpg", or {"file": "a.jpg", "title": …}.
std::optional<ManifestSource> readSource(const Json& value, const std::string& place, bool mayHaveTimecode,
                                         Problems& problems) {
  if (value.is_string()) {
    const auto location = readLocation(value, place, problems);
    if (!location) return std::nullopt;
    return ManifestSource{*location, place, {}, {}, {}};
  }
  if (!value.is_object()) {
    problems.add(place, fmt::format("This is {}, and should be a text or an object", kindName(value)));
    return std::nullopt;
  }
  ObjectReader reader(value, place, problems);
  ManifestSource source;
  source.place = reader.placeOf("file");
  if (const Json* file = reader.member("file")) {
    source.location = readLocation(*file, source.place, problems).value_or("");
  } else {
    problems.add(source.place, "This is missing");
  }
  source.title = reader.text("title");
  source.description = reader.text("description");
  if (mayHaveTimecode)
    if (const Json* timecode = reader.member("timecode"))
      source.timecode = readSeconds(*timecode, reader.placeOf("timecode"), problems);
  reader.finish();
  return source;
}

Text readCategory(ObjectReader& reader, Problems& problems) {
  Text category = reader.text("category");
  if (!category || *category == kQuiltMediaContentCategoryMontage || *category == kQuiltMediaContentCategoryDualSource)
    return category;
  problems.add(reader.placeOf("category"),
               inQuotes(*category) + " is no category here; Montage and DualSource are, and other items need none");
  return category;
}

void readSources(ObjectReader& reader, ManifestItem& item, Problems& problems) {
  const Json* source = reader.member("source");
  const Json* sources = reader.member("sources");
  if (!item.category) {
    if (sources) problems.add(reader.placeOf("sources"), "Several sources need a category, Montage or DualSource");
    if (!source && !sources) problems.add(reader.placeOf("source"), "This is missing");
    if (!source) return;
    if (const auto location = readLocation(*source, reader.placeOf("source"), problems))
      item.sources.push_back({*location, reader.placeOf("source"), {}, {}, {}});
    return;
  }
  if (source) problems.add(reader.placeOf("source"), "An item with a category has \"sources\" instead");
  const auto elements = reader.array("sources", true);
  for (std::size_t i = 0; i < elements.size(); ++i)
    if (auto one = readSource(*elements[i], placeIn(reader.placeOf("sources"), i), true, problems))
      item.sources.push_back(std::move(*one));
  if (*item.category == kQuiltMediaContentCategoryDualSource && elements.size() != 2 && !elements.empty())
    problems.add(reader.placeOf("sources"), fmt::format("A dual-source item has two sources, not {}", elements.size()));
}

ManifestItem readItem(const Json& value, const std::string& place, Problems& problems) {
  ManifestItem item;
  item.place = place;
  if (!isKind(value, "an object", place, problems)) return item;
  ObjectReader reader(value, place, problems);
  item.category = readCategory(reader, problems);
  item.title = reader.text("title");
  item.description = reader.text("description");
  readSources(reader, item, problems);
  const auto extras = reader.array("extras");
  for (std::size_t i = 0; i < extras.size(); ++i)
    if (auto extra = readSource(*extras[i], placeIn(reader.placeOf("extras"), i), false, problems))
      item.extras.push_back(std::move(*extra));
  if (const Json* commentary = reader.member("commentary"))
    item.commentary = readSource(*commentary, reader.placeOf("commentary"), false, problems);
  reader.finish();
  return item;
}

ManifestCollection readCollection(const Json& value, const std::string& place, Problems& problems) {
  ManifestCollection collection;
  if (!isKind(value, "an object", place, problems)) return collection;
  ObjectReader reader(value, place, problems);
  const Text title = reader.text("title");
  if (!title) problems.add(reader.placeOf("title"), "A collection needs a title");
  collection.title = title.value_or("");
  collection.description = reader.text("description");
  collection.author = reader.text("author");
  reader.finish();
  return collection;
}

std::vector<std::string> readFormats(ObjectReader& reader, Problems& problems) {
  std::vector<std::string> formats;
  const auto elements = reader.array("formats");
  const auto& known = QuiltMediaSource::compatibilityTagsInOrderOfQuality();
  for (std::size_t i = 0; i < elements.size(); ++i) {
    const std::string place = placeIn(reader.placeOf("formats"), i);
    const Text format = readText(*elements[i], place, problems);
    if (!format) continue;
    if (std::find(known.begin(), known.end(), *format) == known.end()) {
      problems.add(place, inQuotes(*format) + " is no format; Desktop, 720p and 480p are");
    } else if (std::find(formats.begin(), formats.end(), *format) == formats.end()) {
      formats.push_back(*format);
    }
  }
  return formats;
}

Manifest readRoot(const Json& root, const Path& path, Problems& problems) {
  Manifest manifest;
  manifest.path = path;
  if (!root.is_object()) {
    problems.add("", fmt::format("This is {}, and should be an object", kindName(root)));
    return manifest;
  }
  ObjectReader reader(root, "", problems);
  (void)reader.member("$schema");  // for editors
  manifest.title = reader.text("title");
  manifest.author = reader.text("author");
  manifest.description = reader.text("description");
  manifest.keywords = reader.text("keywords");
  manifest.category = reader.text("category");
  manifest.theme = reader.text("theme");
  manifest.poster = reader.text("poster");
  manifest.formats = readFormats(reader, problems);
  if (const Json* collection = reader.member("collection"))
    manifest.collection = readCollection(*collection, reader.placeOf("collection"), problems);
  const auto media = reader.array("media", true);
  for (std::size_t i = 0; i < media.size(); ++i)
    manifest.media.push_back(readItem(*media[i], placeIn("media", i), problems));
  reader.finish();
  return manifest;
}

/// Refuses, while the text is read, what a reader would pass over: a key twice in one object, and levels without end.
class Guard {
 public:
  explicit Guard(Problems& problems) : _problems(problems) {}

  bool operator()(int depth, Json::parse_event_t event, Json& parsed) {
    using Event = Json::parse_event_t;
    const bool begins = event == Event::object_start || event == Event::array_start;
    if (begins && depth > kDeepest) {
      if (!std::exchange(_isTooDeep, true)) _problems.add("", "It has too many levels");
      return false;
    }
    if (event == Event::object_start) {
      _keys.resize(static_cast<std::size_t>(depth) + 1);
      _keys.back().clear();
    } else if (event == Event::key && depth <= kDeepest) {
      const auto& key = parsed.get_ref<const std::string&>();
      if (!_keys[static_cast<std::size_t>(depth) - 1].insert(key).second)
        _problems.add("", "The key " + inQuotes(key) + " stands twice in one object");
    }
    return true;
  }

 private:
  Problems& _problems;
  std::vector<std::set<std::string>> _keys;  // by depth
  bool _isTooDeep = false;
};

// "[json.exception.parse_error.101] parse error at line 3, column 5: …" without what stands before "line".
std::string syntaxError(const std::string& text) {
  const std::size_t line = text.find("line ");
  return "It is no JSON: " + escaped(line == std::string::npos ? text : text.substr(line));
}

}  // namespace

Failure manifestFailure(const Path& manifest, const std::string& place, const Failure& problem) {
  const std::string where = "The manifest " + inQuotes(manifest.filename().native());
  Failure failure(problem.code, where + (place.empty() ? "" : ", at " + place) + ": " + problem.message,
                  problem.path.empty() ? manifest : problem.path);
  failure.details = Json{{"place", place}};
  return failure;
}

void throwProblems(const Path& manifest, const std::vector<Failure>& problems) {
  if (problems.empty()) return;
  if (problems.size() == 1) throw problems.front();
  const bool alike = std::all_of(problems.begin(), problems.end(),
                                 [&](const Failure& problem) { return problem.code == problems.front().code; });
  Failure all(alike ? problems.front().code : ExitCode::Invalid,
              fmt::format("The manifest {} has {} problems; nothing was exported",
                          inQuotes(manifest.filename().native()), problems.size()),
              manifest);
  all.causes = problems;
  throw all;
}

Manifest parseManifest(std::string_view bytes, const Path& path) {
  Problems problems(path);
  try {
    const Json root = Json::parse(bytes, Guard(problems));
    Manifest manifest = readRoot(root, path, problems);
    throwProblems(path, problems.all());
    return manifest;
  } catch (const Json::exception& error) {
    throw manifestFailure(path, "", Failure(ExitCode::Invalid, syntaxError(error.what())));
  }
}

Manifest readManifest(const std::string& typed) {
  const Path path = absolutePath(typed);
  const auto bytes = services().files->readFile(path, kLongest);
  if (!bytes) throw Failure("Cannot read the manifest " + inQuotes(typed), bytes.error());
  return parseManifest(*bytes, path);
}

}  // namespace quilt::cli
