// SPDX-License-Identifier: Apache-2.0
/// @file
/// What can go wrong with an XML signature.

#pragma once

#include <tarvel/core/exception.h>

namespace Tarvel::Xml::Security {

/// An algorithm outside the profile, a reference that does not resolve to exactly one node, no usable key, a tree without
/// canonical form, or a failure while signing.
class TARVEL_API XmlSecurityException : public Exception {
  TARVEL_EXCEPTION_BODY(XmlSecurityException, Exception);
};

/// A signature element that is not of the form that XML Signature gives it.
class TARVEL_API SignatureSyntaxException : public XmlSecurityException {
  TARVEL_EXCEPTION_BODY(SignatureSyntaxException, XmlSecurityException);
};

} // namespace Tarvel::Xml::Security
