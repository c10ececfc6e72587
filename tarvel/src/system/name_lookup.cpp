// SPDX-License-Identifier: Apache-2.0

#include "system/name_lookup.h"

#include "core/fork_gate.h"

#include <tarvel/system/stream.h>

#include <cerrno>
#include <cstring>
#include <memory>
#include <mutex>
#include <netdb.h>
#include <netinet/in.h>
#include <sys/eventfd.h>
#include <system_error>
#include <unistd.h>
#include <utility>

namespace Tarvel::System {

namespace {

using boost::asio::ip::address_v4;
using boost::asio::ip::address_v6;

struct AddressInfoDeleter {
  void operator()(addrinfo *list) const noexcept { freeaddrinfo(list); }
};

struct Replacement {
  ForkSafeMutex mutex;
  NameLookup lookup; // guarded by mutex; empty for the system's resolver
};

Replacement &GetReplacement() {
  const Computation computing;
  static Replacement *const replacement = new Replacement; // never destroyed: look-ups may outlive static objects
  return *replacement;
}

NameLookup Exchange(NameLookup lookup) {
  Replacement &replacement = GetReplacement();
  const std::lock_guard<ForkSafeMutex> lock(replacement.mutex);
  return std::exchange(replacement.lookup, std::move(lookup));
}

NameLookup CurrentReplacement() {
  Replacement &replacement = GetReplacement();
  const std::lock_guard<ForkSafeMutex> lock(replacement.mutex);
  return replacement.lookup;
}

void AppendAddress(AddressList &addresses, const sockaddr &socketAddress) {
  if (socketAddress.sa_family == AF_INET) {
    sockaddr_in v4{};
    std::memcpy(&v4, &socketAddress, sizeof v4);
    addresses.emplace_back(address_v4(ntohl(v4.sin_addr.s_addr)));
  } else if (socketAddress.sa_family == AF_INET6) {
    sockaddr_in6 v6{};
    std::memcpy(&v6, &socketAddress, sizeof v6);
    address_v6::bytes_type bytes{};
    std::memcpy(bytes.data(), &v6.sin6_addr, bytes.size());
    addresses.emplace_back(address_v6(bytes, v6.sin6_scope_id));
  }
}

/// Returns the system's error if no descriptor is left, otherwise 0. Without descriptors, the resolver reports only an
/// unknown name. It may have left the error in `errno`; if not, this function tries to open a descriptor.
int FindLackOfDescriptors(int errorOfResolver) noexcept {
  if (errorOfResolver == EMFILE || errorOfResolver == ENFILE) {
    return errorOfResolver;
  }
  const int descriptor = ::eventfd(0, EFD_CLOEXEC);
  if (descriptor >= 0) {
    ::close(descriptor);
    return 0;
  }
  return errno == EMFILE || errno == ENFILE ? errno : 0;
}

std::string DescribeFailure(int failure, int systemError) {
  if (const int lack = FindLackOfDescriptors(systemError)) {
    return std::system_category().message(lack);
  }
  return failure == EAI_SYSTEM ? std::system_category().message(systemError) : gai_strerror(failure);
}

AddressList AskSystem(const std::string &host) {
  addrinfo hints{};
  hints.ai_family = AF_UNSPEC;
  hints.ai_socktype = SOCK_STREAM; // otherwise each address is returned once for each kind of socket
  addrinfo *found = nullptr;
  errno = 0;
  if (const int failure = getaddrinfo(host.c_str(), nullptr, &hints, &found)) {
    throw NetworkException(DescribeFailure(failure, errno));
  }
  const std::unique_ptr<addrinfo, AddressInfoDeleter> list(found);
  AddressList addresses;
  for (const addrinfo *entry = list.get(); entry; entry = entry->ai_next) {
    AppendAddress(addresses, *entry->ai_addr);
  }
  return addresses;
}

} // namespace

AddressList LookUpName(const std::string &host) {
  const NameLookup replacement = CurrentReplacement();
  AddressList addresses = replacement ? replacement(host) : AskSystem(host);
  if (addresses.empty()) {
    throw NetworkException("The name has no address");
  }
  return addresses;
}

ScopedNameLookup::ScopedNameLookup(NameLookup lookup) : m_earlier(Exchange(std::move(lookup))) {}

ScopedNameLookup::~ScopedNameLookup() {
  Exchange(std::move(m_earlier));
}

} // namespace Tarvel::System
