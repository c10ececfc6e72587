// SPDX-License-Identifier: Apache-2.0
/// @file
/// The namespaces that tokens and messages use, and the URIs below the WS-Trust namespace, each in one place.

#pragma once

#include <string_view>

// The published WS-Trust 1.3 namespace ends without a slash, so the paths below it begin with one.
#define SSOCLIENT_WS_TRUST "http://docs.oasis-open.org/ws-sx/ws-trust/200512"

namespace SsoClient::Namespaces {

constexpr std::string_view SOAPENV = "http://schemas.xmlsoap.org/soap/envelope/";
constexpr std::string_view SOAP12 = "http://www.w3.org/2003/05/soap-envelope";
constexpr std::string_view WSSE = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";
constexpr std::string_view WSSE11 = "http://docs.oasis-open.org/wss/oasis-wss-wssecurity-secext-1.1.xsd";
constexpr std::string_view WSU = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";
constexpr std::string_view WST = SSOCLIENT_WS_TRUST;
constexpr std::string_view WST14 = "http://docs.oasis-open.org/ws-sx/ws-trust/200802";
constexpr std::string_view WSP = "http://schemas.xmlsoap.org/ws/2004/09/policy";
constexpr std::string_view WSS4J = "http://ws.apache.org/wss4j";
constexpr std::string_view WSA = "http://www.w3.org/2005/08/addressing";
constexpr std::string_view SAML = "urn:oasis:names:tc:SAML:2.0:assertion";
constexpr std::string_view DS = "http://www.w3.org/2000/09/xmldsig#";
constexpr std::string_view DSIG11 = "http://www.w3.org/2009/xmldsig11#";
constexpr std::string_view XS = "http://www.w3.org/2001/XMLSchema";
constexpr std::string_view XSI = "http://www.w3.org/2001/XMLSchema-instance";
constexpr std::string_view DELEGATION = "urn:oasis:names:tc:SAML:2.0:conditions:delegation";
// The beginning of these two depends on the services that are used, and is set when the library is built.
constexpr std::string_view RSA_ADVICE = SSOCLIENT_EXTENSION_AUTHORITY "/names/2009/12/std-ext/WS-Trust1.4/advice";
constexpr std::string_view RSA_SAML2 = SSOCLIENT_EXTENSION_AUTHORITY "/names/2009/12/std-ext/SAML2.0";

} // namespace SsoClient::Namespaces

namespace SsoClient::WstUris {

constexpr char ISSUE[] = SSOCLIENT_WS_TRUST "/Issue";
constexpr char RENEW[] = SSOCLIENT_WS_TRUST "/Renew";
constexpr char VALIDATE[] = SSOCLIENT_WS_TRUST "/Validate";

constexpr char ISSUE_ACTION[] = SSOCLIENT_WS_TRUST "/RST/Issue";
constexpr char RENEW_ACTION[] = SSOCLIENT_WS_TRUST "/RST/Renew";
constexpr char VALIDATE_ACTION[] = SSOCLIENT_WS_TRUST "/RST/Validate";
constexpr char CHALLENGE_ACTION[] = SSOCLIENT_WS_TRUST "/RSTR/Issue";

constexpr char KEY_TYPE_BEARER[] = SSOCLIENT_WS_TRUST "/Bearer";
constexpr char KEY_TYPE_PUBLIC_KEY[] = SSOCLIENT_WS_TRUST "/PublicKey";
constexpr char TOKEN_TYPE_STATUS[] = SSOCLIENT_WS_TRUST "/RSTR/Status";

constexpr char STATUS_VALID[] = SSOCLIENT_WS_TRUST "/status/valid";
constexpr char STATUS_INVALID[] = SSOCLIENT_WS_TRUST "/status/invalid";

} // namespace SsoClient::WstUris

#undef SSOCLIENT_WS_TRUST
