// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/token_details.h>

#include "token/saml2_details.h"
#include "token/saml2_parser.h"
#include "token/saml_token_impl.h"
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

/// The details of `token`. The profile SAML2 reads the tokens of both profiles.
TokenDetails ReadDetails(const SamlTokenImpl &token) {
  Tarvel::Ref<Tarvel::Xml::Document> document;
  ParseXML(token.ToXml(), document);
  NodeFilterIterator iterator(document->GetDocumentElement(), std::make_shared<const SkipWsAndCommentsFilter>());
  Saml2Assertion assertion;
  ParseSaml2AssertionElement(iterator, assertion);
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
