// SPDX-License-Identifier: Apache-2.0
/// @file
/// Arbitrary bytes as a token: only the documented exceptions are thrown; an accepted token has the facts of one of the
/// tokens that the trusted key signed, and its text is returned byte for byte; and the tree gives the same outcome as
/// the text.

#include "support/data_file.h"
#include "support/facts_of.h"
#include "token/assertion_parser.h"
#include "token/token_facts.h"
#include "xml/xml_text.h"

#include <ssoclient/create_saml_token.h>
#include <ssoclient/exceptions.h>
#include <tarvel/core/environment.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/exceptions.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <set>
#include <string>
#include <utility>

namespace {

using namespace SsoClient;
using Tarvel::Crypto::CertificateList;
using Tarvel::Xml::ElementNode;

/// The facts of the seeds that the trusted key signed and that are valid now. Mutating a seed cannot produce another
/// such token.
std::set<std::string> ReadGenuineFacts(const CertificateList &trusted) {
  std::set<std::string> facts;
  for (const char *const name : {"bearer", "bearer-minimal", "c14n-inclusive-prefixes", "delegated", "full",
                                 "holder-of-key", "reference-empty-uri", "reference-two", "rsa-pss-sha256",
                                 "style-default-namespace", "style-prefixes-on-root", "style-pretty"}) {
    const std::string xml = Testing::ReadDataFile("tokens/" + std::string(name) + ".xml");
    facts.insert(Testing::FactsOf(*CreateSamlToken(xml, trusted)));
  }
  return facts;
}

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

/// @param hasCanonicalForm false when the element as a whole has no canonical form, which only this function needs.
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

/// Reads the facts without verifying the signature, because few inputs have one that verifies.
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
  static const CertificateList trusted = Tarvel::Crypto::LoadCertificates(Testing::DataPath("tokens/sts-rsa.crt"));
  static const Tarvel::ScopedEnvironment clock({[] { return std::int64_t{1'767'323'045'006'000}; }, {}});
  static const std::set<std::string> genuineFacts = ReadGenuineFacts(trusted);
  const auto requireGenuine = [](const std::shared_ptr<const SamlToken> &token) {
    Require(!token || genuineFacts.count(Testing::FactsOf(*token)) == 1);
  };

  const std::string xml(reinterpret_cast<const char *>(data), size);
  const std::shared_ptr<const SamlToken> fromText = FromText(xml, trusted);
  requireGenuine(fromText);
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
  requireGenuine(fromDom);
  Require(!hasCanonicalForm || static_cast<bool>(fromText) == static_cast<bool>(fromDom));
  Require(!fromDom || Testing::FactsOf(*fromText) == Testing::FactsOf(*fromDom));
  if (fromDom) {
    // A token from the canonical form has the same facts, or is refused.
    requireGenuine(FromText(fromDom->ToXml(), trusted));
  }
  ReadUnverifiedFacts(root);
  return 0;
}
