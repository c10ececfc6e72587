// SPDX-License-Identifier: Apache-2.0

#include "system/tcp_client_socket.h"

#include "system/endless_thread_pool.h"
#include "system/io_engine.h"
#include "system/uncaught_exception.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <boost/asio/buffer.hpp>
#include <boost/asio/error.hpp>
#include <boost/asio/post.hpp>

#include <cerrno>
#include <sys/socket.h>
#include <unistd.h>
#include <utility>

namespace Tarvel::System {

namespace asio = boost::asio;
using asio::ip::tcp;
using boost::system::error_code;

namespace {

constexpr int MAX_PORT = 65535;

/// A resolver that hangs keeps its thread: so many may hang before further lookups have to wait.
constexpr std::size_t MAX_LOOKUP_THREADS = 64;
constexpr std::chrono::milliseconds LOOKUP_IDLE_TIME{500};

ThreadPool &LookupPool() {
  // Never destroyed, as nobody can end a lookup.
  static ThreadPool *const pool = CreateEndlessThreadPool(MAX_LOOKUP_THREADS, LOOKUP_IDLE_TIME).Detach();
  return *pool;
}

/// Why no connection to `host` can be tried; empty when it can.
std::string RefuseTarget(std::string_view host, int port) {
  if (host.empty()) {
    return "the host name is empty";
  }
  for (const char c : host) {
    if (static_cast<unsigned char>(c) > 0x7E) {
      return "the host name is not ASCII (an internationalised name must be in its \"xn--\" form)";
    }
    if (c <= ' ') {
      return "the host name holds a blank or a control character";
    }
  }
  if (port < 1 || port > MAX_PORT) {
    return "the port is not between 1 and 65535";
  }
  return {};
}

std::string WithoutBrackets(const std::string &host) {
  return host.size() > 2 && host.front() == '[' && host.back() == ']' ? host.substr(1, host.size() - 2) : host;
}

template <typename Failure>
void PostTransferFailure(Stream::TransferHandler handler, Failure failure) {
  asio::post(GetIoContext(), [handler = std::move(handler), failure = std::move(failure)] { handler(0, &failure); });
}

template <typename Failure>
void PostConnectFailure(TcpClientSocket::ConnectHandler handler, Failure failure) {
  asio::post(GetIoContext(), [handler = std::move(handler), failure = std::move(failure)] { handler(&failure); });
}

} // namespace

struct TcpClientSocketImpl::PendingWrite {
  const char *bytes;
  std::size_t length;
  std::size_t written;
  TransferHandler handler;
};

TcpClientSocketImpl::TcpClientSocketImpl() : m_socket(GetIoContext()), m_attemptTimer(GetIoContext()) {}

void TcpClientSocketImpl::AsyncConnect(const std::string &host, int port, ConnectHandler handler) {
  const std::lock_guard<std::mutex> lock(m_mutex);
  if (m_stage != Stage::FRESH) {
    PostConnectFailure(std::move(handler), InvalidStateException("The socket has been used or closed already"));
    return;
  }
  m_stage = Stage::CONNECTING;
  m_target = StringUtil::Shorten(host) + ":" + std::to_string(port);
  m_port = port;
  m_connectHandler = std::move(handler);
  if (const std::string refusal = RefuseTarget(host, port); !refusal.empty()) {
    GiveUpConnect(refusal);
    return;
  }
  const std::string name = WithoutBrackets(host);
  error_code notAnAddress;
  const asio::ip::address address = asio::ip::make_address(name, notAnAddress);
  if (!notAnAddress) {
    TryAddresses({address});
    return;
  }
  if (name != host) {
    GiveUpConnect("only an IPv6 address may stand in brackets");
    return;
  }
  try {
    m_lookup = LookupPool().QueueWorkItem([self = Ref(this), name] { self->LookUpAndConnect(name); });
  } catch (const Exception &noThread) {
    GiveUpConnect(noThread.what());
  }
}

// On a thread of the lookup pool, and perhaps long after the socket was closed.
void TcpClientSocketImpl::LookUpAndConnect(const std::string &host) {
  AddressList addresses;
  std::string failure;
  try {
    addresses = LookUpName(host);
  } catch (const std::exception &exception) {
    failure = exception.what();
  }
  const std::lock_guard<std::mutex> lock(m_mutex);
  if (m_stage != Stage::CONNECTING) {
    return;
  }
  if (addresses.empty()) {
    GiveUpConnect(failure);
    return;
  }
  TryAddresses(std::move(addresses));
}

void TcpClientSocketImpl::TryAddresses(AddressList addresses) {
  m_lookup.reset();
  m_addresses = std::move(addresses);
  TryNextAddress();
}

void TcpClientSocketImpl::TryNextAddress() {
  while (m_nextAddress < m_addresses.size()) {
    const tcp::endpoint endpoint(m_addresses[m_nextAddress++], static_cast<asio::ip::port_type>(m_port));
    error_code error;
    if (OpenSocket(endpoint, error)) {
      m_socket.async_connect(endpoint,
                             [self = Ref(this)](const error_code &result) { self->OnConnectAttempt(result); });
      LimitAttempt();
      return;
    }
    NoteFailedAttempt(error);
  }
  GiveUpConnect(m_attempts);
}

// An address that swallows packets must not use up the time that the others are worth.
void TcpClientSocketImpl::LimitAttempt() {
  m_isAttemptOverdue = false;
  if (m_nextAddress == m_addresses.size()) {
    return; // whoever asked for the connection limits the last one
  }
  m_attemptTimer.expires_after(MAX_ATTEMPT_TIME);
  m_attemptTimer.async_wait([self = Ref(this), attempt = m_nextAddress](const error_code &cancelled) {
    const std::lock_guard<std::mutex> lock(self->m_mutex);
    if (!cancelled && self->m_stage == Stage::CONNECTING && self->m_nextAddress == attempt) {
      self->m_isAttemptOverdue = true;
      error_code ignored;
      self->m_socket.cancel(ignored);
    }
  });
}

// Asio's own `open` would leave a moment in which another thread's new child process inherits the descriptor.
bool TcpClientSocketImpl::OpenSocket(const tcp::endpoint &endpoint, error_code &error) {
  const int descriptor = ::socket(endpoint.protocol().family(), SOCK_STREAM | SOCK_CLOEXEC, 0);
  if (descriptor < 0) {
    error.assign(errno, boost::system::system_category());
    return false;
  }
  m_socket.assign(endpoint.protocol(), descriptor, error);
  if (error) {
    ::close(descriptor);
    return false;
  }
  return true;
}

void TcpClientSocketImpl::OnConnectAttempt(const error_code &error) {
  ConnectHandler handler;
  {
    const std::lock_guard<std::mutex> lock(m_mutex);
    if (m_stage != Stage::CONNECTING) {
      return; // closed meanwhile, and the handler told so
    }
    error_code ignored;
    m_attemptTimer.cancel(ignored);
    if (error) {
      NoteFailedAttempt(m_isAttemptOverdue ? asio::error::make_error_code(asio::error::timed_out) : error);
      TryNextAddress();
      return;
    }
    m_stage = Stage::CONNECTED;
    m_socket.set_option(tcp::no_delay(true), ignored); // without it the connection is slow, not wrong
    handler = std::move(m_connectHandler);
    m_connectHandler = nullptr;
  }
  handler(nullptr);
}

void TcpClientSocketImpl::NoteFailedAttempt(const error_code &error) {
  error_code ignored;
  m_socket.close(ignored);
  m_attempts.append(m_attempts.empty() ? "" : "; ");
  if (m_addresses.size() > 1) {
    m_attempts.append(m_addresses[m_nextAddress - 1].to_string()).append(": ");
  }
  m_attempts.append(error.message());
}

void TcpClientSocketImpl::GiveUpConnect(const std::string &reason) {
  m_stage = Stage::ENDED;
  PostConnectFailure(std::exchange(m_connectHandler, nullptr),
                     NetworkException("Cannot connect to " + m_target + ": " + reason));
}

bool TcpClientSocketImpl::IsConnectDone() const noexcept {
  const std::lock_guard<std::mutex> lock(m_mutex);
  return m_stage == Stage::CONNECTED || m_stage == Stage::ENDED;
}

void TcpClientSocketImpl::Close() noexcept {
  ConnectHandler handler;
  Ref<ScheduledItem> lookup;
  {
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_stage = Stage::ENDED;
    error_code ignored; // the descriptor is gone in any case
    m_socket.close(ignored);
    m_attemptTimer.cancel(ignored);
    handler.swap(m_connectHandler);
    lookup = std::move(m_lookup);
  }
  if (lookup) {
    lookup->Cancel();
  }
  if (!handler) {
    return;
  }
  try {
    PostConnectFailure(std::move(handler), NetworkException("Cannot connect to " + m_target + ": cancelled"));
  } catch (...) {
    LogUncaughtException("the cancellation of a connect");
  }
}

void TcpClientSocketImpl::AsyncReadSome(char *buffer, std::size_t length, TransferHandler handler) {
  const std::lock_guard<std::mutex> lock(m_mutex);
  if (m_stage != Stage::CONNECTED) {
    PostTransferFailure(std::move(handler), DescribeTransferFailure(asio::error::not_connected));
    return;
  }
  if (length == 0) {
    PostTransferFailure(std::move(handler), InvalidArgumentException("a read of no bytes"));
    return;
  }
  if (m_readEnd) {
    asio::post(GetIoContext(), [self = Ref(this), handler = std::move(handler), error = m_readEnd] {
      self->CompleteRead(handler, error, 0);
    });
    return;
  }
  m_socket.async_read_some(asio::buffer(buffer, length),
                           [self = Ref(this), handler = std::move(handler)](
                               const error_code &error, std::size_t count) { self->OnRead(handler, error, count); });
}

void TcpClientSocketImpl::OnRead(const TransferHandler &handler, const error_code &error, std::size_t count) {
  if (error) {
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_readEnd = error;
  }
  CompleteRead(handler, error, count);
}

void TcpClientSocketImpl::CompleteRead(const TransferHandler &handler, const error_code &error,
                                       std::size_t count) const {
  if (!error || error == asio::error::eof) {
    handler(count, nullptr);
    return;
  }
  const NetworkException failure = DescribeTransferFailure(error);
  handler(0, &failure);
}

void TcpClientSocketImpl::AsyncWrite(const char *bytes, std::size_t length, TransferHandler handler) {
  const std::lock_guard<std::mutex> lock(m_mutex);
  if (m_stage != Stage::CONNECTED) {
    PostTransferFailure(std::move(handler), DescribeTransferFailure(asio::error::not_connected));
    return;
  }
  if (m_writeEnd) {
    PostTransferFailure(std::move(handler), DescribeTransferFailure(m_writeEnd));
    return;
  }
  WriteSome(std::make_unique<PendingWrite>(PendingWrite{bytes, length, 0, std::move(handler)}));
}

// Under the lock.
void TcpClientSocketImpl::WriteSome(std::unique_ptr<PendingWrite> pending) {
  const asio::const_buffer rest(pending->bytes + pending->written, pending->length - pending->written);
  m_socket.async_write_some(
      rest, [self = Ref(this), pending = std::move(pending)](const error_code &error, std::size_t count) mutable {
        self->OnWritten(std::move(pending), error, count);
      });
}

void TcpClientSocketImpl::OnWritten(std::unique_ptr<PendingWrite> pending, const error_code &error, std::size_t count) {
  pending->written += count;
  error_code result = error;
  {
    const std::lock_guard<std::mutex> lock(m_mutex);
    if (!result && pending->written < pending->length) {
      if (m_stage == Stage::CONNECTED) {
        WriteSome(std::move(pending));
        return;
      }
      result = asio::error::operation_aborted;
    }
    m_writeEnd = result;
  }
  if (!result) {
    pending->handler(pending->written, nullptr);
    return;
  }
  const NetworkException failure = DescribeTransferFailure(result);
  pending->handler(pending->written, &failure);
}

NetworkException TcpClientSocketImpl::DescribeTransferFailure(const error_code &error) const {
  if (error == asio::error::operation_aborted) {
    return NetworkException("The connection to " + m_target + " was closed by this side");
  }
  if (error == asio::error::not_connected) {
    return NetworkException("There is no connection" + (m_target.empty() ? m_target : " to " + m_target));
  }
  return NetworkException("The connection to " + m_target + " broke: " + error.message());
}

} // namespace Tarvel::System
