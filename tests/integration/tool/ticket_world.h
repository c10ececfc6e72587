// SPDX-License-Identifier: Apache-2.0
/// @file
/// What tests of acquiring by a Kerberos ticket start from.

#pragma once

#include "support/kerberos_realm.h"

#include <string>
#include <vector>

namespace ToolTest {

/// The realm CORP.EXAMPLE with the principal of the service, HTTP/localhost, and alice, who has no ticket yet. The service
/// knows alice@CORP.EXAMPLE by the name alice@corp.example. A test's fixture derives from this first, since the service
/// inherits the realm's environment.
class TicketWorld {
protected:
  explicit TicketWorld(const Testing::RealmSettings &settings = {.name = "CORP.EXAMPLE"}) : m_realm(settings) {}

  /// What the service has to be started with.
  std::vector<std::string> ServiceArguments() const { return {"--keytab", PathOf(m_serviceKeytab)}; }

  /// Logs alice in: her ticket is in the default cache.
  void LogIn() const { m_realm.GetTicket("alice", m_aliceKeytab, m_realm.GetDefaultCache()); }

  /// The path of a file that is named as Kerberos does, "FILE:…".
  static std::string PathOf(const std::string &name) { return name.substr(name.find(':') + 1); }

  Testing::KerberosRealm m_realm;
  const std::string m_serviceKeytab = m_realm.AddPrincipal("HTTP/localhost");
  const std::string m_aliceKeytab = m_realm.AddPrincipal("alice");
};

} // namespace ToolTest
