// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <mutex>
#include <string>

#include "quilt/platform/interfaces/DocumentToolkit.h"
#include "quilt/platform/interfaces/Drawing.h"
#include "quilt/platform/interfaces/FDYArchive.h"
#include "quilt/platform/interfaces/FDYAudioPreview.h"
#include "quilt/platform/interfaces/FDYMedia.h"
#include "quilt/platform/interfaces/FDYMediaTranscoder.h"
#include "quilt/platform/interfaces/ImageWrapper.h"
#include "quilt/platform/interfaces/MovieToolkit.h"

/// Stand-ins for what a build was made without. Each answers Unsupported, and logs one warning, at its first use, that
/// names what is missing.
namespace quilt::platform {

/// The warning and the error of one missing capability.
class Absence {
 public:
  /// `capability` begins a sentence: "Conversion of movies and audio".
  explicit Absence(std::string capability) : _capability(std::move(capability)) {}

  Error error(const std::filesystem::path& file) const;

 private:
  const std::string _capability;
  mutable std::once_flag _warned;
};

class AbsentImages final : public Images {
 public:
  Result<std::shared_ptr<ImageWrapper>> imageWithPath(const std::filesystem::path& path) const override;
  Result<std::shared_ptr<ImageWrapper>> imageWithData(std::span<const unsigned char> data) const override;
  Result<std::shared_ptr<ImageWrapper>> imageWithBitmap(Bitmap bitmap) const override;

 private:
  Absence _absence{"Reading and writing of images"};
};

class AbsentDrawing final : public Drawing {
 public:
  Result<std::unique_ptr<Canvas>> makeCanvas(Size size) const override;

 private:
  Absence _absence{"Drawing of posters"};
};

class AbsentMovieToolkit final : public MovieToolkit {
 public:
  Result<std::unique_ptr<Movie>> openMovie(const std::filesystem::path& path) const override;

 private:
  Absence _absence{"Opening of movies"};
};

class AbsentDocumentToolkit final : public DocumentToolkit {
 public:
  Result<std::shared_ptr<PagedDocument>> openDocument(const std::filesystem::path& path,
                                                      const ContinueBlock& goesOn = {}) const override;

 private:
  Absence _absence{"Showing of document pages"};
};

class AbsentInspector final : public MediaInspector {
 public:
  /// `capability` as for Absence.
  explicit AbsentInspector(std::string capability) : _absence(std::move(capability)) {}
  Result<MediaFacts> inspect(const std::filesystem::path& path) const override;

 private:
  Absence _absence;
};

class AbsentAudioPreview final : public FDYAudioPreview {
 public:
  Result<void> extractAudioSamplesFromAssetURL(const Url& assetURL, const Url& toSampleURL,
                                               const ContinueBlock& goesOn) override;

 private:
  Absence _absence{"Extraction of audio samples"};
};

class AbsentTranscoder final : public FDYMediaTranscoder {
 public:
  Result<void> transcodeToAudio(const Url& source, const Url& toDestination,
                                const TranscoderProgressBlock& withProgressionBlock) override;
  Result<void> transcodeToHD(const Url& source, const Url& toDestination,
                             const TranscoderProgressBlock& withProgressionBlock) override;
  Result<void> transcodeToSD(const Url& source, const Url& toDestination,
                             const TranscoderProgressBlock& withProgressionBlock) override;
  Result<void> transcodeToHDAndSD(const Url& source, const Url& toHDDestination, const Url& toSDDestination,
                                  const TranscoderProgressBlock& withProgressionBlock) override;

 private:
  Absence _absence{"Conversion of movies and audio"};
};

class AbsentArchive final : public FDYArchive {
 public:
  Result<void> archiveFile(const std::filesystem::path& file, std::string_view underName,
                           const std::filesystem::path& toZipFile,
                           const ProgressionBlock& withProgressionBlock) override;

 private:
  Absence _absence{"Writing of zip archives"};
};

}  // namespace quilt::platform
