// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/bridge/ChangedAccessors.h"

namespace quilt::scripting {

namespace {

using Names = std::string_view[];

constexpr Names kTitle = {"cvTitle"};
constexpr Names kDescription = {"cvDescription"};
constexpr Names kAuthor = {"cvAuthor"};
constexpr Names kCopyright = {"cvCopyright"};
constexpr Names kKeywords = {"cvKeywords"};
constexpr Names kCreationDate = {"cvCreationDate"};
constexpr Names kMedia = {"cvMediaCount", "cvMediaAtIndex:"};
constexpr Names kContentCategory = {"cvContentCategory"};
constexpr Names kPoster = {"cvPosterImagePath", "cvPosterImageWidth", "cvPosterImageHeight"};
constexpr Names kSources = {"cvSourcesCount", "cvSourceAtIndex:", "cvContentCategory"};
constexpr Names kExtras = {"cvExtraCount", "cvExtraAtIndex:"};
constexpr Names kCommentary = {"cvAudioCommentarySource"};
constexpr Names kTimecode = {"cvTimeCode"};
constexpr Names kDerivatives = {"cvDerivativeCount", "cvDerivativeAtIndex:", "cvMainDerivative", "cvContentCategory"};
constexpr Names kPreviews = {"cvPreviewCount", "cvPreviewAtIndex:"};
constexpr Names kContentType = {"cvContentType"};
constexpr Names kTags = {"cvCompatibilityTags"};
constexpr Names kUrl = {"cvPath", "cvURL"};
constexpr Names kContent = {"cvContent"};
constexpr Names kImage = {"cvWidth", "cvHeight", "cvPath"};
constexpr Names kPlace = {"cvPath"};

}  // namespace

std::span<const ChangedAccessors> changedAccessors() {
  static constexpr ChangedAccessors kTable[] = {
      {"QuiltCollection", "title", kTitle},
      {"QuiltCollection", "description", kDescription},
      {"QuiltCollection", "author", kAuthor},
      {"QuiltCollection", "copyright", kCopyright},
      {"QuiltCollection", "keywords", kKeywords},
      {"QuiltCollection", "creationDate", kCreationDate},
      {"QuiltDocument", "title", kTitle},
      {"QuiltDocument", "description", kDescription},
      {"QuiltDocument", "author", kAuthor},
      {"QuiltDocument", "creationDate", kCreationDate},
      {"QuiltDocument", "media", kMedia},
      {"QuiltMedia", "title", kTitle},
      {"QuiltMedia", "description", kDescription},
      {"QuiltMedia", "contentCategory", kContentCategory},
      {"QuiltMedia", "posterImage", kPoster},
      {"QuiltMedia", "posterImageVersion", kPoster},
      {"QuiltMedia", "sources", kSources},
      {"QuiltMedia", "extras", kExtras},
      {"QuiltMedia", "audioCommentarySource", kCommentary},
      {"QuiltMediaSource", "title", kTitle},
      {"QuiltMediaSource", "description", kDescription},
      {"QuiltMediaSource", "timecode", kTimecode},
      {"QuiltMediaSource", "derivatives", kDerivatives},
      {"QuiltMediaSource", "previews", kPreviews},
      {"QuiltMediaDerivative", "contentType", kContentType},
      {"QuiltMediaDerivative", "compatibilityTags", kTags},
      {"QuiltMediaDerivative", "url", kUrl},
      {"QuiltMediaPreview", "title", kTitle},
      {"QuiltMediaPreview", "content", kContent},
      {"QuiltMediaPreview", "timecode", kTimecode},
      {"QuiltMediaPreview", "image", kImage},
      {"QuiltMediaPreview", "index", kPlace},
  };
  return kTable;
}

}  // namespace quilt::scripting
