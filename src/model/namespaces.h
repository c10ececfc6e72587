// SPDX-License-Identifier: Apache-2.0
/// @file
/// The namespaces that tokens and messages use, each in one place.

#pragma once

#include <string_view>

namespace SsoClient::Namespaces {

constexpr std::string_view SOAPENV = "http://schemas.xmlsoap.org/soap/envelope/";
constexpr std::string_view WSSE = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";
constexpr std::string_view WSSE11 = "http://docs.oasis-open.org/wss/oasis-wss-wssecurity-secext-1.1.xsd";
constexpr std::string_view WSU = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";
// The published WS-Trust 1.3 namespace ends without a slash; the key types and actions below it bring their own.
constexpr std::string_view WST = "http://docs.oasis-open.org/ws-sx/ws-trust/200512";
constexpr std::string_view WSA = "http://www.w3.org/2005/08/addressing";
constexpr std::string_view SAML = "urn:oasis:names:tc:SAML:2.0:assertion";
constexpr std::string_view DS = "http://www.w3.org/2000/09/xmldsig#";
constexpr std::string_view XS = "http://www.w3.org/2001/XMLSchema";
constexpr std::string_view XSI = "http://www.w3.org/2001/XMLSchema-instance";
constexpr std::string_view DELEGATION = "urn:oasis:names:tc:SAML:2.0:conditions:delegation";
// The authority is the service's choice, made when the library is built.
constexpr std::string_view RSA_ADVICE = SSOCLIENT_EXTENSION_AUTHORITY "/names/2009/12/std-ext/WS-Trust1.4/advice";
constexpr std::string_view RSA_SAML2 = SSOCLIENT_EXTENSION_AUTHORITY "/names/2009/12/std-ext/SAML2.0";

} // namespace SsoClient::Namespaces
