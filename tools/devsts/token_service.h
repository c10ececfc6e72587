// SPDX-License-Identifier: Apache-2.0
/// @file
/// The token service itself: a SOAP request in, a SOAP answer out.

#pragma once

#include "faults.h"
#include "message_check.h"
#include "state_folder.h"
#include "trust_request.h"
#include "users.h"

#include <chrono>
#include <string>
#include <string_view>

namespace DevSts {

struct SoapAnswer {
  int status = 200;
  std::string body;
  std::string log; ///< what happened, in words; nothing secret
};

/// Immutable; any number of threads may use it at once.
class TokenService {
public:
  /// `state` outlives the service. @throws std::runtime_error when a key cannot be used
  TokenService(const StateFolder &state, Users users, std::chrono::seconds tolerance);

  /// `action` is the SOAPAction header's text, without quotation marks. A refusal is an answer too.
  SoapAnswer Answer(std::string_view action, std::string_view message, const Fault &fault) const;

private:
  Document Process(std::string_view action, std::string_view message, const Fault &fault, std::string &log) const;
  Document Issue(const CheckedMessage &message, const TrustRequest &request, const Fault &fault,
                 std::string &log) const;
  Document Renew(const CheckedMessage &message, const TrustRequest &request, const Fault &fault,
                 std::string &log) const;
  Document Validate(const CheckedMessage &message, const TrustRequest &request, std::string &log) const;

  TokenFacts Authenticate(const CheckedMessage &message) const;
  TokenFacts FactsOfUser(const PasswordCredentials &credentials) const;
  TokenFacts FactsOfCertificate(X509 &certificate) const;
  Document MakeToken(TokenFacts facts, TokenFault fault) const;

  const StateFolder &m_state;
  const Users m_users;
  const SignatureKey m_signer;
  const SignatureKey m_foreignSigner;
  const SignatureKey m_verifier;
  const MessagePolicy m_policy;
};

} // namespace DevSts
