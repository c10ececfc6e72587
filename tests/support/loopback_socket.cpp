// SPDX-License-Identifier: Apache-2.0

#include "support/loopback_socket.h"

#include <cstring>
#include <netinet/in.h>
#include <stdexcept>
#include <string>
#include <sys/socket.h>

namespace Testing {

namespace {

void Require(bool condition, const char *what) {
  if (!condition) {
    throw std::runtime_error(std::string("loopback socket: ") + what);
  }
}

sockaddr_storage LoopbackAddress(bool v6, socklen_t &length) {
  sockaddr_storage storage{};
  if (v6) {
    sockaddr_in6 address{};
    address.sin6_family = AF_INET6;
    address.sin6_addr = in6addr_loopback;
    length = sizeof address;
    std::memcpy(&storage, &address, length);
  } else {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    length = sizeof address;
    std::memcpy(&storage, &address, length);
  }
  return storage;
}

} // namespace

int BindLoopback(bool v6, int &port) {
  const int descriptor = ::socket(v6 ? AF_INET6 : AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  Require(descriptor >= 0, "no socket");
  socklen_t length = 0;
  sockaddr_storage address = LoopbackAddress(v6, length);
  Require(::bind(descriptor, reinterpret_cast<const sockaddr *>(&address), length) == 0, "cannot bind");
  Require(::getsockname(descriptor, reinterpret_cast<sockaddr *>(&address), &length) == 0, "no address");
  sockaddr_in bound{}; // the port is at the same place in both families
  std::memcpy(&bound, &address, sizeof bound);
  port = ntohs(bound.sin_port);
  return descriptor;
}

} // namespace Testing
