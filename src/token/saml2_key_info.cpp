// SPDX-License-Identifier: Apache-2.0

#include "token/saml2_key_info.h"

#include "model/namespaces.h"
#include "token/saml2_form.h"
#include "token/subject_parser.h"
#include "xml/expected_element.h"
#include "xml/refuse.h"
#include "xml/strict_checks.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>
#include <tarvel/crypto/subject_public_key.h>

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace SsoClient {

namespace {

using Tarvel::Ref;
using Tarvel::Crypto::Certificate;
using Tarvel::Crypto::NamedCurve;
using Tarvel::Crypto::SubjectPublicKey;
using Tarvel::Xml::ElementNode;

using Octets = std::vector<std::uint8_t>;

void RefuseOctets(const ElementNode &element, const char *allowed, const char *reason, DeviationSink &sink) {
  Refuse(sink, element, allowed, "", "%1 does not decode: %2", element.GetLocalName(), reason);
}

/// Reads an element whose content is Base64. Returns the element, or null if `octets` was not set.
const ElementNode *ParseOctets(NodeFilterIterator &iterator, std::string_view localName, std::string_view namespaceUri,
                               Octets &octets, DeviationSink &sink) {
  const NodeFilterIterator taken = TakeElement(iterator, localName, namespaceUri, sink);
  std::string base64;
  if (!taken.node || !RequireTextualContent(taken, base64, sink)) {
    return nullptr;
  }
  const ElementNode *const element = IteratorToElement(taken);
  try {
    octets = Tarvel::StringUtil::Base64Decode(base64);
    return element;
  } catch (const Tarvel::Base64FormatException &error) {
    RefuseOctets(*element, "Base64", error.what(), sink);
  }
  return nullptr;
}

SubjectPublicKey ParseRsaKeyValue(const NodeFilterIterator &keyValue, DeviationSink &sink) {
  NodeFilterIterator child = keyValue.GetChild();
  Octets modulus;
  Octets exponent;
  const bool hasModulus = ParseOctets(child, "Modulus", Namespaces::DS, modulus, sink);
  const bool hasExponent = ParseOctets(child, "Exponent", Namespaces::DS, exponent, sink);
  RefuseFurtherContent(child, sink);
  return hasModulus && hasExponent ? Tarvel::Crypto::MakeRsaPublicKey(modulus, exponent) : SubjectPublicKey();
}

std::optional<NamedCurve> FindCurve(std::string_view uri) {
  if (uri == "urn:oid:1.2.840.10045.3.1.7") {
    return NamedCurve::P256;
  }
  if (uri == "urn:oid:1.3.132.0.34") {
    return NamedCurve::P384;
  }
  return uri == "urn:oid:1.3.132.0.35" ? std::optional(NamedCurve::P521) : std::nullopt;
}

/// No key if the curve is not written by its name, or is another one.
SubjectPublicKey ParseEcKeyValue(const NodeFilterIterator &keyValue, DeviationSink &sink) {
  NodeFilterIterator child = keyValue.GetChild();
  const ElementNode *const named = IteratorToElement(child);
  const std::optional<NamedCurve> curve = ElementQNameIs(named, "NamedCurve", Namespaces::DSIG11)
                                              ? FindCurve(GetTextAttribute(*named, "URI"))
                                              : std::nullopt;
  if (!curve) {
    return {};
  }
  Octets point;
  const ElementNode *const element = ParseOctets(child.MoveToSibling(), "PublicKey", Namespaces::DSIG11, point, sink);
  RefuseFurtherContent(child, sink);
  try {
    return element ? Tarvel::Crypto::MakeEcPublicKey(*curve, point) : SubjectPublicKey();
  } catch (const Tarvel::Crypto::CryptoException &error) {
    RefuseOctets(*element, "an uncompressed point of the curve, in Base64", error.what(), sink);
  }
  return {};
}

SubjectPublicKey ParseKeyValue(const NodeFilterIterator &iterator, DeviationSink &sink) {
  const NodeFilterIterator child = iterator.GetChild();
  const ElementNode *const element = IteratorToElement(child);
  if (ElementQNameIs(element, "RSAKeyValue", Namespaces::DS)) {
    return ParseRsaKeyValue(child, sink);
  }
  return ElementQNameIs(element, "ECKeyValue", Namespaces::DSIG11) ? ParseEcKeyValue(child, sink) : SubjectPublicKey();
}

/// Reads the first certificate in the `ds:X509Data` at the cursor.
void ParseCertificate(const NodeFilterIterator &iterator, Ref<const Certificate> &certificate, DeviationSink &sink) {
  for (NodeFilterIterator child = iterator.GetChild(); child.node && !certificate; child.MoveToSibling()) {
    if (ElementQNameIs(IteratorToElement(child), "X509Certificate", Namespaces::DS)) {
      ParseX509CertificateElement(child, certificate, sink);
      return;
    }
  }
}

} // namespace

void ParseKeyInfo(const NodeFilterIterator &iterator, ConfirmationDetails &details, DeviationSink &sink) {
  RequireSchemaAttributes(*IteratorToElement(iterator), {{Namespaces::DS, "KeyInfoType"}}, {}, {LocalName("Id")}, sink);
  Ref<const Certificate> certificate;
  std::optional<SubjectPublicKey> keyValue;
  for (NodeFilterIterator child = iterator.GetChild(); child.node; child.MoveToSibling()) {
    const ElementNode *const element = IteratorToElement(child);
    if (!certificate && ElementQNameIs(element, "X509Data", Namespaces::DS)) {
      ParseCertificate(child, certificate, sink);
    } else if (!keyValue && ElementQNameIs(element, "KeyValue", Namespaces::DS)) {
      keyValue = ParseKeyValue(child, sink);
    }
  }
  const bool hasKeyValue = keyValue && !keyValue->der.empty();
  if (certificate && hasKeyValue && !Tarvel::Crypto::HasPublicKey(*certificate, keyValue->der)) {
    Refuse(sink, iterator, "one key", "two keys",
           "The certificate and the key value of a confirmation are different keys");
    return;
  }
  if (certificate) {
    details.publicKey = Tarvel::Crypto::GetSubjectPublicKey(*certificate);
    details.certificate = std::move(certificate);
  } else if (hasKeyValue && keyValue->refusal.empty()) {
    details.publicKey = std::move(keyValue->der);
  }
}

} // namespace SsoClient
