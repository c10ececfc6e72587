// SPDX-License-Identifier: Apache-2.0

#include "integration/transport/service_stand_in.h"

#include <netinet/in.h>
#include <sys/socket.h>

namespace Testing {

std::size_t CountConnectionsTo(int port) {
  constexpr int DESCRIPTORS = 4096;
  std::size_t count = 0;
  for (int descriptor = 3; descriptor < DESCRIPTORS; ++descriptor) {
    sockaddr_in peer{}; // the port has the same offset in both address families
    socklen_t length = sizeof peer;
    count +=
        ::getpeername(descriptor, reinterpret_cast<sockaddr *>(&peer), &length) == 0 && ntohs(peer.sin_port) == port;
  }
  return count;
}

} // namespace Testing
