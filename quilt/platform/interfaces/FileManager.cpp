// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/interfaces/FileManager.h"

namespace quilt::platform {

FileIdentity FileManager::stateOfFileAtPath(const std::filesystem::path& path) const {
  const auto attributes = attributesOfItemAtPath(path);
  return attributes && attributes->kind == FileKind::File ? attributes->identity : FileIdentity{};
}

Result<FileIdentity> FileManager::replaceAtomically(const std::filesystem::path& path, std::string_view bytes,
                                                    const FileIdentity& replaced) {
  if (stateOfFileAtPath(path) != replaced) return changedMeanwhile(path);
  if (Result<void> written = writeAtomically(path, bytes); !written) return written.error();
  return stateOfFileAtPath(path);
}

Error changedMeanwhile(const std::filesystem::path& path) {
  return {ErrorKind::Changed, "Another program has written it meanwhile", path};
}

}  // namespace quilt::platform
