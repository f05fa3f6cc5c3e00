// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/Failure.h"

#include <cerrno>

#include "quilt/platform/ffmpeg/Handles.h"

namespace quilt::platform::ffmpeg {

Error failure(int code, const std::filesystem::path& file) {
  switch (code) {
    case AVERROR(ENOENT):
    case AVERROR(ENOTDIR):
      return {ErrorKind::NotFound, "There is no such file.", file};
    case AVERROR(EACCES):
    case AVERROR(EPERM):
      return {ErrorKind::PermissionDenied, "The system refused access to the file.", file};
    case AVERROR(ENOSPC):
    case AVERROR(EDQUOT):
      return {ErrorKind::NoSpace, "The disk is full.", file};
    case AVERROR(EFBIG):
      return {ErrorKind::NoSpace, "The file is larger than the disk allows.", file};
    case AVERROR(EIO):
      return {ErrorKind::InputOutput, "The file could not be read or written.", file};
    case AVERROR(EMFILE):
    case AVERROR(ENFILE):
      return {ErrorKind::InputOutput, "Too many files are open.", file};
    case AVERROR(ENOMEM):
      return {ErrorKind::Damaged, "The file asks for more memory than it may have.", file};
    case AVERROR_EXIT:
      return {ErrorKind::Damaged, "The file takes too long to read.", file};
    case AVERROR_EOF:
      return {ErrorKind::Damaged, "The file ends too early.", file};
    case AVERROR(EINVAL):  // also: the format is not on the list of permitted ones
    case AVERROR_DEMUXER_NOT_FOUND:
      return {ErrorKind::Unsupported, "The file is in no supported movie or sound format.", file};
    case AVERROR_DECODER_NOT_FOUND:
    case AVERROR_PATCHWELCOME:
    case AVERROR(ENOSYS):
      return {ErrorKind::Unsupported, "The file uses a codec that is not available here.", file};
    case AVERROR_ENCODER_NOT_FOUND:
    case AVERROR_MUXER_NOT_FOUND:
    case AVERROR_FILTER_NOT_FOUND:
      return {ErrorKind::Unsupported, "The installed media library lacks an encoder or a filter that is needed.", file};
    default:  // every other code means bytes that do not decode
      return {ErrorKind::Damaged, "The file is damaged, or is no movie or sound file.", file};
  }
}

Error conversionFailure(int code, const std::filesystem::path& file) {
  if (code != AVERROR(EINVAL)) return failure(code, file);
  return {ErrorKind::Unsupported, "The file's pictures or sound are of a kind that cannot be converted.", file};
}

}  // namespace quilt::platform::ffmpeg
