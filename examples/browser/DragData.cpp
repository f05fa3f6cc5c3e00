// SPDX-License-Identifier: Apache-2.0
#include "examples/browser/DragData.h"

#include <QUrl>

#include "examples/browser/Text.h"

namespace browser {

std::unique_ptr<QMimeData> dragDataOf(const std::vector<std::shared_ptr<quilt::platform::PasteboardItem>>& items) {
  quilt::platform::Pasteboard pasteboard;
  for (const auto& item : items) pasteboard.writeObject(*item);
  auto data = std::make_unique<QMimeData>();
  for (const std::string& type : pasteboard.types()) {
    QByteArray lines;
    for (const quilt::platform::PropertyList& value : pasteboard.propertyListsForType(type))
      if (const auto* uuid = value.as<std::string>()) lines += QByteArray::fromStdString(*uuid) + '\n';
    data->setData(toQt(type), lines);
  }
  return data;
}

std::vector<std::string> uuidsIn(const QMimeData& data, const char* type) {
  std::vector<std::string> uuids;
  for (const QByteArray& line : data.data(type).split('\n'))
    if (!line.isEmpty()) uuids.push_back(line.toStdString());
  return uuids;
}

std::vector<quilt::Path> filesIn(const QMimeData& data) {
  std::vector<quilt::Path> files;
  for (const QUrl& url : data.urls())
    if (url.isLocalFile()) files.push_back(toPath(url.toLocalFile()));
  return files;
}

}  // namespace browser
