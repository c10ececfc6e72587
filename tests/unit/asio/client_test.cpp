// SPDX-License-Identifier: Apache-2.0
// The functions of the component with a client of a service on loopback. The tests do not read the texts of exceptions:
// libstdc++ counts the references to an exception in code that ThreadSanitizer does not see, and reports a race if a thread of
// the library releases the last one.
#include "support/data_file.h"
#include "support/identity.h"
#include "support/process_resources.h"
#include "support/scripted_server.h"
#include "support/service_stand_ins.h"
#include "support/soap_responses.h"

#include <ssoclient/asio/async_client.h>
#include <ssoclient/asio/async_source.h>
#include <ssoclient/client/exceptions.h>
#include <ssoclient/create_saml_token.h>
#include <tarvel/core/exception.h>
#include <tarvel/core/secret_text.h>

#include <boost/asio/bind_executor.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/use_future.hpp>

#include <gtest/gtest.h>

#include <chrono>
#include <future>
#include <memory>
#include <string>
#include <thread>
#include <utility>

namespace Testing {
namespace {

using boost::asio::io_context;
using boost::asio::use_future;
using SsoClient::Asio::AsyncAcquire;
using SsoClient::Asio::AsyncGet;
using SsoClient::Asio::AsyncRenew;
using SsoClient::Asio::AsyncValidate;
using TokenPtr = std::shared_ptr<const SsoClient::SamlToken>;

/// A service that sends the same answer on each connection, and a client of it. If the answer is empty, it never
/// answers.
class World {
public:
  explicit World(std::string answer)
      : m_server([answer = std::move(answer)](ServerConnection &connection) {
          connection.ReadRequest();
          if (answer.empty()) {
            connection.Stall();
          } else {
            connection.Write("HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\nContent-Length: " +
                             std::to_string(answer.size()) + "\r\n\r\n" + answer);
          }
        }),
        client(std::make_shared<SsoClient::TokenClient>(MakeConfig())) {}

  std::size_t GetOpenCount() { return m_server.GetOpenCount(); }

private:
  SsoClient::SecurityTokenServiceConfig MakeConfig() {
    SsoClient::SecurityTokenServiceConfig config;
    config.stsUrl = "http://127.0.0.1:" + std::to_string(m_server.GetPort()) + "/sts";
    config.signingCertificates = TrustedCertificates();
    config.holderOfKeyConfig = HolderIdentity();
    return config;
  }

  ScriptedServer m_server;

public:
  const std::shared_ptr<SsoClient::TokenClient> client;
};

const SsoClient::PasswordCredential ALICE{"alice", Tarvel::SecretText("secret")};

std::string BearerXml() {
  return ReadDataFile("tokens/bearer.xml");
}

TokenPtr HolderToken() {
  return SsoClient::CreateSamlToken(ReadDataFile("tokens/holder-of-key.xml"), TrustedCertificates());
}

TEST(AsyncAcquire, CallsTheHandlerOnItsExecutor) {
  const World world(IssueResponse(BearerXml()));
  io_context context;
  std::thread::id called;
  TokenPtr token;
  AsyncAcquire(*world.client, ALICE, SpecFor(60), {},
               boost::asio::bind_executor(context, [&](const std::exception_ptr &failure, TokenPtr result) {
                 EXPECT_EQ(failure, nullptr);
                 called = std::this_thread::get_id();
                 token = std::move(result);
               }));
  context.run();
  ASSERT_NE(token, nullptr);
  EXPECT_EQ(token->GetSubject().ToString(), "{Name: alice; Domain:corp.example}");
  EXPECT_EQ(called, std::this_thread::get_id());
}

TEST(AsyncAcquire, ReturnsAFuture) {
  const World world(IssueResponse(BearerXml()));
  std::future<TokenPtr> future = AsyncAcquire(*world.client, ALICE, SpecFor(60), {}, use_future);
  EXPECT_NE(future.get(), nullptr);
}

TEST(AsyncAcquire, PassesTheDeadline) {
  const World world("");
  const auto options = SsoClient::CallOptions::WithTimeout(std::chrono::milliseconds(1));
  std::future<TokenPtr> future = AsyncAcquire(*world.client, ALICE, SpecFor(60), options, use_future);
  EXPECT_THROW(future.get(), SsoClient::DeadlineExceededException);
}

TEST(AsyncAcquire, ReportsAFailureThatIsKnownAtTheStart) {
  const World world("");
  std::future<TokenPtr> future =
      AsyncAcquire(*world.client, SsoClient::TokenCredential{nullptr}, SpecFor(60), {}, use_future);
  EXPECT_THROW(future.get(), Tarvel::InvalidArgumentException);
}

TEST(AsyncAcquire, ClosesItsConnectionWhenTheContextIsDestroyed) {
  World world("");
  auto context = std::make_unique<io_context>();
  AsyncAcquire(
      *world.client, ALICE, SpecFor(60), {},
      boost::asio::bind_executor(*context, [](const std::exception_ptr &, const TokenPtr &) { ADD_FAILURE(); }));
  ASSERT_TRUE(Eventually([&world] { return world.GetOpenCount() == 1; }));
  context.reset();
  EXPECT_TRUE(Eventually([&world] { return world.GetOpenCount() == 0; }));
}

TEST(AsyncRenew, RenewsAToken) {
  const World world(RenewResponse(ReadDataFile("tokens/holder-of-key.xml")));
  EXPECT_NE(AsyncRenew(*world.client, HolderToken(), 60, {}, use_future).get(), nullptr);
}

TEST(AsyncValidate, AsksTheService) {
  const World valid(ValidateResponse("http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/valid"));
  EXPECT_TRUE(AsyncValidate(*valid.client, HolderToken(), {}, use_future).get());
  const World invalid(ValidateResponse("http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/invalid"));
  EXPECT_FALSE(AsyncValidate(*invalid.client, HolderToken(), {}, use_future).get());
}

SsoClient::Credential ProvideAlice() {
  return ALICE;
}

TEST(AsyncGet, ReturnsTheTokenOfASource) {
  const World world(IssueResponse(BearerXml()));
  const SsoClient::TokenSource source(world.client, ProvideAlice, SpecFor(60));
  io_context context;
  TokenPtr token;
  AsyncGet(source, {}, boost::asio::bind_executor(context, [&token](const std::exception_ptr &, TokenPtr result) {
             token = std::move(result);
           }));
  context.run();
  ASSERT_NE(token, nullptr);
  EXPECT_EQ(AsyncGet(source, {}, use_future).get(), token);
}

TEST(AsyncGet, PassesTheDeadlineAndTheCancelToken) {
  const World world("");
  const SsoClient::TokenSource source(world.client, ProvideAlice, SpecFor(60));
  SsoClient::GetOptions late;
  late.deadline = std::chrono::steady_clock::now();
  EXPECT_THROW(AsyncGet(source, late, use_future).get(), SsoClient::DeadlineExceededException);
  const SsoClient::CancelSource cancelSource;
  SsoClient::GetOptions cancelled;
  cancelled.cancelToken = cancelSource.GetToken();
  std::future<TokenPtr> future = AsyncGet(source, cancelled, use_future);
  cancelSource.Cancel();
  EXPECT_THROW(future.get(), SsoClient::CancelledException);
}

} // namespace
} // namespace Testing
