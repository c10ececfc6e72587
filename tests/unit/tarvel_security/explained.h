// SPDX-License-Identifier: Apache-2.0
/// @file
/// The report on the signature of a document, and its verdict.

#pragma once

#include "documents.h"

#include <tarvel/xml/security/exceptions.h>
#include <tarvel/xml/security/signature.h>

#include <cstddef>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace Testing {

/// A report with the document that its pointers belong to.
struct Explained {
  Tarvel::Ref<Tarvel::Xml::Document> document;
  Tarvel::Xml::Security::SignatureReport report;
};

inline Explained Explain(std::string_view text, const Tarvel::Xml::Security::KeyInfoResolver &resolver) {
  Explained explained{ParseDocument(text), {}};
  explained.report = SignatureOf(*explained.document)->Explain(resolver);
  return explained;
}

inline Explained Explain(std::string_view text, const std::vector<std::string> &trusted = {"sts-rsa"}) {
  return Explain(text, *Tarvel::Xml::Security::CreateTrustSetKeyResolver(Trusted(trusted)));
}

/// What `Verify` does according to a report: "accepted", "wrong", or the message of the exception.
inline std::string VerdictOf(const Tarvel::Xml::Security::SignatureReport &report) {
  if (report.refusals.empty()) {
    return "accepted";
  }
  return report.refusals.front().message.empty() ? "wrong" : report.refusals.front().message;
}

/// What `Verify` does, in the same words.
inline std::string VerdictOf(const Tarvel::Xml::Security::Signature &signature,
                             const Tarvel::Xml::Security::KeyInfoResolver &resolver) {
  std::set<std::string> uris;
  try {
    return signature.Verify(resolver, uris) ? "accepted" : "wrong";
  } catch (const Tarvel::Xml::Security::XmlSecurityException &exception) {
    return exception.what();
  }
}

inline std::string NameOf(Tarvel::Xml::Security::SignatureRule rule) {
  constexpr const char *NAMES[] = {"PROFILE", "KEYS", "REFERENCES", "VALUE", "DIGESTS"};
  return NAMES[static_cast<std::size_t>(rule)];
}

using Texts = std::vector<std::string>;

/// Each refusal on five lines: rule, message, element, what was found and wanted.
inline Texts RefusalsOf(const Tarvel::Xml::Security::SignatureReport &report) {
  Texts texts;
  for (const auto &[rule, message, element, found, wanted] : report.refusals) {
    const std::string name = element ? std::string(element->GetName()) : "no element";
    texts.push_back(NameOf(rule) + "\n" + message + "\n" + name + "\n" + found + "\n" + wanted);
  }
  return texts;
}

inline Texts RefusalsOf(const Explained &explained) {
  return RefusalsOf(explained.report);
}

/// The refusal of the signature's value; a change of `SignedInfo` causes it, too.
constexpr const char *WRONG_VALUE = "VALUE\n\nds:SignatureValue\n\na signature by a trusted key";

} // namespace Testing
