// SPDX-License-Identifier: Apache-2.0
#include "tests/support/DocumentFixture.h"

#include <algorithm>

namespace quilt::support {

DocumentFixture::DocumentFixture()
    : _clock(std::make_shared<TestClock>(dateOf("2026-03-05T14:07:09Z"))),
      _installedClock(&platform::Services::clock, _clock) {}

std::shared_ptr<QuiltDocument> DocumentFixture::made(const std::string& name) {
  auto document = QuiltDocument::initWithPath(package(name));
  EXPECT_NE(document, nullptr);
  return document;
}

std::shared_ptr<QuiltDocument> DocumentFixture::opened(const Dictionary& record, const std::string& name) {
  Dictionary complete = record;
  if (!complete.contains("Version")) complete.append("Version", "1.0");
  writeRecord(package(name) / "properties.plist", complete);
  return QuiltDocument::initWithPath(package(name));
}

std::shared_ptr<QuiltDocument> DocumentFixture::reopened(const QuiltDocument& document) {
  auto again = QuiltDocument::initWithPath(document.path());
  EXPECT_NE(again, nullptr);
  return again;
}

void DocumentFixture::add(QuiltDocument& document, const std::shared_ptr<QuiltMedia>& item) {
  const bool wasProcessing = document.isProcessing();
  document.setIsProcessing(true);
  document.addMedia(item);
  document.setIsProcessing(wasProcessing);
}

std::shared_ptr<QuiltMedia> DocumentFixture::addItem(QuiltDocument& document, const std::string& title) {
  auto item = QuiltMedia::init();
  item->setTitle(title);
  add(document, item);
  return item;
}

std::shared_ptr<QuiltMedia> DocumentFixture::addWebItem(QuiltDocument& document, const std::string& title) {
  auto item = QuiltMedia::init();
  item->setTitle(title);
  item->addSource(webSource());
  add(document, item);
  return item;
}

std::shared_ptr<QuiltMedia> DocumentFixture::addPictureItem(QuiltDocument& document, std::size_t width,
                                                            std::size_t height) {
  auto item = QuiltMedia::init();
  item->setTitle("Picture");
  auto source = QuiltMediaSource::initWithPath(
      pictureFile(width, height, std::to_string(width) + "x" + std::to_string(height) + ".png"));
  EXPECT_NE(source, nullptr);
  item->addSource(source);
  add(document, item);
  return item;
}

std::shared_ptr<QuiltMedia> DocumentFixture::addFlattenedItem(QuiltDocument& document) {
  auto item = QuiltMedia::init();
  auto source = webSource();
  item->addSource(source);
  auto samples = QuiltMediaAudioSamples::init();
  samples->setIsFlattened(true);
  source->addAudioSamples(samples);
  add(document, item);
  EXPECT_TRUE(item->isFlattened());
  return item;
}

std::shared_ptr<QuiltMediaSource> DocumentFixture::webSource(const std::string& address) {
  auto source = QuiltMediaSource::init();
  source->addDerivative(QuiltMediaDerivative::initWithURL(*Url::parse(address)));
  return source;
}

std::shared_ptr<QuiltMediaSource> DocumentFixture::sourceOf(const Path& file) {
  auto source = QuiltMediaSource::init();
  auto derivative = QuiltMediaDerivative::init();
  derivative->setCompatibilityTags(std::vector<std::string>{kQuiltMediaDerivativeCompatibilityTagDesktop});
  derivative->setContentType(platform::types::kMPEG4);
  if (!file.empty()) derivative->setUrl(Url::fileUrl(file));
  source->addDerivative(derivative);
  return source;
}

Path DocumentFixture::pictureFile(std::size_t width, std::size_t height, const std::string& name) const {
  const Path file = folder() / name;
  const auto saved = picture(width, height)->saveAsPNGAtURL(Url::fileUrl(file));
  EXPECT_TRUE(saved.hasValue());
  return file;
}

Path DocumentFixture::themeBundle(const std::string& name) const {
  const Path bundle = folder() / (name + ".qth");
  writeRecord(bundle / "Info.plist", {{"CFBundleIdentifier", "org.quilt.theme." + name},
                                      {"CFBundleDisplayName", name},
                                      {"CFBundleShortVersionString", "1.0"}});
  writeFile(bundle / "Resources/Template/index.html", "<p>" + name);
  writeFile(bundle / "Resources/Template/controllers/player.js", "play()");
  EXPECT_TRUE(picture(8, 8)->saveAsPNGAtURL(Url::fileUrl(bundle / "Resources/Preview.png")));
  return bundle;
}

std::vector<std::string> DocumentFixture::treeOf(const Path& folder) {
  std::vector<std::string> names;
  for (const auto& entry : std::filesystem::recursive_directory_iterator(folder)) {
    std::string name = entry.path().lexically_relative(folder).native();
    if (entry.is_symlink()) {
      name += "@";
    } else if (entry.is_directory()) {
      name += "/";
    }
    names.push_back(std::move(name));
  }
  std::sort(names.begin(), names.end());
  return names;
}

}  // namespace quilt::support
