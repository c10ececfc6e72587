// SPDX-License-Identifier: Apache-2.0

#include "integration/fork/held_service.h"
#include "support/forked.h"
#include "support/service_stand_ins.h"

#include <ssoclient/client/token_client.h>
#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <unistd.h>

namespace SsoClient {
namespace {

/// Forks when a request is about to be sent. The operation continues in the parent only.
class ForkingObserver final : public OperationObserver {
public:
  explicit ForkingObserver(pid_t &child) : m_child(child) {}
  void OnRequestSent(const OperationInfo &, const RequestSentEvent &) override { m_child = ::fork(); }

private:
  pid_t &m_child;
};

TEST(ClientWhoseObserverForks, EndsACallThatWaitsInTheChild) {
  const Testing::HeldService server(false);
  const TokenClient client(server.GetConfig());
  pid_t child = -1;
  CallOptions options;
  options.observer = std::make_shared<ForkingObserver>(child);
  const PasswordCredential alice{"alice@corp.example", Tarvel::SecretText("pass")};
  std::string end;
  try {
    end = client.Acquire(alice, Testing::SpecFor(60), options)->GetSubject().ToString();
  } catch (const CommunicationException &failure) {
    end = failure.what();
  }
  if (child == 0) {
    ::_exit(end == "The operation was under way when the process forked: its parent goes on with it" ? 0 : 1);
  }
  ASSERT_GT(child, 0);
  EXPECT_EQ(end, "{Name: alice; Domain:corp.example}");
  EXPECT_EQ(Testing::WaitForChild(child), "");
}

} // namespace
} // namespace SsoClient
