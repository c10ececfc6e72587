// SPDX-License-Identifier: Apache-2.0
/// @file
/// The environment of tests that acquire by a Kerberos ticket.

#pragma once

#include "support/kerberos_realm.h"

#include <string>
#include <vector>

namespace ToolTest {

/// The realm CORP.EXAMPLE with the principal of the service, HTTP/localhost, and alice, who has no ticket yet. The
/// service knows alice@CORP.EXAMPLE by the name alice@corp.example. This must be the first base class of a
/// fixture, since the service inherits the realm's environment.
class TicketWorld {
protected:
  explicit TicketWorld(const Testing::RealmSettings &settings = {.name = "CORP.EXAMPLE"}) : m_realm(settings) {}

  /// The arguments that the service must be started with.
  std::vector<std::string> ServiceArguments() const { return {"--keytab", PathOf(m_serviceKeytab)}; }

  /// Logs alice in: her ticket is in the default cache.
  void LogIn() const { m_realm.GetTicket("alice", m_aliceKeytab, m_realm.GetDefaultCache()); }

  /// The path in a Kerberos file name, "FILE:…".
  static std::string PathOf(const std::string &name) { return name.substr(name.find(':') + 1); }

  Testing::KerberosRealm m_realm;
  const std::string m_serviceKeytab = m_realm.AddPrincipal("HTTP/localhost");
  const std::string m_aliceKeytab = m_realm.AddPrincipal("alice");
};

} // namespace ToolTest
