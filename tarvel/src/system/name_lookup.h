// SPDX-License-Identifier: Apache-2.0
/// @file
/// From a host's name to its addresses.

#pragma once

#include <boost/asio/ip/address.hpp>

#include <functional>
#include <string>
#include <vector>

namespace Tarvel::System {

using AddressList = std::vector<boost::asio::ip::address>;

/// Gives the addresses of a host in the order in which they are to be tried; at least one.
/// @throws NetworkException when there is none; the message is the reason alone.
using NameLookup = std::function<AddressList(const std::string &host)>;

/// The addresses of `host` from the system's resolver, or from the innermost `ScopedNameLookup`. Blocks the calling
/// thread for as long as the resolver takes: the system has no way to interrupt it.
/// @throws NetworkException
AddressList LookUpName(const std::string &host);

/// Puts `lookup` in the resolver's place for the whole process, for as long as this lives: for tests. `lookup` is called
/// on any thread, several at once, and may still run after the scope's end. A connection may join a look-up that began
/// before the scope: a test whose look-ups hang waits for their end.
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
