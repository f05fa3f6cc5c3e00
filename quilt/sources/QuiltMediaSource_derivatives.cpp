// SPDX-License-Identifier: Apache-2.0
#include <algorithm>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/sources/ModelFiles.h"
#include "quilt/sources/QuiltMediaSource.h"

namespace quilt {

const std::vector<std::string>& QuiltMediaSource::compatibilityTagsInOrderOfQuality() {
  static const std::vector<std::string> tags = {kQuiltMediaDerivativeCompatibilityTagDesktop,
                                                kQuiltMediaDerivativeCompatibilityTag720p,
                                                kQuiltMediaDerivativeCompatibilityTag480p};
  return tags;
}

void QuiltMediaSource::setDerivatives(std::vector<std::shared_ptr<QuiltMediaDerivative>> derivatives) {
  _derivatives.assign(std::move(derivatives));
}

bool QuiltMediaSource::performBlockOnDerivatives(
    const std::function<bool(const std::shared_ptr<QuiltMediaDerivative>&)>& block) const {
  return _derivatives.walk(block);
}

void QuiltMediaSource::addDerivative(const std::shared_ptr<QuiltMediaDerivative>& derivative) {
  if (!derivative) return;
  const platform::Uninterrupted whole;
  _derivatives.append(derivative);
  updateDocumentUnlessProcessing();
}

void QuiltMediaSource::removeDerivative(const std::shared_ptr<QuiltMediaDerivative>& derivative) {
  if (!derivative) return;
  const platform::Uninterrupted whole;
  {
    const auto guard = _derivatives.lock();
    const auto url = derivative->url();
    // A derivative that is not flattened points at the user's own file.
    if (derivative->isFlattened() && url && url->isFileUrl())
      deleteFromPackage(url->relativePath(), document(), "Failed to delete derivative at path \"%@\": \"%@\"");
    _derivatives.remove(derivative);
  }
  updateDocumentUnlessProcessing();
}

void QuiltMediaSource::removeAllDerivatives() {
  const platform::Uninterrupted whole;
  // The lock is not held across: each removal saves the document, whose lock comes first.
  for (const auto& derivative : _derivatives.copy()) removeDerivative(derivative);
}

std::shared_ptr<QuiltMediaDerivative> QuiltMediaSource::derivativeWithFormat(const std::string& format) const {
  return _derivatives.first([&format](const auto& derivative) { return derivative->hasTag(format); });
}

std::shared_ptr<QuiltMediaDerivative> QuiltMediaSource::bestDerivativeForFormat(const std::string& format) const {
  if (auto exact = derivativeWithFormat(format)) return exact;
  const auto& tags = compatibilityTagsInOrderOfQuality();
  for (auto tag = std::find(tags.begin(), tags.end(), format); tag != tags.end(); ++tag)
    if (auto lower = derivativeWithFormat(*tag)) return lower;
  return nullptr;
}

std::shared_ptr<QuiltMediaDerivative> QuiltMediaSource::mainDerivative() const {
  for (const std::string& tag : compatibilityTagsInOrderOfQuality())
    if (auto derivative = derivativeWithFormat(tag)) return derivative;
  return nullptr;
}

}  // namespace quilt
