// SPDX-License-Identifier: Apache-2.0
/// @file
/// A port of this machine on which no program listens.

#pragma once

#include <stdexcept>
#include <string>

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

namespace ToolTest {

/// Keeps a loopback port bound without listening on it, so that every connection to it is refused.
class ClosedPort {
public:
  ClosedPort() : m_socket(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    m_address.sin_family = AF_INET;
    m_address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t length = sizeof m_address;
    auto *const address = reinterpret_cast<sockaddr *>(&m_address);
    if (bind(m_socket, address, length) != 0 || getsockname(m_socket, address, &length) != 0) {
      throw std::runtime_error("bind");
    }
  }
  ClosedPort(const ClosedPort &) = delete;
  ClosedPort &operator=(const ClosedPort &) = delete;
  ~ClosedPort() { close(m_socket); }

  std::string HostAndPort() const { return "127.0.0.1:" + std::to_string(ntohs(m_address.sin_port)); }

private:
  int m_socket;
  sockaddr_in m_address = {};
};

} // namespace ToolTest
