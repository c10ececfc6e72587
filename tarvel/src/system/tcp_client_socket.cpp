// SPDX-License-Identifier: Apache-2.0

#include "system/tcp_client_socket.h"

#include "system/io_engine.h"
#include "system/shared_lookup.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <boost/asio/buffer.hpp>
#include <boost/asio/error.hpp>
#include <boost/asio/post.hpp>

#include <cerrno>
#include <mutex>
#include <new>
#include <string>
#include <sys/socket.h>
#include <unistd.h>
#include <utility>

namespace Tarvel::System {

namespace asio = boost::asio;
using asio::ip::tcp;
using boost::system::error_code;

namespace {

constexpr int MAX_PORT = 65535;

/// What a completion gets when there is no memory to say more.
const NetworkException &OutOfMemory() {
  const Computation computing;
  static const NetworkException *const failure = new NetworkException("There is not enough memory"); // never destroyed
  return *failure;
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

/// `host` as an address; unspecified, with an error, when it is a name.
asio::ip::address ParseAddress(const std::string &host, error_code &error) {
  return asio::ip::make_address(WithoutBrackets(host), error);
}

/// How messages name the endpoint.
std::string DescribeTarget(const std::string &host, int port) {
  error_code notAnAddress;
  const bool needsBrackets = ParseAddress(host, notAnAddress).is_v6() && host.front() != '[';
  return (needsBrackets ? "[" + host + "]" : StringUtil::Shorten(host)) + ":" + std::to_string(port);
}

template <typename Failure>
void PostTransferFailure(Stream::TransferHandler handler, Failure failure) {
  const Computation computing;
  asio::post(GetIoContext(), [handler = std::move(handler), failure = std::move(failure)] {
    const HostCall call;
    handler(0, &failure);
  });
}

template <typename Failure>
void PostConnectFailure(TcpClientSocket::ConnectHandler handler, Failure failure) {
  const Computation computing;
  asio::post(GetIoContext(), [handler = std::move(handler), failure = std::move(failure)] {
    const HostCall call;
    handler(&failure);
  });
}

} // namespace

struct TcpClientSocketImpl::PendingWrite {
  const char *bytes;
  std::size_t length;
  std::size_t written;
  TransferHandler handler;
};

TcpClientSocketImpl::TcpClientSocketImpl()
    : m_socket(GetIoContext()), m_connectEnd(GetIoContext()), m_attemptTimer(GetIoContext()) {
  OutOfMemory(); // made while there is memory
  Enter();
}

TcpClientSocketImpl::~TcpClientSocketImpl() {
  const Computation computing;
  Leave();
  error_code ignored; // the descriptor is gone in any case
  m_socket.close(ignored);
  m_attemptTimer.cancel(ignored);
  m_connectEnd.cancel(ignored);
}

void TcpClientSocketImpl::CloseInChild() noexcept {
  error_code ignored;
  m_socket.close(ignored);
  m_stage = Stage::ENDED;
  m_isOfParent = true;
}

void TcpClientSocketImpl::AsyncConnect(const std::string &host, int port, ConnectHandler handler) {
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  if (m_stage != Stage::FRESH) {
    PostConnectFailure(std::move(handler), InvalidStateException("The socket has been used or closed already"));
    return;
  }
  m_target = DescribeTarget(host, port);
  m_port = port;
  m_connectEnd.expires_at(std::chrono::steady_clock::time_point::max());
  m_connectEnd.async_wait([self = Ref(this)](const error_code &) { self->OnConnectEnd(); });
  m_connectHandler = std::move(handler);
  m_stage = Stage::CONNECTING;
  TryStep([this, &host] { StartConnect(host); });
}

/// Whatever goes wrong in a step of the connect, memory that runs out included, is how the connect ends.
template <typename Step>
void TcpClientSocketImpl::TryStep(const Step &step) noexcept {
  try {
    step();
  } catch (const std::bad_alloc &) {
    EndConnect("there is not enough memory");
  } catch (const std::exception &failure) {
    EndConnect(failure.what());
  } catch (...) {
    EndConnect("unknown failure");
  }
}

void TcpClientSocketImpl::StartConnect(const std::string &host) {
  if (const std::string refusal = RefuseTarget(host, m_port); !refusal.empty()) {
    EndConnect(refusal);
    return;
  }
  error_code notAnAddress;
  const asio::ip::address address = ParseAddress(host, notAnAddress);
  if (!notAnAddress) {
    TryAddresses({address});
    return;
  }
  if (WithoutBrackets(host) != host) {
    EndConnect("only an IPv6 address may stand in brackets");
    return;
  }
  m_lookup =
      StartSharedLookup(host, [self = Ref(this)](const AddressList &addresses, const std::exception_ptr &failure) {
        self->OnLookup(addresses, failure);
      });
}

// On a thread of the look-ups, and perhaps while the socket is being closed.
void TcpClientSocketImpl::OnLookup(const AddressList &addresses, const std::exception_ptr &failure) {
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  m_lookup.reset();
  if (m_stage != Stage::CONNECTING) {
    return;
  }
  TryStep([&] {
    if (failure) {
      std::rethrow_exception(failure);
    }
    TryAddresses(addresses);
  });
}

void TcpClientSocketImpl::TryAddresses(AddressList addresses) {
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
  EndConnect(m_attempts);
}

// An address that swallows packets must not use up the time that the others are worth.
void TcpClientSocketImpl::LimitAttempt() {
  m_isAttemptOverdue = false;
  if (m_nextAddress == m_addresses.size()) {
    return; // whoever asked for the connection limits the last one
  }
  m_attemptTimer.expires_after(MAX_ATTEMPT_TIME);
  m_attemptTimer.async_wait([self = Ref(this), attempt = m_nextAddress](const error_code &cancelled) {
    const std::lock_guard<ForkSafeMutex> lock(self->m_mutex);
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
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (m_stage != Stage::CONNECTING) {
      return; // ended meanwhile, which the handler learns from `OnConnectEnd`
    }
    error_code ignored;
    m_attemptTimer.cancel(ignored);
    if (error) {
      TryStep([this, &error] {
        NoteFailedAttempt(m_isAttemptOverdue ? asio::error::make_error_code(asio::error::timed_out) : error);
        TryNextAddress();
      });
      return;
    }
    m_stage = Stage::CONNECTED;
    m_socket.set_option(tcp::no_delay(true), ignored); // without it the connection is slow, not wrong
    handler.swap(m_connectHandler);
    m_connectEnd.cancel(ignored); // which finds no handler then
  }
  const HostCall call;
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

void TcpClientSocketImpl::EndConnect(std::string_view reason) noexcept {
  m_stage = Stage::ENDED;
  try {
    m_connectFailure = NetworkException("Cannot connect to " + m_target + ": " + std::string(reason));
  } catch (...) {
    m_connectFailure = OutOfMemory();
  }
  error_code ignored;
  m_socket.close(ignored);
  m_attemptTimer.cancel(ignored);
  m_connectEnd.cancel(ignored);
}

void TcpClientSocketImpl::OnConnectEnd() {
  ConnectHandler handler;
  std::optional<NetworkException> failure;
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    handler.swap(m_connectHandler);
    failure = m_connectFailure;
  }
  if (handler) {
    const HostCall call;
    handler(&*failure);
  }
}

bool TcpClientSocketImpl::IsConnectDone() const noexcept {
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  return m_stage == Stage::CONNECTED || m_stage == Stage::ENDED;
}

void TcpClientSocketImpl::Close() noexcept {
  Ref<ScheduledItem> lookup;
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (m_isOfParent) {
      return;
    }
    if (m_stage == Stage::CONNECTING) {
      EndConnect("cancelled");
    }
    m_stage = Stage::ENDED;
    error_code ignored; // the descriptor is gone in any case
    m_socket.close(ignored);
    lookup = std::move(m_lookup);
  }
  if (lookup) {
    lookup->Cancel();
  }
}

void TcpClientSocketImpl::AsyncReadSome(char *buffer, std::size_t length, TransferHandler handler) {
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
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
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    m_readEnd = error;
  }
  CompleteRead(handler, error, count);
}

void TcpClientSocketImpl::CompleteRead(const TransferHandler &handler, const error_code &error,
                                       std::size_t count) const {
  if (!error || error == asio::error::eof) {
    const HostCall call;
    handler(count, nullptr);
    return;
  }
  const NetworkException failure = DescribeTransferFailure(error);
  const HostCall call;
  handler(0, &failure);
}

void TcpClientSocketImpl::AsyncWrite(const char *bytes, std::size_t length, TransferHandler handler) {
  const std::lock_guard<ForkSafeMutex> lock(m_mutex);
  if (m_stage != Stage::CONNECTED) {
    PostTransferFailure(std::move(handler), DescribeTransferFailure(asio::error::not_connected));
    return;
  }
  if (m_writeEnd) {
    PostTransferFailure(std::move(handler), DescribeTransferFailure(m_writeEnd));
    return;
  }
  WriteSome(std::make_shared<PendingWrite>(PendingWrite{bytes, length, 0, std::move(handler)}));
}

// Under the lock.
void TcpClientSocketImpl::WriteSome(const std::shared_ptr<PendingWrite> &pending) {
  const asio::const_buffer rest(pending->bytes + pending->written, pending->length - pending->written);
  m_socket.async_write_some(rest, [self = Ref(this), pending](const error_code &error, std::size_t count) {
    self->OnWritten(pending, error, count);
  });
}

void TcpClientSocketImpl::OnWritten(const std::shared_ptr<PendingWrite> &pending, const error_code &error,
                                    std::size_t count) {
  pending->written += count;
  error_code result = error;
  {
    const std::lock_guard<ForkSafeMutex> lock(m_mutex);
    if (!result && pending->written < pending->length && m_stage != Stage::CONNECTED) {
      result = asio::error::operation_aborted;
    }
    if (!result && pending->written < pending->length) {
      try {
        WriteSome(pending);
        return;
      } catch (...) {
        result = asio::error::no_memory;
      }
    }
    m_writeEnd = result;
  }
  if (!result) {
    const HostCall call;
    pending->handler(pending->written, nullptr);
    return;
  }
  const NetworkException failure = DescribeTransferFailure(result);
  const HostCall call;
  pending->handler(pending->written, &failure);
}

NetworkException TcpClientSocketImpl::DescribeTransferFailure(const error_code &error) const noexcept {
  try {
    if (error == asio::error::operation_aborted) {
      return NetworkException("The connection to " + m_target + " was closed by this side");
    }
    if (error == asio::error::not_connected) {
      return NetworkException("There is no connection" + (m_target.empty() ? m_target : " to " + m_target));
    }
    return NetworkException("The connection to " + m_target + " broke: " + error.message());
  } catch (...) {
    return OutOfMemory();
  }
}

} // namespace Tarvel::System
