// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/glance/OpenDocuments.h"

#include <algorithm>
#include <utility>

#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::platform {

namespace {

bool isLasting(const Error& error) { return error.kind == ErrorKind::Damaged || error.kind == ErrorKind::Unsupported; }

}  // namespace

// Moves it to the front. Only while the mutex is held.
OpenDocuments::Entry& OpenDocuments::entry(const FileIdentity& identity) {
  const auto found = std::ranges::find(_entries, identity, &Entry::identity);
  if (found != _entries.end()) {
    _entries.splice(_entries.begin(), _entries, found);
  } else {
    _entries.push_front({identity, nullptr, std::nullopt, std::nullopt, false});
    if (_entries.size() > kRemembered) _entries.pop_back();
  }
  return _entries.front();
}

void OpenDocuments::closeOthers() {
  std::size_t open = 0;
  for (Entry& entry : _entries) {
    if (entry.document && ++open > kKeptOpen) entry.document = nullptr;
  }
}

Result<OpenDocuments::Found> OpenDocuments::open(const std::filesystem::path& path, const ContinueBlock& goesOn) {
  const Result<FileAttributes> attributes = services().files->attributesOfItemAtPath(path);
  if (!attributes) return attributes.error();
  const FileIdentity identity = attributes->identity;
  {
    const std::lock_guard lock(_mutex);
    const Entry& known = entry(identity);
    if (known.document) return Found{identity, known.document};
    if (known.failure) return Error{known.failure->kind, known.failure->text, path};
  }
  // Unlocked: it may take long, and two threads that open one document at once do no harm.
  Result<std::shared_ptr<PagedDocument>> opened = services().documents->openDocument(path, goesOn);
  if (!opened && opened.error().kind == ErrorKind::Cancelled) return opened.error();
  if (!opened) warn(path, identity, opened.error());
  const std::lock_guard lock(_mutex);
  Entry& known = entry(identity);
  if (!opened) {
    if (isLasting(opened.error())) known.failure = opened.error();
    return opened.error();
  }
  known.document = *std::move(opened);
  Found found{identity, known.document};
  closeOthers();
  return found;
}

Result<std::shared_ptr<PagedDocument>> OpenDocuments::reopen(const std::filesystem::path& path,
                                                             const FileIdentity& identity) {
  const Result<FileAttributes> attributes = services().files->attributesOfItemAtPath(path);
  if (!attributes) {
    const std::lock_guard lock(_mutex);
    const auto found = std::ranges::find(_entries, identity, &Entry::identity);
    if (found != _entries.end() && found->document) return found->document;
    return attributes.error();
  }
  if (attributes->identity != identity) {
    return Error{ErrorKind::NotFound, "The document was changed after its page was asked for.", path};
  }
  Result<Found> found = open(path);
  if (!found) return found.error();
  return std::move(found->document);
}

Result<std::size_t> OpenDocuments::pageCount(const std::filesystem::path& path) {
  const Result<FileAttributes> attributes = services().files->attributesOfItemAtPath(path);
  if (!attributes) return attributes.error();
  {
    const std::lock_guard lock(_mutex);
    const Entry& known = entry(attributes->identity);
    if (known.count) return *known.count;
    if (known.failure) return Error{known.failure->kind, known.failure->text, path};
  }
  const Result<Found> found = open(path);
  if (!found) return found.error();
  const Result<std::size_t> count = found->document->pageCount();
  if (!count) warn(path, found->identity, count.error());
  const std::lock_guard lock(_mutex);
  Entry& known = entry(found->identity);
  if (count) {
    known.count = *count;
  } else if (isLasting(count.error())) {
    known.failure = count.error();
    known.document = nullptr;
  }
  return count;
}

void OpenDocuments::warn(const std::filesystem::path& path, const FileIdentity& identity, const Error& error) {
  {
    const std::lock_guard lock(_mutex);
    if (std::exchange(entry(identity).isWarned, true)) return;
  }
  FDYLogger::logWarning("Pages of document at path \"%@\" cannot be shown: \"%@\"", path, error);
}

}  // namespace quilt::platform
