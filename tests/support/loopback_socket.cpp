// SPDX-License-Identifier: Apache-2.0

#include "support/loopback_socket.h"

#include <arpa/inet.h>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <netinet/in.h>
#include <stdexcept>
#include <string>
#include <sys/socket.h>
#include <unistd.h>

namespace Testing {

namespace {

/// How many numbers are tried, because one may be in use at another address. After a test of many connections, most
/// numbers may belong to connections that have just ended.
constexpr int TRIALS = 1000;

constexpr const char *V4_ADDRESS = "127.0.0.1";
constexpr const char *V6_ADDRESS = "::1";
constexpr const char *SECOND_V4_ADDRESS = "127.0.0.2";

void Require(bool condition, const char *what) {
  if (!condition) {
    throw std::runtime_error(std::string("loopback socket: ") + what);
  }
}

/// @param port 0 for any free port
/// @return the socket; -1 when it cannot be bound, with the reason in errno
int BindAt(const std::string &address, int port) {
  const bool v6 = address.find(':') != std::string::npos;
  sockaddr_in6 place6{};
  sockaddr_in place4{};
  place6.sin6_family = AF_INET6;
  place4.sin_family = AF_INET;
  place6.sin6_port = place4.sin_port = htons(static_cast<std::uint16_t>(port));
  const int family = v6 ? AF_INET6 : AF_INET;
  ::inet_pton(family, address.c_str(), v6 ? static_cast<void *>(&place6.sin6_addr) : &place4.sin_addr);
  const auto *const place = v6 ? reinterpret_cast<const sockaddr *>(&place6) : reinterpret_cast<sockaddr *>(&place4);
  const int descriptor = ::socket(family, SOCK_STREAM | SOCK_CLOEXEC, 0);
  if (descriptor >= 0 && ::bind(descriptor, place, v6 ? sizeof place6 : sizeof place4) != 0) {
    const int reason = errno;
    ::close(descriptor);
    errno = reason;
    return -1;
  }
  return descriptor;
}

int PortOf(int descriptor) {
  sockaddr_storage address{};
  socklen_t length = sizeof address;
  Require(::getsockname(descriptor, reinterpret_cast<sockaddr *>(&address), &length) == 0, "no address");
  sockaddr_in bound{}; // the port is at the same place in both families
  std::memcpy(&bound, &address, sizeof bound);
  return ntohs(bound.sin_port);
}

} // namespace

int BindLoopback(bool v6, int &port) {
  const int descriptor = BindAt(v6 ? V6_ADDRESS : V4_ADDRESS, 0);
  Require(descriptor >= 0, "cannot bind");
  port = PortOf(descriptor);
  return descriptor;
}

LoopbackPort::LoopbackPort(bool v6) {
  for (int trial = 0; trial < TRIALS; ++trial) {
    m_sockets.push_back(BindLoopback(v6, m_number));
    if (ReserveAtOtherAddresses(v6)) {
      return;
    }
    CloseAll();
  }
  Require(false, "no number is free at all addresses");
}

LoopbackPort::~LoopbackPort() {
  CloseAll();
}

bool LoopbackPort::ReserveAtOtherAddresses(bool v6) {
  for (const char *const address : {v6 ? V4_ADDRESS : V6_ADDRESS, SECOND_V4_ADDRESS}) {
    const int descriptor = BindAt(address, m_number);
    if (descriptor >= 0) {
      m_sockets.push_back(descriptor);
    } else if (errno == EADDRINUSE) {
      return false;
    } // else this machine does not have the address, so nobody can use it
  }
  return true;
}

void LoopbackPort::CloseAll() noexcept {
  for (const int descriptor : m_sockets) {
    ::close(descriptor);
  }
  m_sockets.clear();
}

} // namespace Testing
