// SPDX-License-Identifier: Apache-2.0
/// @file
/// `SoapFault`, the texts of a SOAP 1.1 fault, for the observer of an operation.

#pragma once

#include <tarvel/xml/node.h>

#include <string>
#include <string_view>

namespace SsoClient {

/// The texts are as the service wrote them, at full length, and may contain secrets that the service repeats. The views
/// are valid as long as the fault's tree.
struct SoapFault {
  std::string_view code;          ///< as written; empty if there is none
  std::string_view codeNamespace; ///< of the code; empty if its prefix is not bound
  std::string_view text;          ///< the `faultstring`
  std::string detail;             ///< the texts in the `detail` element that may be shown, with blanks between them
};

/// Reads the children of the `Fault` element. The text of a missing child is empty. The time is linear in the length of
/// the fault.
SoapFault ReadSoapFault(const Tarvel::Xml::ElementNode &fault);

/// Whether the content of an element with this local name is never shown: a token, a signature, a key or a password.
bool IsSecretElement(std::string_view localName) noexcept;

} // namespace SsoClient
