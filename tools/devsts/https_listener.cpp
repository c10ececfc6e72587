// SPDX-License-Identifier: Apache-2.0

#include "https_listener.h"

#include "connection.h"
#include "request_handler.h"
#include "state_folder.h"

#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/ip/v6_only.hpp>
#include <boost/asio/ssl/context.hpp>
#include <boost/asio/strand.hpp>
#include <boost/system/system_error.hpp>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <deque>
#include <string_view>
#include <thread>
#include <utility>
#include <vector>

namespace DevSts {

namespace {

namespace asio = boost::asio;
using asio::ip::tcp;
using ErrorCode = boost::system::error_code;

constexpr int MOST_CONNECTIONS = 8192;
constexpr int PORT_TRIES = 20;
constexpr unsigned LEAST_THREADS = 4;
constexpr std::chrono::milliseconds PAUSE_WITHOUT_DESCRIPTORS(100);

tcp::acceptor OpenAcceptor(asio::io_context &context, const asio::ip::address &address, std::uint16_t port) {
  tcp::acceptor acceptor(context);
  const tcp::endpoint endpoint(address, port);
  acceptor.open(endpoint.protocol());
  acceptor.set_option(tcp::acceptor::reuse_address(true));
  if (address.is_v6()) {
    acceptor.set_option(asio::ip::v6_only(true));
  }
  acceptor.bind(endpoint);
  acceptor.listen();
  return acceptor;
}

bool IsPortTaken(const boost::system::system_error &failure) {
  return failure.code() == boost::system::errc::address_in_use;
}

bool LacksIpV6(const boost::system::system_error &failure) {
  return failure.code() == boost::system::errc::address_family_not_supported ||
         failure.code() == boost::system::errc::address_not_available;
}

void AskForCertificates(asio::ssl::context &tls) {
  tls.set_verify_mode(asio::ssl::verify_peer);
  tls.set_verify_callback([](bool, asio::ssl::verify_context &) { return true; });
  // Without a context, OpenSSL resumes no session with a client certificate.
  constexpr std::string_view SESSIONS = "devsts";
  SSL_CTX_set_session_id_context(tls.native_handle(), reinterpret_cast<const unsigned char *>(SESSIONS.data()),
                                 static_cast<unsigned>(SESSIONS.size()));
}

void SetUpTls(asio::ssl::context &tls, const Identity &identity) {
  tls.use_certificate_chain_file(identity.certificateFile.string());
  tls.use_private_key_file(identity.keyFile.string(), asio::ssl::context::pem);
  SSL_CTX_set_min_proto_version(tls.native_handle(), TLS1_2_VERSION);
}

} // namespace

class HttpsListener::Server {
public:
  Server(const Identity &identity, std::uint16_t port, bool asksForCertificates, const RequestHandler &handler);
  Server(const Server &) = delete;
  Server &operator=(const Server &) = delete;
  ~Server();

  std::uint16_t GetPort() const noexcept { return m_port; }
  void Start();

private:
  void Listen(std::uint16_t port);
  void Accept(tcp::acceptor &acceptor);

  std::atomic<int> m_connections{0};
  asio::ssl::context m_tls;
  asio::io_context m_context;
  std::deque<tcp::acceptor> m_acceptors;
  const RequestHandler &m_handler;
  std::uint16_t m_port = 0;
  std::vector<std::thread> m_threads;
};

HttpsListener::Server::Server(const Identity &identity, std::uint16_t port, bool asksForCertificates,
                              const RequestHandler &handler)
    : m_tls(asio::ssl::context::tls_server), m_handler(handler) {
  SetUpTls(m_tls, identity);
  if (asksForCertificates) {
    AskForCertificates(m_tls);
  }
  Listen(port);
}

HttpsListener::Server::~Server() {
  m_context.stop();
  for (std::thread &thread : m_threads) {
    thread.join();
  }
}

void HttpsListener::Server::Listen(std::uint16_t port) {
  // A free port of one address may be in use on the other. When the caller does not choose the port, another is tried.
  for (int left = port == 0 ? PORT_TRIES : 1;; --left) {
    m_acceptors.clear();
    m_acceptors.push_back(OpenAcceptor(m_context, asio::ip::address_v4::loopback(), port));
    m_port = m_acceptors.front().local_endpoint().port();
    try {
      m_acceptors.push_back(OpenAcceptor(m_context, asio::ip::address_v6::loopback(), m_port));
      return;
    } catch (const boost::system::system_error &failure) {
      if (LacksIpV6(failure)) {
        LogLine("listening only on 127.0.0.1: this machine has no ::1");
        return;
      }
      if (!IsPortTaken(failure) || left <= 1) {
        throw;
      }
    }
  }
}

void HttpsListener::Server::Start() {
  for (tcp::acceptor &acceptor : m_acceptors) {
    Accept(acceptor);
  }
  const unsigned count = std::max(LEAST_THREADS, std::thread::hardware_concurrency());
  for (unsigned i = 0; i < count; ++i) {
    m_threads.emplace_back([this] { m_context.run(); });
  }
}

void HttpsListener::Server::Accept(tcp::acceptor &acceptor) {
  acceptor.async_accept(asio::make_strand(m_context), [this, &acceptor](const ErrorCode &error, tcp::socket socket) {
    if (!error && m_connections < MOST_CONNECTIONS) {
      StartConnection(std::move(socket), m_tls, m_handler, m_connections);
    }
    if (error) {
      LogLine("cannot accept a connection: " + error.message());
      std::this_thread::sleep_for(PAUSE_WITHOUT_DESCRIPTORS);
    }
    Accept(acceptor);
  });
}

HttpsListener::HttpsListener(const Identity &identity, std::uint16_t port, bool asksForCertificates,
                             const RequestHandler &handler)
    : m_server(std::make_unique<Server>(identity, port, asksForCertificates, handler)) {}

HttpsListener::~HttpsListener() = default;

std::uint16_t HttpsListener::GetPort() const noexcept {
  return m_server->GetPort();
}

void HttpsListener::Start() {
  m_server->Start();
}

} // namespace DevSts
