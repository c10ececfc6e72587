// SPDX-License-Identifier: Apache-2.0

#include "token/saml_token_impl.h"

#include "token/assertion_parser.h"
#include "token/saml2_checks.h"
#include "token/saml2_facts.h"
#include "token/saml2_parser.h"
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

SamlTokenImpl::SamlTokenImpl(const std::string &xml, const KeyInfoResolver &resolver, const VerifyOptions &options) {
  {
    Ref<Document> document;
    ParseXML(xml, document);
    InitializeFromDom(document ? document->GetDocumentElement() : nullptr, resolver, options);
  }
  m_xml = xml; // after the tree and its copy of the text are destroyed: there is one copy of a large text at a time
}

SamlTokenImpl::SamlTokenImpl(const ElementNode &element, const KeyInfoResolver &resolver, const VerifyOptions &options)
    : m_xml(CanonicalElementText(element)) {
  InitializeFromDom(&element, resolver, options);
}

void SamlTokenImpl::InitializeFromDom(const ElementNode *element, const KeyInfoResolver &resolver,
                                      const VerifyOptions &options) {
  // The filter outlives all cursors, so the shared pointer owns nothing: counting references would cost two atomic
  // operations per cursor.
  const SkipWsAndCommentsFilter filter;
  NodeFilterIterator iterator(element, std::shared_ptr<const NodeFilter>(std::shared_ptr<void>(), &filter));
  if (options.profile == TokenProfile::SAML2) {
    InitializeSaml2(iterator, resolver, options);
  } else {
    InitializeStrict(iterator, resolver, options);
  }
}

void SamlTokenImpl::InitializeStrict(NodeFilterIterator &iterator, const KeyInfoResolver &resolver,
                                     const VerifyOptions &options) {
  SamlAssertionType assertion;
  ParseSamlAssertionElement(iterator, assertion);
  CheckTokenProperties(assertion, options.clockToleranceSec);
  ValidateSignature(*assertion.Signature, resolver);

  m_facts = TakeTokenFacts(std::move(assertion));
  CheckAudience(m_facts.audience, options, nullptr, ThrowingSink());
  CheckRequiredConfirmation(m_facts.confirmationMethod, options, nullptr, ThrowingSink());
}

void SamlTokenImpl::InitializeSaml2(NodeFilterIterator &iterator, const KeyInfoResolver &resolver,
                                    const VerifyOptions &options) {
  Saml2Assertion assertion;
  ParseSaml2AssertionElement(iterator, assertion);
  CheckSaml2Properties(assertion, options);
  ValidateSignature(*assertion.common.Signature, resolver);

  m_facts = TakeSaml2Facts(assertion);
  CheckAudienceRestrictions(assertion.details.audienceRestrictions, options, nullptr, ThrowingSink());
  CheckRequiredConfirmation(m_facts.confirmationMethod, options, nullptr, ThrowingSink());
  m_facts.audience = TakeCommonAudiences(std::move(assertion.details.audienceRestrictions));
  m_nameId = std::move(assertion.details.subject);
  m_usedConfirmation = assertion.details.usedConfirmation;
  if (m_facts.confirmationMethod == HOLDER_OF_KEY && !m_facts.confirmationCertificate) {
    m_confirmationKeyValue = std::move(assertion.details.confirmations[m_usedConfirmation].publicKey);
  }
}

NameId SamlTokenImpl::GetNameId() const {
  if (m_nameId) {
    return *m_nameId;
  }
  NameId nameId;
  nameId.value = m_facts.subject.name + "@" + m_facts.subject.domain;
  nameId.format = std::string(FORMAT_UPN);
  return nameId;
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
