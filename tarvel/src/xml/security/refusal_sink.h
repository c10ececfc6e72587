// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RefusalSink`, which receives everything for which the rules of a verification refuse a signature.
///
/// `Signature::Verify` and `Signature::Explain` run the same rules with different sinks: the sink of a verification throws
/// at the first refusal; that of a report keeps the refusal, and the rule goes on.

#pragma once

#include <tarvel/xml/security/signature_report.h>

#include <string>

namespace Tarvel::Xml::Security {

/// Receives refusals in the order in which the rules meet them. For one thread.
class RefusalSink {
public:
  /// Receives the rule that refuses, the message and the place (may be null). Rules add what they found and wanted to the
  /// result, so that a verification does not spend time on these texts. The result is valid until the next call.
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
