// SPDX-License-Identifier: Apache-2.0
/// @file
/// Assertions as text, in pieces that a test can leave out, repeat or change. Their signatures are well-formed, but do
/// not sign anything.

#pragma once

#include "support/data_file.h"

#include <stdexcept>
#include <string>
#include <vector>

namespace Testing {

/// `text` with `from` replaced by `to`. @throws std::logic_error unless `from` occurs exactly once.
inline std::string ReplaceOnce(const std::string &text, const std::string &from, const std::string &to) {
  const std::size_t position = text.find(from);
  if (position == std::string::npos || text.find(from, position + 1) != std::string::npos) {
    throw std::logic_error("the text must be there exactly once: " + from);
  }
  return std::string(text).replace(position, from.size(), to);
}

/// The Base64 text of tests/data/tokens/holder.crt.
inline std::string HolderCertificateBase64() {
  std::string base64 = ReadDataFile("tokens/holder.crt");
  base64 = ReplaceOnce(base64, "-----BEGIN CERTIFICATE-----", "");
  return ReplaceOnce(base64, "-----END CERTIFICATE-----", "");
}

namespace Piece {

constexpr const char *START = R"(<saml:Assertion xmlns:saml="urn:oasis:names:tc:SAML:2.0:assertion")"
                              R"( xmlns:ds="http://www.w3.org/2000/09/xmldsig#")"
                              R"( xmlns:xsi="http://www.w3.org/2001/XMLSchema-instance")"
                              R"( xmlns:del="urn:oasis:names:tc:SAML:2.0:conditions:delegation")"
                              R"( xmlns:rsa="http://www.rsa.com/names/2009/12/std-ext/SAML2.0")"
                              R"( Version="2.0" ID="_a1" IssueInstant="2026-01-01T00:00:00Z">)";

constexpr const char *ISSUER = R"(<saml:Issuer Format="urn:format:issuer">the issuer</saml:Issuer>)";

constexpr const char *SIGNATURE =
    R"(<ds:Signature><ds:SignedInfo>)"
    R"(<ds:CanonicalizationMethod Algorithm="http://www.w3.org/2001/10/xml-exc-c14n#"/>)"
    R"(<ds:SignatureMethod Algorithm="http://www.w3.org/2001/04/xmldsig-more#rsa-sha256"/>)"
    R"(<ds:Reference URI="#_a1">)"
    R"(<ds:DigestMethod Algorithm="http://www.w3.org/2001/04/xmlenc#sha256"/><ds:DigestValue>AAAA</ds:DigestValue>)"
    R"(</ds:Reference></ds:SignedInfo><ds:SignatureValue>AAAA</ds:SignatureValue></ds:Signature>)";

constexpr const char *SUBJECT_NAME = R"(<saml:NameID Format="urn:format:subject">alice@corp</saml:NameID>)";
constexpr const char *DELEGATE_NAME = R"(<saml:NameID Format="urn:format:delegate">backup@corp</saml:NameID>)";
constexpr const char *BEARER_DATA = R"(<saml:SubjectConfirmationData NotOnOrAfter="2026-01-01T08:00:00Z"/>)";

constexpr const char *DELEGATES = R"(<del:Delegate DelegationInstant="2026-01-01T00:00:01Z">)"
                                  R"(<saml:NameID Format="urn:format:first">gateway@corp</saml:NameID></del:Delegate>)"
                                  R"(<del:Delegate DelegationInstant="2026-01-01T00:00:02Z">)"
                                  R"(<saml:NameID Format="urn:format:last">backup@corp</saml:NameID></del:Delegate>)";

constexpr const char *AUDIENCES =
    R"(<saml:Audience>https://b/</saml:Audience><saml:Audience>https://a/</saml:Audience>)"
    R"(<saml:Audience>https://b/</saml:Audience>)";
constexpr const char *PROXY_RESTRICTION = R"(<saml:ProxyRestriction Count="3"/>)";
constexpr const char *RENEW_RESTRICTION = R"(<saml:Condition xsi:type="rsa:RenewRestrictionType" Count="5")"
                                          R"( Postdatable="false" RenewExpired="never mind"/>)";

constexpr const char *RSA_ADVICE =
    R"(<rsa:RSAAdvice AdviceSource="urn:mapper"><saml:Attribute Name="color">)"
    R"(<saml:AttributeValue>green</saml:AttributeValue><saml:AttributeValue>blue</saml:AttributeValue>)"
    R"(</saml:Attribute><saml:Attribute Name="size"/></rsa:RSAAdvice><rsa:RSAAdvice AdviceSource="urn:audit"/>)";

constexpr const char *CLASS_REF = R"(<saml:AuthnContextClassRef>urn:class</saml:AuthnContextClassRef>)";

constexpr const char *ATTRIBUTES =
    R"(<saml:Attribute Name="urn:one" NameFormat="urn:name-format" FriendlyName="One">)"
    R"(<saml:AttributeValue>first</saml:AttributeValue><saml:AttributeValue>second</saml:AttributeValue>)"
    R"(</saml:Attribute><saml:Attribute Name="urn:two"/>)";

constexpr const char *END = "</saml:Assertion>";

inline std::string Subject(const std::string &name, const std::string &confirmation) {
  return "<saml:Subject>" + name + confirmation + "</saml:Subject>";
}
inline std::string Confirmation(const std::string &method, const std::string &content) {
  return "<saml:SubjectConfirmation Method=\"urn:oasis:names:tc:SAML:2.0:cm:" + method + "\">" + content +
         "</saml:SubjectConfirmation>";
}
inline std::string BearerSubject() {
  return Subject(SUBJECT_NAME, Confirmation("bearer", std::string(DELEGATE_NAME) + BEARER_DATA));
}
inline std::string HolderOfKeyData() {
  return "<saml:SubjectConfirmationData xsi:type=\"saml:KeyInfoConfirmationDataType\"><ds:KeyInfo><ds:X509Data>"
         "<ds:X509Certificate>" +
         HolderCertificateBase64() + "</ds:X509Certificate></ds:X509Data></ds:KeyInfo></saml:SubjectConfirmationData>";
}
inline std::string HolderOfKeySubject() {
  return Subject(SUBJECT_NAME, Confirmation("holder-of-key", HolderOfKeyData()));
}
inline std::string Conditions(const std::string &restrictions) {
  return "<saml:Conditions NotBefore=\"2026-01-01T00:00:00Z\" NotOnOrAfter=\"2026-01-01T07:00:00Z\">" + restrictions +
         "</saml:Conditions>";
}
inline std::string DelegationRestriction() {
  return std::string("<saml:Condition xsi:type=\"del:DelegationRestrictionType\">") + DELEGATES + "</saml:Condition>";
}
inline std::string AudienceRestriction() {
  return std::string("<saml:AudienceRestriction>") + AUDIENCES + "</saml:AudienceRestriction>";
}
inline std::string AllConditions() {
  return Conditions(DelegationRestriction() + AudienceRestriction() + PROXY_RESTRICTION + RENEW_RESTRICTION);
}
inline std::string Advice() {
  return std::string("<saml:Advice>") + RSA_ADVICE + "</saml:Advice>";
}
inline std::string AuthnStatement() {
  return std::string("<saml:AuthnStatement AuthnInstant=\"2026-01-01T00:00:03Z\"><saml:AuthnContext>") + CLASS_REF +
         "</saml:AuthnContext></saml:AuthnStatement>";
}
inline std::string AttributeStatement() {
  return std::string("<saml:AttributeStatement>") + ATTRIBUTES + "</saml:AttributeStatement>";
}

} // namespace Piece

/// An assertion with these children.
inline std::string Assertion(const std::vector<std::string> &children) {
  std::string text = Piece::START;
  for (const std::string &child : children) {
    text += child;
  }
  return text + Piece::END;
}

/// A bearer token with all optional parts.
inline std::string BearerAssertion() {
  return Assertion({Piece::ISSUER, Piece::SIGNATURE, Piece::BearerSubject(), Piece::AllConditions(), Piece::Advice(),
                    Piece::AuthnStatement(), Piece::AttributeStatement()});
}

/// A holder-of-key token without optional parts.
inline std::string HolderOfKeyAssertion() {
  return Assertion(
      {Piece::ISSUER, Piece::SIGNATURE, Piece::HolderOfKeySubject(), Piece::Conditions(""), Piece::AuthnStatement()});
}

} // namespace Testing
