// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/interfaces/PropertyLists.h"

#include "quilt/platform/interfaces/Services.h"

namespace quilt::platform {

Result<FileIdentity> PropertyLists::replaceDictionary(const Dictionary& dictionary, const std::filesystem::path& path,
                                                      const FileIdentity& replaced) {
  const FileManager& files = *services().files;
  if (files.stateOfFileAtPath(path) != replaced) return changedMeanwhile(path);
  if (Result<void> written = writeDictionary(dictionary, path); !written) return written.error();
  return files.stateOfFileAtPath(path);
}

}  // namespace quilt::platform
