// SPDX-License-Identifier: Apache-2.0
/// @file
/// The least that a server can do: it shakes hands, reads a request and gives the answer that it always gives.

#pragma once

#include "support/scripted_server.h"

#include <atomic>
#include <string>

namespace Bench {

/// Serves loopback over TLS, inside the measuring process: whoever is measured beside whom against it, the server's share
/// is in both figures.
class CannedServer {
public:
  /// What a client must trust.
  static const std::string AUTHORITY_FILE;

  /// @param body of the answer, of the type text/xml.
  /// @param resumesSessions whether connections after a client's first need no full handshake.
  CannedServer(const std::string &body, bool resumesSessions);

  const std::string &GetUrl() const { return m_url; }

  /// How many of the handshakes so far were not of the kind that the server was made for. A client's first one, which has
  /// nothing to resume, is among them when the server resumes sessions.
  int CountOtherHandshakes() const { return m_otherHandshakes; }

private:
  void Answer(Testing::ServerConnection &connection);

  const std::string m_answer;
  const bool m_resumesSessions;
  std::atomic<int> m_otherHandshakes{0};
  Testing::ScriptedServer m_server;
  const std::string m_url;
};

} // namespace Bench
