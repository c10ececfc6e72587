// SPDX-License-Identifier: Apache-2.0
/// @file
/// The exceptions of XML signatures.

#pragma once

#include <tarvel/core/exception.h>

namespace Tarvel::Xml::Security {

/// An algorithm outside the profile, a reference that does not resolve to exactly one node, no usable key, a tree without a
/// canonical form, or a failure while signing.
class TARVEL_API XmlSecurityException : public Exception {
  TARVEL_EXCEPTION_BODY(XmlSecurityException, Exception);
};

/// A signature element that does not follow the syntax of XML Signature.
class TARVEL_API SignatureSyntaxException : public XmlSecurityException {
  TARVEL_EXCEPTION_BODY(SignatureSyntaxException, XmlSecurityException);
};

} // namespace Tarvel::Xml::Security
