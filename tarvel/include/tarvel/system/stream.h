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
/// The message contains the endpoint and the reason.
class TARVEL_API NetworkException : public Exception {
  TARVEL_EXCEPTION_BODY(NetworkException, Exception);
};

/// An operation that was waited for did not end in time.
class TARVEL_API TimeoutException : public NetworkException {
  TARVEL_EXCEPTION_BODY(TimeoutException, NetworkException);
};

/// A connected stream of bytes with asynchronous operations. A completion is called exactly once for each start that
/// returns, whatever goes wrong. It is never called inside the starting call, but another thread may call it before
/// that call has returned. A start throws only `std::bad_alloc`, when there is no memory to begin, and, in a child
/// process made by `fork`, `InvalidStateException`, when no thread or descriptor is left for the I/O threads. In both
/// cases its completion is not called.
///
/// Completions run on the platform's I/O threads: there are two, and all pending operations of the process share them.
/// A completion must not block, nor wait for another operation, synchronous or asynchronous: start the next one from
/// the completion, and queue work that takes time on a thread pool. An exception that a completion throws is logged
/// (logger "Tarvel", level 8) and has no other effect.
///
/// At most one read and one write may be pending at a time. Buffers belong to the caller and must stay valid until the
/// completion. Any thread may start operations and close the stream.
///
/// A child process made by `fork` closes its copy of the connection and sends nothing over it. No completion of an
/// operation that the parent has begun is called in the child, and operations that the child begins on such a stream
/// fail.
class TARVEL_API Stream : public Object {
public:
  /// Called with the number of bytes moved and null, or with the failure, which is valid during the call:
  /// - a `NetworkException` (also when memory runs out on the way); over TLS its subclass `Ssl::SSLException`;
  /// - an `InvalidArgumentException` or `InvalidStateException` for a read of no bytes and, over TLS, for a second read
  ///   or write while one is pending, and for a read or write before the handshake or on a connection of the parent
  ///   process;
  /// - over TLS, an `InvalidStateException` when OpenSSL has cleaned itself up because the process ends (at once,
  ///   whatever the peer does), or an `OutOfMemoryException`; either ends the connection.
  using TransferHandler = std::function<void(std::size_t, const Exception *)>;

  /// Reads at least one byte, at most `length`; 0 bytes without an exception mean that the peer has closed its side
  /// properly.
  virtual void AsyncReadSome(char *buffer, std::size_t length, TransferHandler handler) = 0;

  /// Writes all `length` bytes.
  virtual void AsyncWrite(const char *bytes, std::size_t length, TransferHandler handler) = 0;

  /// Ends the connection at once; pending operations complete with an exception.
  virtual void Close() noexcept = 0;

  /// Whether what is written is encrypted and the peer is verified before anything is sent. The result is the same at
  /// any time and on any thread. It is false unless a class overrides this, such as `Ssl::SSLStream`. A stream that
  /// only passes bytes on to another one, for example to count them, returns the other one's result.
  /// `Http::UserAgent` depends on the result: it sends cookies with the attribute Secure only over a secure stream, and
  /// assumes the default port 443 there.
  virtual bool IsSecure() const noexcept { return false; }

protected:
  ~Stream() override;
};

/// How many host names are looked up at a time. The system's resolver cannot be interrupted, so a name that gets no
/// answer occupies one of these places until the resolver's own time-out. Simultaneous look-ups of one name, in any
/// letter case, share one place. Up to 63 names without an answer delay no other name.
constexpr std::size_t MAX_NAME_LOOKUPS = 64;

/// A TCP connection to be made.
class TARVEL_API TcpClientSocket : public Stream {
public:
  /// Called with null, or with the failure, which is valid during the call: a `NetworkException` (also when no
  /// descriptor, thread or memory is left), or an `InvalidStateException` for a socket that has been used or closed
  /// already.
  using ConnectHandler = std::function<void(const Exception *)>;

  /// Resolves `host` (a name, an IPv4 address, or an IPv6 address with or without brackets) and connects: tries each
  /// address in the resolver's order until one answers. A name that is not ASCII and a port outside 1 to 65535 are
  /// refused, with a `NetworkException` to the handler. If the same name is being looked up already, this waits for
  /// that look-up; if `MAX_NAME_LOOKUPS` other names are being looked up, this waits until one of these look-ups ends.
  /// `Close` ends the wait, not the look-up. No result is kept for later connections.
  virtual void AsyncConnect(const std::string &host, int port, ConnectHandler handler) = 0;

protected:
  ~TcpClientSocket() override;
};

/// A socket, not connected. Its completions run on the platform's I/O threads.
/// @throws InvalidStateException when these threads cannot be started, or no descriptor is left for them to wait on.
///         Only the first sockets of a process can fail in this way; a later call tries again.
TARVEL_API Ref<TcpClientSocket> CreateTcpClientSocket();

/// A handle that cancels by closing `stream`.
TARVEL_API Ref<ScheduledItem> CreateStreamCanceller(const Ref<Stream> &stream);

} // namespace Tarvel::System
