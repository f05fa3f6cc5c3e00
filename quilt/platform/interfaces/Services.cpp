// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/interfaces/Services.h"

namespace quilt::platform {

namespace {

// Never destroyed: objects with static lifetime may use a service while the process ends.
Services& installed() {
  static Services& set = *new Services;
  return set;
}

}  // namespace

const Services& services() { return installed(); }

void installServices(Services set) { installed() = std::move(set); }

std::string generateUUID() { return services().uuids->generateUUID(); }

std::optional<std::string> FDYTypePreferredIdentifier(const std::filesystem::path& path) {
  return services().types->preferredIdentifier(path);
}

std::shared_ptr<const FDYMedia> FDYMedia::initWithPath(const std::filesystem::path& path) {
  Result<MediaFacts> facts = services().inspector->inspect(path);
  return facts ? std::make_shared<const FDYMedia>(*std::move(facts)) : nullptr;
}

std::shared_ptr<ImageWrapper> ImageWrapper::imageWithPath(const std::filesystem::path& path) {
  Result<std::shared_ptr<ImageWrapper>> image = services().images->imageWithPath(path);
  return image ? *std::move(image) : nullptr;
}

std::shared_ptr<ImageWrapper> ImageWrapper::imageWithURL(const Url& url) {
  return url.isFileUrl() ? imageWithPath(url.relativePath()) : nullptr;
}

std::shared_ptr<ImageWrapper> FDYThumbnailImageForURL(const Url& url) {
  return services().glance->thumbnailImageForURL(url);
}

void FDYPreviewPrepareDocument(const std::filesystem::path& path, const ContinueBlock& goesOn) {
  services().glance->prepareDocument(path, goesOn);
}

std::size_t FDYPreviewDocumentPagesCount(const std::filesystem::path& path) {
  return services().glance->documentPagesCount(path);
}

std::optional<DocumentPage> FDYPreviewDocumentPageAtIndex(const std::filesystem::path& path, std::size_t index) {
  return services().glance->documentPageAtIndex(path, index);
}

}  // namespace quilt::platform
