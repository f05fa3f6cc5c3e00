// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Result.h"

namespace quilt::platform {

/// A named stretch of a movie or audio file.
struct Chapter {
  std::string name;  ///< UTF-8; may be empty
  double start = 0;  ///< seconds
};

/// What an inspector saw in a file.
struct MediaFacts {
  bool hasAudio = false;                ///< at least one sound track
  bool hasVideo = false;                ///< real video; a cover picture is none
  std::string audioCodecName;           ///< "AAC", "Kestrel Lossless", "MP3", …; empty without audio
  std::string videoCodecName;           ///< "H.264", "HEVC", …; empty without video
  double width = 0;                     ///< displayed pixels: rotation and pixel shape applied; 0 when unknown
  double height = 0;                    ///< displayed pixels; 0 when unknown
  double duration = 0;                  ///< seconds; 0 when unknown
  std::optional<std::string> mimeType;  ///< of the file's format: "video/mp4"
  /// @{
  /// What the file says of itself, UTF-8; none when it says nothing.
  std::optional<std::string> metadataTitle;
  std::optional<std::string> metadataInformation;
  std::optional<std::string> metadataAuthor;
  /// @}
  std::vector<Chapter> chapters;                             ///< in order of time
  std::vector<std::pair<std::string, std::string>> details;  ///< further facts for people: name, text
};

/// The inspection of one kind of file, or of all.
class QUILT_EXPORT MediaInspector {
 public:
  virtual ~MediaInspector() = default;

  /// Opens the file and looks. Any thread. Damaged or Unsupported when it is no medium of this inspector's kinds.
  [[nodiscard]] virtual Result<MediaFacts> inspect(const std::filesystem::path& path) const = 0;
};

/// One inspected file. Immutable.
class QUILT_EXPORT FDYMedia {
 public:
  /// Inspects with the installed service; null when the file cannot be opened as a medium.
  static std::shared_ptr<const FDYMedia> initWithPath(const std::filesystem::path& path);

  /// What an inspector saw, as a medium.
  explicit FDYMedia(MediaFacts facts) : _facts(std::move(facts)) {}

  /// @{
  /// The facts, one by one and together; MediaFacts tells what each means.
  [[nodiscard]] bool hasAudio() const { return _facts.hasAudio; }
  [[nodiscard]] bool hasVideo() const { return _facts.hasVideo; }
  [[nodiscard]] const std::string& audioCodecName() const { return _facts.audioCodecName; }
  [[nodiscard]] const std::string& videoCodecName() const { return _facts.videoCodecName; }
  [[nodiscard]] double width() const { return _facts.width; }
  [[nodiscard]] double height() const { return _facts.height; }
  [[nodiscard]] double duration() const { return _facts.duration; }
  [[nodiscard]] const std::optional<std::string>& mimeType() const { return _facts.mimeType; }
  [[nodiscard]] const std::optional<std::string>& metadataTitle() const { return _facts.metadataTitle; }
  [[nodiscard]] const std::optional<std::string>& metadataInformation() const { return _facts.metadataInformation; }
  [[nodiscard]] const std::optional<std::string>& metadataAuthor() const { return _facts.metadataAuthor; }
  [[nodiscard]] const MediaFacts& facts() const { return _facts; }
  /// @}

 private:
  MediaFacts _facts;
};

}  // namespace quilt::platform
