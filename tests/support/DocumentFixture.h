// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "quilt/documents/QuiltDocument.h"
#include "tests/support/ModelFixture.h"

namespace quilt::support {

/// Every value that a progression block was given. It goes on until a test says otherwise.
struct Progress {
  std::vector<double> values;
  std::size_t cancelFrom = static_cast<std::size_t>(-1);  ///< answers false from this call (0 is the first) on

  ProgressionBlock block() {
    return [this](double value) {
      values.push_back(value);
      return values.size() <= cancelFrom;
    };
  }
};

/// A test of documents: packages in the test's folder, a clock that stands still, and verbs for what goes into them.
class DocumentFixture : public ModelFixture {
 protected:
  DocumentFixture();

  TestClock& clock() { return *_clock; }

  Path package(const std::string& name = "package") const { return folder() / (name + ".qpk"); }
  /// A new package: its folder is there, its properties file is not.
  std::shared_ptr<QuiltDocument> made(const std::string& name = "package");
  /// The package with this properties file, opened; null when it is refused. "Version" is added when missing.
  std::shared_ptr<QuiltDocument> opened(const Dictionary& record, const std::string& name = "package");
  /// The package as it lies on disk, opened once more.
  static std::shared_ptr<QuiltDocument> reopened(const QuiltDocument& document);
  static Dictionary saved(const QuiltDocument& document) { return readRecord(document.propertiesPath()); }

  /// Adds an item without saving.
  static void add(QuiltDocument& document, const std::shared_ptr<QuiltMedia>& item);
  /// An item without sources.
  static std::shared_ptr<QuiltMedia> addItem(QuiltDocument& document, const std::string& title = "Item");
  /// An item with a source that needs no file: a web link, which suits every format.
  static std::shared_ptr<QuiltMedia> addWebItem(QuiltDocument& document, const std::string& title = "Link");
  /// An item whose source is a picture outside of the package.
  std::shared_ptr<QuiltMedia> addPictureItem(QuiltDocument& document, std::size_t width = 64, std::size_t height = 48);
  /// An item that says of itself that it is flattened: its link and its samples need no copy.
  static std::shared_ptr<QuiltMedia> addFlattenedItem(QuiltDocument& document);

  static std::shared_ptr<QuiltMediaSource> webSource(const std::string& address = "https://example.org/");
  /// A source with a derivative that points at the file, or at nothing when there is no file.
  static std::shared_ptr<QuiltMediaSource> sourceOf(const Path& file);

  /// A picture file of one colour outside of every package.
  Path pictureFile(std::size_t width, std::size_t height, const std::string& name = "picture.png") const;
  /// A theme bundle whose template holds an "index.html" and a "controllers" folder.
  Path themeBundle(const std::string& name = "Plain") const;

  /// Everything in a folder by its path relative to it, sorted; folders end in "/". Symbolic links end in "@" and are
  /// not followed.
  static std::vector<std::string> treeOf(const Path& folder);

 private:
  const std::shared_ptr<TestClock> _clock;
  platform::ScopedService<platform::Clock> _installedClock;
};

}  // namespace quilt::support
