// SPDX-License-Identifier: Apache-2.0
/// @file
/// The elements that a signature covers.

#pragma once

#include <ssoclient/proof/message_verifier.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/security/signature.h>

#include <vector>

namespace SsoClient {

/// The targets of `signature` as elements of `document`, in document order and each of them once. A target that is the
/// whole document is its document element.
std::vector<VerifiedMessage::CoveredElement>
ListCoveredElements(const std::vector<Tarvel::Xml::Security::Signature::Coverage::Target> &targets,
                    const Tarvel::Xml::ElementNode &signature, const Tarvel::Xml::Document &document);

/// Whether `element` is one of the covered elements or inside one of them, and not in the signature that the covered
/// element omits.
bool IsCoveredBy(const std::vector<VerifiedMessage::CoveredElement> &covered,
                 const Tarvel::Xml::ElementNode &element) noexcept;

} // namespace SsoClient
