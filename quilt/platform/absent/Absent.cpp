// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/absent/Absent.h"

#include "quilt/platform/base/FDYLogger.h"

namespace quilt::platform {

Error Absence::error(const std::filesystem::path& file) const {
  const std::string text = _capability + " is not part of this build";
  std::call_once(_warned, [&text] { FDYLogger::logWarning("%@", text); });
  return {ErrorKind::Unsupported, text, file};
}

Result<std::shared_ptr<ImageWrapper>> AbsentImages::imageWithPath(const std::filesystem::path& path) const {
  return _absence.error(path);
}

Result<std::shared_ptr<ImageWrapper>> AbsentImages::imageWithData(std::span<const unsigned char> /*data*/) const {
  return _absence.error({});
}

Result<std::shared_ptr<ImageWrapper>> AbsentImages::imageWithBitmap(Bitmap /*bitmap*/) const {
  return _absence.error({});
}

Result<std::unique_ptr<Canvas>> AbsentDrawing::makeCanvas(Size /*size*/) const { return _absence.error({}); }

Result<std::unique_ptr<Movie>> AbsentMovieToolkit::openMovie(const std::filesystem::path& path) const {
  return _absence.error(path);
}

Result<std::shared_ptr<PagedDocument>> AbsentDocumentToolkit::openDocument(const std::filesystem::path& path,
                                                                           const ContinueBlock& /*goesOn*/) const {
  return _absence.error(path);
}

Result<MediaFacts> AbsentInspector::inspect(const std::filesystem::path& path) const { return _absence.error(path); }

Result<void> AbsentAudioPreview::extractAudioSamplesFromAssetURL(const Url& assetURL, const Url& /*toSampleURL*/,
                                                                 const ContinueBlock& /*goesOn*/) {
  return _absence.error(assetURL.relativePath());
}

Result<void> AbsentTranscoder::transcodeToAudio(const Url& source, const Url& /*toDestination*/,
                                                const TranscoderProgressBlock& /*withProgressionBlock*/) {
  return _absence.error(source.relativePath());
}

Result<void> AbsentTranscoder::transcodeToHD(const Url& source, const Url& /*toDestination*/,
                                             const TranscoderProgressBlock& /*withProgressionBlock*/) {
  return _absence.error(source.relativePath());
}

Result<void> AbsentTranscoder::transcodeToSD(const Url& source, const Url& /*toDestination*/,
                                             const TranscoderProgressBlock& /*withProgressionBlock*/) {
  return _absence.error(source.relativePath());
}

Result<void> AbsentTranscoder::transcodeToHDAndSD(const Url& source, const Url& /*toHDDestination*/,
                                                  const Url& /*toSDDestination*/,
                                                  const TranscoderProgressBlock& /*withProgressionBlock*/) {
  return _absence.error(source.relativePath());
}

Result<void> AbsentArchive::archiveFile(const std::filesystem::path& file, std::string_view /*underName*/,
                                        const std::filesystem::path& /*toZipFile*/,
                                        const ProgressionBlock& /*withProgressionBlock*/) {
  return _absence.error(file);
}

}  // namespace quilt::platform
