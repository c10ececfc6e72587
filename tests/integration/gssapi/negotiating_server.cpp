// SPDX-License-Identifier: Apache-2.0

#include "integration/gssapi/negotiating_server.h"

#include <tarvel/core/string_util.h>

#include <utility>

namespace Testing {

namespace {

/// The text between `before` and `after`; empty when `before` does not occur.
std::string Between(const std::string &text, const std::string &before, const std::string &after) {
  const std::size_t start = text.find(before);
  if (start == std::string::npos) {
    return {};
  }
  const std::size_t begin = start + before.size();
  return text.substr(begin, text.find(after, begin) - begin);
}

} // namespace

NegotiatingServer::NegotiatingServer(const std::string &keytab, const std::filesystem::path &folder, Script script)
    : m_script(std::move(script)), m_acceptor(keytab, folder),
      m_server([this](ServerConnection &peer) { Serve(peer); }) {}

SsoClient::SecurityTokenServiceConfig NegotiatingServer::MakeConfig() const {
  return ConfigFor("http://localhost:" + std::to_string(m_server.GetPort()) + "/sts");
}

std::vector<std::string> NegotiatingServer::GetContexts() const {
  const std::lock_guard<std::mutex> lock(m_mutex);
  return m_contexts;
}

void NegotiatingServer::Serve(ServerConnection &peer) {
  const NegotiationAnswer answer = Answer(peer.ReadRequest());
  peer.Write("HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\n" + answer.header +
             "Content-Length: " + std::to_string(answer.body.size()) + "\r\n\r\n" + answer.body);
}

NegotiationAnswer NegotiatingServer::Answer(const std::string &request) {
  const std::lock_guard<std::mutex> lock(m_mutex);
  const std::string exchange = request.substr(request.find("<wst:BinaryExchange"));
  NegotiationLeg leg;
  leg.request = request;
  leg.context = Between(request, " Context=\"", "\"");
  m_contexts.push_back(leg.context);
  leg.number = static_cast<int>(m_contexts.size());
  std::vector<std::uint8_t> octets;
  if (!m_acceptor.IsComplete()) {
    octets = m_acceptor.Accept(Tarvel::StringUtil::Base64Decode(Between(exchange, ">", "</wst:BinaryExchange>")));
  }
  leg.answer = Tarvel::StringUtil::Base64Encode(octets);
  leg.isLast = m_acceptor.IsComplete();
  return m_script(leg);
}

} // namespace Testing
