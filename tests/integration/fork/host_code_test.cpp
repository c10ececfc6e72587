// SPDX-License-Identifier: Apache-2.0
// Functions of the host that the platform calls: fork waits for none of them, for they may wait for the thread that forks.

#include "core/fork_gate.h"
#include "support/data_file.h"
#include "support/forked.h"
#include "support/posting_server.h"
#include "support/rendezvous.h"

#include <ssoclient/connection_spec.h>
#include <tarvel/core/exception.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/http/user_agent.h>
#include <tarvel/io/reader.h>
#include <tarvel/service/app.h>
#include <tarvel/xml/parser.h>

#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <string_view>
#include <thread>

namespace Tarvel {
namespace {

using Testing::Gate;
using Testing::RunInChild;

/// What the child of a parent does whose other thread waits at `gate`: the fork returns, and the child goes its way.
void ExpectForkWhileHeldAt(
    Gate &gate, const std::function<void()> &inChild = [] {}) {
  ASSERT_TRUE(gate.WaitForArrivals(1));
  EXPECT_EQ(RunInChild(inChild), "");
  gate.Open();
}

TEST(ForkBesideTheHostsCode, DoesNotWaitForALogSink) {
  Gate gate;
  const Ref<Service::LogRoot> root = Service::GetApp().GetRootLogger();
  root->SetSink([&gate](const Service::LogRecord &) { gate.Pass(); });
  std::thread logging([&root] {
    const Computation computing; // as when the platform itself logs
    root->Write(Service::LogRecord{});
  });
  ExpectForkWhileHeldAt(gate);
  logging.join();
  root->SetSink(nullptr);
}

TEST(ForkBesideTheHostsCode, DoesNotWaitForAPassphrase) {
  Gate gate;
  std::thread loading([&gate] {
    EXPECT_THROW(static_cast<void>(Crypto::LoadPrivateKey("file:" + Testing::DataPath("crypto/p256-encrypted.key"),
                                                          [&gate]() -> std::string {
                                                            gate.Pass();
                                                            return "wrong";
                                                          })),
                 Crypto::WrongPassphraseException);
  });
  ExpectForkWhileHeldAt(gate);
  loading.join();
}

TEST(ForkBesideTheHostsCode, DoesNotWaitForTheCompletionOfARequest) {
  if (!Testing::MAY_FORK_WHILE_OTHERS_ALLOCATE) {
    GTEST_SKIP() << "the sanitizer's allocator may stay locked in the child";
  }
  const Testing::PostingServer server({"<a/>"});
  Ref<Http::ConnectionSpec> spec;
  const std::string url = server.GetUrl();
  const std::string port = url.substr(url.rfind(':') + 1, url.rfind('/') - url.rfind(':') - 1);
  SsoClient::CreateSsoConnectionSpec("localhost", std::stoi(port), false, spec);
  Ref<Http::CookieStore> cookies;
  Http::CreateCookieStore("", cookies);
  Ref<Http::UserAgent> agent;
  Http::CreateHttpUserAgent(spec, cookies, nullptr, agent);
  Ref<Http::ClientRequest> request;
  Http::CreateHttpRequest("POST", "/sts", request);
  Gate gate;
  Ref<Http::PendingRequestItem> pending;
  agent->StartRequest(
      request,
      [&gate](const Exception *, const Ref<Http::ClientResponse> &, const Ref<Http::PendingRequestItem> &) {
        gate.Pass();
      },
      pending);
  ExpectForkWhileHeldAt(gate);
  Ref<Http::ClientResponse> response;
  agent->WaitForRequest(pending, std::int64_t{60} * 1000000, response);
  EXPECT_EQ(response->GetStatusCode(), 200);
}

/// A handler that is held while a document is parsed.
class HeldHandler final : public Xml::XMLHandler {
public:
  explicit HeldHandler(Gate &gate) : m_gate(gate) {}

  void StartDocument(std::string_view, const Ref<Object> &) override {}
  void StartElement(std::string_view, const Xml::AttributeEvent *, std::size_t, std::uint32_t, std::uint32_t) override {
    m_gate.Pass();
  }
  void EndElement() override {}
  void Characters(std::string_view) override {}
  void Comment(std::string_view) override {}
  void ProcessingInstruction(std::string_view, std::string_view) override {}
  Ref<Object> TakeResult() override { return {}; }

private:
  Gate &m_gate;
};

Ref<Object> Parse(const Ref<Xml::XMLHandler> &handler) {
  return Xml::CreateXMLParser(handler)->Parse(*CreateStringReader("<a/>"));
}

TEST(ForkBesideTheHostsCode, DoesNotWaitForTheHandlerOfAParse) {
  Gate gate;
  std::thread parsing([&gate] { Parse(MakeRef<HeldHandler>(gate)); });
  ExpectForkWhileHeldAt(gate, [] { EXPECT_TRUE(Parse(Xml::CreateXMLDocumentHandler())); });
  parsing.join();
}

} // namespace
} // namespace Tarvel
