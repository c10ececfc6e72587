// SPDX-License-Identifier: Apache-2.0
/// @file
/// How a user agent's connections are opened.

#pragma once

#include <tarvel/core/exception.h>
#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/system/scheduled_item.h>
#include <tarvel/system/stream.h>

#include <functional>
#include <string>

namespace Tarvel::Http {

/// Opens connections to one endpoint. Immutable; safe on any thread.
class TARVEL_API ConnectionSpec : public Object {
public:
  /// Called exactly once for each start that has not thrown, on an I/O thread: with the stream and null, or with an
  /// exception and perhaps a stream. The exception is valid during the call. The function must not block, nor wait for
  /// another operation. It may start the next operation.
  using ConnectCompletion = std::function<void(const Ref<System::Stream> &, const Exception *)>;

  /// One line for logs. The platform does not read it.
  virtual std::string ToString() const = 0;

  /// The host to which requests are sent, for the Host header and the cookies; an IPv6 address with or without
  /// brackets.
  virtual std::string GetHost() const = 0;

  /// "host:port", for messages. The port, after the last colon, is also used for the Host header.
  virtual std::string GetEndpointString() const = 0;

  /// Whether a connection may be used again after an authentication has failed on it. The platform's user agent, which
  /// opens one connection for each request, does not call this.
  virtual bool IsReuseOnAuthErrorSupported() const = 0;

  /// Starts to connect. The returned item cancels the attempt; the completion then gets an exception. Failures are
  /// reported to the completion: usually as a `System::NetworkException`, such as an `Ssl::SSLException`; as an
  /// `OutOfMemoryException` when memory ran out; as an `InvalidStateException` with the text of a foreign exception.
  /// @throws InvalidStateException when there is no I/O thread that could call the completion, and none can be started;
  ///         `std::bad_alloc`. In both cases the completion is not called.
  virtual Ref<System::ScheduledItem> AsyncConnect(ConnectCompletion completion) const = 0;

protected:
  ~ConnectionSpec() override;
};

/// The base of connection specifications that are written outside the platform.
class TARVEL_API CustomConnectionSpec : public virtual ConnectionSpec {
protected:
  ~CustomConnectionSpec() override;
};

} // namespace Tarvel::Http
