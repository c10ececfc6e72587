// SPDX-License-Identifier: Apache-2.0
/// @file
/// The URIs and identifiers in outgoing messages, except namespaces and what is in the WS-Trust namespace.

#pragma once

#include <string_view>

namespace SsoClient::WireNames {

/// WS-Security 1.0 SOAP Message Security: the encoding of binary security tokens and binary exchanges.
constexpr std::string_view BASE64_BINARY =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-soap-message-security-1.0#Base64Binary";
/// X.509 Token Profile 1.0: a single certificate.
constexpr std::string_view X509V3 =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-x509-token-profile-1.0#X509v3";
/// Username Token Profile 1.0: a password in clear text.
constexpr std::string_view PASSWORD_TEXT =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-username-token-profile-1.0#PasswordText";
// Services expect exactly these two spellings: "tokenprofile" in SAML_TOKEN_TYPE, "token-profile" in SAML_ID. The
// published token type is for services that enforce the Basic Security Profile.
constexpr std::string_view SAML_TOKEN_TYPE = "http://docs.oasis-open.org/wss/oasis-wss-saml-tokenprofile-1.1#SAMLV2.0";
constexpr std::string_view SAML_TOKEN_TYPE_AS_PUBLISHED =
    "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLV2.0";
constexpr std::string_view SAML_ID = "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLID";
/// The SPNEGO binary exchange uses the value type of WS-Trust of February 2005 on purpose.
constexpr std::string_view SPNEGO = "http://schemas.xmlsoap.org/ws/2005/02/trust/spnego";

/// WS-Addressing 1.0: the reply is the HTTP response.
constexpr std::string_view ANONYMOUS = "http://www.w3.org/2005/08/addressing/anonymous";

/// The identifier of the binary security token that contains the client's certificate.
constexpr std::string_view HOLDER_OF_KEY_CERTIFICATE_ID = "holderOfKeyCertificate";
/// The identifier of the message signature, to which `wst:UseKey` refers.
constexpr std::string_view HOLDER_OF_KEY_SIGNATURE_ID = "holderOfKeyProofSignature";

} // namespace SsoClient::WireNames
