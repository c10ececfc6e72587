// SPDX-License-Identifier: Apache-2.0

#include "token/saml2_subject_parser.h"

#include "token/saml2_form.h"
#include "token/saml2_key_info.h"
#include "token/subject_parser.h"
#include "xml/expected_element.h"
#include "xml/refuse.h"
#include "xml/strict_checks.h"

#include <string>
#include <string_view>
#include <utility>

namespace SsoClient {

namespace {

using Tarvel::Xml::ElementNode;

constexpr std::string_view WHITE_SPACE = "\t\n\r ";

/// Reads an attribute of a name. The standard allows no values that are empty or white space (SAML 2.0 core, section
/// 1.3.1).
boost::optional<std::string> ReadQualifier(const ElementNode &element, std::string_view name, DeviationSink &sink) {
  boost::optional<std::string> value = ReadOptionalText(element, name);
  if (value && value->find_first_not_of(WHITE_SPACE) == std::string::npos) {
    Refuse(sink, {element, name}, "a text that is not white space", *value,
           "Attribute '%1' of element '%2' must not be empty", name, element.GetName());
  }
  return value;
}

/// Reads the element at the cursor except its `Format`, which the caller has read into `exact`.
void ParseName(const NodeFilterIterator &iterator, NameIDType &nameId, NameId &exact, DeviationSink &sink) {
  const ElementNode &element = *IteratorToElement(iterator);
  RequireSchemaAttributes(
      element, {SamlType("NameIDType")}, {},
      {LocalName("Format"), LocalName("NameQualifier"), LocalName("SPNameQualifier"), LocalName("SPProvidedID")}, sink);
  exact.nameQualifier = ReadQualifier(element, "NameQualifier", sink);
  exact.spNameQualifier = ReadQualifier(element, "SPNameQualifier", sink);
  exact.spProvidedId = ReadQualifier(element, "SPProvidedID", sink);
  nameId.element = &element;
  nameId.Format = exact.format.value_or(std::string());
  RequireTextualContent(iterator, nameId.value, sink);
  exact.value = nameId.value;
}

void ParseMethod(const ElementNode &element, Saml2Confirmation &confirmation, ConfirmationDetails &details) {
  details.method = GetTextAttribute(element, "Method");
  confirmation.type = FindConfirmationType(details.method);
}

/// Reads the first key in the data of a confirmation whose method is known. The standard allows any other elements and
/// text there, which are ignored. A key of a bearer confirmation is not read.
void ParseContent(NodeFilterIterator child, Saml2Confirmation &confirmation, ConfirmationDetails &details,
                  DeviationSink &sink) {
  for (bool isKeyRead = false; child.node; child.MoveToSibling()) {
    const ElementNode *const element = IteratorToElement(child);
    if (!ElementQNameIs(element, "KeyInfo", Namespaces::DS)) {
      continue;
    }
    if (confirmation.type == SamlToken::BEARER) {
      confirmation.bearerKey = element;
    } else if (!isKeyRead) {
      isKeyRead = ParseKeyInfo(child, details, sink);
    }
  }
}

void ParseData(NodeFilterIterator &iterator, Saml2Confirmation &confirmation, ConfirmationDetails &details,
               DeviationSink &sink) {
  const ElementNode &data = *IteratorToElement(iterator);
  RequireSchemaAttributes(data, {SamlType("SubjectConfirmationDataType"), KEY_INFO_CONFIRMATION_DATA_TYPE}, {},
                          {LocalName("NotBefore"), LocalName("NotOnOrAfter"), LocalName("Recipient"),
                           LocalName("InResponseTo"), LocalName("Address")},
                          sink, ForeignAttributes::IGNORED);
  confirmation.data = &data;
  details.notBefore = ReadOptionalDate(data, "NotBefore", sink);
  details.notOnOrAfter = ReadOptionalDate(data, "NotOnOrAfter", sink);
  details.recipient = ReadOptionalText(data, "Recipient");
  details.inResponseTo = ReadOptionalText(data, "InResponseTo");
  details.address = ReadOptionalText(data, "Address");
  if (confirmation.type) {
    ParseContent(iterator.GetChild(), confirmation, details, sink);
  }
  iterator.MoveToSibling();
}

/// Reads the name of the party that must confirm.
void ParseConfirmingName(NodeFilterIterator &iterator, Saml2Confirmation &confirmation, ConfirmationDetails &details,
                         DeviationSink &sink) {
  NameIDType name;
  NameId exact;
  ParseSaml2NameIdElement(iterator, name, exact, sink);
  details.nameId = std::move(exact);
  confirmation.nameId = name.element;
}

void ParseConfirmation(NodeFilterIterator &iterator, Saml2Assertion &assertion, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeListElement(iterator, "SubjectConfirmation", Namespaces::SAML, sink);
  if (!taken.node || !RequireRoomForElement(taken, assertion.confirmations.size(), sink)) {
    return;
  }
  const ElementNode &element = *IteratorToElement(taken);
  Saml2Confirmation &confirmation = assertion.confirmations.emplace_back();
  ConfirmationDetails &details = assertion.details.confirmations.emplace_back();
  RequireSchemaAttributes(element, {SamlType("SubjectConfirmationType")}, {LocalName("Method")}, {}, sink);
  confirmation.element = &element;
  ParseMethod(element, confirmation, details);

  NodeFilterIterator child = taken.GetChild();
  if (IsSamlElement(child, "NameID")) {
    ParseConfirmingName(child, confirmation, details, sink);
  } else {
    TryRefuseUnsupported(child, sink);
  }
  if (IsSamlElement(child, "SubjectConfirmationData")) {
    ParseData(child, confirmation, details, sink);
  }
  RefuseFurtherContent(child, sink);
}

} // namespace

void ParseSaml2IssuerElement(NodeFilterIterator &iterator, NameIDType &issuer, NameId &exact, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeElement(iterator, "Issuer", Namespaces::SAML, sink);
  if (taken.node) {
    exact.format = ReadOptionalText(*IteratorToElement(taken), "Format");
    ParseName(taken, issuer, exact, sink);
  }
}

void ParseSaml2NameIdElement(NodeFilterIterator &iterator, NameIDType &nameId, NameId &exact, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeElement(iterator, "NameID", Namespaces::SAML, sink);
  if (taken.node) {
    exact.format = ReadQualifier(*IteratorToElement(taken), "Format", sink);
    ParseName(taken, nameId, exact, sink);
  }
}

void ParseSaml2SubjectElement(NodeFilterIterator &iterator, Saml2Assertion &assertion, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeElement(iterator, "Subject", Namespaces::SAML, sink);
  if (!taken.node) {
    return;
  }
  RequireSchemaAttributes(*IteratorToElement(taken), {SamlType("SubjectType")}, {}, {}, sink);
  NodeFilterIterator child = taken.GetChild();
  if (!TryRefuseUnsupported(child, sink)) {
    ParseSaml2NameIdElement(child, assertion.common.Subject.NameID, assertion.details.subject, sink);
  }
  do {
    ParseConfirmation(child, assertion, sink);
  } while (child.node);
}

} // namespace SsoClient
