// SPDX-License-Identifier: Apache-2.0
/// @file
/// A minimal server: it completes the handshake, reads a request, and always sends the same answer.

#pragma once

#include "support/scripted_server.h"

#include <atomic>
#include <string>

namespace Bench {

/// Serves loopback over TLS, inside the measuring process. When two clients are compared, both figures include the
/// server's work.
class CannedServer {
public:
  /// The authority that a client must trust.
  static const std::string AUTHORITY_FILE;

  /// @param body of the answer, of the type text/xml.
  /// @param resumesSessions whether a client's connections after its first need no full handshake.
  CannedServer(const std::string &body, bool resumesSessions);

  const std::string &GetUrl() const { return m_url; }

  /// How many handshakes so far were not of the kind that the server was made for. With resumed sessions, this includes
  /// a client's first handshake, which has no session to resume.
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
