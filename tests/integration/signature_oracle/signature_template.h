// SPDX-License-Identifier: Apache-2.0
/// @file
/// Signature templates for generated documents, and changes to a signed document.

#pragma once

#include "generated_document.h"

#include <string>
#include <string_view>

namespace Testing {

/// The document with a signature template as the last child of its document element: any canonicalisation, one to three
/// references to the document, its document element or another element, with every transform and digest of the profile.
std::string AddSignatureTemplate(const GeneratedDocument &document, std::string_view signatureUri,
                                 RandomSource &random);

/// A signed document after a small change that may or may not matter: to content, to the signature, or around it. The
/// result need not be well-formed.
std::string ChangeSomething(std::string text, RandomSource &random);

} // namespace Testing
