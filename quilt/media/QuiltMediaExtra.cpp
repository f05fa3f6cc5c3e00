// SPDX-License-Identifier: Apache-2.0
#include "quilt/media/QuiltMediaExtra.h"

#include <utility>

#include "quilt/media/QuiltMedia.h"
#include "quilt/sources/ModelFiles.h"

namespace quilt {

std::shared_ptr<QuiltMediaExtra> QuiltMediaExtra::init() {
  struct Made final : QuiltMediaExtra {};
  return std::make_shared<Made>();
}

std::shared_ptr<QuiltMediaExtra> QuiltMediaExtra::initWithURL(const Url& url) {
  auto extra = init();
  return extra->initializeWithURL(url) ? extra : nullptr;
}

std::shared_ptr<QuiltMediaExtra> QuiltMediaExtra::initWithPath(const Path& path) {
  return initWithURL(Url::fileUrl(path));
}

std::shared_ptr<QuiltMediaExtra> QuiltMediaExtra::initWithDictionary(Dictionary dictionary,
                                                                     const std::shared_ptr<QuiltMedia>& andMedia) {
  return read(dictionary, andMedia);
}

std::shared_ptr<QuiltMediaExtra> QuiltMediaExtra::read(Dictionary& record,
                                                       const std::shared_ptr<QuiltMedia>& andMedia) {
  auto extra = init();
  return extra->initializeWithDictionary(record, andMedia) ? extra : nullptr;
}

std::string QuiltMediaExtra::folder() const {
  const auto media = mediaOwner();
  return media ? below(folderOf(*media), {"extras", uuid()}) : std::string();
}

}  // namespace quilt
