// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <QCache>
#include <QObject>
#include <QPixmap>
#include <QSet>
#include <QThreadPool>
#include <atomic>
#include <memory>

#include "quilt/sources/Representations.h"

namespace browser {

/// The pictures of the image browser's cells, by UID and version. They are asked for and decoded on threads of their
/// own: a poster may have to be loaded, drawn, or made from a movie or a page.
class Posters : public QObject {
  Q_OBJECT

 public:
  /// The longer side, in pixels, that pictures are kept with.
  static constexpr int kSize = 384;

  explicit Posters(QObject* parent = nullptr);
  ~Posters() override { close(); }

  /// Waits for the pictures that are being made; the main thread runs blocks meanwhile, because drawing may need it.
  void close();

  /// The picture, or a null one while it is being made or when there is none; ready() tells when to ask again. When the
  /// version has risen, the old picture until the new one is there.
  QPixmap poster(const std::shared_ptr<quilt::ImageBrowserItem>& item);

  [[nodiscard]] bool isBusy() const { return _running > 0; }

 signals:
  void ready(const QString& uid);

 private:
  struct Entry {
    std::uint64_t version;
    QPixmap picture;
  };

  void make(const std::shared_ptr<quilt::ImageBrowserItem>& item, const QString& uid, std::uint64_t version);
  void keep(const QString& uid, std::uint64_t version, const QImage& picture);

  QCache<QString, Entry> _entries;
  QSet<QString> _wanted;
  QThreadPool _threads;
  std::atomic<int> _running = 0;
  std::atomic<bool> _isClosing = false;
};

}  // namespace browser
