// SPDX-License-Identifier: Apache-2.0
/// @file
/// The xmlsec1 library, to sign with and to compare verdicts with.

#pragma once

#include "libxml2_oracle.h"

#include <xmlsec/keys.h>

#include <memory>
#include <string>

namespace Testing {

struct XmlSecKeyDeleter {
  void operator()(xmlSecKey *key) const noexcept { xmlSecKeyDestroy(key); }
};
using XmlSecKeyHandle = std::unique_ptr<xmlSecKey, XmlSecKeyDeleter>;

/// The private key in a PEM file.
XmlSecKeyHandle LoadXmlSecKey(const std::string &path);

/// Fills digests and signature value into the first `Signature` element of the document. @return whether that
/// succeeded.
bool SignWithXmlSec(xmlDoc &document, const xmlSecKey &key);

/// Whether the first `Signature` element of the document verifies. False after an error, too.
bool VerifiesWithXmlSec(xmlDoc &document, const xmlSecKey &key);

/// The document as UTF-8 text.
std::string Serialise(xmlDoc &document);

} // namespace Testing
