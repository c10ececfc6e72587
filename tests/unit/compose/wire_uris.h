// SPDX-License-Identifier: Apache-2.0
/// @file
/// The URIs in messages, written again here: a test that used those of the code would not notice a change.

#pragma once

#include <string>

namespace Testing {

const std::string SOAPENV_URI = "http://schemas.xmlsoap.org/soap/envelope/";
const std::string WSSE_URI = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";
const std::string WSSE11_URI = "http://docs.oasis-open.org/wss/oasis-wss-wssecurity-secext-1.1.xsd";
const std::string WSU_URI = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";
const std::string WST_URI = "http://docs.oasis-open.org/ws-sx/ws-trust/200512";
const std::string WSA_URI = "http://www.w3.org/2005/08/addressing";
const std::string SAML_URI = "urn:oasis:names:tc:SAML:2.0:assertion";
const std::string DS_URI = "http://www.w3.org/2000/09/xmldsig#";
const std::string XS_URI = "http://www.w3.org/2001/XMLSchema";
const std::string XSI_URI = "http://www.w3.org/2001/XMLSchema-instance";
const std::string RSA_ADVICE_URI = SSOCLIENT_EXTENSION_AUTHORITY "/names/2009/12/std-ext/WS-Trust1.4/advice";

/// A namespace declaration as it is written in a start tag, with a blank before it.
inline std::string Declare(const std::string &prefix, const std::string &uri) {
  return " xmlns:" + prefix + "=\"" + uri + "\"";
}

} // namespace Testing
