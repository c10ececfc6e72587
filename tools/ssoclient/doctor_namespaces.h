// SPDX-License-Identifier: Apache-2.0
/// @file
/// The namespaces by which an answer is recognised, and the request that is sent.

#pragma once

#include <string_view>

#define SSOCLIENT_TOOL_TRUST "http://docs.oasis-open.org/ws-sx/ws-trust/200512"
#define SSOCLIENT_TOOL_SOAP_11 "http://schemas.xmlsoap.org/soap/envelope/"

namespace SsoClient::Tool::SoapNamespaces {

constexpr std::string_view SOAP_11 = SSOCLIENT_TOOL_SOAP_11;
constexpr std::string_view SOAP_12 = "http://www.w3.org/2003/05/soap-envelope";
constexpr std::string_view WSSE = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";
constexpr std::string_view WSSE_11 = "http://docs.oasis-open.org/wss/oasis-wss-wssecurity-secext-1.1.xsd";
constexpr std::string_view TRUST = SSOCLIENT_TOOL_TRUST;

} // namespace SsoClient::Tool::SoapNamespaces

namespace SsoClient::Tool {

constexpr const char *PROBE_ACTION = "\"" SSOCLIENT_TOOL_TRUST "/RST/Validate\"";

/// A request that no service acts upon: to validate a token, without a token, a credential or a security header.
constexpr std::string_view PROBE_MESSAGE =
    "<?xml version=\"1.0\" encoding=\"UTF-8\"?>"
    "<soapenv:Envelope xmlns:soapenv=\"" SSOCLIENT_TOOL_SOAP_11 "\"><soapenv:Header></soapenv:Header><soapenv:Body>"
    "<wst:RequestSecurityToken xmlns:wst=\"" SSOCLIENT_TOOL_TRUST "\">"
    "<wst:TokenType>" SSOCLIENT_TOOL_TRUST "/RSTR/Status</wst:TokenType>"
    "<wst:RequestType>" SSOCLIENT_TOOL_TRUST "/Validate</wst:RequestType>"
    "</wst:RequestSecurityToken></soapenv:Body></soapenv:Envelope>";

} // namespace SsoClient::Tool

#undef SSOCLIENT_TOOL_TRUST
#undef SSOCLIENT_TOOL_SOAP_11
