// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RefusalSink`, which receives each reason for which the rules of a verification refuse a signature.
///
/// `Signature::Verify` and `Signature::Explain` run the same rules with different sinks. The sink of a verification
/// throws at the first refusal. The sink of a report keeps the refusal, and the rule continues.

#pragma once

#include <tarvel/xml/security/signature_report.h>

#include <string>

namespace Tarvel::Xml::Security {

/// Receives refusals in the order in which the rules find them. Used by one thread, except for `ThrowingSink`.
class RefusalSink {
public:
  /// Receives the rule that refuses, the message, and the place, which may be null. Rules write what they found and
  /// wanted into the result, so a verification spends no time on these texts. The result is valid until the next call.
  /// @throws XmlSecurityException with the message, if this is the sink of a verification.
  virtual SignatureReport::Refusal &Add(SignatureRule rule, const std::string &message, const ElementNode *element) = 0;

protected:
  RefusalSink() = default;
  RefusalSink(const RefusalSink &) = default;
  RefusalSink &operator=(const RefusalSink &) = default;
  ~RefusalSink() = default;
};

/// The sink of verifications, which throws at the first refusal. It has no state, so all threads may use it.
RefusalSink &ThrowingSink() noexcept;

} // namespace Tarvel::Xml::Security
