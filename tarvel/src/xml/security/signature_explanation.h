// SPDX-License-Identifier: Apache-2.0
/// @file
/// The report on a signature that was read from a tree.

#pragma once

#include "xml/security/signature_rules.h"

#include <tarvel/xml/security/key_info_resolver.h>
#include <tarvel/xml/security/signature_report.h>

namespace Tarvel::Xml::Security {

/// Implements `Signature::Explain` for `signature`.
SignatureReport ExplainSignature(const SignatureInTree &signature, const KeyInfoResolver &resolver);

} // namespace Tarvel::Xml::Security
