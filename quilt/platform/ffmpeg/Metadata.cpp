// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/Metadata.h"

#include <strings.h>

#include <algorithm>
#include <cmath>

#include "quilt/platform/ffmpeg/Limits.h"
#include "quilt/platform/ffmpeg/Streams.h"

namespace quilt::platform::ffmpeg {

namespace {

// The length of the well-formed UTF-8 sequence at `position`, 0 when there is none.
std::size_t sequenceLength(std::string_view text, std::size_t position) {
  const auto byte = [&](std::size_t offset) {
    return position + offset < text.size() ? static_cast<unsigned char>(text[position + offset]) : 0U;
  };
  const auto continues = [&](std::size_t offset) { return (byte(offset) & 0xc0U) == 0x80U; };
  const unsigned first = byte(0);
  if (first < 0x80) return 1;
  if (first >= 0xc2 && first <= 0xdf) return continues(1) ? 2 : 0;
  if (first >= 0xe0 && first <= 0xef) {
    if (!continues(1) || !continues(2)) return 0;
    const bool overlong = first == 0xe0 && byte(1) < 0xa0;
    const bool surrogate = first == 0xed && byte(1) >= 0xa0;
    return overlong || surrogate ? 0 : 3;
  }
  if (first >= 0xf0 && first <= 0xf4) {
    if (!continues(1) || !continues(2) || !continues(3)) return 0;
    const bool overlong = first == 0xf0 && byte(1) < 0x90;
    const bool tooLarge = first == 0xf4 && byte(1) >= 0x90;
    return overlong || tooLarge ? 0 : 4;
  }
  return 0;
}

bool isUtf8(std::string_view text) {
  for (std::size_t i = 0; i < text.size();) {
    const std::size_t length = sequenceLength(text, i);
    if (length == 0) return false;
    i += length;
  }
  return true;
}

std::string fromLatin1(std::string_view text) {
  std::string result;
  for (const char character : text) {
    const auto byte = static_cast<unsigned char>(character);
    if (byte < 0x80) {
      result += character;
    } else {
      result += static_cast<char>(0xc0U | byte >> 6U);
      result += static_cast<char>(0x80U | (byte & 0x3fU));
    }
  }
  return result;
}

bool isBlank(char character) { return static_cast<unsigned char>(character) <= ' '; }

bool isNamed(const char* key, std::string_view name) {
  const std::string_view whole(key);
  const std::string_view last = whole.substr(whole.rfind('.') + 1);  // npos + 1 is 0
  return last.size() == name.size() && strncasecmp(last.data(), name.data(), name.size()) == 0;
}

std::optional<std::string> find(const AVDictionary* tags, std::string_view name) {
  const AVDictionaryEntry* entry = nullptr;
  while ((entry = av_dict_get(tags, "", entry, AV_DICT_IGNORE_SUFFIX)) != nullptr) {
    if (!isNamed(entry->key, name)) continue;
    if (std::string text = repairedText(entry->value); !text.empty()) return text;
  }
  return std::nullopt;
}

}  // namespace

std::string repairedText(std::string_view text) {
  while (!text.empty() && isBlank(text.front())) text.remove_prefix(1);
  while (!text.empty() && isBlank(text.back())) text.remove_suffix(1);
  std::string result = isUtf8(text) ? std::string(text) : fromLatin1(text);
  if (result.size() > kMaximumTagBytes) {
    std::size_t end = kMaximumTagBytes;
    while (end > 0 && (static_cast<unsigned char>(result[end]) & 0xc0U) == 0x80U) --end;
    result.resize(end);
  }
  return result;
}

std::optional<std::string> tag(const Input& input, std::initializer_list<std::string_view> names) {
  const AVStream* video = mainVideo(input);
  const AVStream* audio = mainAudio(input);
  for (const std::string_view name : names) {
    for (const AVDictionary* tags : {input.context()->metadata, video != nullptr ? video->metadata : nullptr,
                                     audio != nullptr ? audio->metadata : nullptr}) {
      if (std::optional<std::string> text = find(tags, name)) return text;
    }
  }
  return std::nullopt;
}

std::vector<Chapter> chapters(const Input& input, double duration) {
  std::vector<Chapter> result;
  const AVFormatContext& context = *input.context();
  for (unsigned i = 0; i < context.nb_chapters && result.size() < kMaximumChapters; ++i) {
    const AVChapter& chapter = *context.chapters[i];
    if (chapter.start == AV_NOPTS_VALUE || chapter.time_base.den == 0) continue;
    if (chapter.end != AV_NOPTS_VALUE && chapter.end <= chapter.start) continue;
    const double start = std::max(0.0, seconds(chapter.start, chapter.time_base));
    if (!std::isfinite(start) || start > kMaximumDuration || (duration > 0 && start >= duration)) continue;
    result.push_back({find(chapter.metadata, "title").value_or(std::string()), start});
  }
  std::ranges::stable_sort(result, {}, &Chapter::start);
  // Of several that start together all but one are empty; the first one named is kept.
  const auto last = std::unique(result.begin(), result.end(), [](Chapter& kept, Chapter& other) {
    if (kept.start != other.start) return false;
    if (kept.name.empty()) kept.name = std::move(other.name);
    return true;
  });
  result.erase(last, result.end());
  return result;
}

}  // namespace quilt::platform::ffmpeg
