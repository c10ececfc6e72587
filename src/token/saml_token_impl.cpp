// SPDX-License-Identifier: Apache-2.0

#include "token/saml_token_impl.h"

#include "token/assertion_parser.h"
#include "token/signature_refusal.h"
#include "token/token_checks.h"
#include "xml/xml_text.h"

#include <ssoclient/exceptions.h>
#include <tarvel/xml/security/exceptions.h>

#include <memory>
#include <utility>

namespace SsoClient {

using Tarvel::Ref;
using Tarvel::Xml::Document;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Security::KeyInfoResolver;
using Tarvel::Xml::Security::Signature;

SamlTokenImpl::SamlTokenImpl(const std::string &xml, const KeyInfoResolver &resolver, std::int64_t clockToleranceSec) {
  {
    Ref<Document> document;
    ParseXML(xml, document);
    InitializeFromDom(document ? document->GetDocumentElement() : nullptr, resolver, clockToleranceSec);
  }
  m_xml = xml; // after the tree and its copy of the text are destroyed: there is one copy of a large text at a time
}

SamlTokenImpl::SamlTokenImpl(const ElementNode &element, const KeyInfoResolver &resolver,
                             std::int64_t clockToleranceSec)
    : m_xml(CanonicalElementText(element)) {
  InitializeFromDom(&element, resolver, clockToleranceSec);
}

void SamlTokenImpl::InitializeFromDom(const ElementNode *element, const KeyInfoResolver &resolver,
                                      std::int64_t clockToleranceSec) {
  // The filter outlives all cursors, so the shared pointer owns nothing: counting references would cost two atomic
  // operations per cursor.
  const SkipWsAndCommentsFilter filter;
  NodeFilterIterator iterator(element, std::shared_ptr<const NodeFilter>(std::shared_ptr<void>(), &filter));
  SamlAssertionType assertion;
  ParseSamlAssertionElement(iterator, assertion);
  CheckTokenProperties(assertion, clockToleranceSec);
  ValidateSignature(*assertion.Signature, resolver);

  m_facts = TakeTokenFacts(std::move(assertion));
}

void SamlTokenImpl::ValidateSignature(const Signature &signature, const KeyInfoResolver &resolver) {
  bool verified = false;
  try {
    std::set<std::string> signedUris;
    verified = signature.Verify(resolver, signedUris);
  } catch (const Tarvel::Xml::Security::XmlSecurityException &error) {
    throw InvalidSignatureException(SignatureRefusalText(error.what()));
  }
  if (!verified) {
    throw InvalidSignatureException(SignatureRefusalText({}));
  }
}

} // namespace SsoClient
