// SPDX-License-Identifier: Apache-2.0
/// @file
/// Arbitrary bytes as a token, in both profiles: only the documented exceptions are thrown; an accepted token has the
/// facts of one of the tokens that the trusted key signed, and its text is returned byte for byte; the tree has the
/// same outcome as the text; and the profile SAML2 accepts all that the profile STRICT accepts, with the same facts.

#include "support/data_file.h"
#include "support/facts_of.h"
#include "token/assertion_parser.h"
#include "token/saml2_checks.h"
#include "token/saml2_details.h"
#include "token/saml2_facts.h"
#include "token/saml2_parser.h"
#include "token/token_facts.h"
#include "xml/xml_text.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/token_details.h>
#include <ssoclient/token_verifier.h>
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
using Tarvel::Xml::ElementNode;

/// A verifier, and the facts of the seeds that the trusted key signed and that are valid now. Mutating a seed cannot
/// produce another such token.
struct Profile {
  explicit Profile(TokenProfile profile)
      : verifier(Tarvel::Crypto::LoadCertificates(Testing::DataPath("tokens/sts-rsa.crt")), OptionsOf(profile)) {
    for (const char *const name :
         {"tokens/bearer", "tokens/bearer-minimal", "tokens/c14n-inclusive-prefixes", "tokens/delegated", "tokens/full",
          "tokens/holder-of-key", "tokens/reference-empty-uri", "tokens/reference-two", "tokens/rsa-pss-sha256",
          "tokens/style-default-namespace", "tokens/style-prefixes-on-root", "tokens/style-pretty"}) {
      AddGenuine(name);
    }
    if (profile == TokenProfile::SAML2) {
      for (const char *const name : SAML2_SEEDS) {
        AddGenuine(name);
      }
    }
  }

  static VerifyOptions OptionsOf(TokenProfile profile) {
    VerifyOptions options;
    options.profile = profile;
    return options;
  }

  void AddGenuine(const std::string &name) {
    genuineFacts.insert(Testing::FactsOf(*verifier.Verify(Testing::ReadDataFile(name + ".xml"))));
  }

  static constexpr const char *SAML2_SEEDS[] = {"saml2/wss4j-bearer",
                                                "saml2/wss4j-confirmation-data",
                                                "saml2/wss4j-conditions",
                                                "saml2/name-persistent",
                                                "saml2/form-unusable-key-and-bearer",
                                                "saml2/holder-rsa-value",
                                                "saml2/holder-ec-value",
                                                "saml2/holder-certificate-and-value",
                                                "saml2/authn-everything",
                                                "saml2/attributes-all-values",
                                                "saml2/attributes-known",
                                                "saml2/advice-everything",
                                                "saml2/delegation-confirmed",
                                                "saml2/confirmations-second-fits"};

  TokenVerifier verifier;
  std::set<std::string> genuineFacts;
};

void Require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

/// The token of `xml`, or null when it is refused in a documented way.
std::shared_ptr<const SamlToken> FromText(const std::string &xml, const TokenVerifier &verifier) {
  try {
    return verifier.Verify(xml);
  } catch (const Tarvel::Xml::XMLParseException &) {
  } catch (const ParseException &) {
  } catch (const InvalidSignatureException &) {
  }
  return nullptr;
}

/// @param hasCanonicalForm false when the element as a whole has no canonical form, which only this function needs.
std::shared_ptr<const SamlToken> FromDom(const ElementNode &element, const TokenVerifier &verifier,
                                         bool &hasCanonicalForm) {
  hasCanonicalForm = true;
  try {
    return verifier.Verify(element);
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

/// The same in the profile SAML2.
void ReadUnverifiedSaml2Facts(const ElementNode &element) {
  try {
    NodeFilterIterator iterator(&element, std::make_shared<SkipWsAndCommentsFilter>());
    Saml2Assertion assertion;
    ParseSaml2AssertionElement(iterator, assertion);
    CheckSaml2Properties(assertion, VerifyOptions());
    const TokenFacts facts = TakeSaml2Facts(assertion);
    Require(!facts.subject.name.empty() && !facts.subject.domain.empty());
    Require(facts.startDate < facts.endDate);
    TakeDetails(assertion);
  } catch (const ParseException &) {
  } catch (const Tarvel::Xml::Security::XmlSecurityException &) { // an attribute value has no canonical form
  }
}

/// Verifies `xml`, checks the outcome in the same way for both profiles, and returns the token; null if it is refused.
std::shared_ptr<const SamlToken> Judge(const std::string &xml, const Profile &profile) {
  const auto requireGenuine = [&profile](const std::shared_ptr<const SamlToken> &token) {
    Require(!token || profile.genuineFacts.count(Testing::FactsOf(*token)) == 1);
  };
  const std::shared_ptr<const SamlToken> fromText = FromText(xml, profile.verifier);
  requireGenuine(fromText);
  Require(!fromText || fromText->ToXml() == xml);

  Tarvel::Ref<Tarvel::Xml::Document> document;
  try {
    ParseXML(xml, document);
  } catch (const Tarvel::Xml::XMLParseException &) {
    Require(!fromText);
    return nullptr;
  }
  bool hasCanonicalForm = false;
  const std::shared_ptr<const SamlToken> fromDom =
      FromDom(*document->GetDocumentElement(), profile.verifier, hasCanonicalForm);
  requireGenuine(fromDom);
  Require(!hasCanonicalForm || static_cast<bool>(fromText) == static_cast<bool>(fromDom));
  Require(!fromDom || Testing::FactsOf(*fromText) == Testing::FactsOf(*fromDom));
  if (fromDom) {
    // A token from the canonical form has the same facts, or is refused.
    requireGenuine(FromText(fromDom->ToXml(), profile.verifier));
    Require(GetTokenDetails(*fromDom).subject == GetNameId(*fromText));
  }
  return fromText;
}

void ReadUnverified(const std::string &xml) {
  Tarvel::Ref<Tarvel::Xml::Document> document;
  try {
    ParseXML(xml, document);
  } catch (const Tarvel::Xml::XMLParseException &) {
    return;
  }
  ReadUnverifiedFacts(*document->GetDocumentElement());
  ReadUnverifiedSaml2Facts(*document->GetDocumentElement());
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  static const Tarvel::ScopedEnvironment clock({[] { return std::int64_t{1'767'323'045'006'000}; }, {}});
  static const Profile strict(TokenProfile::STRICT);
  static const Profile saml2(TokenProfile::SAML2);
  const std::string xml(reinterpret_cast<const char *>(data), size);
  const std::shared_ptr<const SamlToken> narrow = Judge(xml, strict);
  const std::shared_ptr<const SamlToken> wide = Judge(xml, saml2);
  Require(!narrow || (wide && Testing::FactsOf(*narrow) == Testing::FactsOf(*wide)));
  ReadUnverified(xml);
  return 0;
}
