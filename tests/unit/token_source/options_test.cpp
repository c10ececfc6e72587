// SPDX-License-Identifier: Apache-2.0
// The arguments of the constructor of TokenSource.

#include "client/token_source_options.h"

#include "support/throws_message.h"

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <limits>
#include <string>
#include <vector>

namespace Testing {

using namespace SsoClient;
using namespace std::chrono_literals;

namespace {

struct Arguments {
  bool hasClient = true;
  CredentialProvider provider = [] { return CertificateCredential(); };
  std::int64_t lifetime = 3600;
  TokenSourceOptions options;

  void Check() const {
    TokenSpec spec;
    spec.tokenLifetimeSec = lifetime;
    CheckTokenSource(hasClient, provider, spec, options);
  }
};

struct BadCase {
  const char *message;
  std::function<void(Arguments &)> change;
};

constexpr double NOT_A_NUMBER = std::numeric_limits<double>::quiet_NaN();
constexpr auto YEAR = std::chrono::hours(24 * 365);

} // namespace

TEST(TokenSourceOptions, AreValidByDefaultAndAtTheirLimits) {
  EXPECT_NO_THROW(Arguments().Check());
  Arguments limits;
  limits.options.refreshAt = 0.1;
  limits.options.jitter = 0.05;
  limits.options.expiryMargin = 0s;
  limits.options.firstBackOff = limits.options.longestBackOff = YEAR;
  limits.options.attemptTimeout = 1ms;
  EXPECT_NO_THROW(limits.Check());
  limits.options.refreshAt = 0.99;
  limits.options.jitter = 0;
  limits.options.expiryMargin = YEAR;
  limits.options.firstBackOff = 1ms;
  limits.options.attemptTimeout = YEAR;
  EXPECT_NO_THROW(limits.Check());
}

TEST(TokenSourceOptions, AreRefusedOutsideTheirLimits) {
  const char *const refreshAt = "TokenSourceOptions::refreshAt must be between 0.1 and 0.99";
  const char *const jitter = "TokenSourceOptions::jitter must be between 0 and the half of refreshAt";
  const char *const margin = "TokenSourceOptions::expiryMargin must be between 0 and a year";
  const char *const backOff = "TokenSourceOptions::firstBackOff must be positive and at most longestBackOff";
  const char *const longest = "TokenSourceOptions::longestBackOff must be at most a year";
  const char *const timeout = "TokenSourceOptions::attemptTimeout must be positive and at most a year";
  const std::vector<BadCase> cases = {
      {"the client of a TokenSource is null", [](Arguments &a) { a.hasClient = false; }},
      {"the credential provider of a TokenSource is empty", [](Arguments &a) { a.provider = nullptr; }},
      {"TokenSpec::tokenLifetimeSec must be positive", [](Arguments &a) { a.lifetime = 0; }},
      {refreshAt, [](Arguments &a) { a.options.refreshAt = 0.099; }},
      {refreshAt, [](Arguments &a) { a.options.refreshAt = 0.991; }},
      {refreshAt, [](Arguments &a) { a.options.refreshAt = NOT_A_NUMBER; }},
      {jitter, [](Arguments &a) { a.options.jitter = -0.001; }},
      {jitter, [](Arguments &a) { a.options.jitter = 0.401; }},
      {jitter, [](Arguments &a) { a.options.jitter = NOT_A_NUMBER; }},
      {margin, [](Arguments &a) { a.options.expiryMargin = -1s; }},
      {margin, [](Arguments &a) { a.options.expiryMargin = YEAR + 1s; }},
      {margin, [](Arguments &a) { a.options.expiryMargin = std::chrono::seconds::max(); }},
      {backOff, [](Arguments &a) { a.options.firstBackOff = 0ms; }},
      {backOff, [](Arguments &a) { a.options.longestBackOff = 999ms; }},
      {longest, [](Arguments &a) { a.options.longestBackOff = std::chrono::milliseconds::max(); }},
      {timeout, [](Arguments &a) { a.options.attemptTimeout = 0ms; }},
      {timeout, [](Arguments &a) { a.options.attemptTimeout = YEAR + 1ms; }},
      {"TokenCacheOptions::path must not be empty", [](Arguments &a) { a.options.cache = TokenCacheOptions(); }},
  };
  for (const BadCase &bad : cases) {
    Arguments arguments;
    bad.change(arguments);
    EXPECT_THROWS_MESSAGE(arguments.Check(), Tarvel::InvalidArgumentException,
                          std::string("Invalid argument : ") + bad.message);
  }
}

} // namespace Testing
