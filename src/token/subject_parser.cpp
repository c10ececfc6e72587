// SPDX-License-Identifier: Apache-2.0

#include "token/subject_parser.h"

#include "model/namespaces.h"
#include "xml/qualified_name.h"
#include "xml/strict_checks.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/message_formatter.h>
#include <tarvel/core/string_util.h>

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace SsoClient {

namespace {

using Tarvel::MessageFormatter;
using Tarvel::Ref;
using Tarvel::Crypto::Certificate;
using Tarvel::Xml::ElementNode;

constexpr QNameView KEY_INFO_CONFIRMATION_DATA_TYPE(Namespaces::SAML, "KeyInfoConfirmationDataType");
constexpr std::string_view METHOD_BEARER = "urn:oasis:names:tc:SAML:2.0:cm:bearer";
constexpr std::string_view METHOD_HOLDER_OF_KEY = "urn:oasis:names:tc:SAML:2.0:cm:holder-of-key";

SamlToken::ConfirmationType ParseMethod(std::string_view method) {
  if (method == METHOD_BEARER) {
    return SamlToken::BEARER;
  }
  if (method == METHOD_HOLDER_OF_KEY) {
    return SamlToken::HOLDER_OF_KEY;
  }
  throw ParseException(MessageFormatter::ASPrint("Unknown subject confirmation method: '%1'", method));
}

Ref<const Certificate> DecodeCertificate(const std::string &base64) {
  try {
    const std::vector<std::uint8_t> der = Tarvel::StringUtil::Base64Decode(base64);
    return Tarvel::Crypto::CreateCertificateFromDer(der.data(), der.size());
  } catch (const Tarvel::Base64FormatException &error) {
    throw ParseException(MessageFormatter::ASPrint("X509Certificate does not decode: %1", error.what()));
  } catch (const Tarvel::Crypto::CryptoException &error) {
    throw ParseException(MessageFormatter::ASPrint("X509Certificate does not decode: %1", error.what()));
  }
}

void ParseX509CertificateElement(NodeFilterIterator &iterator, Ref<const Certificate> &certificate) {
  RequireNoAttributes(RequireElementQName(IteratorToElement(iterator), "X509Certificate", Namespaces::DS));
  std::string base64;
  RequireTextualContent(iterator, base64);
  certificate = DecodeCertificate(base64);
  iterator.MoveToSibling();
}

void ParseX509DataElement(NodeFilterIterator &iterator, Ref<const Certificate> &certificate) {
  RequireNoAttributes(RequireElementQName(IteratorToElement(iterator), "X509Data", Namespaces::DS));
  NodeFilterIterator child = iterator.GetChild();
  ParseX509CertificateElement(child, certificate);
  RequireNoFurtherNode(child, "Unexpected elements after X509Certificate");
  iterator.MoveToSibling();
}

void ParseHolderOfKeyData(const NodeFilterIterator &iterator, const ElementNode &element,
                          Ref<const Certificate> &certificate) {
  RequireElementAttributesQNames(element, {XSI_TYPE}, {});
  const std::string_view type = element.FindAttribute(Namespaces::XSI, "type")->GetValue();
  if (ResolveXsiType(element, type) != KEY_INFO_CONFIRMATION_DATA_TYPE) {
    throw ParseException(MessageFormatter::ASPrint("Invalid SubjectConfirmationData type: '%1'", type));
  }
  NodeFilterIterator child = iterator.GetChild();
  ParseSubjectConfirmationDataKeyInfoElement(child, certificate);
  RequireNoFurtherNode(child, "Unexpected elements after SubjectConfirmationData/KeyInfo");
}

} // namespace

void ParseNameIDType(NodeFilterIterator &iterator, NameIDType &nameId) {
  const ElementNode &element = *IteratorToElement(iterator);
  RequireElementAttributesNames(element, {"Format"}, {});
  nameId.Format = GetTextAttribute(element, "Format");
  RequireTextualContent(iterator, nameId.value);
  iterator.MoveToSibling();
}

void ParseSamlIssuerElement(NodeFilterIterator &iterator, NameIDType &issuer) {
  RequireElementQName(IteratorToElement(iterator), "Issuer", Namespaces::SAML);
  ParseNameIDType(iterator, issuer);
}

void ParseSubjectNameIdElement(NodeFilterIterator &iterator, NameIDType &nameId) {
  RequireElementQName(IteratorToElement(iterator), "NameID", Namespaces::SAML);
  ParseNameIDType(iterator, nameId);
}

void ParseSubjectElement(NodeFilterIterator &iterator, SubjectType &subject) {
  RequireNoAttributes(RequireElementQName(IteratorToElement(iterator), "Subject", Namespaces::SAML));
  NodeFilterIterator child = iterator.GetChild();
  ParseSubjectNameIdElement(child, subject.NameID);
  ParseSubjectConfirmationElement(child, subject.SubjectConfirmation);
  RequireNoFurtherNode(child, "Unexpected elements after SubjectConfirmation");
  iterator.MoveToSibling();
}

void ParseSubjectConfirmationElement(NodeFilterIterator &iterator, SubjectConfirmationType &confirmation) {
  const ElementNode &element =
      RequireElementQName(IteratorToElement(iterator), "SubjectConfirmation", Namespaces::SAML);
  RequireElementAttributesNames(element, {"Method"}, {});
  confirmation.Method = ParseMethod(GetTextAttribute(element, "Method"));

  NodeFilterIterator child = iterator.GetChild();
  if (ElementQNameIs(IteratorToElement(child), "NameID", Namespaces::SAML)) {
    confirmation.NameID.emplace();
    ParseNameIDType(child, *confirmation.NameID);
  }
  ParseSubjectConfirmationDataElement(child, confirmation.Method, confirmation.SubjectConfirmationData);
  RequireNoFurtherNode(child, "Unexpected elements after SubjectConfirmationData");
  iterator.MoveToSibling();
}

void ParseSubjectConfirmationDataElement(NodeFilterIterator &iterator, SamlToken::ConfirmationType method,
                                         SubjectConfirmationDataType &data) {
  const ElementNode &element =
      RequireElementQName(IteratorToElement(iterator), "SubjectConfirmationData", Namespaces::SAML);
  if (method == SamlToken::HOLDER_OF_KEY) {
    ParseHolderOfKeyData(iterator, element, data.certificate);
  } else {
    RequireElementAttributesNames(element, {"NotOnOrAfter"}, {});
    RequireEmptyElement(iterator);
    GetDateAttribute(element, "NotOnOrAfter", data.NotOnOrAfter);
  }
  iterator.MoveToSibling();
}

void ParseSubjectConfirmationDataKeyInfoElement(NodeFilterIterator &iterator, Ref<const Certificate> &certificate) {
  RequireNoAttributes(RequireElementQName(IteratorToElement(iterator), "KeyInfo", Namespaces::DS));
  NodeFilterIterator child = iterator.GetChild();
  ParseX509DataElement(child, certificate);
  RequireNoFurtherNode(child, "Unexpected elements after X509Data");
  iterator.MoveToSibling();
}

} // namespace SsoClient
