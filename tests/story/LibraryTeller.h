// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/collections/QuiltCollectionsController.h"
#include "tests/story/Teller.h"

namespace quilt::story {

/// Tells a story in this process, as a host does: on idle documents that save themselves. What lies outside stays there
/// until something brings it in.
class LibraryTeller final : public Teller {
 public:
  LibraryTeller(Path library, const Path& theme);

  Outcome newDocument(const std::string& title, const Path& theme) override;
  Outcome importFile(const Path& file) override;
  Outcome removeDocument(const Document& document) override;
  Outcome setTitle(const Document& document, const std::string& title) override;
  Outcome setDescription(const Document& document, const std::string& description) override;
  Outcome setPoster(const Document& document, const Path& picture) override;
  Outcome convert(const Document& document, const std::string& format) override;
  Outcome finalize(const Document& document) override;
  Outcome exportTo(const Document& document, const Path& folder, bool zipped, Path& made) override;

  Outcome addItems(const Document& document, const std::vector<std::string>& sources) override;
  Outcome addComposition(const Document& document, const std::string& category, const std::string& title,
                         const std::vector<Path>& files) override;
  Outcome addExtra(const Document& document, const Item& item, const Path& file) override;
  Outcome setCommentary(const Document& document, const Item& item, const Path& file) override;
  Outcome setItemTitle(const Document& document, const Item& item, const std::string& title) override;
  Outcome removeItem(const Document& document, const Item& item) override;
  Outcome moveItem(const Document& document, std::size_t from, std::size_t to) override;

  Outcome bringEverythingIn() override;
  /// On disk, where everything is saved already, and in the objects.
  Contents look() override;

  std::vector<Operation> ownOperations() override;

 private:
  void open();
  [[nodiscard]] std::shared_ptr<QuiltDocument> find(const Document& document) const;
  [[nodiscard]] std::shared_ptr<QuiltMedia> find(const Document& document, const Item& item) const;

  const Path _library;
  std::shared_ptr<QuiltCollectionsController> _controller;
};

}  // namespace quilt::story
