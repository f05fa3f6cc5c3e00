// SPDX-License-Identifier: Apache-2.0
#include "tests/support/PackageFixture.h"

namespace quilt::support {

PackageFixture::PackageFixture() : _document(QuiltDocument::initWithPath(folder() / "package.qpk")) {
  _document->addMedia(_item);
  takeLines();
}

std::shared_ptr<QuiltMediaSource> PackageFixture::addSource(const Path& file) {
  auto source = QuiltMediaSource::initWithPath(file);
  EXPECT_NE(source, nullptr) << file;
  _item->addSource(source);
  return source;
}

std::shared_ptr<QuiltMediaSource> PackageFixture::addEmptySource() {
  auto source = QuiltMediaSource::init();
  _item->addSource(source);
  return source;
}

std::shared_ptr<QuiltMediaDerivative> PackageFixture::derivativeTagged(std::vector<std::string> tags) {
  auto derivative = QuiltMediaDerivative::init();
  derivative->setCompatibilityTags(std::move(tags));
  return derivative;
}

std::shared_ptr<QuiltMediaDerivative> PackageFixture::addFlattenedDerivative(QuiltMediaSource& source,
                                                                             std::vector<std::string> tags) {
  auto derivative = derivativeTagged(std::move(tags));
  std::filesystem::create_directories(source.derivativesFolderPath());
  derivative->setUrl(
      Url::fileUrl(writeFile(source.derivativesFolderPath() / (derivative->uuid() + ".bin"), "content")));
  derivative->setIsFlattened(true);
  source.addDerivative(derivative);
  return derivative;
}

Path PackageFixture::pictureFile(std::size_t width, std::size_t height, const std::string& extension) const {
  const Path file = folder() / (std::to_string(width) + "x" + std::to_string(height) + "." + extension);
  const auto image = picture(width, height);
  const auto saved = extension == "jpg" ? image->saveAsJPGAtPath(file) : image->saveAsPNGAtURL(Url::fileUrl(file));
  EXPECT_TRUE(saved.hasValue());
  return file;
}

}  // namespace quilt::support
