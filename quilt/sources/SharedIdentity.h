// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>

#include "quilt/sources/ModelTypes.h"

namespace quilt {

class QuiltMedia;
class QuiltMediaDerivative;
class QuiltMediaSource;

/// Two objects of a document can name the same file: a record holds one identity twice, a reload adds an item that is
/// there already, and a picture so small that it suits every grade serves each of them. These tests tell whether what
/// an object names would be missed by another one. They take the locks of the document's lists down the tree, so the
/// caller holds none of them but, for an item, the document's.

/// Whether another item of the same document has the item's folder.
bool sharesFolder(const QuiltMedia& item);
/// Whether another source, extra or commentary of the same document has the source's folder.
bool sharesFolder(const QuiltMediaSource& source);
/// Whether another derivative of the same document has the derivative's file.
bool sharesFile(const QuiltMediaDerivative& derivative);

}  // namespace quilt
