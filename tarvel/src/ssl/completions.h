// SPDX-License-Identifier: Apache-2.0
/// @file
/// Calls completion handlers while no lock is held. Their exceptions are logged and ignored.

#pragma once

#include "core/fork_gate.h"
#include "service/uncaught_exception.h"

#include <tarvel/ssl/ssl_context.h>

#include <cstddef>
#include <memory>

namespace Tarvel::Ssl {

template <typename Handler, typename... Args>
void CallGuarded(const Handler &handler, const Args &...args) noexcept {
  const HostCall call;
  try {
    handler(args...);
  } catch (...) {
    Service::LogUncaughtException("a completion handler");
  }
}

/// Handlers whose operations have ended, collected under the stream's lock and called after it is released. `Run` calls
/// each handler once, with its result.
class Completions {
public:
  using Failure = std::shared_ptr<const Exception>;

  void AddHandshake(SSLStream::HandshakeHandler handler, Failure failure);
  void AddRead(System::Stream::TransferHandler handler, std::size_t count, Failure failure);
  void AddWrite(System::Stream::TransferHandler handler, std::size_t count, Failure failure);

  void Run() const noexcept;

private:
  struct Transfer {
    System::Stream::TransferHandler handler;
    std::size_t count = 0;
    Failure failure;
  };

  SSLStream::HandshakeHandler m_handshake;
  Failure m_handshakeFailure;
  Transfer m_read;
  Transfer m_write;
};

} // namespace Tarvel::Ssl
