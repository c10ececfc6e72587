// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/token_details.h>

#include "token/saml2_details.h"
#include "token/saml2_parser.h"
#include "token/saml_token_impl.h"
#include "xml/deviation_sink.h"
#include "xml/xml_text.h"

#include <tarvel/core/exception.h>

#include <memory>
#include <utility>

namespace SsoClient {

namespace {

const SamlTokenImpl &ImplementationOf(const SamlToken &token) {
  const auto *const implementation = dynamic_cast<const SamlTokenImpl *>(&token);
  if (!implementation) {
    throw Tarvel::InvalidArgumentException("the token was not made by this library");
  }
  return *implementation;
}

/// Ignores deviations. A verified token has none, but the canonical form of an element repeats the `xml:` attributes of the
/// elements around it, which an assertion may not have.
class IgnoringSink final : public DeviationSink {
public:
  bool IsFull() const noexcept override { return true; }
  void Add(Deviation) override {}
  void Count() noexcept override {}
};

/// The details of `token`. The profile SAML2 reads the tokens of both profiles.
TokenDetails ReadDetails(const SamlTokenImpl &token) {
  Tarvel::Ref<Tarvel::Xml::Document> document;
  ParseXML(token.ToXml(), document);
  NodeFilterIterator iterator(document->GetDocumentElement(), std::make_shared<const SkipWsAndCommentsFilter>());
  Saml2Assertion assertion;
  IgnoringSink sink;
  ParseSaml2AssertionElement(iterator, assertion, sink);
  assertion.details.subject = token.GetNameId(); // white space before a comment is a part of it in the canonical form
  assertion.details.usedConfirmation = token.GetUsedConfirmation();
  return TakeDetails(assertion);
}

} // namespace

TokenDetails GetTokenDetails(const SamlToken &token) {
  return ReadDetails(ImplementationOf(token));
}

NameId GetNameId(const SamlToken &token) {
  return ImplementationOf(token).GetNameId();
}

std::vector<SamlAttribute> GetAttributes(const SamlToken &token) {
  return ReadDetails(ImplementationOf(token)).attributes;
}

} // namespace SsoClient
