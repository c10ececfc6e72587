// SPDX-License-Identifier: Apache-2.0
/// @file
/// The parsed form of one SAML 2.0 assertion: a record for each schema type of the accepted profile.
///
/// The records and their fields have the names of the schema's types, elements and attributes. The parser fills them, and the
/// checks and the token read them. They exist only while a token is made. Pointers to elements and views are valid as long
/// as the tree.
///
/// If the parser continues after a deviation, a field that it cannot read keeps its initial value, such as an empty
/// text or null. If an element was not found, `element` in its record is null.

#pragma once

#include <ssoclient/advice.h>
#include <ssoclient/saml_token.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/system/date_time.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/security/signature.h>

#include <boost/optional.hpp>

#include <cstdint>
#include <set>
#include <string>
#include <string_view>
#include <vector>

namespace SsoClient {

struct NameIDType {
  std::string Format;
  std::string value;                                 ///< the element's text
  const Tarvel::Xml::ElementNode *element = nullptr; ///< where it is; not compared

  friend bool operator==(const NameIDType &left, const NameIDType &right) {
    return left.Format == right.Format && left.value == right.value;
  }
};

struct SubjectConfirmationDataType {
  Tarvel::System::DateTime NotOnOrAfter;                      ///< set for bearer
  Tarvel::Ref<const Tarvel::Crypto::Certificate> certificate; ///< set for holder-of-key
  const Tarvel::Xml::ElementNode *element = nullptr;
};

struct SubjectConfirmationType {
  SamlToken::ConfirmationType Method = SamlToken::BEARER;
  boost::optional<NameIDType> NameID; ///< the delegate, if there is one
  SubjectConfirmationDataType SubjectConfirmationData;
  const Tarvel::Xml::ElementNode *element = nullptr;
  boost::optional<std::string_view> writtenMethod; ///< the attribute's value; empty if there is no such attribute
  bool isMethodKnown = false;                      ///< whether `Method` was read from the attribute
};

struct SubjectType {
  NameIDType NameID;
  SubjectConfirmationType SubjectConfirmation;
};

struct RenewRestrictionType {
  boost::optional<std::uint64_t> Count;
};

struct ProxyRestrictionType {
  boost::optional<std::uint64_t> Count;
};

struct DelegateType {
  Tarvel::System::DateTime DelegationInstant;
  NameIDType NameID;
};

struct DelegationRestrictionType {
  std::vector<DelegateType> delegates; ///< in document order, at least one after a parse without deviations
};

struct AudienceRestrictionType {
  std::set<std::string> audiences;
};

struct ConditionsType {
  Tarvel::System::DateTime NotBefore;
  Tarvel::System::DateTime NotOnOrAfter;
  boost::optional<RenewRestrictionType> RenewRestriction;
  boost::optional<DelegationRestrictionType> DelegationRestriction;
  boost::optional<AudienceRestrictionType> AudienceRestriction;
  boost::optional<ProxyRestrictionType> ProxyRestriction;
  const Tarvel::Xml::ElementNode *element = nullptr;
};

struct AdviceType {
  std::vector<Advice> advice; ///< one for each RSAAdvice, in document order
};

struct AuthnContextType {
  std::string AuthnContextClassRef;
};

struct AuthnStatementType {
  Tarvel::System::DateTime AuthnInstant;
  AuthnContextType AuthnContext;
};

struct AttributeType {
  std::string Name;
  std::string NameFormat;          ///< empty when absent
  std::string FriendlyName;        ///< empty when absent
  std::vector<std::string> values; ///< one for each AttributeValue that could be read, in document order
  const Tarvel::Xml::ElementNode *element = nullptr;
};

struct AttributeStatementType {
  std::vector<AttributeType> attributes; ///< in document order
};

struct SamlAssertionType {
  std::string Version;
  std::string ID;
  Tarvel::System::DateTime IssueInstant;
  NameIDType Issuer;
  Tarvel::Ref<Tarvel::Xml::Security::Signature> Signature;
  SubjectType Subject;
  ConditionsType Conditions;
  boost::optional<AdviceType> Advice;
  AuthnStatementType AuthnStatement;
  boost::optional<AttributeStatementType> AttributeStatement;
  const Tarvel::Xml::ElementNode *element = nullptr; ///< the assertion that was read
};

} // namespace SsoClient
