// SPDX-License-Identifier: Apache-2.0
// Each allocation of OpenSSL fails in turn during an operation of the client. The one outcome of the operation is the
// token, or reports that there is no memory. It never refuses the token.
#include "integration/out_of_memory/failing_memory.h"
#include "support/completion.h"
#include "support/data_file.h"
#include "support/operation_forms.h"
#include "support/posting_server.h"
#include "support/scripted_server.h"
#include "support/soap_responses.h"

#include <ssoclient/client/token_client.h>
#include <ssoclient/client/token_source.h>
#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <tuple>
#include <typeinfo>

namespace Testing {
namespace {

const std::string BODY = IssueResponse(ReadDataFile("tokens/bearer.xml"));

/// Over plain HTTP, because the server uses OpenSSL for TLS, too.
void AnswerWithAToken(ServerConnection &peer) {
  if (!peer.ReadRequest().empty()) {
    peer.Write("HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\nContent-Length: " + std::to_string(BODY.size()) +
               "\r\n\r\n" + BODY);
  }
}

/// "done", "no memory", or the class and the message of the exception.
std::string OutcomeOf(const std::function<TokenPtr()> &operation) {
  try {
    return operation() ? "done" : "no token";
  } catch (const Tarvel::OutOfMemoryException &) {
    return "no memory";
  } catch (const std::exception &failure) {
    return std::string(typeid(failure).name()) + ": " + failure.what();
  }
}

class ClientWithoutMemoryForOpenSsl : public testing::TestWithParam<std::tuple<Form, Shortage>> {
protected:
  /// Runs the operation repeatedly. In run n, allocation n fails, until the operation makes fewer than n allocations.
  static void Sweep(const std::function<TokenPtr()> &operation) {
    ASSERT_EQ(OutcomeOf(operation), "done");
    ASSERT_EQ(OutcomeOf(operation), "done"); // creates what exists once per process
    std::map<std::string, int> outcomes;
    for (int number = 1;; ++number) {
      const FailingMemory memory(number, std::get<1>(GetParam()));
      const std::string outcome = OutcomeOf(operation);
      if (!memory.HasFailed()) {
        break;
      }
      ++outcomes[outcome];
    }
    EXPECT_GT(outcomes["no memory"], 0);
    outcomes.erase("no memory");
    outcomes.erase("done");
    EXPECT_EQ(outcomes, (std::map<std::string, int>{}));
  }

  const Form m_form = std::get<0>(GetParam());
  const ScriptedServer m_server{AnswerWithAToken};
  const SsoClient::Credential m_credential = SsoClient::PasswordCredential{"alice", Tarvel::SecretText("secret")};
  const SsoClient::TokenSpec m_spec = [] {
    SsoClient::TokenSpec spec;
    spec.tokenLifetimeSec = 3600;
    return spec;
  }();
  const std::shared_ptr<const SsoClient::TokenClient> m_client = std::make_shared<const SsoClient::TokenClient>(
      ConfigFor("http://127.0.0.1:" + std::to_string(m_server.GetPort()) + "/sts"));
};

TEST_P(ClientWithoutMemoryForOpenSsl, NeverRefusesATokenThatItAcquires) {
  Sweep([&] { return Acquire(m_form, *m_client, m_credential, m_spec); });
}

TEST_P(ClientWithoutMemoryForOpenSsl, NeverRefusesATokenOfASource) {
  Sweep([&] {
    return Get(m_form, SsoClient::TokenSource(
                           m_client, [&] { return m_credential; }, m_spec));
  });
}

INSTANTIATE_TEST_SUITE_P(Forms, ClientWithoutMemoryForOpenSsl,
                         testing::Combine(testing::ValuesIn(AllForms()),
                                          testing::Values(Shortage::ONCE, Shortage::FROM_THEN)),
                         [](const auto &one) {
                           return NameOf(std::get<0>(one.param)) +
                                  (std::get<1>(one.param) == Shortage::ONCE ? "One" : "AllThatFollow");
                         });

} // namespace
} // namespace Testing
