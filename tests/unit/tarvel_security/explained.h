// SPDX-License-Identifier: Apache-2.0
/// @file
/// The report on the signature of a document, and its verdict.

#pragma once

#include "documents.h"

#include <tarvel/xml/security/exceptions.h>
#include <tarvel/xml/security/signature.h>

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

/// What `Verify` does by a report: "accepted", "wrong", or the message of the exception.
inline std::string VerdictOf(const Tarvel::Xml::Security::SignatureReport &report) {
  if (report.refusals.empty()) {
    return "accepted";
  }
  return report.refusals.front().message.empty() ? "wrong" : report.refusals.front().message;
}

/// What `Verify` does.
inline std::string VerdictOf(const Tarvel::Xml::Security::Signature &signature,
                             const Tarvel::Xml::Security::KeyInfoResolver &resolver) {
  std::set<std::string> uris;
  try {
    return signature.Verify(resolver, uris) ? "accepted" : "wrong";
  } catch (const Tarvel::Xml::Security::XmlSecurityException &exception) {
    return exception.what();
  }
}

} // namespace Testing
