// SPDX-License-Identifier: Apache-2.0

#include "outcome.h"

#include "support/data_file.h"
#include "support/exception_class.h"
#include "support/facts_of.h"
#include "xml/xml_text.h"

#include <ssoclient/create_saml_token.h>
#include <ssoclient/token_verifier.h>
#include <tarvel/xml/parser.h>

#include <stdexcept>

namespace Attacks {
namespace {

using namespace SsoClient;

template <typename Factory>
Outcome Try(const Factory &factory) {
  try {
    return {"", Testing::FactsOf(*factory())};
  } catch (const std::exception &failure) {
    return {Testing::ClassOf(failure), failure.what()};
  } catch (...) {
    return {"undocumented", "no std::exception"};
  }
}

const TokenVerifier &Saml2Verifier() {
  static const TokenVerifier VERIFIER = [] {
    VerifyOptions options;
    options.profile = TokenProfile::SAML2;
    return TokenVerifier(Trusted(), options);
  }();
  return VERIFIER;
}

const Tarvel::Xml::Node *NextInDocumentOrder(const Tarvel::Xml::Node *node) {
  if (node->GetFirstChild()) {
    return node->GetFirstChild();
  }
  while (node && !node->GetNextSibling()) {
    node = node->GetParent();
  }
  return node ? node->GetNextSibling() : nullptr;
}

const Tarvel::Xml::ElementNode &FindAssertion(const Tarvel::Xml::Document &document, std::size_t index) {
  const Tarvel::Xml::Node *node = document.GetDocumentElement();
  for (; node; node = NextInDocumentOrder(node)) {
    const Tarvel::Xml::ElementNode *const element = Tarvel::Xml::AsElement(node);
    if (element && element->GetLocalName() == "Assertion" && index-- == 0) {
      return *element;
    }
  }
  throw std::out_of_range("fewer assertions than asked for");
}

} // namespace

std::ostream &operator<<(std::ostream &out, const Outcome &outcome) {
  return out << (outcome.IsAccepted() ? "accepted" : outcome.exceptionClass) << '\t' << outcome.text;
}

const Tarvel::Crypto::CertificateList &Trusted() {
  static const Tarvel::Crypto::CertificateList TRUSTED = [] {
    Tarvel::Crypto::CertificateList list;
    for (const char *name : {"sts-rsa", "sts-rsa3072", "sts-rsa1024", "sts-ec256", "sts-ec384", "sts-ec521"}) {
      list.push_back(
          Tarvel::Crypto::CreateCertificateFromPem(Testing::ReadDataFile(std::string("tokens/") + name + ".crt")));
    }
    return list;
  }();
  return TRUSTED;
}

Outcome TryToken(const std::string &xml, TokenProfile profile) {
  if (profile == TokenProfile::STRICT) {
    return Try([&] { return CreateSamlToken(xml, Trusted()); });
  }
  return Try([&] { return Saml2Verifier().Verify(xml); });
}

Outcome TryElement(const std::string &xml, std::size_t index, TokenProfile profile) {
  Tarvel::Ref<Tarvel::Xml::Document> document;
  ParseXML(xml, document);
  const Tarvel::Xml::ElementNode &element = FindAssertion(*document, index);
  if (profile == TokenProfile::STRICT) {
    return Try([&] { return CreateSamlTokenFromDom(element, Trusted()); });
  }
  return Try([&] { return Saml2Verifier().Verify(element); });
}

std::string ReadToken(const std::string &name) {
  return Testing::ReadDataFile("tokens/" + name + ".xml");
}

std::string Replaced(std::string text, const std::string &from, const std::string &to) {
  const std::size_t place = text.find(from);
  if (place == std::string::npos) {
    throw std::logic_error("nothing to replace: " + from);
  }
  return text.replace(place, from.size(), to);
}

} // namespace Attacks
