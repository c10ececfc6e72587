// SPDX-License-Identifier: Apache-2.0
/// @file
/// Signatures: reading and verifying the first `Signature` element of any document ends in an answer or in a documented
/// exception, and in the same one each time.

#include <tarvel/crypto/certificate.h>
#include <tarvel/io/reader.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/exceptions.h>
#include <tarvel/xml/security/key_info_resolver.h>
#include <tarvel/xml/security/signature.h>

#include <cstdint>
#include <cstdlib>
#include <set>
#include <string>

namespace {

using Tarvel::Ref;
using Tarvel::Xml::Document;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;

// Of the key that the seeds are signed with; made by openssl.
constexpr const char *SIGNER = R"(
-----BEGIN CERTIFICATE-----
MIICyTCCAbECFAv6tQ9/HIsB/Tx3grBHGnf2XMPYMA0GCSqGSIb3DQEBCwUAMCAx
EDAOBgNVBAoMB0V4YW1wbGUxDDAKBgNVBAMMA3N0czAgFw0yMDAxMDEwMDAwMDBa
GA8yMTIwMDEwMTAwMDAwMFowIDEQMA4GA1UECgwHRXhhbXBsZTEMMAoGA1UEAwwD
c3RzMIIBIjANBgkqhkiG9w0BAQEFAAOCAQ8AMIIBCgKCAQEA8n+JEaYVjFIgZB7B
Z1ImemklkeMBWn2ZxPauFWDBKKAghAOZOHGA3hHWb8LG1tfocoxR4dVyJ6HnYCsQ
SDcd0VqIbXjY6B2fa9f+TRg5DAev/9+2fhHVfIKKBKQEIFSxk4/O1L7MCJsNdyRU
tZpEs3WnpqDgE4crw0tHgAOzDt1jWQUra17Jw3zJ49vvDvI0m76pw7d/nPpFODiX
8FeqBW4YNRgC6XbCMsew+NQ2tGyVqU3brFGsrdqI/uLlhte8LOO1SrDrKSjRb3ie
33H/bWMWHlgyHrLhpS2iViUms1brhsAOi7h8TQTerOybUODZzbwOndVHsS9IgeC5
MfryLwIDAQABMA0GCSqGSIb3DQEBCwUAA4IBAQDa71KAJpnSVOoVcj9VwlIUmtSk
L7DnKspnLzqwm9O3MQTrr7ry4MxXme3TCl4yKilt2uDWJU6IZb+aISnviG2lShND
MwbaebXo/P87B0wQi98PmTy7+bVMnHlYP1RnR7PN+Gkbh9VmkYVbJMo94vYe3j7i
9Sct2Obu+oufoX7dBwtKa4iYDMDBaEi5LXZ+RkCpOR9K3XQMnqq9egBhcmmlbz4q
+iI+KQUcj0s8w+25QuTsDsigbWNTc7NUr9W7CxFRX62eqn/vUtI6EcLN6LFfXk8P
KnOCIjIZfYEE6BJcIaKsKSan1HibjkBzQhnNIr8+Etd7gMB/WrG3EQoe7xn5
-----END CERTIFICATE-----
)";

// A second one, so that there is a choice to narrow.
constexpr const char *OTHER = R"(
-----BEGIN CERTIFICATE-----
MIIBSDCB7wIUTiikHExPU+/DgLqmzY5XmkBjGj8wCgYIKoZIzj0EAwIwJjEQMA4G
A1UECgwHRXhhbXBsZTESMBAGA1UEAwwJc3RzIFAtMjU2MCAXDTIwMDEwMTAwMDAw
MFoYDzIxMjAwMTAxMDAwMDAwWjAmMRAwDgYDVQQKDAdFeGFtcGxlMRIwEAYDVQQD
DAlzdHMgUC0yNTYwWTATBgcqhkjOPQIBBggqhkjOPQMBBwNCAASQqYOrRu86EH8I
sUDSi9QesTvMPE1g5td3V3Fjo4Tsn54B+2JjxNT0RLX4pqjdtqTPn5JCVZvVLDx7
Rtco1b73MAoGCCqGSM49BAMCA0gAMEUCIBoHqYEpKsZQ6xZoru139VSu0JCuJg+V
a/VrZY74R2I8AiEArLKNh0tn5LB6dH1I/V5BglLud+UyHfFiP3Vb7VOsPpY=
-----END CERTIFICATE-----
)";

void Require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

const ElementNode *FindSignature(const Document &document) {
  for (const Node *node = document.GetDocumentNode(); node;) {
    const ElementNode *element = Tarvel::Xml::AsElement(node);
    if (element && element->GetLocalName() == "Signature") {
      return element;
    }
    if (node->GetFirstChild()) {
      node = node->GetFirstChild();
      continue;
    }
    while (node && !node->GetNextSibling()) {
      node = node->GetParent();
    }
    node = node ? node->GetNextSibling() : nullptr;
  }
  return nullptr;
}

std::string Judge(const Tarvel::Xml::Security::Signature &signature) {
  static const auto resolver = Tarvel::Xml::Security::CreateTrustSetKeyResolver(
      {Tarvel::Crypto::CreateCertificateFromPem(SIGNER), Tarvel::Crypto::CreateCertificateFromPem(OTHER)});
  std::set<std::string> uris;
  try {
    const bool isGenuine = signature.Verify(*resolver, uris);
    Require(uris.empty() != isGenuine);
    return isGenuine ? "genuine" : "wrong";
  } catch (const Tarvel::Xml::Security::XmlSecurityException &exception) {
    Require(uris.empty());
    return exception.what();
  }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  try {
    const Ref<Tarvel::Object> result =
        Tarvel::Xml::CreateXMLParser(Tarvel::Xml::CreateXMLDocumentHandler())
            ->Parse(*Tarvel::CreateStringReader(std::string(reinterpret_cast<const char *>(data), size)));
    const Ref<Document> document(&dynamic_cast<Document &>(*result));
    const ElementNode *element = FindSignature(*document);
    if (!element) {
      return 0;
    }
    Ref<Tarvel::Xml::Security::Signature> signature;
    Tarvel::Xml::Security::CreateSignatureFromDom(*document->GetDocumentElement(), *element, signature);
    Require(Judge(*signature) == Judge(*signature));
  } catch (const Tarvel::Xml::XMLParseException &) {
  } catch (const Tarvel::Xml::Security::SignatureSyntaxException &) {
  }
  return 0;
}
