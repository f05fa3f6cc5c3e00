// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cerrno>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "tests/support/FaultyServices.h"

// Services as the operations of a source see them, told by a test what to answer. Installed for a scope by
// Installed<…> of FaultyServices.h.

namespace quilt::support {

/// The installed files, of which a test decides what a copy reports and answers, and what a size is.
class ToldFiles final : public platform::ForwardingFileManager {
 public:
  ToldFiles() : ForwardingFileManager(platform::services().files) {}

  FailsAt failAttributes, failSync;
  std::optional<std::uint64_t> size;                 ///< of every file
  std::optional<std::vector<std::int64_t>> reports;  ///< bytes copied, in place of the copy's own reports
  int copyAnswer = 0;                                ///< below 0 each copy writes half of the file and fails with it
  std::vector<std::pair<std::filesystem::path, std::filesystem::path>> copies;

  [[nodiscard]] platform::Result<platform::FileAttributes> attributesOfItemAtPath(
      const std::filesystem::path& path) const override {
    if (fails(failAttributes, path)) return kFault;
    auto attributes = ForwardingFileManager::attributesOfItemAtPath(path);
    if (attributes && size) attributes->size = *size;
    return attributes;
  }
  int syncItem(const std::filesystem::path& path) override {
    return fails(failSync, path) ? -EIO : ForwardingFileManager::syncItem(path);
  }
  int copyfile(const std::filesystem::path& source, const std::filesystem::path& destination,
               platform::CopyCallback callback, void* context) override;
};

/// Takes samples from nothing: writes a file of its own. Remembers what it was asked for.
class ToldAudioPreview final : public platform::FDYAudioPreview {
 public:
  bool fails = false;
  std::vector<std::pair<platform::Url, platform::Url>> asked;

  platform::Result<void> extractAudioSamplesFromAssetURL(const platform::Url& assetURL,
                                                         const platform::Url& toSampleURL,
                                                         const platform::ContinueBlock& goesOn) override;
};

/// Converts nothing: reports what it was told to, then puts `made` at the destination, or fails.
class ToldTranscoder final : public platform::FDYMediaTranscoder {
 public:
  struct Call {
    std::string operation;  ///< "audio", "HD", "SD"; "HD and SD" with "SD with it"
    platform::Url source;
    platform::Url destination;
  };
  std::vector<Call> calls;
  std::vector<float> reports;
  std::vector<bool> stops;     ///< the stop flag after each report
  std::filesystem::path made;  ///< empty: every call fails with "The film tore."

  platform::Result<void> transcodeToAudio(const platform::Url& source, const platform::Url& toDestination,
                                          const platform::TranscoderProgressBlock& withProgressionBlock) override {
    return run("audio", source, toDestination, withProgressionBlock);
  }
  platform::Result<void> transcodeToHD(const platform::Url& source, const platform::Url& toDestination,
                                       const platform::TranscoderProgressBlock& withProgressionBlock) override {
    return run("HD", source, toDestination, withProgressionBlock);
  }
  platform::Result<void> transcodeToSD(const platform::Url& source, const platform::Url& toDestination,
                                       const platform::TranscoderProgressBlock& withProgressionBlock) override {
    return run("SD", source, toDestination, withProgressionBlock);
  }
  platform::Result<void> transcodeToHDAndSD(const platform::Url& source, const platform::Url& toHDDestination,
                                            const platform::Url& toSDDestination,
                                            const platform::TranscoderProgressBlock& withProgressionBlock) override {
    const auto made = run("HD and SD", source, toHDDestination, withProgressionBlock);
    return made ? run("SD with it", source, toSDDestination, {}) : made;
  }

 private:
  platform::Result<void> run(const char* operation, const platform::Url& source, const platform::Url& destination,
                             const platform::TranscoderProgressBlock& block);
};

/// Says of every file what it was told.
class ToldInspector final : public platform::MediaInspector {
 public:
  platform::MediaFacts facts;
  [[nodiscard]] platform::Result<platform::MediaFacts> inspect(const std::filesystem::path&) const override {
    return facts;
  }
};

/// Six and a half hours of silence at 44.1 kHz in a file of which the disk holds only the header.
std::filesystem::path longSilence();

}  // namespace quilt::support
