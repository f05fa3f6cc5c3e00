// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "quilt/platform/ffmpeg/Input.h"
#include "quilt/platform/interfaces/FDYMedia.h"

namespace quilt::platform::ffmpeg {

/// The first of the named tags that says something, looked for in the file's tags and then in those of its main
/// streams. Names match without case; reverse-domain names by their last part ("org.example.title" is a title).
std::optional<std::string> tag(const Input& input, std::initializer_list<std::string_view> names);

/// The text unchanged when it is UTF-8, else read as Latin-1; without control characters at its ends, and cut at the
/// limit for tags.
std::string repairedText(std::string_view text);

/// In order of time, none at or past `duration` (unless that is 0, unknown), none that ends where it starts.
std::vector<Chapter> chapters(const Input& input, double duration);

}  // namespace quilt::platform::ffmpeg
