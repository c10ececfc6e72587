// SPDX-License-Identifier: Apache-2.0
/// @file
/// Connected byte streams, and the TCP client socket.

#pragma once

#include <tarvel/core/exception.h>
#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/system/scheduled_item.h>

#include <cstddef>
#include <functional>
#include <string>

namespace Tarvel::System {

/// A failure of the network: a name that does not resolve, a connection that fails or breaks, a cancelled operation.
/// The message names the endpoint and the reason.
class TARVEL_API NetworkException : public Exception {
  TARVEL_EXCEPTION_BODY(NetworkException, Exception);
};

/// A time-out of an operation that was waited for.
class TARVEL_API TimeoutException : public NetworkException {
  TARVEL_EXCEPTION_BODY(TimeoutException, NetworkException);
};

/// A connected stream of bytes, driven asynchronously. A completion is called exactly once for each start that returns,
/// whatever goes wrong, and never inside the starting call (though perhaps before it has returned). A start throws
/// `std::bad_alloc` when there is no memory to begin with, and, in a child process made by `fork`, `InvalidStateException` when
/// the I/O threads get no thread or descriptor; nothing else. Its completion is not called then.
///
/// Completions run on the platform's I/O threads, of which all that is pending in the process shares two. They must not
/// block, nor wait for another operation, synchronous or asynchronous: start the next one from the completion, and queue
/// work that takes time on a thread pool. What a completion throws is logged (logger "Tarvel", level 8) and goes no further.
///
/// At most one read and one write may be pending at a time. Buffers belong to the caller and must stay until the
/// completion. Any thread may start and close.
///
/// A child process made by `fork` closes its copy of the connection and sends nothing over it. No completion of an operation
/// that the parent has begun is called there; what the child begins on such a stream fails.
class TARVEL_API Stream : public Object {
public:
  /// Called with the number of bytes moved and null, or with what went wrong, which is valid during the call: a
  /// `NetworkException` (also when memory runs out on the way), over TLS its `Ssl::SSLException`;
  /// `InvalidArgumentException` or `InvalidStateException` for a read of no bytes and, over TLS, for a second read or write
  /// while one is pending, for one before the handshake, and for one on a connection that is the parent process's. Over TLS
  /// also an `InvalidStateException` when OpenSSL has cleaned itself up because the process ends, at once whatever the peer
  /// does, and an `OutOfMemoryException`; either ends the connection.
  using TransferHandler = std::function<void(std::size_t, const Exception *)>;

  /// Reads at least one byte, at most `length`; 0 bytes and no exception mean the peer's orderly end.
  virtual void AsyncReadSome(char *buffer, std::size_t length, TransferHandler handler) = 0;

  /// Writes all `length` bytes.
  virtual void AsyncWrite(const char *bytes, std::size_t length, TransferHandler handler) = 0;

  /// Ends the connection at once; pending operations complete with an exception.
  virtual void Close() noexcept = 0;

  /// Whether what is written is encrypted and the peer is verified before anything is sent. The same at any time, from
  /// any thread. False unless a class says otherwise; `Ssl::SSLStream` does. A stream that only passes bytes on to
  /// another one, for example to count them, returns that one's answer. What depends on it: `Http::UserAgent` sends
  /// cookies with the attribute Secure only over a secure stream, and takes 443 for the default port there.
  virtual bool IsSecure() const noexcept { return false; }

protected:
  ~Stream() override;
};

/// How many host names are looked up at a time. Nothing can interrupt the system's resolver, so that a name that gets no
/// answer holds one of these places until the resolver gives up, however many connections ask for it: look-ups of one name
/// at the same time are one, in whatever letter case. Up to 63 such names hold up no other.
constexpr std::size_t MAX_NAME_LOOKUPS = 64;

/// A TCP connection to be made.
class TARVEL_API TcpClientSocket : public Stream {
public:
  /// Called with null, or with what went wrong, which is valid during the call: a `NetworkException` (also when no
  /// descriptor, thread or memory is left), or an `InvalidStateException` for a socket that has been used or closed already.
  using ConnectHandler = std::function<void(const Exception *)>;

  /// Resolves `host` (a name, or an IPv4 or IPv6 address, this one with or without brackets) and connects, trying each
  /// address in the resolver's order until one answers. Names that are not ASCII are refused, and ports outside 1 to
  /// 65535, by a `NetworkException` to the handler. A look-up of the name that is under way is joined; when
  /// `MAX_NAME_LOOKUPS` other names are being looked up, it waits for its turn. `Close` ends the wait, not the look-up.
  /// No result is kept for later connections.
  virtual void AsyncConnect(const std::string &host, int port, ConnectHandler handler) = 0;

protected:
  ~TcpClientSocket() override;
};

/// A socket, not connected. Its completions run on the platform's I/O threads.
/// @throws InvalidStateException when these cannot be started, or no descriptor is left for what they wait on. Only the
///         first sockets of a process can meet that; a later call tries again.
TARVEL_API Ref<TcpClientSocket> CreateTcpClientSocket();

/// A handle that cancels by closing `stream`.
TARVEL_API Ref<ScheduledItem> CreateStreamCanceller(const Ref<Stream> &stream);

} // namespace Tarvel::System
