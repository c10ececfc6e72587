// SPDX-License-Identifier: Apache-2.0
/// @file
/// Reads the signature of a message that was signed, and verifies it with the key of the token.

#pragma once

#include "support/sample_message.h"
#include "support/xml_tree.h"
#include "token/confirmation_key.h"

#include <tarvel/xml/security/signature.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace Testing {

/// The first element below `top` with that local name; a null pointer if there is none.
inline const Tarvel::Xml::ElementNode *FindBelow(const Tarvel::Xml::Node &top, std::string_view localName) {
  for (const Tarvel::Xml::Node *child = top.GetFirstChild(); child; child = child->GetNextSibling()) {
    const auto *const element = Tarvel::Xml::AsElement(child);
    const auto *const found = element && element->GetLocalName() == localName ? element : FindBelow(*child, localName);
    if (found) {
      return found;
    }
  }
  return nullptr;
}

/// The local names of what the proof signature of `text` covers, in the order of its references. The signature is the child
/// of the first security header. Each is verified with the key of `token`; "(wrong)" if that fails.
inline std::vector<std::string> CoveredBySignature(const std::string &text, const SsoClient::SamlToken &token) {
  const Tarvel::Ref<Tarvel::Xml::Document> document = ParseDocument(text);
  const auto *const security = FindBelow(*document->GetDocumentNode(), "Security");
  const auto *const element = security ? security->FindChildElement("Signature") : nullptr;
  if (!element) {
    return {"(no signature)"};
  }
  Tarvel::Ref<Tarvel::Xml::Security::Signature> signature;
  Tarvel::Xml::Security::CreateSignatureFromDom(*document->GetDocumentElement(), *element, signature);
  Tarvel::Xml::Security::Signature::Coverage coverage;
  if (!signature->Verify(*SsoClient::GetConfirmationKey(token), coverage)) {
    return {"(wrong)"};
  }
  std::vector<std::string> names;
  for (const auto &target : coverage.targets) {
    names.emplace_back(Tarvel::Xml::AsElement(target.node)->GetLocalName());
  }
  return names;
}

} // namespace Testing
