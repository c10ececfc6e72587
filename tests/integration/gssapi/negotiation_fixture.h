// SPDX-License-Identifier: Apache-2.0
/// @file
/// The starting point of most tests of the negotiation: a realm with a service and a user.

#pragma once

#include "integration/gssapi/gss_acceptor.h"
#include "support/kerberos_realm.h"

#include <ssoclient/gssapi/exceptions.h>
#include <ssoclient/gssapi/spnego_handler.h>

#include <gtest/gtest.h>

#include <exception>
#include <memory>
#include <string>
#include <typeinfo>
#include <vector>

namespace Testing {

using Bytes = std::vector<std::uint8_t>;

/// The realm EXAMPLE.TEST with the service sts/localhost and the user alice, who has no ticket yet.
struct RealmWithAlice {
  explicit RealmWithAlice(const RealmSettings &settings = {}) : realm(settings) {}

  /// Logs alice in: puts her ticket into the default cache.
  void LogIn() const { realm.GetTicket("alice", userKeytab, realm.GetDefaultCache()); }

  GssAcceptor MakeAcceptor() const { return GssAcceptor(serviceKeytab, realm.GetFolder()); }

  KerberosRealm realm;
  const std::string serviceKeytab = realm.AddPrincipal("sts/localhost");
  const std::string userKeytab = realm.AddPrincipal("alice");
};

inline SsoClient::Gssapi::SpnegoSettings SettingsFor(const std::string &service = "sts@localhost") {
  SsoClient::Gssapi::SpnegoSettings settings;
  settings.service = service;
  return settings;
}

/// Runs both sides of a negotiation to its end.
/// @return the number of the client's legs
inline int Negotiate(SsoClient::NegotiationHandler &client, GssAcceptor &service) {
  Bytes leg = *client.NegotiateLeg({});
  int legs = 1;
  while (!leg.empty()) {
    const Bytes answer = service.Accept(leg);
    if (answer.empty()) {
      break;
    }
    leg = *client.NegotiateLeg(answer);
    ++legs;
  }
  return legs;
}

/// Checks for an exception whose message begins with `ours` and continues with text of the Kerberos library. That text
/// contains `words`; the rest of it differs between versions.
template <typename Expected, typename Statement>
::testing::AssertionResult FailsWithWords(const Statement &statement, const std::string &ours,
                                          const std::string &words) {
  try {
    statement();
  } catch (const std::exception &thrown) {
    const std::string message = thrown.what();
    if (typeid(thrown) != typeid(Expected)) {
      return ::testing::AssertionFailure() << "got " << typeid(thrown).name() << " \"" << message << "\"";
    }
    if (message.rfind(ours, 0) != 0 || message.find(words, ours.size()) == std::string::npos) {
      return ::testing::AssertionFailure()
             << "expected the message\n  " << ours << "… " << words << " …\ngot\n  " << message;
    }
    return ::testing::AssertionSuccess();
  }
  return ::testing::AssertionFailure() << "nothing was thrown";
}

} // namespace Testing

/// Expects an exception of exactly the class `Class`, whose message begins with `ours` and contains `words` after that.
#define EXPECT_FAILS_WITH_WORDS(statement, Class, ours, words)                                                         \
  EXPECT_TRUE(::Testing::FailsWithWords<Class>([&] { statement; }, ours, words))
