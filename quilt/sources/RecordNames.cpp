// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/RecordNames.h"

#include "quilt/documents/QuiltDocument.h"
#include "quilt/media/QuiltMedia.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/QuiltMediaSource.h"

namespace quilt {

using platform::FDYLogger;

bool isAcceptedName(const std::string& name, const char* kind) {
  if (platform::isPlainComponent(name)) return true;
  FDYLogger::logWarning("Refused the record of a %@: \"%@\" is no plain file name", kind, name);
  return false;
}

bool hasAcceptedIdentity(const Dictionary& record, const char* kind) {
  const platform::PropertyList* value = record.find("UUID");
  const auto* uuid = value ? value->as<std::string>() : nullptr;
  return !uuid || isAcceptedName(*uuid, kind);
}

bool isIdentity(const std::string& uuid) { return platform::isPlainComponent(uuid) && !uuid.starts_with('.'); }

bool isAcceptedIdentity(const std::string& uuid, const char* kind) {
  if (isIdentity(uuid)) return true;
  FDYLogger::logWarning("Refused the identity \"%@\" for a %@: it is no plain file name", uuid, kind);
  return false;
}

bool isInsidePackage(const Path& path, const std::shared_ptr<QuiltDocument>& document, const char* kind) {
  if (!document || document->path().empty()) return true;
  if (platform::services().files->isConfined(path, document->path())) return true;
  FDYLogger::logWarning("Refused the file of a %@: \"%@\" leads out of the document", kind, path);
  return false;
}

std::shared_ptr<QuiltDocument> documentOf(const std::shared_ptr<QuiltMediaSource>& source) {
  const auto media = source ? source->mediaOwner() : nullptr;
  return media ? media->documentOwner() : nullptr;
}

}  // namespace quilt
