// SPDX-License-Identifier: Apache-2.0
#include "examples/browser/Posters.h"

#include "examples/browser/Text.h"
#include "quilt/platform/interfaces/Services.h"

namespace browser {

namespace {

using Image = std::shared_ptr<quilt::ImageWrapper>;

// What an image browser is told to show is a file, a file of any kind to make a thumbnail of, or an image.
Image imageOf(quilt::ImageBrowserItem& item) {
  const std::string type = item.imageRepresentationType();
  const quilt::ImageRepresentation what = item.imageRepresentation();
  if (const auto* path = std::get_if<quilt::Path>(&what)) return quilt::ImageWrapper::imageWithPath(*path);
  if (const auto* image = std::get_if<Image>(&what)) return *image;
  if (const auto* url = std::get_if<quilt::platform::Url>(&what))
    return type == quilt::kImageBrowserPreviewPathRepresentationType ? quilt::platform::FDYThumbnailImageForURL(*url)
                                                                     : quilt::ImageWrapper::imageWithURL(*url);
  return nullptr;
}

QImage decoded(quilt::ImageBrowserItem& item) {
  const Image image = imageOf(item);
  const Image small = image ? image->convertToSD() : nullptr;
  if (!small) return {};
  const auto bitmap = small->bitmap();
  if (!bitmap) return {};
  const QImage pixels(bitmap->pixels.data(), static_cast<int>(bitmap->width), static_cast<int>(bitmap->height),
                      QImage::Format_RGBA8888);
  return pixels.scaled(Posters::kSize, Posters::kSize, Qt::KeepAspectRatio, Qt::SmoothTransformation);
}

constexpr int kMemory = 128 << 10;  // KiB of pictures

}  // namespace

Posters::Posters(QObject* parent) : QObject(parent), _entries(kMemory) { _threads.setMaxThreadCount(2); }

void Posters::close() {
  _isClosing = true;
  quilt::platform::services().runLoop->runUntil([this] { return _running == 0; });
  _threads.waitForDone();
}

QPixmap Posters::poster(const std::shared_ptr<quilt::ImageBrowserItem>& item) {
  const QString uid = toQt(item->imageUID());
  const std::uint64_t version = item->imageVersion();
  const Entry* const entry = _entries.object(uid);
  if ((!entry || entry->version != version) && !_wanted.contains(uid)) make(item, uid, version);
  return entry ? entry->picture : QPixmap();
}

void Posters::make(const std::shared_ptr<quilt::ImageBrowserItem>& item, const QString& uid, std::uint64_t version) {
  _wanted.insert(uid);
  ++_running;
  _threads.start([this, item, uid, version] {
    const QImage picture = _isClosing ? QImage() : decoded(*item);
    QMetaObject::invokeMethod(this, [=, this] { keep(uid, version, picture); });
    --_running;
    quilt::platform::services().runLoop->wake();
  });
}

void Posters::keep(const QString& uid, std::uint64_t version, const QImage& picture) {
  _wanted.remove(uid);
  const auto cost = static_cast<int>(picture.sizeInBytes() >> 10) + 1;
  _entries.insert(uid, new Entry{version, QPixmap::fromImage(picture)}, cost);
  emit ready(uid);
}

}  // namespace browser
