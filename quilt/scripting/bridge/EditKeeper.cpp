// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/bridge/EditKeeper.h"

#include "quilt/documents/DataScript.h"
#include "quilt/platform/base/CleanUp.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::scripting {

namespace {

constexpr std::chrono::milliseconds kPause{1000};

// Which file holds the record; another one after each save.
std::optional<platform::FileIdentity> recordOf(const QuiltDocument& document) {
  const auto attributes = platform::services().files->attributesOfItemAtPath(document.propertiesPath());
  return attributes ? std::optional(attributes->identity) : std::nullopt;
}

}  // namespace

EditKeeper::EditKeeper(std::shared_ptr<QuiltDocument> document)
    : _document(std::move(document)), _saves(_document->observe("modifiedDate", [this](const platform::ChangeNotice&) {
        if (_editor.load() == std::this_thread::get_id()) _hasSaved = true;
        _lastEdit = Clock::now();
        _isPageOld = true;
        _wantsSettling = true;
      })) {}

bool EditKeeper::keep(const std::function<bool()>& edit) {
  const auto before = recordOf(*_document);
  _hasSaved = false;
  _editor = std::this_thread::get_id();
  const bool hasEdited = platform::withCleanUp(edit, [this] { _editor = std::thread::id(); });
  if (!hasEdited) return true;
  // By the model itself. A save of another thread may have read the document before the edit.
  if (_hasSaved && recordOf(*_document) != before) return true;
  _isUnsaved = true;
  return save();
}

bool EditKeeper::save() {
  if (_document->isBusy()) {
    _lastEdit = Clock::now();
    _wantsSettling = true;
    return true;
  }
  if (!_document->update()) return false;
  _isUnsaved = false;
  return true;
}

bool EditKeeper::isDue() { return Clock::now() - _lastEdit.load() > kPause && _wantsSettling.exchange(false); }

bool EditKeeper::settle() {
  if (_document->isBusy()) {
    _lastEdit = Clock::now();
    _wantsSettling = true;  // after the next pause
    return true;
  }
  if (_isUnsaved && !save()) {
    _wantsSettling = false;  // tried again at the next edit and at the end, not for ever
    return false;
  }
  if (_isPageOld.exchange(false) && !refreshFinalizedTexts(*_document)) _isPageOld = true;
  return true;
}

}  // namespace quilt::scripting
