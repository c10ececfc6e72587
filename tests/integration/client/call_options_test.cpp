// SPDX-License-Identifier: Apache-2.0
// The options of one call replace those of the client, and only for that call.
#include "integration/service/service_client.h"
#include "support/data_file.h"
#include "support/operation_forms.h"
#include "support/posting_server.h"
#include "support/recorded_events.h"
#include "support/soap_responses.h"
#include "support/throws_message.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/service_dialect.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <thread>
#include <vector>

namespace SsoClient {
namespace {

using namespace Testing;
using Texts = std::vector<std::string>;

const Credential ALICES = PasswordCredential{ALICE, Tarvel::SecretText(PASSWORD)};

class OptionsOfACall : public testing::TestWithParam<Form> {
protected:
  TokenPtr Acquire(const CallOptions &options) const {
    return Testing::Acquire(GetParam(), m_client, ALICES, SpecFor(3600), options);
  }

  const std::shared_ptr<RecordedEvents> m_events = std::make_shared<RecordedEvents>();
  const Tarvel::Ref<Tarvel::Ssl::SSLContext> m_context = TrustingContext();
  const TokenClient m_client{ConfigFor(*m_context, "", RunningService().GetUrl()), [this] {
                               ClientOptions options;
                               options.service.observer = m_events;
                               return options;
                             }()};
};

TEST_P(OptionsOfACall, ReplaceTheObserver) {
  const auto other = std::make_shared<RecordedEvents>();
  CallOptions options;
  options.observer = other;
  Acquire(options);
  EXPECT_EQ(m_events->Lines(), Texts());
  const Texts success = {"started AcquireToken", "sent http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue",
                         "received 200 OK, text/xml; charset=utf-8", "ended"};
  EXPECT_EQ(other->Lines(), success);
  Acquire({});
  EXPECT_EQ(m_events->Lines(), success);
  EXPECT_EQ(other->Lines(), success);
}

TEST_P(OptionsOfACall, ReplaceTheVerifyOptions) {
  CallOptions options;
  options.verifyOptions.emplace();
  options.verifyOptions->requiredConfirmation = SamlToken::HOLDER_OF_KEY;
  EXPECT_THROW(Acquire(options), SsoException);
  EXPECT_EQ(Acquire({})->GetConfirmationMethod(), SamlToken::BEARER);
  const Texts lines = m_events->Lines();
  ASSERT_EQ(lines.size(), 8u);
  EXPECT_THAT(lines[3], testing::StartsWith("ended "));
  EXPECT_EQ(lines[7], "ended");
}

TEST_P(OptionsOfACall, ReplaceTheDialect) {
  const std::string answer = IssueResponse(ReadDataFile("tokens/bearer.xml"));
  const PostingServer server({answer, answer, answer});
  const TokenClient client(Testing::ConfigFor(server.GetUrl()));
  CallOptions options;
  options.dialect = GetServiceDialect("cxf");
  Testing::Acquire(GetParam(), client, ALICES, SpecFor(3600));
  Testing::Acquire(GetParam(), client, ALICES, SpecFor(3600), options);
  Testing::Acquire(GetParam(), client, ALICES, SpecFor(3600));
  const Texts requests = server.GetRequests();
  ASSERT_EQ(requests.size(), 3u);
  const auto hasCharset = [](const std::string &request) { return request.find("charset=") != std::string::npos; };
  EXPECT_EQ(hasCharset(requests[0]), hasCharset(requests[2]));
  EXPECT_NE(hasCharset(requests[0]), hasCharset(requests[1]));
}

INSTANTIATE_TEST_SUITE_P(Forms, OptionsOfACall, testing::ValuesIn(AllForms()),
                         [](const auto &form) { return NameOf(form.param); });

TEST(ExecutorOfACall, ReplacesTheExecutorOfTheClient) {
  const auto context = TrustingContext();
  std::vector<std::string> ran;
  std::mutex mutex;
  const auto named = [&](const std::string &name) -> Executor {
    return [&, name](const std::function<void()> &function) {
      {
        const std::lock_guard<std::mutex> lock(mutex);
        ran.push_back(name);
      }
      std::thread(function).detach();
    };
  };
  ClientOptions clientOptions;
  clientOptions.executor = named("client's");
  const TokenClient client(ConfigFor(*context, "", RunningService().GetUrl()), clientOptions);
  CallOptions options;
  options.executor = named("call's");
  Testing::Acquire(Form::CALLBACK, client, ALICES, SpecFor(60), options);
  Testing::Acquire(Form::CALLBACK, client, ALICES, SpecFor(60));
  Testing::Acquire(Form::WAITING, client, ALICES, SpecFor(60), options);
  EXPECT_EQ(ran, (std::vector<std::string>{"call's", "client's"}));
}

} // namespace
} // namespace SsoClient
