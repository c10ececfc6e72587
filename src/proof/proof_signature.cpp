// SPDX-License-Identifier: Apache-2.0

#include "proof/proof_signature.h"

#include "model/namespaces.h"
#include "proof/key_info_referral.h"
#include "proof/message_checks.h"
#include "xml/refuse.h"

#include <tarvel/xml/security/exceptions.h>

namespace SsoClient {

namespace {

using Tarvel::Ref;
using Tarvel::Crypto::VerifyingKey;
using Tarvel::Xml::AsElement;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;
using Tarvel::Xml::Security::Signature;

/// Whether `signature` refers to the token and to nothing else.
bool RefersToToken(const ElementNode &signature, const SamlToken &token, const VerifyingKey *key, DeviationSink &sink) {
  switch (FindKeyReferral(signature, token, key)) {
  case KeyReferral::TOKEN:
    return true;
  case KeyReferral::OTHER_TOKEN:
    Refuse(sink, signature, "a reference to the token of the security header", "",
           "A signature of the security header refers to another token");
    return false;
  case KeyReferral::SEVERAL:
    Refuse(sink, signature, "one reference", "", "A signature refers to the token and to something else");
    return false;
  case KeyReferral::NOTHING:
  case KeyReferral::OTHER_KEY:
    break;
  }
  return false;
}

} // namespace

const ElementNode *FindProofSignature(const ElementNode &security, const SamlToken &token, const VerifyingKey *key,
                                      DeviationSink &sink) {
  const ElementNode *proof = nullptr;
  std::size_t count = 0;
  for (const Node *child = security.GetFirstChild(); child; child = child->GetNextSibling()) {
    const ElementNode *const element = AsElement(child);
    if (!element || !element->HasQName(Namespaces::DS, "Signature")) {
      continue;
    }
    if (++count > MAX_HEADER_SIGNATURES) {
      Refuse(sink, *element, "fewer signatures", "", "The security header has more than %1 signatures",
             MAX_HEADER_SIGNATURES);
      break;
    }
    if (RefersToToken(*element, token, key, sink)) {
      if (proof) {
        Refuse(sink, *element, "one", "two", "Two signatures refer to the token");
      } else {
        proof = element;
      }
    }
  }
  return proof;
}

boost::optional<Signature::Coverage> VerifyProofSignature(const ElementNode &signature, const VerifyingKey &key,
                                                          DeviationSink &sink) {
  try {
    Ref<Signature> parsed;
    Tarvel::Xml::Security::CreateSignatureFromDom(signature, signature, parsed);
    Signature::Coverage coverage;
    if (parsed->Verify(key, coverage)) {
      return coverage;
    }
  } catch (const Tarvel::Xml::Security::SignatureSyntaxException &error) {
    Refuse(sink, signature, "", "", "Syntax error in the signature of the message: %1", error.what());
    return boost::none;
  } catch (const Tarvel::Xml::Security::XmlSecurityException &error) {
    Refuse(sink, signature, "", "", "The signature of the message is not accepted: %1", error.what());
    return boost::none;
  }
  Refuse(sink, signature, "a signature by the token's key over the present content", "",
         "The signature of the message is wrong: another key made it, or signed content was changed");
  return boost::none;
}

} // namespace SsoClient
