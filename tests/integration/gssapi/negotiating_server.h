// SPDX-License-Identifier: Apache-2.0
/// @file
/// `NegotiatingServer`, a token service on loopback over plain HTTP. It really negotiates; the test writes its answers.

#pragma once

#include "integration/gssapi/gss_acceptor.h"
#include "support/posting_server.h"
#include "support/scripted_server.h"

#include <ssoclient/security_token_service_config.h>

#include <functional>
#include <mutex>
#include <string>
#include <vector>

namespace Testing {

/// What the service answers.
struct NegotiationAnswer {
  std::string header; ///< further HTTP header lines, each with its line end
  std::string body;
};

/// A leg of the client, and what the GSSAPI answers to it.
struct NegotiationLeg {
  int number = 1;      ///< counted from 1
  std::string request; ///< header and body
  std::string context; ///< the identifier that the client sent
  std::string answer;  ///< the GSSAPI's leg in Base64
  bool isLast = false; ///< whether the negotiation is complete
};

class NegotiatingServer {
public:
  /// Called for one leg after the other, on a thread of the server.
  using Script = std::function<NegotiationAnswer(const NegotiationLeg &)>;

  NegotiatingServer(const std::string &keytab, const std::filesystem::path &folder, Script script);

  SsoClient::SecurityTokenServiceConfig MakeConfig() const;

  /// The context identifiers that the client sent, leg by leg.
  std::vector<std::string> GetContexts() const;

private:
  void Serve(ServerConnection &peer);
  NegotiationAnswer Answer(const std::string &request);

  const Script m_script;
  mutable std::mutex m_mutex; // guards all members below except the server
  GssAcceptor m_acceptor;
  std::vector<std::string> m_contexts;
  ScriptedServer m_server; // last: its scripts use all other members
};

} // namespace Testing
