// SPDX-License-Identifier: Apache-2.0
/// @file
/// A signed assertion of the profile SAML2 that states everything that `TokenDetails` has.

#pragma once

#include "unit/token/assertion_text.h"
#include "unit/token/signed_assertion.h"

#include <ssoclient/verify_options.h>

#include <cstddef>
#include <string>

namespace Testing {

namespace Rich {

constexpr const char *START =
    R"(<saml:Assertion xmlns:saml="urn:oasis:names:tc:SAML:2.0:assertion" xmlns:ds="http://www.w3.org/2000/09/xmldsig#")"
    R"( xmlns:xsi="http://www.w3.org/2001/XMLSchema-instance" xmlns:xs="http://www.w3.org/2001/XMLSchema")"
    R"( xmlns:q="urn:q" xmlns:unused="urn:unused" Version="2.0" ID="_rich" IssueInstant="2026-01-01T00:00:00Z")"
    R"( xsi:type="saml:AssertionType"><saml:Issuer NameQualifier="urn:realm">https://idp.example/</saml:Issuer>)";

constexpr const char *NAME =
    R"(<saml:NameID Format="urn:oasis:names:tc:SAML:2.0:nameid-format:persistent" NameQualifier="https://idp.example/")"
    R"( SPNameQualifier="https://sp.example/" SPProvidedID="a-17">AbC &amp; d</saml:NameID>)";

constexpr const char *BEARER =
    R"(<saml:SubjectConfirmation Method="urn:oasis:names:tc:SAML:2.0:cm:bearer"><saml:SubjectConfirmationData)"
    R"( NotBefore="2026-01-02T00:00:00Z" NotOnOrAfter="2026-01-03T00:00:00Z" Recipient="https://sp.example/acs")"
    R"( InResponseTo="_request" Address="192.0.2.7"/></saml:SubjectConfirmation>)";

constexpr const char *EXPIRED_BEARER =
    R"(<saml:SubjectConfirmation Method="urn:oasis:names:tc:SAML:2.0:cm:bearer"><saml:SubjectConfirmationData)"
    R"( NotOnOrAfter="2026-01-01T12:00:00Z"/></saml:SubjectConfirmation>)";

constexpr const char *VOUCHED =
    R"(<saml:SubjectConfirmation Method="urn:oasis:names:tc:SAML:2.0:cm:sender-vouches"><saml:NameID>gateway)"
    R"(</saml:NameID></saml:SubjectConfirmation>)";

constexpr const char *CONDITIONS =
    R"(<saml:Conditions NotBefore="2026-01-01T00:00:00Z" NotOnOrAfter="2026-02-01T00:00:00Z"><saml:AudienceRestriction>)"
    R"(<saml:Audience>urn:a</saml:Audience><saml:Audience>urn:b</saml:Audience></saml:AudienceRestriction>)"
    R"(<saml:AudienceRestriction><saml:Audience>urn:b</saml:Audience></saml:AudienceRestriction><saml:OneTimeUse/>)"
    R"(<saml:ProxyRestriction Count="2"><saml:Audience>urn:proxy</saml:Audience></saml:ProxyRestriction>)"
    R"(</saml:Conditions>)";

constexpr const char *STATEMENT =
    R"(<saml:AuthnStatement AuthnInstant="2026-01-02T01:00:00Z" SessionIndex="s-1")"
    R"( SessionNotOnOrAfter="2026-01-02T20:00:00Z"><saml:SubjectLocality Address="192.0.2.8" DNSName="pc.example"/>)"
    R"(<saml:AuthnContext><saml:AuthnContextClassRef>urn:class</saml:AuthnContextClassRef><saml:AuthnContextDeclRef>)"
    R"(urn:declaration</saml:AuthnContextDeclRef><saml:AuthenticatingAuthority>urn:first)"
    R"(</saml:AuthenticatingAuthority><saml:AuthenticatingAuthority>urn:second</saml:AuthenticatingAuthority>)"
    R"(</saml:AuthnContext></saml:AuthnStatement>)";

constexpr const char *ATTRIBUTES =
    R"(<saml:AttributeStatement><saml:Attribute Name="mail" NameFormat="urn:format" FriendlyName="Mail">)"
    R"(<saml:AttributeValue xsi:type="xs:string">a&#xE9;<![CDATA[<b>]]> </saml:AttributeValue><saml:AttributeValue/>)"
    R"(<saml:AttributeValue>  </saml:AttributeValue><saml:AttributeValue xsi:nil="true"/></saml:Attribute>)"
    R"(<saml:Attribute Name="none"/></saml:AttributeStatement><saml:AttributeStatement><saml:Attribute Name="tree">)"
    R"(<saml:AttributeValue><!-- c --><q:v  b="2" a='1'>x<w xmlns="urn:w"/></q:v></saml:AttributeValue>)"
    R"(</saml:Attribute></saml:AttributeStatement>)";

} // namespace Rich

inline std::string RichConfirmations() {
  return Rich::VOUCHED + std::string(Rich::EXPIRED_BEARER) +
         Piece::Confirmation("holder-of-key", Piece::HolderOfKeyData()) + Rich::BEARER;
}

/// The assertion, in which the text `from` is replaced by `to` before it is signed.
inline std::string RichToken(const std::string &from = "Version=\"2.0\"", const std::string &to = "Version=\"2.0\"") {
  return SignAgain(ReplaceOnce(Rich::START + std::string(Piece::SIGNATURE) +
                                   Piece::Subject(Rich::NAME, RichConfirmations()) + Rich::CONDITIONS +
                                   Rich::STATEMENT + Rich::ATTRIBUTES + Piece::END,
                               from, to));
}

/// The assertion with `count` values that use a namespace whose name is 4000 bytes long. It is not signed.
inline std::string WithLongNamespace(std::size_t count) {
  std::string values;
  for (std::size_t index = 0; index < count; ++index) {
    values += "<saml:AttributeValue><q:v/></saml:AttributeValue>";
  }
  const std::string token = RichToken(Rich::ATTRIBUTES, "<saml:AttributeStatement><saml:Attribute Name=\"n\">" +
                                                            values + "</saml:Attribute></saml:AttributeStatement>");
  return ReplaceOnce(token, "xmlns:q=\"urn:q\"", "xmlns:q=\"urn:" + std::string(4000, 'q') + "\"");
}

inline SsoClient::VerifyOptions Saml2Options() {
  SsoClient::VerifyOptions options;
  options.profile = SsoClient::TokenProfile::SAML2;
  return options;
}

} // namespace Testing
