// SPDX-License-Identifier: Apache-2.0

#include "canned_server.h"

namespace Bench {

namespace {

Testing::TlsSettings SettingsFor(bool resumesSessions) {
  Testing::TlsSettings settings;
  settings.resumesSessions = resumesSessions;
  return settings;
}

} // namespace

const std::string CannedServer::AUTHORITY_FILE = TEST_DATA_DIR "/tls/authority.crt";

CannedServer::CannedServer(const std::string &body, bool resumesSessions)
    : m_answer("HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\nContent-Length: " + std::to_string(body.size()) +
               "\r\nConnection: close\r\n\r\n" + body),
      m_resumesSessions(resumesSessions),
      m_server([this](Testing::ServerConnection &connection) { Answer(connection); }, SettingsFor(resumesSessions)),
      m_url("https://localhost:" + std::to_string(m_server.GetPort()) + "/STS/trust") {}

void CannedServer::Answer(Testing::ServerConnection &connection) {
  if (!connection.Handshake()) {
    return;
  }
  if (connection.WasResumed() != m_resumesSessions) {
    ++m_otherHandshakes;
  }
  connection.ReadRequest();
  connection.Write(m_answer);
}

} // namespace Bench
