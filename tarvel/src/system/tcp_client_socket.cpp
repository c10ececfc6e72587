// SPDX-License-Identifier: Apache-2.0

#include "system/tcp_client_socket.h"

#include "system/connect_target.h"
#include "system/io_engine.h"
#include "system/shared_lookup.h"

#include <tarvel/core/exception.h>

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

/// The failure that a completion gets when there is no memory for a message about its operation.
const NetworkException &OutOfMemory() {
  const Computation computing;
  static const NetworkException *const failure = new NetworkException("There is not enough memory"); // never destroyed
  return *failure;
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
    : m_socket(m_context.Get()), m_connectEnd(m_context.Get()), m_attemptTimer(m_context.Get()) {
  OutOfMemory(); // made while there is memory
  Enter();
}

TcpClientSocketImpl::~TcpClientSocketImpl() {
  const Computation computing;
  Leave();
  error_code ignored; // the descriptor is released in any case
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

/// Runs one step of the connect. An exception, including `std::bad_alloc`, ends the connect with that failure.
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
  if (const std::optional<asio::ip::address> address = ParseAddress(host)) {
    TryAddresses({*address});
    return;
  }
  m_lookup =
      StartSharedLookup(host, [self = Ref(this)](const AddressList &addresses, const std::exception_ptr &failure) {
        self->OnLookup(addresses, failure);
      });
}

// Runs on a thread of the look-ups, perhaps while the socket is being closed.
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

// An address that never answers must not use up the time for the others.
void TcpClientSocketImpl::LimitAttempt() {
  m_isAttemptOverdue = false;
  if (m_nextAddress == m_addresses.size()) {
    return; // the caller limits the time of the last attempt
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

// Asio's own `open` sets close-on-exec only afterwards: a child process that another thread starts in between would
// inherit the descriptor.
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
      return; // the connect has ended already; `OnConnectEnd` reports that
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
    m_socket.set_option(tcp::no_delay(true), ignored); // if this fails, the connection is only slower
    handler.swap(m_connectHandler);
    m_connectEnd.cancel(ignored); // `OnConnectEnd` finds no handler then
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
    error_code ignored; // the descriptor is released in any case
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
    asio::post(m_context.Get(), [self = Ref(this), handler = std::move(handler), error = m_readEnd] {
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

// Called under the lock.
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
