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
  try {
    return hasModulus && hasExponent ? Tarvel::Crypto::MakeRsaPublicKey(modulus, exponent) : SubjectPublicKey();
  } catch (const Tarvel::Crypto::CryptoException &error) { // another version of OpenSSL may be stricter
    Refuse(sink, keyValue, "an RSA public key", "", "RSAKeyValue does not decode: %1", error.what());
  }
  return {};
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

/// Returns no key if the curve is not written by its name, or is not one of `NamedCurve`.
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

/// A cursor on the first child of the element at `parent` for which `isWanted` is true; past the end if there is none.
template <typename IsWanted>
NodeFilterIterator FindChild(const NodeFilterIterator &parent, const IsWanted &isWanted) {
  NodeFilterIterator child = parent.GetChild();
  while (child.node && !isWanted(child)) {
    child.MoveToSibling();
  }
  return child;
}

bool IsSignatureElement(const NodeFilterIterator &iterator, std::string_view localName) {
  return ElementQNameIs(IteratorToElement(iterator), localName, Namespaces::DS);
}

NodeFilterIterator FindCertificate(const NodeFilterIterator &iterator) {
  const auto inData = [](const NodeFilterIterator &data) {
    return FindChild(data, [](const auto &child) { return IsSignatureElement(child, "X509Certificate"); });
  };
  const NodeFilterIterator data = FindChild(
      iterator, [&](const auto &child) { return IsSignatureElement(child, "X509Data") && inData(child).node; });
  return data.node ? inData(data) : data;
}

bool IsRsaKeyValue(const NodeFilterIterator &iterator) {
  return IsSignatureElement(iterator, "RSAKeyValue");
}

bool IsEcKeyValue(const NodeFilterIterator &iterator) {
  return ElementQNameIs(IteratorToElement(iterator), "ECKeyValue", Namespaces::DSIG11);
}

NodeFilterIterator FindKeyValue(const NodeFilterIterator &iterator) {
  return FindChild(iterator,
                   [](const NodeFilterIterator &child) {
                     const NodeFilterIterator value = child.GetChild();
                     return IsSignatureElement(child, "KeyValue") && (IsRsaKeyValue(value) || IsEcKeyValue(value));
                   })
      .GetChild();
}

SubjectPublicKey ParseKeyValue(const NodeFilterIterator &value, DeviationSink &sink) {
  if (!value.node) {
    return {};
  }
  return IsRsaKeyValue(value) ? ParseRsaKeyValue(value, sink) : ParseEcKeyValue(value, sink);
}

} // namespace

bool ParseKeyInfo(const NodeFilterIterator &iterator, ConfirmationDetails &details, DeviationSink &sink) {
  RequireSchemaAttributes(*IteratorToElement(iterator), {{Namespaces::DS, "KeyInfoType"}}, {}, {LocalName("Id")}, sink);
  NodeFilterIterator certificateElement = FindCertificate(iterator);
  const NodeFilterIterator keyValueElement = FindKeyValue(iterator);
  const bool hasKey = certificateElement.node || keyValueElement.node;
  Ref<const Certificate> certificate;
  if (certificateElement.node) {
    ParseX509CertificateElement(certificateElement, certificate, sink);
  }
  SubjectPublicKey keyValue = ParseKeyValue(keyValueElement, sink);
  if (certificate && !keyValue.der.empty() && !Tarvel::Crypto::HasPublicKey(*certificate, keyValue.der)) {
    Refuse(sink, iterator, "one key", "two keys",
           "The certificate and the key value of a confirmation are different keys");
  } else if (certificate) {
    details.publicKey = Tarvel::Crypto::GetSubjectPublicKey(*certificate);
    details.certificate = std::move(certificate);
  } else if (keyValue.refusal.empty()) {
    details.publicKey = std::move(keyValue.der);
  }
  return hasKey;
}

} // namespace SsoClient
