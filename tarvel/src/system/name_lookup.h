// SPDX-License-Identifier: Apache-2.0
/// @file
/// Looks up the addresses of a host name.

#pragma once

#include <boost/asio/ip/address.hpp>

#include <functional>
#include <string>
#include <vector>

namespace Tarvel::System {

using AddressList = std::vector<boost::asio::ip::address>;

/// Returns the addresses of a host in the order in which to try them; at least one.
/// @throws NetworkException when the host has no address; the message is only the reason.
using NameLookup = std::function<AddressList(const std::string &host)>;

/// The addresses of `host` from the system's resolver, or from the innermost `ScopedNameLookup`. Blocks the calling
/// thread until the resolver returns; the system cannot interrupt it.
/// @throws NetworkException when there is no address.
AddressList LookUpName(const std::string &host);

/// Replaces the resolver by `lookup` for the whole process while this object exists. For tests. `lookup` is called on
/// any thread, several at once, and may still run after the scope's end. A connection may join a look-up that began
/// before the scope, so a test whose look-ups hang must wait until they end.
class ScopedNameLookup {
public:
  explicit ScopedNameLookup(NameLookup lookup);
  ScopedNameLookup(const ScopedNameLookup &) = delete;
  ScopedNameLookup &operator=(const ScopedNameLookup &) = delete;
  ~ScopedNameLookup();

private:
  NameLookup m_earlier;
};

} // namespace Tarvel::System
