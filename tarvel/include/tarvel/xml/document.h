// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Document`, a parsed XML document.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/xml/node.h>

namespace Tarvel::Xml {

/// A whole document; it keeps its tree alive.
class TARVEL_API Document : public Object {
public:
  /// The node above all others; never null.
  virtual const DocumentNode *GetDocumentNode() const noexcept = 0;

  /// The document element, or null after it has been moved to another tree.
  virtual const ElementNode *GetDocumentElement() const noexcept = 0;
  virtual ElementNode *GetDocumentElement() noexcept = 0;

protected:
  ~Document() override;
};

} // namespace Tarvel::Xml
