// SPDX-License-Identifier: Apache-2.0
/// @file
/// The token service itself: from a SOAP request to a SOAP answer.

#pragma once

#include "faults.h"
#include "message_check.h"
#include "negotiations.h"
#include "state_folder.h"
#include "trust_request.h"
#include "users.h"

#include <chrono>
#include <memory>
#include <string>
#include <string_view>

namespace DevSts {

struct SoapAnswer {
  int status = 200;
  std::string body;
  std::string log; ///< what happened, as text without secrets
};

/// Any number of threads may use it at once.
class TokenService {
public:
  /// `state` outlives the service. Without an acceptor, the service does not negotiate.
  /// @throws std::runtime_error when a key cannot be used
  TokenService(const StateFolder &state, Users users, std::chrono::seconds tolerance,
               std::unique_ptr<const GssAcceptor> acceptor);

  /// `action` is the text of the SOAPAction header, without quotation marks. A refusal is also an answer.
  SoapAnswer Answer(std::string_view action, std::string_view message, const Fault &fault) const;

private:
  Document Process(std::string_view action, std::string_view message, const Fault &fault, std::string &log) const;
  Document Issue(const CheckedMessage &message, const TrustRequest &request, const Fault &fault,
                 std::string &log) const;
  Document BeginNegotiation(const CheckedMessage &message, const TrustRequest &request, const Fault &fault,
                            std::string &log) const;
  Document ContinueNegotiation(std::string_view action, const CheckedMessage &message, const Fault &fault,
                               std::string &log) const;
  Document AnswerLeg(const std::string &context, NegotiationStep step, const Fault &fault, std::string &log) const;
  Document Renew(const CheckedMessage &message, const TrustRequest &request, const Fault &fault,
                 std::string &log) const;
  Document Validate(const CheckedMessage &message, const TrustRequest &request, std::string &log) const;

  TokenFacts Authenticate(const CheckedMessage &message) const;
  TokenFacts FactsOfUser(const PasswordCredentials &credentials) const;
  TokenFacts FactsOfCertificate(X509 &certificate) const;
  void SetClient(TokenFacts &facts, const std::string &principal) const;
  void SetParty(TokenFacts &facts, const std::string &name) const;
  Negotiations &RequireNegotiations() const;
  Document MakeToken(TokenFacts facts, TokenFault fault) const;

  const StateFolder &m_state;
  const Users m_users;
  const SignatureKey m_signer;
  const SignatureKey m_foreignSigner;
  const SignatureKey m_verifier;
  const MessagePolicy m_policy;
  const std::unique_ptr<Negotiations> m_negotiations; // null when the service does not negotiate
};

} // namespace DevSts
