// SPDX-License-Identifier: Apache-2.0
// Settings that `CreateSpnegoHandler` refuses.

#include "integration/gssapi/negotiation_fixture.h"
#include "support/throws_message.h"

#include <gtest/gtest.h>

#include <functional>
#include <ostream>
#include <string>

namespace SsoClient::Gssapi {
namespace {

struct InvalidSetting {
  std::string name;
  std::function<void(SpnegoSettings &)> change;
  std::string message;
};

void PrintTo(const InvalidSetting &setting, std::ostream *out) {
  *out << setting.name;
}

std::string NameOf(const testing::TestParamInfo<InvalidSetting> &info) {
  return info.param.name;
}

class RefusedSettings : public testing::TestWithParam<InvalidSetting> {};

TEST_P(RefusedSettings, RaiseAnInvalidArgument) {
  SpnegoSettings settings = Testing::SettingsFor();
  GetParam().change(settings);
  EXPECT_THROWS_MESSAGE(CreateSpnegoHandler(settings), Tarvel::InvalidArgumentException,
                        "Invalid argument : " + GetParam().message);
}

InvalidSetting InvalidService(const std::string &name, const std::string &service) {
  return {name, [service](SpnegoSettings &settings) { settings.service = service; },
          "'" + service + "' is not a service name such as HTTP@host or HTTP/host@REALM"};
}

const std::string NULL_CHARACTER("a\0b", 3);

INSTANTIATE_TEST_SUITE_P(
    CreateSpnegoHandler, RefusedSettings,
    testing::Values(
        InvalidService("EmptyService", ""), InvalidService("ServiceWithoutHost", "sts@"),
        InvalidService("ServiceWithoutName", "@localhost"), InvalidService("ServiceOfOneWord", "sts"),
        InvalidService("PrincipalWithoutHost", "sts/"),
        InvalidService("PrincipalWithoutName", "/localhost@EXAMPLE.TEST"),
        InvalidSetting{"ServiceOf2000Characters", [](SpnegoSettings &settings) { settings.service.assign(2000, 'x'); },
                       "'" + std::string(1024, 'x') +
                           "... (976 more bytes)' is not a service name such as HTTP@host or HTTP/host@REALM"},
        InvalidSetting{"NullInService", [](SpnegoSettings &settings) { settings.service += NULL_CHARACTER; },
                       "A GSS setting contains a null character"},
        InvalidSetting{"NullInClient", [](SpnegoSettings &settings) { settings.client = NULL_CHARACTER; },
                       "A GSS setting contains a null character"},
        InvalidSetting{"NullInCache", [](SpnegoSettings &settings) { settings.credentialCache = NULL_CHARACTER; },
                       "A GSS setting contains a null character"},
        InvalidSetting{"NullInKeytab", [](SpnegoSettings &settings) { settings.clientKeytab = NULL_CHARACTER; },
                       "A GSS setting contains a null character"},
        InvalidSetting{"NoLegs", [](SpnegoSettings &settings) { settings.maximumLegs = 0; },
                       "The limit on legs must be positive"},
        InvalidSetting{"NegativeLegs", [](SpnegoSettings &settings) { settings.maximumLegs = -1; },
                       "The limit on legs must be positive"},
        InvalidSetting{"NoTime", [](SpnegoSettings &settings) { settings.timeLimitSec = 0; },
                       "The time limit must be positive"},
        InvalidSetting{"NegativeTime", [](SpnegoSettings &settings) { settings.timeLimitSec = -1; },
                       "The time limit must be positive"}),
    NameOf);

} // namespace
} // namespace SsoClient::Gssapi
