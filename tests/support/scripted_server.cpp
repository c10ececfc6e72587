// SPDX-License-Identifier: Apache-2.0

#include "support/scripted_server.h"

#include "support/data_file.h"

#include <openssl/err.h>
#include <openssl/ssl.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <chrono>
#include <csignal>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <pthread.h>
#include <stdexcept>
#include <sys/socket.h>
#include <sys/time.h>
#include <unistd.h>

namespace Testing {

namespace {

constexpr int WAIT_SECONDS = 30;
constexpr int BACKLOG = 1024;
constexpr int POLL_MILLISECONDS = 50;

void Require(bool condition, const char *what) {
  if (!condition) {
    throw std::runtime_error(std::string("scripted server: ") + what);
  }
}

std::string TlsFile(const std::string &name) {
  return DataPath("tls/" + name);
}

SSL_CTX *CreateTls(const TlsSettings &settings) {
  SSL_CTX *const tls = SSL_CTX_new(TLS_server_method());
  Require(tls, "no TLS context");
  if (settings.allowsWeakness) {
    SSL_CTX_set_security_level(tls, 0);
  }
  Require(settings.ciphers.empty() || SSL_CTX_set_cipher_list(tls, settings.ciphers.c_str()) == 1, "bad ciphers");
  Require(SSL_CTX_set_min_proto_version(tls, settings.minimumVersion) == 1, "bad minimum version");
  Require(SSL_CTX_set_max_proto_version(tls, settings.maximumVersion) == 1, "bad maximum version");
  Require(SSL_CTX_use_certificate_chain_file(tls, TlsFile(settings.certificate + ".crt").c_str()) == 1,
          "no certificate");
  Require(SSL_CTX_use_PrivateKey_file(tls, TlsFile(settings.certificate + ".key").c_str(), SSL_FILETYPE_PEM) == 1,
          "no key");
  static constexpr unsigned char SESSION_CONTEXT[] = "tests";
  SSL_CTX_set_session_id_context(tls, SESSION_CONTEXT, sizeof SESSION_CONTEXT - 1);
  Require(SSL_CTX_set_num_tickets(tls, settings.tickets) == 1, "bad number of tickets");
  if (!settings.resumesSessions) {
    SSL_CTX_set_session_cache_mode(tls, SSL_SESS_CACHE_OFF);
    SSL_CTX_set_options(tls, SSL_OP_NO_TICKET);
    SSL_CTX_set_num_tickets(tls, 0);
  }
  if (settings.demandsClient) {
    Require(SSL_CTX_load_verify_file(tls, TlsFile("authority.crt").c_str()) == 1, "no authority");
    SSL_CTX_set_verify(tls, SSL_VERIFY_PEER | SSL_VERIFY_FAIL_IF_NO_PEER_CERT, nullptr);
  }
  return tls;
}

/// OpenSSL writes to sockets without MSG_NOSIGNAL, so a write to a closed connection would raise SIGPIPE.
void BlockBrokenPipeSignal() {
  sigset_t blocked;
  sigemptyset(&blocked);
  sigaddset(&blocked, SIGPIPE);
  pthread_sigmask(SIG_BLOCK, &blocked, nullptr);
}

/// The value of a request's Content-Length; 0 when there is none.
std::size_t ContentLength(std::string header) {
  std::transform(header.begin(), header.end(), header.begin(),
                 [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
  constexpr std::string_view FIELD = "\r\ncontent-length:";
  const std::size_t at = header.find(FIELD);
  return at == std::string::npos ? 0 : std::stoul(header.substr(at + FIELD.size()));
}

} // namespace

ServerConnection::ServerConnection(int descriptor, SSL_CTX *tls)
    : m_descriptor(descriptor), m_tls(tls ? SSL_new(tls) : nullptr) {
  const timeval limit{WAIT_SECONDS, 0};
  const int on = 1;
  ::setsockopt(descriptor, SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
  ::setsockopt(descriptor, SOL_SOCKET, SO_SNDTIMEO, &limit, sizeof limit);
  ::setsockopt(descriptor, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
  if (m_tls) {
    SSL_set_fd(m_tls, descriptor);
  }
}

ServerConnection::~ServerConnection() {
  Close();
  SSL_free(m_tls);
}

bool ServerConnection::Handshake() {
  if (!m_tls) {
    return true;
  }
  ERR_clear_error();
  m_established = SSL_accept(m_tls) == 1;
  return m_established;
}

std::ptrdiff_t ServerConnection::Receive(char *buffer, std::size_t length) {
  if (m_descriptor < 0 || (m_tls && !m_established)) {
    return 0;
  }
  if (!m_tls) {
    return ::recv(m_descriptor, buffer, length, 0);
  }
  ERR_clear_error();
  std::size_t count = 0;
  return SSL_read_ex(m_tls, buffer, length, &count) == 1 ? static_cast<std::ptrdiff_t>(count) : 0;
}

std::string ServerConnection::ReadSome(std::size_t limit) {
  if (m_ahead.empty()) {
    std::array<char, 65536> buffer;
    const std::ptrdiff_t count = Receive(buffer.data(), buffer.size());
    m_ahead.assign(buffer.data(), count > 0 ? static_cast<std::size_t>(count) : 0);
  }
  std::string some = m_ahead.substr(0, limit);
  m_ahead.erase(0, some.size());
  return some;
}

std::string ServerConnection::ReadExactly(std::size_t length) {
  std::string all;
  while (all.size() < length) {
    const std::string some = ReadSome(length - all.size());
    if (some.empty()) {
      break;
    }
    all += some;
  }
  return all;
}

std::string ServerConnection::ReadUntil(std::string_view delimiter) {
  std::string all;
  std::size_t end = std::string::npos;
  while ((end = all.find(delimiter)) == std::string::npos) {
    const std::string some = ReadSome();
    if (some.empty()) {
      return all;
    }
    all += some;
  }
  end += delimiter.size();
  m_ahead.insert(0, all, end);
  return all.substr(0, end);
}

std::string ServerConnection::ReadRequest() {
  std::string request = ReadUntil("\r\n\r\n");
  return request + ReadExactly(ContentLength(request));
}

bool ServerConnection::Write(std::string_view bytes) {
  if (!m_tls) {
    return WriteRaw(bytes);
  }
  if (!m_established || m_descriptor < 0) {
    return false;
  }
  ERR_clear_error();
  std::size_t count = 0;
  return bytes.empty() || SSL_write_ex(m_tls, bytes.data(), bytes.size(), &count) == 1;
}

std::string ServerConnection::ReadRawSome(std::size_t limit) {
  std::string some(limit, '\0');
  const std::ptrdiff_t count = ::recv(m_descriptor, some.data(), some.size(), 0);
  some.resize(count > 0 ? static_cast<std::size_t>(count) : 0);
  return some;
}

bool ServerConnection::WriteRaw(std::string_view bytes) {
  while (!bytes.empty()) {
    const std::ptrdiff_t count = ::send(m_descriptor, bytes.data(), bytes.size(), MSG_NOSIGNAL);
    if (count <= 0) {
      return false;
    }
    bytes.remove_prefix(static_cast<std::size_t>(count));
  }
  return true;
}

void ServerConnection::Stall() {
  std::array<char, 4096> buffer;
  while (m_descriptor >= 0 && ::recv(m_descriptor, buffer.data(), buffer.size(), 0) > 0) {
  }
}

void ServerConnection::WaitForInterrupt() {
  std::unique_lock<std::mutex> lock(m_mutex);
  m_interrupted.wait_for(lock, std::chrono::seconds(WAIT_SECONDS), [this] { return m_isInterrupted; });
}

void ServerConnection::Close() {
  if (m_established && m_descriptor >= 0) {
    ERR_clear_error();
    SSL_shutdown(m_tls);
  }
  CloseWithoutNotice();
}

// Closing a descriptor with unread bytes sends a reset, so this first reads the bytes that have arrived.
void ServerConnection::CloseWithoutNotice() {
  if (m_descriptor < 0) {
    return;
  }
  ::shutdown(m_descriptor, SHUT_WR);
  std::array<char, 4096> buffer;
  while (::recv(m_descriptor, buffer.data(), buffer.size(), MSG_DONTWAIT) > 0) {
  }
  EndDescriptor();
}

void ServerConnection::Reset() {
  const linger reset{1, 0};
  ::setsockopt(m_descriptor, SOL_SOCKET, SO_LINGER, &reset, sizeof reset);
  EndDescriptor();
}

void ServerConnection::EndDescriptor() noexcept {
  const std::lock_guard<std::mutex> lock(m_mutex);
  ::close(m_descriptor);
  m_descriptor = -1;
  if (m_tls) {
    SSL_set_quiet_shutdown(m_tls, 1);
    SSL_set_shutdown(m_tls, SSL_SENT_SHUTDOWN | SSL_RECEIVED_SHUTDOWN); // its session stays resumable
  }
}

void ServerConnection::Interrupt() noexcept {
  const std::lock_guard<std::mutex> lock(m_mutex);
  m_isInterrupted = true;
  m_interrupted.notify_all();
  if (m_descriptor >= 0) {
    ::shutdown(m_descriptor, SHUT_RDWR);
  }
}

bool ServerConnection::ReceivedClosingNotice() const {
  return m_tls && (SSL_get_shutdown(m_tls) & SSL_RECEIVED_SHUTDOWN) != 0;
}

bool ServerConnection::WasResumed() const {
  return m_tls && SSL_session_reused(m_tls) == 1;
}

std::string ServerConnection::GetServerName() const {
  const char *const name = m_tls ? SSL_get_servername(m_tls, TLSEXT_NAMETYPE_host_name) : nullptr;
  return name ? name : "";
}

std::string ServerConnection::GetClientName() const {
  X509 *const certificate = m_tls ? SSL_get0_peer_certificate(m_tls) : nullptr;
  if (!certificate) {
    return {};
  }
  std::array<char, 256> name{};
  X509_NAME_get_text_by_NID(X509_get_subject_name(certificate), NID_commonName, name.data(), name.size());
  return name.data();
}

ScriptedServer::ScriptedServer(Script script, std::optional<TlsSettings> tls, bool v6)
    : m_script(std::move(script)), m_tls(tls ? CreateTls(*tls) : nullptr), m_port(v6) {
  Require(::listen(m_port.GetSocket(), BACKLOG) == 0, "cannot listen");
  m_acceptor = std::thread([this] { Accept(); });
}

ScriptedServer::~ScriptedServer() {
  m_stopping = true;
  ::shutdown(m_port.GetSocket(), SHUT_RDWR); // wakes the acceptor, and refuses new connections
  m_acceptor.join();
  {
    const std::lock_guard<std::mutex> lock(m_mutex);
    for (const Running &running : m_running) {
      running.connection->Interrupt();
    }
  }
  Reap(true);
  SSL_CTX_free(m_tls);
}

void ScriptedServer::ChangeTls(const TlsSettings &settings) {
  SSL_CTX *const changed = CreateTls(settings);
  const std::lock_guard<std::mutex> lock(m_mutex);
  SSL_CTX_free(m_tls); // connections that use it keep their own references
  m_tls = changed;
}

void ScriptedServer::Accept() {
  BlockBrokenPipeSignal();
  pollfd listener{m_port.GetSocket(), POLLIN, 0};
  while (!m_stopping) {
    if (::poll(&listener, 1, POLL_MILLISECONDS) > 0) {
      const int descriptor = ::accept4(listener.fd, nullptr, nullptr, SOCK_CLOEXEC);
      if (descriptor >= 0) {
        Start(descriptor);
      }
    }
    Reap(false);
  }
}

void ScriptedServer::Start(int descriptor) {
  ++m_accepted;
  ++m_retained;
  const std::lock_guard<std::mutex> lock(m_mutex);
  Running &running = m_running.emplace_back();
  running.connection = std::make_unique<ServerConnection>(descriptor, m_tls);
  running.thread = std::thread([this, &running] {
    m_script(*running.connection);
    running.connection->Close();
    const std::lock_guard<std::mutex> ended(m_mutex);
    running.ended = true;
  });
}

void ScriptedServer::Reap(bool all) {
  std::list<Running> ended;
  {
    const std::lock_guard<std::mutex> lock(m_mutex);
    for (auto it = m_running.begin(); it != m_running.end();) {
      const auto current = it++;
      if (current->ended || all) {
        ended.splice(ended.end(), m_running, current);
      }
    }
  }
  for (Running &running : ended) {
    running.thread.join();
  }
  const std::size_t released = ended.size();
  ended.clear();
  m_retained -= released;
}

std::size_t ScriptedServer::GetOpenCount() const {
  const std::lock_guard<std::mutex> lock(m_mutex);
  return static_cast<std::size_t>(
      std::count_if(m_running.begin(), m_running.end(), [](const Running &running) { return !running.ended; }));
}

} // namespace Testing
