// SPDX-License-Identifier: Apache-2.0

#include <tarvel/system/stream.h>

#include "core/fork_gate.h"
#include "system/tcp_client_socket.h"

#include <atomic>

namespace Tarvel::System {

namespace {

class StreamCanceller final : public ScheduledItem {
public:
  explicit StreamCanceller(const Ref<Stream> &stream)
      : m_stream(stream), m_socket(dynamic_cast<TcpClientSocketImpl *>(stream.get())) {}

  void Cancel() noexcept override {
    m_cancelled = true;
    m_stream->Close();
  }

  bool IsDone() const noexcept override { return m_cancelled || (m_socket && m_socket->IsConnectDone()); }

private:
  const Ref<Stream> m_stream;
  const TcpClientSocketImpl *const m_socket; // m_stream; null if it is another kind of stream
  std::atomic<bool> m_cancelled{false};
};

} // namespace

TARVEL_DEFINE_EXCEPTION(NetworkException)
TARVEL_DEFINE_EXCEPTION(TimeoutException)

Stream::~Stream() = default;

TcpClientSocket::~TcpClientSocket() = default;

Ref<TcpClientSocket> CreateTcpClientSocket() {
  const Computation computing;
  return MakeRef<TcpClientSocketImpl>();
}

Ref<ScheduledItem> CreateStreamCanceller(const Ref<Stream> &stream) {
  return MakeRef<StreamCanceller>(stream);
}

} // namespace Tarvel::System
