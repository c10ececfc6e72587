// SPDX-License-Identifier: Apache-2.0
/// @file
/// Arbitrary bytes as a token: nothing but the documented exceptions, what is accepted comes back byte for byte, and the road
/// over the tree agrees with the road over the text.

#include "token/assertion_parser.h"
#include "token/token_facts.h"
#include "xml/parse_xml.h"

#include <ssoclient/create_saml_token.h>
#include <ssoclient/exceptions.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/system/environment.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/exceptions.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>
#include <utility>

namespace {

using namespace SsoClient;
using Tarvel::Crypto::CertificateList;
using Tarvel::Xml::ElementNode;

/// tests/data/tokens/sts-rsa.crt, whose key signed most of the seeds.
constexpr const char *TRUSTED = "-----BEGIN CERTIFICATE-----\n"
                                "MIICyTCCAbECFAv6tQ9/HIsB/Tx3grBHGnf2XMPYMA0GCSqGSIb3DQEBCwUAMCAx\n"
                                "EDAOBgNVBAoMB0V4YW1wbGUxDDAKBgNVBAMMA3N0czAgFw0yMDAxMDEwMDAwMDBa\n"
                                "GA8yMTIwMDEwMTAwMDAwMFowIDEQMA4GA1UECgwHRXhhbXBsZTEMMAoGA1UEAwwD\n"
                                "c3RzMIIBIjANBgkqhkiG9w0BAQEFAAOCAQ8AMIIBCgKCAQEA8n+JEaYVjFIgZB7B\n"
                                "Z1ImemklkeMBWn2ZxPauFWDBKKAghAOZOHGA3hHWb8LG1tfocoxR4dVyJ6HnYCsQ\n"
                                "SDcd0VqIbXjY6B2fa9f+TRg5DAev/9+2fhHVfIKKBKQEIFSxk4/O1L7MCJsNdyRU\n"
                                "tZpEs3WnpqDgE4crw0tHgAOzDt1jWQUra17Jw3zJ49vvDvI0m76pw7d/nPpFODiX\n"
                                "8FeqBW4YNRgC6XbCMsew+NQ2tGyVqU3brFGsrdqI/uLlhte8LOO1SrDrKSjRb3ie\n"
                                "33H/bWMWHlgyHrLhpS2iViUms1brhsAOi7h8TQTerOybUODZzbwOndVHsS9IgeC5\n"
                                "MfryLwIDAQABMA0GCSqGSIb3DQEBCwUAA4IBAQDa71KAJpnSVOoVcj9VwlIUmtSk\n"
                                "L7DnKspnLzqwm9O3MQTrr7ry4MxXme3TCl4yKilt2uDWJU6IZb+aISnviG2lShND\n"
                                "MwbaebXo/P87B0wQi98PmTy7+bVMnHlYP1RnR7PN+Gkbh9VmkYVbJMo94vYe3j7i\n"
                                "9Sct2Obu+oufoX7dBwtKa4iYDMDBaEi5LXZ+RkCpOR9K3XQMnqq9egBhcmmlbz4q\n"
                                "+iI+KQUcj0s8w+25QuTsDsigbWNTc7NUr9W7CxFRX62eqn/vUtI6EcLN6LFfXk8P\n"
                                "KnOCIjIZfYEE6BJcIaKsKSan1HibjkBzQhnNIr8+Etd7gMB/WrG3EQoe7xn5\n"
                                "-----END CERTIFICATE-----\n";

void Require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

/// The token of `xml`, or null when it is refused in a documented way.
std::shared_ptr<const SamlToken> FromText(const std::string &xml, const CertificateList &trusted) {
  try {
    return CreateSamlToken(xml, trusted);
  } catch (const Tarvel::Xml::XMLParseException &) {
  } catch (const ParseException &) {
  } catch (const InvalidSignatureException &) {
  }
  return nullptr;
}

/// @param hasCanonicalForm false when the element as a whole has none, which only this road asks for.
std::shared_ptr<const SamlToken> FromDom(const ElementNode &element, const CertificateList &trusted,
                                         bool &hasCanonicalForm) {
  hasCanonicalForm = true;
  try {
    return CreateSamlTokenFromDom(element, trusted);
  } catch (const Tarvel::Xml::Security::XmlSecurityException &) {
    hasCanonicalForm = false;
  } catch (const ParseException &) {
  } catch (const InvalidSignatureException &) {
  }
  return nullptr;
}

/// Reads the facts without asking who vouches for them: few inputs have a signature that verifies.
void ReadUnverifiedFacts(const ElementNode &element) {
  try {
    NodeFilterIterator iterator(&element, std::make_shared<SkipWsAndCommentsFilter>());
    SamlAssertionType assertion;
    ParseSamlAssertionElement(iterator, assertion);
    const TokenFacts facts = TakeTokenFacts(std::move(assertion));
    Require(!facts.subject.name.empty() && !facts.subject.domain.empty());
  } catch (const ParseException &) {
  }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  static const CertificateList trusted{Tarvel::Crypto::CreateCertificateFromPem(TRUSTED)};
  static const Tarvel::System::ScopedEnvironment clock({[] { return std::int64_t{1'767'323'045'006'000}; }, {}});

  const std::string xml(reinterpret_cast<const char *>(data), size);
  const std::shared_ptr<const SamlToken> fromText = FromText(xml, trusted);
  Require(!fromText || fromText->ToXml() == xml);

  Tarvel::Ref<Tarvel::Xml::Document> document;
  try {
    ParseXML(xml, document);
  } catch (const Tarvel::Xml::XMLParseException &) {
    Require(!fromText);
    return 0;
  }
  const ElementNode &root = *document->GetDocumentElement();
  bool hasCanonicalForm = false;
  const std::shared_ptr<const SamlToken> fromDom = FromDom(root, trusted, hasCanonicalForm);
  Require(!hasCanonicalForm || static_cast<bool>(fromText) == static_cast<bool>(fromDom));
  Require(!fromDom || (fromText->GetId() == fromDom->GetId() && fromText->GetSubject() == fromDom->GetSubject()));
  ReadUnverifiedFacts(root);
  return 0;
}
