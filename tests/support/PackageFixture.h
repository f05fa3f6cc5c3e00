// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/documents/QuiltDocument.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/ModelFixture.h"

namespace quilt::support {

/// A test with a document package on disk that holds one media item, and verbs for what goes into it. The document is
/// idle, as a host's is: it saves itself with every change.
class PackageFixture : public ModelFixture {
 protected:
  PackageFixture();

  const std::shared_ptr<QuiltDocument>& document() const { return _document; }
  const std::shared_ptr<QuiltMedia>& item() const { return _item; }

  /// @{
  /// For a test of one step, which would otherwise see what each save makes and writes: the poster, its preview and
  /// their folders. The document is as in the middle of a long operation, until letDocumentSave().
  void keepDocumentBusy() { _document->setIsProcessing(true); }
  void letDocumentSave() { _document->setIsProcessing(false); }
  /// @}

  /// A source of the item, made of a file.
  std::shared_ptr<QuiltMediaSource> addSource(const Path& file);
  /// A source of the item with nothing in it.
  std::shared_ptr<QuiltMediaSource> addEmptySource();
  /// A derivative with the tags and no file.
  static std::shared_ptr<QuiltMediaDerivative> derivativeTagged(std::vector<std::string> tags);
  /// A derivative with the tags whose file, with some content, lies in the source's folder.
  static std::shared_ptr<QuiltMediaDerivative> addFlattenedDerivative(QuiltMediaSource& source,
                                                                      std::vector<std::string> tags);
  /// A picture file of one colour with the extension "png" or "jpg".
  Path pictureFile(std::size_t width, std::size_t height, const std::string& extension = "png") const;

  /// Every value that a progression block was given, and its answer.
  struct Progress {
    std::vector<double> values;
    double cancelAt = -1;  ///< answers false to this value and later ones

    ProgressionBlock block() {
      return [this](double value) {
        values.push_back(value);
        return cancelAt < 0 || value < cancelAt;
      };
    }
  };

 private:
  std::shared_ptr<QuiltDocument> _document;
  std::shared_ptr<QuiltMedia> _item = QuiltMedia::init();
};

}  // namespace quilt::support
