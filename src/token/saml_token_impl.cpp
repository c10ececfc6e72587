// SPDX-License-Identifier: Apache-2.0

#include "token/saml_token_impl.h"

#include "token/assertion_parser.h"
#include "token/token_checks.h"
#include "xml/parse_xml.h"

#include <ssoclient/exceptions.h>
#include <tarvel/io/writer.h>
#include <tarvel/xml/security/canonicalizer.h>
#include <tarvel/xml/security/exceptions.h>

#include <memory>
#include <utility>

namespace SsoClient {

namespace {

using Tarvel::Ref;
using Tarvel::Xml::Document;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Security::KeyInfoResolver;
using Tarvel::Xml::Security::Signature;

// The published URI has no "#" at its end; the canonicalizer knows this spelling as the same algorithm.
constexpr const char *CANONICAL_XML = "http://www.w3.org/TR/2001/REC-xml-c14n-20010315#";

std::string Canonicalize(const ElementNode &element) {
  const Ref<Tarvel::StringWriter> writer = Tarvel::CreateStringWriter();
  Tarvel::Xml::Security::CreateCanonicalizer(CANONICAL_XML)->Canonicalize(element, *writer);
  return writer->TakeText();
}

} // namespace

SamlTokenImpl::SamlTokenImpl(const std::string &xml, const KeyInfoResolver &resolver, std::int64_t clockToleranceSec) {
  {
    Ref<Document> document;
    ParseXML(xml, document);
    InitializeFromDom(document ? document->GetDocumentElement() : nullptr, resolver, clockToleranceSec);
  }
  m_xml = xml; // not before the tree and its own copy of the text are gone: a large document needs one copy at a time
}

SamlTokenImpl::SamlTokenImpl(const ElementNode &element, const KeyInfoResolver &resolver,
                             std::int64_t clockToleranceSec)
    : m_xml(Canonicalize(element)) {
  InitializeFromDom(&element, resolver, clockToleranceSec);
}

void SamlTokenImpl::InitializeFromDom(const ElementNode *element, const KeyInfoResolver &resolver,
                                      std::int64_t clockToleranceSec) {
  // The filter outlives all cursors. So it is shared without a count, which would cost two atomic operations a cursor.
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
    throw InvalidSignatureException(std::string("Signature verification error. ") + error.what());
  }
  if (!verified) {
    throw InvalidSignatureException("Failed to verify signature: token might have been tampered with.");
  }
}

} // namespace SsoClient
