// SPDX-License-Identifier: Apache-2.0
// Checks the values with which the library calls the platform and its own factories, where no caller can see them.

#include "support/parsed_document.h"
#include "support/throws_message.h"
#include "transport/https_client.h"
#include "xml/xml_text.h"

#include <ssoclient/connection_spec.h>
#include <tarvel/http/user_agent.h>
#include <tarvel/xml/security/canonicalizer.h>

#include <gtest/gtest.h>

#include <cstdint>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace {

using Tarvel::Ref;
using Tarvel::Http::ConnectionPool;
using Tarvel::Http::ConnectionSpec;
using Tarvel::Http::CookieStore;
using Tarvel::Http::UserAgent;
using ContextRef = Ref<Tarvel::Ssl::SSLContext>;

std::vector<std::string> g_specs; ///< "FACTORY HOST:PORT FLAG" for each call
std::vector<std::string> g_algorithms;
Ref<UserAgent> g_userAgent; ///< returned instead of a real one, unless it is null

void NoteSpec(const char *factory, const std::string &host, int port, bool flag) {
  g_specs.push_back(std::string(factory) + " " + host + ":" + std::to_string(port) + (flag ? " true" : " false"));
}

} // namespace

// The linker redirects calls of the library's functions to these; the originals have the names with "__real_".

#define TEXT "NSt7__cxx1112basic_stringIcSt11char_traitsIcESaIcEEE"
#define MAKE_SPEC "_ZN9SsoClient23CreateSsoConnectionSpecERK" TEXT "ibRN6Tarvel3RefINS8_4Http14ConnectionSpecEEE"
#define MAKE_SSL_SPEC                                                                                                  \
  "_ZN9SsoClient26CreateSsoSSLConnectionSpecERK" TEXT                                                                  \
  "iRKN6Tarvel3RefINS8_3Ssl10SSLContextEEES7_bRNS9_INS8_4Http14ConnectionSpecEEE"
#define MAKE_CANONICALIZER                                                                                             \
  "_ZN6Tarvel3Xml8Security19CreateCanonicalizerESt17basic_string_viewIcSt11char_traitsIcEERKSt6vector"                 \
  "INSt7__cxx1112basic_stringIcS4_SaIcEEESaISA_EE"
#define MAKE_USER_AGENT                                                                                                \
  "_ZN6Tarvel4Http19CreateHttpUserAgentERKNS_3RefINS0_14ConnectionSpecEEERKNS1_INS0_11CookieStoreEEE"                  \
  "RKNS1_INS0_14ConnectionPoolEEERNS1_INS0_9UserAgentEEE"

void RealMakeSpec(const std::string &host, int port, bool flag, Ref<ConnectionSpec> &out) asm("__real_" MAKE_SPEC);
void NotedMakeSpec(const std::string &host, int port, bool flag, Ref<ConnectionSpec> &out) asm("__wrap_" MAKE_SPEC);
void NotedMakeSpec(const std::string &host, int port, bool flag, Ref<ConnectionSpec> &out) {
  NoteSpec("plain", host, port, flag);
  RealMakeSpec(host, port, flag, out);
}

void RealMakeSslSpec(const std::string &host, int port, const ContextRef &context, const std::string &parameter,
                     bool flag, Ref<ConnectionSpec> &out) asm("__real_" MAKE_SSL_SPEC);
void NotedMakeSslSpec(const std::string &host, int port, const ContextRef &context, const std::string &parameter,
                      bool flag, Ref<ConnectionSpec> &out) asm("__wrap_" MAKE_SSL_SPEC);
void NotedMakeSslSpec(const std::string &host, int port, const ContextRef &context, const std::string &parameter,
                      bool flag, Ref<ConnectionSpec> &out) {
  NoteSpec("ssl", host, port, flag);
  RealMakeSslSpec(host, port, context, parameter, flag, out);
}

using CanonicalizerRef = Ref<Tarvel::Xml::Security::Canonicalizer>;

CanonicalizerRef RealMakeCanonicalizer(std::string_view uri,
                                       const std::vector<std::string> &prefixes) asm("__real_" MAKE_CANONICALIZER);
CanonicalizerRef NotedMakeCanonicalizer(std::string_view uri,
                                        const std::vector<std::string> &prefixes) asm("__wrap_" MAKE_CANONICALIZER);
CanonicalizerRef NotedMakeCanonicalizer(std::string_view uri, const std::vector<std::string> &prefixes) {
  g_algorithms.emplace_back(uri);
  return RealMakeCanonicalizer(uri, prefixes);
}

void RealMakeUserAgent(const Ref<ConnectionSpec> &spec, const Ref<CookieStore> &cookies,
                       const Ref<ConnectionPool> &pool, Ref<UserAgent> &out) asm("__real_" MAKE_USER_AGENT);
void ChosenUserAgent(const Ref<ConnectionSpec> &spec, const Ref<CookieStore> &cookies, const Ref<ConnectionPool> &pool,
                     Ref<UserAgent> &out) asm("__wrap_" MAKE_USER_AGENT);
void ChosenUserAgent(const Ref<ConnectionSpec> &spec, const Ref<CookieStore> &cookies, const Ref<ConnectionPool> &pool,
                     Ref<UserAgent> &out) {
  if (g_userAgent) {
    out = g_userAgent;
    return;
  }
  RealMakeUserAgent(spec, cookies, pool, out);
}

namespace SsoClient {
namespace {

using Texts = std::vector<std::string>;

/// The specifications that are made for a client of `url`, with the flag or without it.
class SpecsOfAClient {
public:
  explicit SpecsOfAClient(const std::string &url) : m_url(url) {}

  Texts With(bool flag) const {
    g_specs.clear();
    const HttpsClient client(m_url, m_context, "", 1000000, flag);
    return g_specs;
  }
  Texts WithoutFlag() const {
    g_specs.clear();
    const HttpsClient client(m_url, m_context, "", 1000000);
    return g_specs;
  }

private:
  const std::string m_url;
  const ContextRef m_context = Tarvel::Ssl::CreateSSLContext();
};

TEST(HttpsClient, PassesItsFlagToTheFactoryOfSslConnections) {
  const SpecsOfAClient specs("https://sts.example:7444/STS");
  EXPECT_EQ(specs.With(true), Texts{"ssl sts.example:7444 true"});
  EXPECT_EQ(specs.With(false), Texts{"ssl sts.example:7444 false"});
}

TEST(HttpsClient, PassesItsFlagToTheFactoryOfPlainConnections) {
  const SpecsOfAClient specs("http://sts.example:7080/STS");
  EXPECT_EQ(specs.With(true), Texts{"plain sts.example:7080 true"});
  EXPECT_EQ(specs.With(false), Texts{"plain sts.example:7080 false"});
}

TEST(HttpsClient, PassesNoFlagByDefault) {
  EXPECT_EQ(SpecsOfAClient("https://sts.example/STS").WithoutFlag(), Texts{"ssl sts.example:443 false"});
  EXPECT_EQ(SpecsOfAClient("http://sts.example/STS").WithoutFlag(), Texts{"plain sts.example:80 false"});
}

TEST(CanonicalElementText, RequestsTheAlgorithmByItsNameWithANumberSign) {
  g_algorithms.clear();
  EXPECT_EQ(CanonicalElementText(Testing::ParsedDocument("<a b=\"c\"/>").Root()), "<a b=\"c\"></a>");
  EXPECT_EQ(g_algorithms, Texts{"http://www.w3.org/TR/2001/REC-xml-c14n-20010315#"});
}

/// Starts every request, and throws when the caller waits for the response.
class ExhaustedUserAgent final : public UserAgent {
public:
  void StartRequest(const Ref<Tarvel::Http::ClientRequest> &, CompletionFunction,
                    Ref<Tarvel::Http::PendingRequestItem> &) override {}
  void WaitForRequest(const Ref<Tarvel::Http::PendingRequestItem> &, std::int64_t,
                      Ref<Tarvel::Http::ClientResponse> &) override {
    throw std::runtime_error("the machine is exhausted");
  }
};

TEST(HttpsSession, PassesOnExceptionsOfOtherKindsUnchanged) {
  g_userAgent = Tarvel::MakeRef<ExhaustedUserAgent>();
  const auto session = HttpsClient("http://sts.example/STS", nullptr, "", 1000000).CreateSession();
  g_userAgent = nullptr;
  Ref<Tarvel::Reader> response;
  EXPECT_THROWS_MESSAGE(session->SendRequest(Request(), response), std::runtime_error, "the machine is exhausted");
  EXPECT_EQ(response, nullptr);
}

} // namespace
} // namespace SsoClient
