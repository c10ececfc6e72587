// SPDX-License-Identifier: Apache-2.0

#include "token/subject_parser.h"

#include "xml/expected_element.h"
#include "xml/refuse.h"
#include "xml/strict_checks.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace SsoClient {

namespace {

using Tarvel::Ref;
using Tarvel::Crypto::Certificate;
using Tarvel::Xml::ElementNode;

constexpr std::string_view METHOD_BEARER = "urn:oasis:names:tc:SAML:2.0:cm:bearer";
constexpr std::string_view METHOD_HOLDER_OF_KEY = "urn:oasis:names:tc:SAML:2.0:cm:holder-of-key";

constexpr std::string_view METHODS =
    "urn:oasis:names:tc:SAML:2.0:cm:bearer or urn:oasis:names:tc:SAML:2.0:cm:holder-of-key";

void ParseMethod(const ElementNode &element, SubjectConfirmationType &confirmation, DeviationSink &sink) {
  const Tarvel::Xml::Attribute *const attribute = element.FindAttribute(std::string_view(), "Method");
  if (!attribute) {
    return;
  }
  const std::string_view method = attribute->GetValue();
  confirmation.writtenMethod = method;
  const boost::optional<SamlToken::ConfirmationType> type = FindConfirmationType(method);
  confirmation.isMethodKnown = type.has_value();
  if (type) {
    confirmation.Method = *type;
  } else {
    RefuseMethod(&element, method, sink);
  }
}

/// The method for which the data of `element` is read. If the written method is not known, it is guessed from the data.
SamlToken::ConfirmationType MethodOfData(const ElementNode &element, const SubjectConfirmationType &confirmation) {
  if (confirmation.isMethodKnown) {
    return confirmation.Method;
  }
  const ElementNode *const data = element.FindChildElement("SubjectConfirmationData");
  return data && data->FindChildElement("KeyInfo") ? SamlToken::HOLDER_OF_KEY : SamlToken::BEARER;
}

/// Null if the text is not a certificate.
Ref<const Certificate> DecodeCertificate(const ElementNode &element, const std::string &base64, DeviationSink &sink) {
  const auto refuse = [&](const char *reason) {
    Refuse(sink, element, "an X.509 certificate in DER, in Base64", "", "X509Certificate does not decode: %1", reason);
  };
  try {
    const std::vector<std::uint8_t> der = Tarvel::StringUtil::Base64Decode(base64);
    return Tarvel::Crypto::CreateCertificateFromDer(der.data(), der.size());
  } catch (const Tarvel::Base64FormatException &error) {
    refuse(error.what());
  } catch (const Tarvel::Crypto::CryptoException &error) {
    refuse(error.what());
  }
  return {};
}

void ParseX509DataElement(NodeFilterIterator &iterator, Ref<const Certificate> &certificate, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeElement(iterator, "X509Data", Namespaces::DS, sink);
  if (!taken.node) {
    return;
  }
  RequireNoAttributes(*IteratorToElement(taken), sink);
  NodeFilterIterator child = taken.GetChild();
  ParseX509CertificateElement(child, certificate, sink);
  RequireNoFurtherNode(child, "Unexpected elements after X509Certificate", sink);
}

void RequireKeyInfoType(const ElementNode &element, DeviationSink &sink) {
  RequireElementAttributesQNames(element, {XSI_TYPE}, {}, sink);
  const Tarvel::Xml::Attribute *const type = element.FindAttribute(XSI_TYPE.namespaceUri, XSI_TYPE.localName);
  const std::optional<QNameView> name = type ? ResolveXsiType(element, *type, sink) : std::nullopt;
  if (name && *name != KEY_INFO_CONFIRMATION_DATA_TYPE) {
    Refuse(sink, {element, type->GetName()}, "saml:KeyInfoConfirmationDataType", type->GetValue(),
           "Invalid SubjectConfirmationData type: '%1'", type->GetValue());
  }
}

void ParseHolderOfKeyData(const NodeFilterIterator &data, Ref<const Certificate> &certificate, DeviationSink &sink) {
  RequireKeyInfoType(*IteratorToElement(data), sink);
  NodeFilterIterator child = data.GetChild();
  ParseSubjectConfirmationDataKeyInfoElement(child, certificate, sink);
  RequireNoFurtherNode(child, "Unexpected elements after SubjectConfirmationData/KeyInfo", sink);
}

} // namespace

void RefuseMethod(const ElementNode *confirmation, std::string_view method, DeviationSink &sink) {
  Refuse(sink, {confirmation, "Method"}, METHODS, method, "Unknown subject confirmation method: '%1'", method);
}

boost::optional<SamlToken::ConfirmationType> FindConfirmationType(std::string_view method) {
  if (method == METHOD_BEARER) {
    return SamlToken::BEARER;
  }
  return method == METHOD_HOLDER_OF_KEY ? boost::make_optional(SamlToken::HOLDER_OF_KEY) : boost::none;
}

void ParseNameIDType(NodeFilterIterator &iterator, NameIDType &nameId, DeviationSink &sink) {
  const ElementNode &element = *IteratorToElement(iterator);
  RequireElementAttributesNames(element, {"Format"}, {}, sink);
  nameId.element = &element;
  nameId.Format = GetTextAttribute(element, "Format");
  RequireTextualContent(iterator, nameId.value, sink);
  iterator.MoveToSibling();
}

void ParseSamlIssuerElement(NodeFilterIterator &iterator, NameIDType &issuer, DeviationSink &sink) {
  NodeFilterIterator taken = TakeElement(iterator, "Issuer", Namespaces::SAML, sink);
  if (taken.node) {
    ParseNameIDType(taken, issuer, sink);
  }
}

void ParseSubjectNameIdElement(NodeFilterIterator &iterator, NameIDType &nameId, DeviationSink &sink) {
  NodeFilterIterator taken = TakeElement(iterator, "NameID", Namespaces::SAML, sink);
  if (taken.node) {
    ParseNameIDType(taken, nameId, sink);
  }
}

void ParseSubjectElement(NodeFilterIterator &iterator, SubjectType &subject, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeElement(iterator, "Subject", Namespaces::SAML, sink);
  if (!taken.node) {
    return;
  }
  RequireNoAttributes(*IteratorToElement(taken), sink);
  NodeFilterIterator child = taken.GetChild();
  ParseSubjectNameIdElement(child, subject.NameID, sink);
  ParseSubjectConfirmationElement(child, subject.SubjectConfirmation, sink);
  RequireNoFurtherNode(child, "Unexpected elements after SubjectConfirmation", sink);
}

void ParseSubjectConfirmationElement(NodeFilterIterator &iterator, SubjectConfirmationType &confirmation,
                                     DeviationSink &sink) {
  const NodeFilterIterator taken = TakeElement(iterator, "SubjectConfirmation", Namespaces::SAML, sink);
  if (!taken.node) {
    return;
  }
  const ElementNode &element = *IteratorToElement(taken);
  RequireElementAttributesNames(element, {"Method"}, {}, sink);
  confirmation.element = &element;
  ParseMethod(element, confirmation, sink);

  NodeFilterIterator child = taken.GetChild();
  if (ElementQNameIs(IteratorToElement(child), "NameID", Namespaces::SAML)) {
    confirmation.NameID.emplace();
    ParseNameIDType(child, *confirmation.NameID, sink);
  }
  ParseSubjectConfirmationDataElement(child, MethodOfData(element, confirmation), confirmation.SubjectConfirmationData,
                                      sink);
  RequireNoFurtherNode(child, "Unexpected elements after SubjectConfirmationData", sink);
}

void ParseSubjectConfirmationDataElement(NodeFilterIterator &iterator, SamlToken::ConfirmationType method,
                                         SubjectConfirmationDataType &data, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeElement(iterator, "SubjectConfirmationData", Namespaces::SAML, sink);
  if (!taken.node) {
    return;
  }
  const ElementNode &element = *IteratorToElement(taken);
  data.element = &element;
  if (method == SamlToken::HOLDER_OF_KEY) {
    ParseHolderOfKeyData(taken, data.certificate, sink);
  } else {
    RequireElementAttributesNames(element, {"NotOnOrAfter"}, {}, sink);
    RequireEmptyElement(taken, sink);
    GetDateAttribute(element, "NotOnOrAfter", data.NotOnOrAfter, sink);
  }
}

void ParseX509CertificateElement(NodeFilterIterator &iterator, Ref<const Certificate> &certificate,
                                 DeviationSink &sink) {
  const NodeFilterIterator taken = TakeElement(iterator, "X509Certificate", Namespaces::DS, sink);
  if (!taken.node) {
    return;
  }
  const ElementNode &element = *IteratorToElement(taken);
  RequireNoAttributes(element, sink);
  std::string base64;
  if (RequireTextualContent(taken, base64, sink)) {
    certificate = DecodeCertificate(element, base64, sink);
  }
}

void ParseSubjectConfirmationDataKeyInfoElement(NodeFilterIterator &iterator, Ref<const Certificate> &certificate,
                                                DeviationSink &sink) {
  const NodeFilterIterator taken = TakeElement(iterator, "KeyInfo", Namespaces::DS, sink);
  if (!taken.node) {
    return;
  }
  RequireNoAttributes(*IteratorToElement(taken), sink);
  NodeFilterIterator child = taken.GetChild();
  ParseX509DataElement(child, certificate, sink);
  RequireNoFurtherNode(child, "Unexpected elements after X509Data", sink);
}

} // namespace SsoClient
