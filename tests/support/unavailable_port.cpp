// SPDX-License-Identifier: Apache-2.0

#include "support/unavailable_port.h"

#include "support/scripted_server.h"

#include <poll.h>
#include <stdexcept>
#include <sys/socket.h>
#include <unistd.h>

namespace Testing {

namespace {

constexpr int WAIT_MILLISECONDS = 60'000;

} // namespace

UnusedPort::UnusedPort() = default;

FullPort::FullPort() {
  sockaddr_storage address{};
  socklen_t length = sizeof address;
  if (::listen(m_listener, 0) != 0 || ::getsockname(m_listener, reinterpret_cast<sockaddr *>(&address), &length) != 0) {
    throw std::runtime_error("full port: cannot listen");
  }
  constexpr int FILLERS = 8;
  for (int i = 0; i < FILLERS; ++i) {
    const int filler = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
    ::connect(filler, reinterpret_cast<const sockaddr *>(&address), length);
    m_fillers.push_back(filler);
  }
  // The kernel may be late: the queue is full when the first connection is in it.
  pollfd listener{m_listener, POLLIN, 0};
  if (::poll(&listener, 1, WAIT_MILLISECONDS) != 1) {
    throw std::runtime_error("full port: no connection arrives");
  }
}

FullPort::~FullPort() {
  Empty();
}

void FullPort::Empty() {
  for (const int filler : m_fillers) {
    ::close(filler);
  }
  m_fillers.clear();
  pollfd listener{m_listener, POLLIN, 0};
  int waiting = 0;
  while (::poll(&listener, 1, 0) > 0 && (waiting = ::accept4(m_listener, nullptr, nullptr, SOCK_CLOEXEC)) >= 0) {
    ::close(waiting);
  }
}

void FullPort::AnswerAll(std::string_view bytes) {
  int descriptor = -1;
  while ((descriptor = ::accept4(m_listener, nullptr, nullptr, SOCK_CLOEXEC)) >= 0) {
    ServerConnection connection(descriptor, nullptr);
    if (!connection.ReadRequest().empty()) {
      connection.Write(bytes);
    }
  }
}

void FullPort::StopAnswering() {
  ::shutdown(m_listener, SHUT_RDWR);
}

} // namespace Testing
