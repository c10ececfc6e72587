// SPDX-License-Identifier: Apache-2.0

#include "tls_client.h"

#include <openssl/err.h>
#include <openssl/ssl.h>

#include <array>
#include <cerrno>
#include <charconv>
#include <csignal>
#include <cstdint>
#include <stdexcept>
#include <utility>

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <unistd.h>

namespace DevStsTest {

namespace {

constexpr int WAIT_SECONDS = 30;

void Require(bool condition, const char *what) {
  if (!condition) {
    throw std::runtime_error(std::string("TLS client: ") + what);
  }
}

SSL_CTX *NewContext(const Testing::DevSts &service) {
  SSL_CTX *const context = SSL_CTX_new(TLS_client_method());
  Require(context && SSL_CTX_load_verify_file(context, service.PathOf("authority.crt").c_str()) == 1, "no context");
  SSL_CTX_set_verify(context, SSL_VERIFY_PEER, nullptr);
  return context;
}

int Connect(int port, bool v6) {
  const int descriptor = ::socket(v6 ? AF_INET6 : AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  const timeval limit{WAIT_SECONDS, 0};
  ::setsockopt(descriptor, SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
  ::setsockopt(descriptor, SOL_SOCKET, SO_SNDTIMEO, &limit, sizeof limit);
  int outcome = -1;
  if (v6) {
    sockaddr_in6 address{};
    address.sin6_family = AF_INET6;
    address.sin6_addr = in6addr_loopback;
    address.sin6_port = htons(static_cast<std::uint16_t>(port));
    outcome = ::connect(descriptor, reinterpret_cast<const sockaddr *>(&address), sizeof address);
  } else {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    address.sin_port = htons(static_cast<std::uint16_t>(port));
    outcome = ::connect(descriptor, reinterpret_cast<const sockaddr *>(&address), sizeof address);
  }
  if (outcome != 0) {
    ::close(descriptor);
  }
  Require(outcome == 0, "no connection");
  return descriptor;
}

/// The number after `field` in the head; 0 when there is none.
std::size_t NumberAfter(std::string_view head, std::string_view field) {
  std::size_t number = 0;
  const std::size_t at = head.find(field);
  if (at != std::string_view::npos) {
    const std::string_view rest = head.substr(at + field.size());
    std::from_chars(rest.data(), rest.data() + rest.size(), number);
  }
  return number;
}

} // namespace

RawConnection::RawConnection(const Testing::DevSts &service, bool v6) : m_descriptor(Connect(service.GetPort(), v6)) {}

RawConnection::~RawConnection() {
  ::close(m_descriptor);
}

void RawConnection::Send(std::string_view bytes) {
  Require(::send(m_descriptor, bytes.data(), bytes.size(), MSG_NOSIGNAL) == static_cast<ssize_t>(bytes.size()),
          "cannot send");
}

bool RawConnection::IsEnded() {
  std::array<char, 4096> dropped;
  ssize_t count = 0;
  while ((count = ::recv(m_descriptor, dropped.data(), dropped.size(), 0)) > 0) {
  }
  return count == 0 || errno == ECONNRESET;
}

TlsClient::TlsClient(const Testing::DevSts &service, bool v6)
    : m_context(NewContext(service), SSL_CTX_free), m_connection(service, v6),
      m_tls(SSL_new(m_context.get()), SSL_free) {
  Connect();
}

TlsClient::TlsClient(const Testing::DevSts &service, const std::string &identity)
    : m_context(NewContext(service), SSL_CTX_free), m_connection(service, false),
      m_tls(SSL_new(m_context.get()), SSL_free) {
  const std::string certificate = service.PathOf(identity + ".crt");
  const std::string key = service.PathOf(identity + ".key");
  Require(SSL_use_certificate_file(m_tls.get(), certificate.c_str(), SSL_FILETYPE_PEM) == 1 &&
              SSL_use_PrivateKey_file(m_tls.get(), key.c_str(), SSL_FILETYPE_PEM) == 1,
          "no identity");
  Connect();
}

void TlsClient::Connect() {
  std::signal(SIGPIPE, SIG_IGN); // OpenSSL may write to a connection that the service has reset
  ERR_clear_error();
  Require(SSL_set_fd(m_tls.get(), m_connection.GetDescriptor()) == 1 && SSL_set1_host(m_tls.get(), "localhost") == 1 &&
              SSL_connect(m_tls.get()) == 1,
          "no handshake");
}

void TlsClient::Send(std::string_view bytes) {
  ERR_clear_error();
  std::size_t count = 0;
  Require(SSL_write_ex(m_tls.get(), bytes.data(), bytes.size(), &count) == 1, "cannot send");
}

bool TlsClient::ReadSome() {
  std::array<char, 65536> buffer;
  std::size_t count = 0;
  ERR_clear_error();
  if (SSL_read_ex(m_tls.get(), buffer.data(), buffer.size(), &count) != 1) {
    return false;
  }
  m_ahead.append(buffer.data(), count);
  return true;
}

HttpAnswer TlsClient::Receive() {
  std::size_t end = std::string::npos;
  while ((end = m_ahead.find("\r\n\r\n")) == std::string::npos && ReadSome()) {
  }
  HttpAnswer answer;
  if (end == std::string::npos) {
    answer.head = std::exchange(m_ahead, {});
    return answer;
  }
  answer.head = m_ahead.substr(0, end + 2);
  m_ahead.erase(0, end + 4);
  answer.status = static_cast<int>(NumberAfter(answer.head, "HTTP/1.1 "));
  const std::size_t length = NumberAfter(answer.head, "\r\nContent-Length: ");
  while (m_ahead.size() < length && ReadSome()) {
  }
  answer.body = m_ahead.substr(0, length);
  m_ahead.erase(0, answer.body.size());
  return answer;
}

bool TlsClient::IsClosed() {
  return m_ahead.empty() && !ReadSome();
}

std::string PostBytes(std::string_view action, std::string_view message, std::string_view target,
                      std::string_view contentType) {
  std::string bytes = "POST " + std::string(target) + " HTTP/1.1\r\nHost: localhost\r\n";
  if (!contentType.empty()) {
    bytes += "Content-Type: " + std::string(contentType) + "\r\n";
  }
  bytes += "SOAPAction: \"" + std::string(action) + "\"\r\nContent-Length: " + std::to_string(message.size());
  return bytes + "\r\n\r\n" + std::string(message);
}

HttpAnswer Post(const Testing::DevSts &service, std::string_view action, std::string_view message,
                std::string_view target, std::string_view contentType) {
  TlsClient client(service);
  client.Send(PostBytes(action, message, target, contentType));
  return client.Receive();
}

} // namespace DevStsTest
