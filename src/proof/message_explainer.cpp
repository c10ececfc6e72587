// SPDX-License-Identifier: Apache-2.0

#include "proof/message_explainer.h"

#include "proof/message_checks.h"
#include "proof/message_recorder.h"
#include "xml/date_time_text.h"
#include "xml/xml_text.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/ref.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/parser.h>

#include <algorithm>

namespace SsoClient {

namespace {

using Check = MessageReport::Check;
using Tarvel::Ref;
using Tarvel::Crypto::Certificate;
using Tarvel::Xml::Document;

constexpr const char *NO_SECURITY_HEADER = "There is no security header.";

/// Runs the rules in their order. A rule is skipped if something that it reads is missing.
class MessageExplainer {
public:
  MessageExplainer(const TokenVerifier &tokens, const MessageVerifierOptions &options,
                   const Certificate *peerCertificate, MessageReport &report, MessageRecorder &recorder)
      : m_tokens(tokens), m_report(report),
        m_recorder(recorder), m_sinks{recorder, recorder, recorder}, m_rules{options, peerCertificate, m_sinks} {}

  void Explain(const Document &document);

private:
  bool ExplainEnvelope(const Document &document);
  bool ExplainSecurityHeader();
  void ExplainTimestamp();
  void ExplainToken();
  void ExplainProof(const Document &document);
  void ExplainParts();

  const TokenVerifier &m_tokens;
  MessageReport &m_report;
  MessageRecorder &m_recorder;
  const MessageSinks m_sinks;
  const MessageRules m_rules;
  CheckedMessage m_message;
};

void MessageExplainer::Explain(const Document &document) {
  if (!ExplainEnvelope(document)) {
    m_recorder.SkipFrom(Check::SECURITY_HEADER, "There is no envelope.");
    return;
  }
  if (!ExplainSecurityHeader()) {
    m_recorder.Skip(Check::TIMESTAMP, NO_SECURITY_HEADER);
    m_recorder.Skip(Check::TOKEN, NO_SECURITY_HEADER);
    m_recorder.Skip(Check::PROOF, NO_SECURITY_HEADER);
  } else {
    ExplainTimestamp();
    ExplainToken();
    ExplainProof(document);
  }
  ExplainParts();
}

bool MessageExplainer::ExplainEnvelope(const Document &document) {
  m_recorder.Begin(Check::ENVELOPE);
  CheckEnvelope(document, m_rules, m_message);
  const EnvelopeFault fault = m_message.envelope.fault;
  if (fault == EnvelopeFault::NOT_AN_ENVELOPE || fault == EnvelopeFault::OTHER_VERSION) {
    m_recorder.Summarize("There is no envelope of SOAP 1.1 or SOAP 1.2.");
    return false;
  }
  m_recorder.Summarize(std::string("The envelope is of SOAP ") +
                       (m_message.envelope.version == SoapVersion::SOAP11 ? "1.1" : "1.2") +
                       (m_recorder.HasFailed() ? ", but does not have the accepted form." : "."));
  return true;
}

bool MessageExplainer::ExplainSecurityHeader() {
  m_recorder.Begin(Check::SECURITY_HEADER);
  CheckSecurityHeader(m_rules, m_message);
  if (!m_message.security) {
    m_recorder.Summarize("There is no security header for this receiver.");
  } else {
    m_recorder.Summarize(m_recorder.HasFailed() ? "There are several security headers; the first is examined."
                                                : "There is one security header for this receiver.");
  }
  return m_message.security;
}

void MessageExplainer::ExplainTimestamp() {
  m_recorder.Begin(Check::TIMESTAMP);
  CheckTimestamp(m_rules, m_message);
  const MessageTimestamp &timestamp = m_message.timestamp;
  if (!timestamp.element) {
    m_recorder.Summarize("There is no timestamp.");
    return;
  }
  const auto text = [](const boost::optional<Tarvel::System::DateTime> &date) {
    return date ? DateTimeFormatter(*date) : std::string("(none)");
  };
  m_recorder.Summarize("Created " + text(timestamp.created) + ", expires " + text(timestamp.expires) + "; now " +
                       DateTimeFormatter(Tarvel::System::GetUtcDateTime()) + " (tolerance " +
                       std::to_string(m_rules.options.clockToleranceSec) + " s, longest age " +
                       std::to_string(m_rules.options.maxAgeSec) + " s).");
}

void MessageExplainer::ExplainToken() {
  m_recorder.Begin(Check::TOKEN);
  FindToken(m_rules, m_message);
  if (!m_message.assertion) {
    m_recorder.Summarize("There is no token in the security header.");
    return;
  }
  m_report.token = m_tokens.Explain(*m_message.assertion);
  try { // a report is not a token, so the token is verified for the checks that need it
    VerifyToken(m_tokens, m_rules, m_message);
  } catch (const SsoException &error) {
    m_recorder.Add({error.what(), m_message.assertion, {}, {}, {}, 0});
  }
  m_recorder.Summarize(m_recorder.HasFailed() ? "The token is not accepted."
                                              : "There is one token, and it is accepted.");
}

void MessageExplainer::ExplainProof(const Document &document) {
  if (!m_message.token) {
    m_recorder.Skip(Check::PROOF, "There is no token whose key could be proved.");
    return;
  }
  m_recorder.Begin(Check::PROOF);
  CheckProof(document, m_rules, m_message);
  m_recorder.Summarize(m_message.proof ? std::string("The proof is: ") + GetProofName(*m_message.proof) + "."
                                       : std::string("Nothing is proved."));
  for (const VerifiedMessage::CoveredElement &covered : m_message.covered) {
    m_report.covered.push_back(m_recorder.PathOf(*covered.element));
  }
}

void MessageExplainer::ExplainParts() {
  m_recorder.Begin(Check::PARTS);
  CheckParts(m_rules, m_message);
  if (!m_message.proof) {
    m_recorder.SetNotDone("Nothing is proved, so it is not known what is covered.");
  } else if (*m_message.proof != ProofKind::MESSAGE_SIGNATURE) {
    m_recorder.Summarize("The message is not signed, so nothing is covered.");
  } else {
    m_recorder.Summarize("Covered elements: " + std::to_string(m_message.covered.size()) + ".");
  }
}

/// Null if the text is not well-formed.
Ref<Document> ExplainText(const std::string &message, MessageRecorder &recorder) {
  Ref<Document> document;
  recorder.Begin(Check::WELL_FORMED);
  try {
    ParseXML(message, document);
    recorder.Summarize("The text is a well-formed XML document.");
  } catch (const Tarvel::Xml::XMLParseException &error) {
    recorder.AddAt({error.what(), nullptr, {}, {}, {}, 0}, error.GetLine(), error.GetColumn());
    recorder.Summarize("The text is not a well-formed XML document within the limits.");
  }
  return document;
}

} // namespace

MessageReport ExplainMessage(const std::string &message, const TokenVerifier &tokens,
                             const MessageVerifierOptions &options, const Certificate *peerCertificate) {
  MessageReport report;
  MessageRecorder recorder(report);
  if (const Ref<Document> document = ExplainText(message, recorder)) {
    MessageExplainer(tokens, options, peerCertificate, report, recorder).Explain(*document);
  } else {
    recorder.SkipFrom(Check::ENVELOPE, "The text could not be parsed.");
  }
  report.accepted = std::all_of(report.checks.begin(), report.checks.end(),
                                [](const auto &result) { return result.outcome == TokenReport::Outcome::PASSED; });
  return report;
}

} // namespace SsoClient
