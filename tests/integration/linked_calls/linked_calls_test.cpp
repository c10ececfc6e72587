// SPDX-License-Identifier: Apache-2.0
// Counts the descriptions that an operation computes, and checks the values with which a service's client is made.
#include "support/counting_token.h"
#include "support/data_file.h"
#include "support/posting_server.h"
#include "support/recorded_log.h"
#include "support/service_stand_ins.h"

#include <ssoclient/gss_negotiation_context.h>
#include <ssoclient/security_token_service.h>

#include <gtest/gtest.h>

#include <cstdint>
#include <functional>
#include <memory>
#include <ostream>
#include <string>
#include <vector>

namespace {

using ContextRef = Tarvel::Ref<Tarvel::Ssl::SSLContext>;

int g_specDescriptions = 0;
int g_tokenDescriptions = 0;

struct ClientValues {
  std::string url;
  const Tarvel::Ssl::SSLContext *context;
  std::string sslParameter;
  std::int64_t timeoutMicroseconds;
  std::string domainControllerFlag; ///< "true", "false", or "not given"
};

std::vector<ClientValues> g_clients;

} // namespace

// The linker redirects calls of the library's functions to these; the originals have the names with "__real_".

#define ARGUMENTS "RKNSt7__cxx1112basic_stringIcSt11char_traitsIcESaIcEEERKN6Tarvel3RefINS9_3Ssl10SSLContextEEES8_l"
#define WRITE_TOKEN_SPEC "_ZN9SsoClient14WriteTokenSpecB5cxx11ERKNS_9TokenSpecE"
#define DESCRIBE_TOKEN "_ZN9SsoClient25CreateRedactedDescriptionB5cxx11ERKNS_9SamlTokenE"
#define MAKE_CLIENT "_ZN9SsoClient11HttpsClientC1E" ARGUMENTS

std::string RealWriteTokenSpec(const SsoClient::TokenSpec &spec) asm("__real_" WRITE_TOKEN_SPEC);
std::string CountedWriteTokenSpec(const SsoClient::TokenSpec &spec) asm("__wrap_" WRITE_TOKEN_SPEC);
std::string CountedWriteTokenSpec(const SsoClient::TokenSpec &spec) {
  ++g_specDescriptions;
  return RealWriteTokenSpec(spec);
}

std::string RealDescribeToken(const SsoClient::SamlToken &token) asm("__real_" DESCRIBE_TOKEN);
std::string CountedDescribeToken(const SsoClient::SamlToken &token) asm("__wrap_" DESCRIBE_TOKEN);
std::string CountedDescribeToken(const SsoClient::SamlToken &token) {
  ++g_tokenDescriptions;
  return RealDescribeToken(token);
}

void RealMakeClient(void *client, const std::string &url, const ContextRef &context, const std::string &sslParameter,
                    std::int64_t timeout, bool flag) asm("__real_" MAKE_CLIENT "b");
void NotedMakeClient(void *client, const std::string &url, const ContextRef &context, const std::string &sslParameter,
                     std::int64_t timeout, bool flag) asm("__wrap_" MAKE_CLIENT "b");
void NotedMakeClient(void *client, const std::string &url, const ContextRef &context, const std::string &sslParameter,
                     std::int64_t timeout, bool flag) {
  g_clients.push_back({url, context.get(), sslParameter, timeout, flag ? "true" : "false"});
  RealMakeClient(client, url, context, sslParameter, timeout, flag);
}

void RealMakeClientWithoutFlag(void *client, const std::string &url, const ContextRef &context,
                               const std::string &sslParameter, std::int64_t timeout) asm("__real_" MAKE_CLIENT);
void NotedMakeClientWithoutFlag(void *client, const std::string &url, const ContextRef &context,
                                const std::string &sslParameter, std::int64_t timeout) asm("__wrap_" MAKE_CLIENT);
void NotedMakeClientWithoutFlag(void *client, const std::string &url, const ContextRef &context,
                                const std::string &sslParameter, std::int64_t timeout) {
  g_clients.push_back({url, context.get(), sslParameter, timeout, "not given"});
  RealMakeClientWithoutFlag(client, url, context, sslParameter, timeout);
}

namespace SsoClient {
namespace {

using Testing::CountingToken;
using Testing::SpecFor;

struct DescribingOperation {
  const char *name;
  const char *responseBegin;
  int specs;  ///< how many descriptions of specs a successful operation computes
  int tokens; ///< how many descriptions of tokens, including that of the new token
  std::function<void(const SecurityTokenService &)> run;
};

void PrintTo(const DescribingOperation &operation, std::ostream *out) {
  *out << operation.name;
}

class Descriptions : public testing::TestWithParam<DescribingOperation> {
protected:
  void RunAtLevel(int level) const {
    const Testing::RecordedLog log; // a line is formatted only when a sink receives it
    const Testing::ScopedLogLevel scope(level);
    g_specDescriptions = g_tokenDescriptions = 0;
    const std::string begin = GetParam().responseBegin;
    const bool yieldsToken = begin != "valid:true";
    const std::string response = begin + (yieldsToken ? Testing::ReadDataFile("tokens/bearer-minimal.xml") : "");
    GetParam().run(*Testing::ServiceOn(
        std::make_shared<Testing::TransportStandIn>([response](const Request &) { return response; })));
  }
};

TEST_P(Descriptions, AreComputedAtLevel64) {
  RunAtLevel(64);
  EXPECT_EQ(g_specDescriptions, GetParam().specs);
  EXPECT_EQ(g_tokenDescriptions, GetParam().tokens);
}

TEST_P(Descriptions, AreNotComputedBelowLevel64) {
  for (const int level : {63, 8, 0}) {
    RunAtLevel(level);
    EXPECT_EQ(g_specDescriptions, 0) << "at level " << level;
    EXPECT_EQ(g_tokenDescriptions, 0) << "at level " << level;
  }
}

INSTANTIATE_TEST_SUITE_P(
    OfEachOperation, Descriptions,
    testing::Values(
        DescribingOperation{
            "AcquireToken", "issued:", 1, 1,
            [](const SecurityTokenService &service) { service.AcquireToken("alice", "pass", SpecFor(60)); }},
        DescribingOperation{"AcquireTokenByGSS", "leg:context||", 1, 1,
                            [](const SecurityTokenService &service) {
                              Testing::NegotiationHandlerStandIn handler({Testing::Leg("hello")});
                              service.AcquireTokenByGSS(SpecFor(60), handler);
                            }},
        DescribingOperation{
            "AcquireTokenByCertificate", "issued:", 1, 1,
            [](const SecurityTokenService &service) { service.AcquireTokenByCertificate(SpecFor(60)); }},
        DescribingOperation{
            "AcquireTokenByToken", "issued:", 1, 2,
            [](const SecurityTokenService &service) { service.AcquireTokenByToken(CountingToken(), SpecFor(60)); }},
        DescribingOperation{"ValidateSubject", "valid:true", 0, 1,
                            [](const SecurityTokenService &service) { service.ValidateSubject(CountingToken()); }},
        DescribingOperation{"RenewToken", "renewed:", 0, 2,
                            [](const SecurityTokenService &service) { service.RenewToken(CountingToken(), 60); }}),
    [](const auto &operation) { return std::string(operation.param.name); });

SecurityTokenServiceConfig ConfigWith(const ContextRef &context, bool useDomainControllerName) {
  SecurityTokenServiceConfig config = Testing::ConfigFor("https://sts.example:7444/STS");
  config.sslContext = context.get();
  config.sslParameter = "the parameter";
  config.useDomainControllerName = useDomainControllerName;
  return config;
}

void ExpectClient(const ContextRef &context, std::int64_t timeoutMicroseconds, const std::string &flag) {
  ASSERT_EQ(g_clients.size(), 1u);
  const ClientValues &client = g_clients[0];
  EXPECT_EQ(client.url, "https://sts.example:7444/STS");
  EXPECT_EQ(client.context, context.get());
  EXPECT_EQ(client.sslParameter, "the parameter");
  EXPECT_EQ(client.timeoutMicroseconds, timeoutMicroseconds);
  EXPECT_EQ(client.domainControllerFlag, flag);
}

TEST(CreateSecurityTokenService, GivesItsClientFourMinutesForARequestAndTheConfiguredFlag) {
  const ContextRef context = Tarvel::Ssl::CreateSSLContext();
  for (const bool flag : {false, true}) {
    g_clients.clear();
    CreateSecurityTokenService(ConfigWith(context, flag));
    ExpectClient(context, 240000000, flag ? "true" : "false");
  }
}

TEST(CreateGssNegotiationContext, GivesItsClientFortySecondsForALegAndNoFlagWhateverIsConfigured) {
  const ContextRef context = Tarvel::Ssl::CreateSSLContext();
  for (const bool flag : {false, true}) {
    g_clients.clear();
    InternalApi::CreateGssNegotiationContext(ConfigWith(context, flag), SpecFor(60));
    ExpectClient(context, 40000000, "not given");
  }
}

} // namespace
} // namespace SsoClient
