// SPDX-License-Identifier: Apache-2.0
/// @file
/// The namespaces and identifiers that messages and tokens use.

#pragma once

namespace DevSts {

/// A namespace, with the prefix that the service uses for it.
struct Namespace {
  const char *prefix;
  const char *uri;
};

namespace Ns {
constexpr Namespace SOAPENV{"soapenv", "http://schemas.xmlsoap.org/soap/envelope/"};
constexpr Namespace SOAP12{"env", "http://www.w3.org/2003/05/soap-envelope"};
constexpr Namespace WSSE{"wsse", "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd"};
constexpr Namespace WSSE11{"wsse11", "http://docs.oasis-open.org/wss/oasis-wss-wssecurity-secext-1.1.xsd"};
constexpr Namespace WSU{"wsu", "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd"};
constexpr Namespace WST{"wst", "http://docs.oasis-open.org/ws-sx/ws-trust/200512"};
constexpr Namespace WST14{"wst14", "http://docs.oasis-open.org/ws-sx/ws-trust/200802"};
constexpr Namespace WSA{"wsa", "http://www.w3.org/2005/08/addressing"};
constexpr Namespace SAML{"saml", "urn:oasis:names:tc:SAML:2.0:assertion"};
constexpr Namespace DS{"ds", "http://www.w3.org/2000/09/xmldsig#"};
constexpr Namespace XSI{"xsi", "http://www.w3.org/2001/XMLSchema-instance"};
constexpr Namespace DELEGATION{"del", "urn:oasis:names:tc:SAML:2.0:conditions:delegation"};
constexpr Namespace ADVICE{"rsa-advice", SSOCLIENT_EXTENSION_AUTHORITY "/names/2009/12/std-ext/WS-Trust1.4/advice"};
constexpr Namespace EXTENSION{"rsa", SSOCLIENT_EXTENSION_AUTHORITY "/names/2009/12/std-ext/SAML2.0"};
constexpr Namespace ECHO{"echo", "https://localhost/echo"};
} // namespace Ns

constexpr const char *EXCLUSIVE_C14N = "http://www.w3.org/2001/10/xml-exc-c14n#";
constexpr const char *ENVELOPED_SIGNATURE = "http://www.w3.org/2000/09/xmldsig#enveloped-signature";
constexpr const char *RSA_SHA256 = "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256";
constexpr const char *SHA256 = "http://www.w3.org/2001/04/xmlenc#sha256";

constexpr const char *SAML_TOKEN_TYPE = "urn:oasis:names:tc:SAML:2.0:assertion";
constexpr const char *SAML_PROFILE_TOKEN_TYPE =
    "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLV2.0";
/// The spelling of the same type that other services use in references to a token.
constexpr const char *ESTABLISHED_TOKEN_TYPE =
    "http://docs.oasis-open.org/wss/oasis-wss-saml-tokenprofile-1.1#SAMLV2.0";
constexpr const char *BEARER_METHOD = "urn:oasis:names:tc:SAML:2.0:cm:bearer";
constexpr const char *HOLDER_OF_KEY_METHOD = "urn:oasis:names:tc:SAML:2.0:cm:holder-of-key";
constexpr const char *PASSWORD_CONTEXT = "urn:oasis:names:tc:SAML:2.0:ac:classes:PasswordProtectedTransport";
constexpr const char *CERTIFICATE_CONTEXT = "urn:oasis:names:tc:SAML:2.0:ac:classes:X509";
constexpr const char *KERBEROS_CONTEXT = "urn:oasis:names:tc:SAML:2.0:ac:classes:Kerberos";
constexpr const char *UNSPECIFIED_CONTEXT = "urn:oasis:names:tc:SAML:2.0:ac:classes:unspecified";
constexpr const char *ENTITY_FORMAT = "urn:oasis:names:tc:SAML:2.0:nameid-format:entity";
constexpr const char *UPN_FORMAT = "http://schemas.xmlsoap.org/claims/UPN";

constexpr const char *GROUP_ATTRIBUTE = SSOCLIENT_EXTENSION_AUTHORITY "/schemas/attr-names/2009/01/GroupIdentity";
constexpr const char *SOLUTION_ATTRIBUTE = SSOCLIENT_SOLUTION_AUTHORITY "/schemas/attr-names/2011/07/isSolution";
constexpr const char *FIRST_NAME_ATTRIBUTE = "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/givenname";
constexpr const char *LAST_NAME_ATTRIBUTE = "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/surname";

constexpr const char *BASE64_ENCODING =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-soap-message-security-1.0#Base64Binary";
constexpr const char *SPNEGO_VALUE_TYPE = "http://schemas.xmlsoap.org/ws/2005/02/trust/spnego";
constexpr const char *X509_VALUE_TYPE =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-x509-token-profile-1.0#X509v3";
constexpr const char *SAML_ID_VALUE_TYPE = "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLID";
constexpr const char *ULTIMATE_RECEIVER = "http://www.w3.org/2003/05/soap-envelope/role/ultimateReceiver";
constexpr const char *PASSWORD_TEXT_TYPE =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-username-token-profile-1.0#PasswordText";

} // namespace DevSts
