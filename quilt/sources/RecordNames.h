// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <string>

#include "quilt/sources/ModelTypes.h"

namespace quilt {

class QuiltDocument;
class QuiltMediaSource;

/// Records come from strangers. These tests keep what a record names inside the package that holds it; a refusal logs
/// one warning. `kind` names the record in that warning: "source derivative".

/// Whether a "UUID" or "Filename" may become a component of a path.
bool isAcceptedName(const std::string& name, const char* kind);

/// The same of the record's "UUID", when it has one that is a text.
bool hasAcceptedIdentity(const Dictionary& record, const char* kind);

/// @{
/// Whether a host may give an object this identity: one that may become a component of a path, and is not hidden,
/// because no loader looks at hidden names. The second logs a warning when not.
bool isIdentity(const std::string& uuid);
bool isAcceptedIdentity(const std::string& uuid, const char* kind);
/// @}

/// Whether a path of the package reaches its file without leaving the package through a symbolic link. True without a
/// document.
bool isInsidePackage(const Path& path, const std::shared_ptr<QuiltDocument>& document, const char* kind);

/// The document that a source belongs to, through its item; null while detached.
std::shared_ptr<QuiltDocument> documentOf(const std::shared_ptr<QuiltMediaSource>& source);

}  // namespace quilt
