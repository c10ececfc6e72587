// SPDX-License-Identifier: Apache-2.0

#include "token/signature_explainer.h"

#include "token/signature_refusal.h"
#include "token/trusted_keys.h"

#include <tarvel/core/string_util.h>

#include <algorithm>
#include <string>

namespace SsoClient {

namespace {

using Check = TokenReport::Check;
using Tarvel::Xml::AsElement;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;
using Tarvel::Xml::Security::SignatureReport;
using Tarvel::Xml::Security::SignatureRule;

TokenReport::Reference DescribeReference(const SignatureReport::Reference &reference, const ElementNode &assertion) {
  TokenReport::Reference described;
  const Node *const target = reference.target;
  const ElementNode *const element = AsElement(target);
  described.uri = ReportText(reference.uri);
  described.resolves = target != nullptr;
  described.coversToken = target && (target == &assertion || target == assertion.GetRoot());
  described.target = element ? ReportText(element->GetName()) : target ? "document" : "";
  for (const std::string &transform : reference.transforms) {
    described.transforms.push_back(ReportText(transform));
  }
  described.digestMethod = ReportText(reference.digestMethod);
  described.digestWanted = ReportText(Tarvel::StringUtil::Base64Encode(reference.digestWanted));
  described.digestComputed = Tarvel::StringUtil::Base64Encode(reference.digestComputed);
  described.digestMatches = reference.digestMatches;
  return described;
}

TokenReport::TrustedKey DescribeKey(const SignatureReport::Key &key) {
  TokenReport::TrustedKey described = DescribeTrustedKey(key.certificate);
  described.isNamed = key.isNamed;
  described.isUsable = key.isUsable;
  described.madeSignature = key.madeSignature;
  return described;
}

void Describe(const SignatureReport &signature, const ElementNode &assertion, TokenReport &report) {
  report.signatureAlgorithm = ReportText(signature.signatureMethod);
  report.canonicalization = ReportText(signature.canonicalizationMethod);
  for (const SignatureReport::Reference &reference : signature.references) {
    report.references.push_back(DescribeReference(reference, assertion));
  }
  report.trustedKeys.clear();
  for (const SignatureReport::Key &key : signature.keys) {
    report.trustedKeys.push_back(DescribeKey(key));
  }
  for (const SignatureReport::NamedCertificate &named : signature.namedCertificates) {
    report.namedCertificates.push_back({ReportText(named.subject), named.thumbprint, named.isTrusted});
  }
}

std::string NameOf(const std::string &subject, const std::string &thumbprint) {
  return subject + " (SHA-256 " + thumbprint + ")";
}

std::string CountOf(std::size_t count, std::size_t all, const char *what) {
  return std::to_string(count) + " of " + std::to_string(all) + " " + what;
}

/// What the `KeyInfo` says; empty if it names trusted certificates only, or none.
std::string DescribeStrangers(const TokenReport &report) {
  std::string text;
  for (const TokenReport::NamedCertificate &named : report.namedCertificates) {
    if (!named.isTrusted) {
      text += "; KeyInfo names a certificate that ";
      text +=
          named.thumbprint.empty() ? "cannot be read" : "is not trusted: " + NameOf(named.subject, named.thumbprint);
      text += "; it was not used";
    }
  }
  return text;
}

/// Runs one check after the other over what the platform found.
class Explainer {
public:
  Explainer(const SignatureReport &signature, const TokenReport &report, ReportRecorder &recorder)
      : m_signature(signature), m_report(report), m_recorder(recorder) {}

  void ExplainAlgorithms() {
    Begin(Check::ALGORITHMS, SignatureRule::PROFILE);
    m_recorder.Summarize("The signature's algorithm is " + m_report.signatureAlgorithm + ", its canonicalization " +
                         m_report.canonicalization + ".");
  }

  void ExplainKeys() {
    Begin(Check::KEYS, SignatureRule::KEYS);
    const auto &keys = m_report.trustedKeys;
    const auto usable = static_cast<std::size_t>(
        std::count_if(keys.begin(), keys.end(), [](const TokenReport::TrustedKey &key) { return key.isUsable; }));
    const std::string summary = CountOf(usable, keys.size(), "trusted keys") + " can be used with the signature" +
                                DescribeStrangers(m_report) + ".";
    if (usable == 0) {
      m_recorder.SetNotDone(summary);
    } else {
      m_recorder.Summarize(summary);
    }
  }

  void ExplainReferences() {
    Begin(Check::REFERENCES, SignatureRule::REFERENCES);
    const auto &references = m_report.references;
    const auto resolved = static_cast<std::size_t>(std::count_if(
        references.begin(), references.end(), [](const TokenReport::Reference &one) { return one.resolves; }));
    const std::string summary = CountOf(resolved, references.size(), "references resolve.");
    if (resolved == 0 || resolved != references.size()) {
      m_recorder.SetNotDone(summary);
    } else {
      m_recorder.Summarize(summary);
    }
  }

  void ExplainValue() {
    Begin(Check::SIGNATURE, SignatureRule::VALUE);
    const auto &keys = m_report.trustedKeys;
    const auto signer =
        std::find_if(keys.begin(), keys.end(), [](const TokenReport::TrustedKey &key) { return key.madeSignature; });
    if (signer != keys.end()) {
      m_recorder.Summarize("Signed by " + NameOf(signer->subject, signer->thumbprint) + ".");
    } else {
      // There is no refusal of the value if none of the keys that KeyInfo selects can be used; other keys are tried only
      // for the report.
      m_recorder.SetNotDone(m_signature.isValueChecked ? "No trusted key made the signature."
                                                       : "No key could be tried.");
    }
  }

  void ExplainDigests() {
    Begin(Check::DIGESTS, SignatureRule::DIGESTS);
    const auto &references = m_report.references;
    const auto matching = static_cast<std::size_t>(std::count_if(
        references.begin(), references.end(), [](const TokenReport::Reference &one) { return one.digestMatches; }));
    const std::string summary = CountOf(matching, references.size(), "digests match.");
    if (m_signature.areDigestsComputed) {
      m_recorder.Summarize(summary);
    } else {
      m_recorder.SetNotDone("Not all digests could be computed.");
    }
  }

private:
  void Begin(Check check, SignatureRule rule) {
    m_recorder.Begin(check);
    for (const SignatureReport::Refusal &refusal : m_signature.refusals) {
      if (refusal.rule == rule) {
        ReportDeviation(m_recorder, [&refusal] {
          return Deviation{
              SignatureRefusalText(refusal.message), refusal.element, {}, refusal.wanted, refusal.found, 0};
        });
      }
    }
  }

  const SignatureReport &m_signature;
  const TokenReport &m_report;
  ReportRecorder &m_recorder;
};

} // namespace

void ExplainSignature(const Tarvel::Xml::Security::Signature *signature, const ElementNode &assertion,
                      const Tarvel::Xml::Security::KeyInfoResolver &resolver, TokenReport &report,
                      ReportRecorder &recorder) {
  if (!signature) {
    for (const Check check : {Check::ALGORITHMS, Check::KEYS, Check::REFERENCES, Check::SIGNATURE, Check::DIGESTS}) {
      recorder.Skip(check, "There is no signature that can be read.");
    }
    return;
  }
  const SignatureReport found = signature->Explain(resolver);
  Describe(found, assertion, report);
  Explainer explainer(found, report, recorder);
  explainer.ExplainAlgorithms();
  explainer.ExplainKeys();
  explainer.ExplainReferences();
  explainer.ExplainValue();
  explainer.ExplainDigests();
}

} // namespace SsoClient
