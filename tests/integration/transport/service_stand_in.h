// SPDX-License-Identifier: Apache-2.0
/// @file
/// A service on loopback, and the client that asks it.

#pragma once

#include "support/process_resources.h"
#include "support/scripted_server.h"
#include "transport/https_client.h"
#include "unit/tarvel_ssl/tls_client.h"

#include <ssoclient/exceptions.h>
#include <tarvel/http/user_agent.h>

#include <atomic>
#include <chrono>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <utility>

namespace Testing {

constexpr std::int64_t SECOND = 1000000;          // in microseconds
constexpr std::int64_t NO_TIMEOUT = 120 * SECOND; // far longer than any of these tests

inline std::string Response(const std::string &status, const std::string &body, const std::string &fields = "") {
  return "HTTP/1.1 " + status + "\r\n" + fields + "Content-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
}

/// A script that reads the request and answers it with these bytes.
inline ScriptedServer::Script AnswerWith(std::string bytes) {
  return [bytes = std::move(bytes)](ServerConnection &connection) {
    if (connection.Handshake()) {
      connection.ReadRequest();
      connection.Write(bytes);
    }
  };
}

inline SsoClient::Request SampleRequest(const std::string &body = "<request/>") {
  SsoClient::Request request;
  request.soapAction = SsoClient::Request::ISSUE;
  request.body = body;
  return request;
}

/// The whole body of the response.
inline std::string Ask(SsoClient::TransportSession &session, const SsoClient::Request &request = SampleRequest()) {
  Tarvel::Ref<Tarvel::Reader> response;
  session.SendRequest(request, response);
  return response->ReadToEnd(Tarvel::Http::MAX_BODY_BYTES);
}

/// The body, or class and message of what was thrown.
inline std::string AskForOutcome(SsoClient::TransportSession &session,
                                 const SsoClient::Request &request = SampleRequest()) {
  try {
    return Ask(session, request);
  } catch (const SsoClient::CommunicationException &exception) {
    return std::string("CommunicationException: ") + exception.what();
  } catch (const std::exception &exception) {
    return std::string("another exception: ") + exception.what();
  }
}

inline std::string Failure(const std::string &message) {
  return "CommunicationException: " + message;
}

/// A service, its client, and what its address is.
class ServiceStandIn {
public:
  /// @param tls none for http. The client trusts the authority of the server's certificate.
  explicit ServiceStandIn(ScriptedServer::Script script, std::optional<TlsSettings> tls = std::nullopt,
                          std::int64_t timeout = NO_TIMEOUT, const std::string &host = "localhost",
                          const std::string &sslParameter = "")
      : m_server(std::move(script), tls), m_endpoint(host + ":" + std::to_string(m_server.GetPort())),
        m_client((tls ? "https://" : "http://") + m_endpoint + "/STS/trust", tls ? CreateTrustingContext() : nullptr,
                 sslParameter, timeout) {}

  std::shared_ptr<SsoClient::TransportSession> CreateSession() const { return m_client.CreateSession(); }
  const std::string &GetEndpoint() const noexcept { return m_endpoint; }
  ScriptedServer &GetServer() noexcept { return m_server; }

private:
  ScriptedServer m_server;
  const std::string m_endpoint;
  const SsoClient::HttpsClient m_client;
};

/// A script that does `fault` at the first connection, and answers all later ones.
inline ScriptedServer::Script FaultThenAnswer(ScriptedServer::Script fault) {
  const auto count = std::make_shared<std::atomic<int>>(0);
  return [fault = std::move(fault), count](ServerConnection &connection) {
    (*count)++ == 0 ? fault(connection) : AnswerWith(Response("200 OK", "<after/>"))(connection);
  };
}

class Stopwatch {
public:
  std::chrono::milliseconds Read() const {
    return std::chrono::duration_cast<std::chrono::milliseconds>(std::chrono::steady_clock::now() - m_start);
  }

private:
  const std::chrono::steady_clock::time_point m_start = std::chrono::steady_clock::now();
};

/// Connected sockets of this process whose peer is `port`; it does not count a server's own side.
std::size_t CountConnectionsTo(int port);

} // namespace Testing
