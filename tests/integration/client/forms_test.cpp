// SPDX-License-Identifier: Apache-2.0
// Each kind of credential in each form against the development service, over TLS: all facts of the token are compared.
#include "integration/service/service_client.h"
#include "support/operation_forms.h"
#include "support/rendezvous.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <future>
#include <memory>
#include <string>

namespace SsoClient {
namespace {

using namespace Testing;

TokenSpec Renewable(TokenSpec spec) {
  spec.renewable = true;
  return spec;
}

Credential Alice(const char *password = PASSWORD) {
  return PasswordCredential{ALICE, Tarvel::SecretText(password)};
}

struct SentRequests final : OperationObserver {
  void OnRequestSent(const OperationInfo &, const RequestSentEvent &) override { count.Add(); }
  EventCount count;
};

class ClientOverTls : public testing::TestWithParam<Form> {
protected:
  /// A client of the running service with this identity; without one if it is empty.
  std::unique_ptr<TokenClient> Client(const std::string &identity = "", const std::string &url = "") const {
    return std::make_unique<TokenClient>(
        ConfigFor(*m_context, identity, url.empty() ? RunningService().GetUrl() : url));
  }

  const std::int64_t m_begin = NowInMilliseconds();
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> m_context = TrustingContext();
};

TEST_P(ClientOverTls, AcquiresByPassword) {
  EXPECT_EQ(Compare(Acquire(GetParam(), *Client(), Alice(), SpecFor(3600)), {}, m_begin), "");
  ExpectedFields held;
  held.confirmation = "client";
  EXPECT_EQ(Compare(Acquire(GetParam(), *Client("client"), Alice(), SpecFor(3600)), held, m_begin), "");
}

TEST_P(ClientOverTls, AcquiresByCertificateWithEverythingThatASpecCanRequest) {
  ExpectedFields fields = FieldsOfCertificate("client");
  fields.lifetimeSec = 7200;
  fields.renewable = true;
  fields.delegable = true;
  fields.audience = {"https://a.example/", "https://b.example/"};
  fields.advice = "https://advice.example/{colour=red,green;size=7} urn:more{no value=}";
  EXPECT_EQ(
      Compare(Acquire(GetParam(), *Client("client"), CertificateCredential{}, SpecWithEverything()), fields, m_begin),
      "");
}

TEST_P(ClientOverTls, AcquiresADelegatedTokenByAToken) {
  const auto client = Client("client");
  TokenSpec spec = SpecFor(3600);
  spec.delegable = true;
  const TokenPtr held = Acquire(GetParam(), *client, Alice(), spec);
  TokenSpec delegated = SpecFor(3600);
  delegated.delegateTo = std::string("bob@corp.example");
  ExpectedFields fields;
  fields.confirmation = "client";
  fields.delegation = {"bob@corp.example"};
  EXPECT_EQ(Compare(Acquire(GetParam(), *client, TokenCredential{held}, delegated), fields, m_begin), "");
}

TEST_P(ClientOverTls, RenewsAndValidates) {
  const auto client = Client("client");
  const TokenPtr held = Acquire(GetParam(), *client, Alice(), Renewable(SpecFor(3600)));
  EXPECT_TRUE(Validate(GetParam(), *client, held));
  ExpectedFields fields;
  fields.confirmation = "client";
  fields.renewable = true;
  fields.lifetimeSec = 1800;
  const TokenPtr renewed = Renew(GetParam(), *client, held, 1800);
  EXPECT_EQ(Compare(renewed, fields, m_begin), "");
  EXPECT_NE(renewed->GetId(), held->GetId());
}

TEST_P(ClientOverTls, ReportsWhatTheServiceRefuses) {
  EXPECT_THROWS_MESSAGE(Acquire(GetParam(), *Client(), Alice("looking-glass"), SpecFor(60)),
                        InvalidCredentialsException, "Authentication failed: unknown user or wrong password");
  const auto client = Client("client");
  const TokenPtr held = Acquire(GetParam(), *client, Alice(), SpecFor(60));
  EXPECT_THROWS_MESSAGE(Renew(GetParam(), *client, held, 60), SsoException,
                        "Unexpected SOAP fault: wst:UnableToRenew; request failed.");
  const std::string url = RunningService().FaultUrl("soap-fault-FailedAuthentication");
  EXPECT_THROWS_MESSAGE(Validate(GetParam(), *Client("client", url), held), InvalidCredentialsException,
                        "Authentication failed: a fault was asked for");
}

TEST_P(ClientOverTls, ReportsWhatTheCallerDoesWrongWithoutARequest) {
  const DevSts service; // the running service can still log what earlier tests sent to it
  const std::string log = service.GetLog();
  const auto client = Client("", service.GetUrl());
  EXPECT_THROWS_MESSAGE(Acquire(GetParam(), *client, Alice(), SpecFor(0)), Tarvel::InvalidArgumentException,
                        "Invalid argument : Token lifetime must be positive");
  EXPECT_THROWS_MESSAGE(Acquire(GetParam(), *client, CertificateCredential{}, SpecFor(60)),
                        Tarvel::InvalidStateException,
                        "No HolderOfKeyConfig provided. Unable to acquire token by certificate");
  EXPECT_THROW(Acquire(GetParam(), *client, TokenCredential{}, SpecFor(60)), Tarvel::InvalidArgumentException);
  EXPECT_THROW(Acquire(GetParam(), *client, NegotiationCredential{}, SpecFor(60)), Tarvel::InvalidArgumentException);
  EXPECT_THROW(Renew(GetParam(), *client, nullptr, 60), Tarvel::InvalidArgumentException);
  EXPECT_THROW(Validate(GetParam(), *client, nullptr), Tarvel::InvalidArgumentException);
  EXPECT_EQ(service.GetLog(), log);
}

TEST_P(ClientOverTls, RefusesAnUntrustedSignature) {
  EXPECT_THROWS_MESSAGE(
      Acquire(GetParam(), *Client("", RunningService().FaultUrl("wrong-signer")), Alice(), SpecFor(60)),
      InvalidSignatureException, "Failed to verify signature: token might have been tampered with.");
}

TEST_P(ClientOverTls, EndsAtTheDeadlineOrAtACancelDuringTheWaitForAnAnswer) {
  const auto client = Client("", RunningService().FaultUrl("stall"));
  EXPECT_THROWS_MESSAGE(
      Acquire(GetParam(), *client, Alice(), SpecFor(60), CallOptions::WithTimeout(std::chrono::milliseconds(300))),
      DeadlineExceededException, "The deadline passed before the operation ended");
  const auto sent = std::make_shared<SentRequests>();
  const CancelSource cancel;
  CallOptions options;
  options.cancelToken = cancel.GetToken();
  options.observer = sent;
  const std::future<void> canceller = std::async(std::launch::async, [&] {
    EXPECT_TRUE(sent->count.WaitFor(1));
    cancel.Cancel();
  });
  EXPECT_THROWS_MESSAGE(Acquire(GetParam(), *client, Alice(), SpecFor(60), options), CancelledException,
                        "The operation was cancelled");
}

TEST_P(ClientOverTls, SendsNothingAfterTheDeadlineOrACancel) {
  const DevSts service; // the running service can still log what earlier tests sent to it
  const std::string log = service.GetLog();
  const auto client = Client("", service.GetUrl());
  CallOptions late = CallOptions::WithTimeout(std::chrono::milliseconds(-1));
  EXPECT_THROWS_MESSAGE(Acquire(GetParam(), *client, Alice(), SpecFor(60), late), DeadlineExceededException,
                        "The deadline passed before the operation ended");
  const CancelSource cancel;
  cancel.Cancel();
  late.cancelToken = cancel.GetToken();
  EXPECT_THROWS_MESSAGE(Acquire(GetParam(), *client, Alice(), SpecFor(60), late), CancelledException,
                        "The operation was cancelled");
  EXPECT_EQ(service.GetLog(), log);
}

INSTANTIATE_TEST_SUITE_P(Forms, ClientOverTls, testing::ValuesIn(AllForms()),
                         [](const auto &form) { return NameOf(form.param); });

} // namespace
} // namespace SsoClient
