// SPDX-License-Identifier: Apache-2.0

#include "ssl/completions.h"

#include <utility>

namespace Tarvel::Ssl {

void Completions::AddHandshake(SSLStream::HandshakeHandler handler, Failure failure) {
  m_handshake = std::move(handler);
  m_handshakeFailure = std::move(failure);
}

void Completions::AddRead(System::Stream::TransferHandler handler, std::size_t count, Failure failure) {
  m_read = {std::move(handler), count, std::move(failure)};
}

void Completions::AddWrite(System::Stream::TransferHandler handler, std::size_t count, Failure failure) {
  m_write = {std::move(handler), count, std::move(failure)};
}

void Completions::Run() const noexcept {
  const unsigned generation = GetForkGeneration();
  if (m_handshake) {
    CallGuarded(m_handshake, m_handshakeFailure.get());
  }
  for (const Transfer *transfer : {&m_write, &m_read}) {
    // A handler may have forked: the child must not call the others.
    if (transfer->handler && generation == GetForkGeneration()) {
      CallGuarded(transfer->handler, transfer->count, transfer->failure.get());
    }
  }
}

} // namespace Tarvel::Ssl
