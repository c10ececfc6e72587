// SPDX-License-Identifier: Apache-2.0
// Settings that no handler is made from.

#include "integration/gssapi/negotiation_fixture.h"
#include "support/throws_message.h"

#include <gtest/gtest.h>

#include <functional>
#include <ostream>
#include <string>

namespace SsoClient::Gssapi {
namespace {

struct BadSetting {
  std::string name;
  std::function<void(SpnegoSettings &)> spoil;
  std::string message;
};

void PrintTo(const BadSetting &setting, std::ostream *out) {
  *out << setting.name;
}

std::string NameOf(const testing::TestParamInfo<BadSetting> &info) {
  return info.param.name;
}

class RefusedSettings : public testing::TestWithParam<BadSetting> {};

TEST_P(RefusedSettings, RaiseAnInvalidArgument) {
  SpnegoSettings settings = Testing::SettingsFor();
  GetParam().spoil(settings);
  EXPECT_THROWS_MESSAGE(CreateSpnegoHandler(settings), Tarvel::InvalidArgumentException,
                        "Invalid argument : " + GetParam().message);
}

BadSetting BadService(const std::string &name, const std::string &service) {
  return {name, [service](SpnegoSettings &settings) { settings.service = service; },
          "'" + service + "' is not a service name such as HTTP@host or HTTP/host@REALM"};
}

const std::string NULL_CHARACTER("a\0b", 3);

INSTANTIATE_TEST_SUITE_P(
    CreateSpnegoHandler, RefusedSettings,
    testing::Values(
        BadService("EmptyService", ""), BadService("ServiceWithoutHost", "sts@"),
        BadService("ServiceWithoutName", "@localhost"), BadService("ServiceOfOneWord", "sts"),
        BadService("PrincipalWithoutHost", "sts/"), BadService("PrincipalWithoutName", "/localhost@EXAMPLE.TEST"),
        BadSetting{"ServiceOf2000Characters", [](SpnegoSettings &settings) { settings.service.assign(2000, 'x'); },
                   "'" + std::string(1024, 'x') +
                       "... (976 more bytes)' is not a service name such as HTTP@host or HTTP/host@REALM"},
        BadSetting{"NullInService", [](SpnegoSettings &settings) { settings.service += NULL_CHARACTER; },
                   "A GSS setting contains a null character"},
        BadSetting{"NullInClient", [](SpnegoSettings &settings) { settings.client = NULL_CHARACTER; },
                   "A GSS setting contains a null character"},
        BadSetting{"NullInCache", [](SpnegoSettings &settings) { settings.credentialCache = NULL_CHARACTER; },
                   "A GSS setting contains a null character"},
        BadSetting{"NullInKeytab", [](SpnegoSettings &settings) { settings.clientKeytab = NULL_CHARACTER; },
                   "A GSS setting contains a null character"},
        BadSetting{"NoLegs", [](SpnegoSettings &settings) { settings.maximumLegs = 0; },
                   "The limit on legs must be positive"},
        BadSetting{"NegativeLegs", [](SpnegoSettings &settings) { settings.maximumLegs = -1; },
                   "The limit on legs must be positive"},
        BadSetting{"NoTime", [](SpnegoSettings &settings) { settings.timeLimitSec = 0; },
                   "The time limit must be positive"},
        BadSetting{"NegativeTime", [](SpnegoSettings &settings) { settings.timeLimitSec = -1; },
                   "The time limit must be positive"}),
    NameOf);

} // namespace
} // namespace SsoClient::Gssapi
