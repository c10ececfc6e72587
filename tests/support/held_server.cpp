// SPDX-License-Identifier: Apache-2.0

#include "support/held_server.h"

#include "support/data_file.h"
#include "support/loopback_socket.h"

#include <openssl/err.h>
#include <openssl/ssl.h>

#include <array>
#include <atomic>
#include <cerrno>
#include <csignal>
#include <deque>
#include <memory>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <new>
#include <stdexcept>
#include <sys/epoll.h>
#include <sys/ioctl.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>
#include <unordered_map>
#include <utility>

namespace Testing {

struct HeldServerState {
  std::atomic<bool> isHolding{false};
  std::atomic<int> delayMilliseconds{0};
  std::atomic<int> requests{0};
  std::atomic<int> connections{0};
};

namespace {

using Clock = std::chrono::steady_clock;

constexpr int BACKLOG = 65535;       // the kernel lowers it to its own limit
constexpr int EVENTS = 16;           // few, so that new connections are accepted between handshakes
constexpr int LOOK_MILLISECONDS = 2; // how often the server checks whether it may answer

void Require(bool condition, const char *what) {
  if (!condition) {
    throw std::runtime_error(std::string("held server: ") + what);
  }
}

SSL_CTX *CreateTls(bool resumesSessions) {
  SSL_CTX *const tls = SSL_CTX_new(TLS_server_method());
  Require(tls && SSL_CTX_use_certificate_chain_file(tls, DataPath("tls/localhost.crt").c_str()) == 1 &&
              SSL_CTX_use_PrivateKey_file(tls, DataPath("tls/localhost.key").c_str(), SSL_FILETYPE_PEM) == 1,
          "no certificate");
  static constexpr unsigned char SESSION_CONTEXT[] = "held";
  SSL_CTX_set_session_id_context(tls, SESSION_CONTEXT, sizeof SESSION_CONTEXT - 1);
  SSL_CTX_set_mode(tls, SSL_MODE_RELEASE_BUFFERS);
  if (!resumesSessions) {
    SSL_CTX_set_session_cache_mode(tls, SSL_SESS_CACHE_OFF);
    SSL_CTX_set_options(tls, SSL_OP_NO_TICKET);
    SSL_CTX_set_num_tickets(tls, 0);
  }
  return tls;
}

/// One connection of the server.
class Connection {
public:
  enum class Stage { READING, WAITING, ANSWERED, OVER };

  Connection(int descriptor, SSL_CTX *tls) : m_descriptor(descriptor), m_tls(tls ? SSL_new(tls) : nullptr) {
    if (m_tls) {
      SSL_set_fd(m_tls, descriptor);
      SSL_set_accept_state(m_tls);
    }
  }
  Connection(const Connection &) = delete;
  Connection &operator=(const Connection &) = delete;
  ~Connection() {
    SSL_free(m_tls);
    ::close(m_descriptor);
  }

  /// Reads what has arrived. @return the stage afterwards
  Stage Read() {
    std::array<char, 16384> bytes;
    for (;;) {
      const std::ptrdiff_t count = Receive(bytes.data(), bytes.size());
      if (count == WOULD_BLOCK) {
        return m_stage;
      }
      if (count <= 0) {
        return m_stage = Stage::OVER;
      }
      m_request.append(bytes.data(), static_cast<std::size_t>(count));
      if (m_stage == Stage::READING && IsComplete()) {
        m_stage = Stage::WAITING;
        m_request = std::string();
      }
    }
  }

  /// The answer fits into the socket's buffer. A connection that does not accept all of it at once is closed.
  Stage Answer(const std::string &answer) {
    bool isSent = false;
    if (m_tls) {
      ERR_clear_error();
      std::size_t count = 0;
      isSent = SSL_write_ex(m_tls, answer.data(), answer.size(), &count) == 1;
      SSL_shutdown(m_tls);
    } else {
      isSent = ::send(m_descriptor, answer.data(), answer.size(), MSG_NOSIGNAL) ==
               static_cast<std::ptrdiff_t>(answer.size());
    }
    ::shutdown(m_descriptor, SHUT_WR);
    return m_stage = isSent ? Stage::ANSWERED : Stage::OVER;
  }

private:
  static constexpr std::ptrdiff_t WOULD_BLOCK = -2;

  std::ptrdiff_t Receive(char *bytes, std::size_t size) {
    if (!m_tls || m_stage == Stage::ANSWERED) {
      const std::ptrdiff_t count = ::recv(m_descriptor, bytes, size, 0);
      return count < 0 && errno == EAGAIN ? WOULD_BLOCK : count;
    }
    ERR_clear_error();
    std::size_t count = 0;
    const int result = SSL_read_ex(m_tls, bytes, size, &count);
    if (result == 1) {
      return static_cast<std::ptrdiff_t>(count);
    }
    const int error = SSL_get_error(m_tls, result);
    return error == SSL_ERROR_WANT_READ || error == SSL_ERROR_WANT_WRITE ? WOULD_BLOCK : 0;
  }

  bool IsComplete() const {
    const std::size_t end = m_request.find("\r\n\r\n");
    const std::size_t length = m_request.find("Content-Length: ");
    return end != std::string::npos && length < end &&
           m_request.size() >= end + 4 + std::stoul(m_request.substr(length + sizeof "Content-Length: " - 1, 10));
  }

  const int m_descriptor;
  SSL *const m_tls; // null for HTTP
  Stage m_stage = Stage::READING;
  std::string m_request;
};

class Server {
public:
  Server(HeldServerState &state, int listener, SSL_CTX *tls, std::string answer)
      : m_state(state), m_listener(listener), m_tls(tls), m_answer(std::move(answer)) {
    Watch(m_listener);
  }

  [[noreturn]] void Run() {
    for (;;) {
      std::array<epoll_event, EVENTS> events;
      const int count = ::epoll_wait(m_poll, events.data(), EVENTS, m_waiting.empty() ? -1 : LOOK_MILLISECONDS);
      for (int i = 0; i < count; ++i) {
        const int descriptor = events[static_cast<std::size_t>(i)].data.fd;
        descriptor == m_listener ? Accept() : Read(descriptor);
      }
      AnswerDue();
    }
  }

private:
  void Watch(int descriptor) {
    epoll_event event{};
    event.events = EPOLLIN;
    event.data.fd = descriptor;
    Require(::epoll_ctl(m_poll, EPOLL_CTL_ADD, descriptor, &event) == 0, "cannot wait");
  }

  void Accept() {
    for (;;) {
      const int descriptor = ::accept4(m_listener, nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK);
      if (descriptor < 0) {
        return;
      }
      const int on = 1;
      ::setsockopt(descriptor, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
      m_connections[descriptor] = std::make_unique<Connection>(descriptor, m_tls);
      ++m_state.connections;
      Watch(descriptor);
    }
  }

  void Read(int descriptor) {
    Connection &connection = *m_connections.at(descriptor);
    switch (const bool wasWaiting = m_isWaiting.count(descriptor) > 0; connection.Read()) {
    case Connection::Stage::WAITING:
      if (!wasWaiting) {
        m_isWaiting[descriptor] = ++m_number;
        m_waiting.push_back({descriptor, m_number, Clock::now()});
        ++m_state.requests;
      }
      return;
    case Connection::Stage::OVER:
      End(descriptor);
      return;
    default:
      return;
    }
  }

  void End(int descriptor) {
    m_isWaiting.erase(descriptor);
    m_connections.erase(descriptor);
    --m_state.connections;
  }

  void AnswerDue() {
    const auto now = Clock::now();
    const std::chrono::milliseconds delay(m_state.delayMilliseconds.load());
    while (!m_waiting.empty() && !m_state.isHolding.load() && m_waiting.front().since + delay <= now) {
      const Waiting next = m_waiting.front();
      m_waiting.pop_front();
      const auto found = m_isWaiting.find(next.descriptor);
      if (found == m_isWaiting.end() || found->second != next.number) {
        continue; // the client has ended the connection
      }
      m_isWaiting.erase(found);
      if (m_connections.at(next.descriptor)->Answer(m_answer) == Connection::Stage::OVER) {
        End(next.descriptor);
      }
    }
  }

  struct Waiting {
    int descriptor;
    long number;
    Clock::time_point since;
  };

  HeldServerState &m_state;
  const int m_listener;
  SSL_CTX *const m_tls; // null for HTTP
  const std::string m_answer;
  const int m_poll = ::epoll_create1(EPOLL_CLOEXEC);
  std::unordered_map<int, std::unique_ptr<Connection>> m_connections; // by descriptor
  std::unordered_map<int, long> m_isWaiting;                          // numbers of requests, by descriptor
  std::deque<Waiting> m_waiting;                                      // in the order of arrival
  long m_number = 0;
};

[[noreturn]] void Serve(HeldServerState &state, int listener, const std::string &body, HeldServer::Kind kind) noexcept {
  try {
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);
    ::signal(SIGPIPE, SIG_IGN);
    SSL_CTX *const tls = kind == HeldServer::Kind::HTTP ? nullptr : CreateTls(kind == HeldServer::Kind::TLS);
    Server(state, listener, tls,
           "HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\nContent-Length: " + std::to_string(body.size()) +
               "\r\nConnection: close\r\n\r\n" + body)
        .Run();
  } catch (...) {
    ::_exit(1); // the clients' connections break
  }
}

} // namespace

HeldServer::HeldServer(const std::string &body, Kind kind) {
  void *const shared =
      ::mmap(nullptr, sizeof(HeldServerState), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
  Require(shared != MAP_FAILED, "no shared memory");
  m_state = new (shared) HeldServerState;
  const LoopbackPort port; // the child keeps its copies of the sockets
  int flags = 1;
  Require(::listen(port.GetSocket(), BACKLOG) == 0 && ::ioctl(port.GetSocket(), FIONBIO, &flags) == 0, "cannot listen");
  m_process = ::fork();
  Require(m_process >= 0, "cannot fork");
  if (m_process == 0) {
    Serve(*m_state, port.GetSocket(), body, kind);
  }
  m_url = (kind == Kind::HTTP ? "http" : "https") + ("://localhost:" + std::to_string(port.GetNumber())) + "/sts";
}

HeldServer::~HeldServer() {
  ::kill(m_process, SIGKILL);
  ::waitpid(m_process, nullptr, 0);
  ::munmap(m_state, sizeof *m_state);
}

void HeldServer::Hold() noexcept {
  m_state->isHolding = true;
}

void HeldServer::Release() noexcept {
  m_state->isHolding = false;
}

void HeldServer::DelayAnswers(std::chrono::milliseconds delay) noexcept {
  m_state->delayMilliseconds = static_cast<int>(delay.count());
}

int HeldServer::CountRequests() const noexcept {
  return m_state->requests;
}

int HeldServer::CountConnections() const noexcept {
  return m_state->connections;
}

bool AllowDescriptors(unsigned long count) noexcept {
  rlimit limit{};
  if (::getrlimit(RLIMIT_NOFILE, &limit) != 0) {
    return false;
  }
  limit.rlim_cur = limit.rlim_max;
  return ::setrlimit(RLIMIT_NOFILE, &limit) == 0 && limit.rlim_max >= count;
}

} // namespace Testing
