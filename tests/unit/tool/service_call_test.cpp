// SPDX-License-Identifier: Apache-2.0

#include "service_call.h"

#include "support/throws_message.h"
#include "support/token_stand_in.h"

#include <gtest/gtest.h>

#include <memory>
#include <stdexcept>

namespace SsoClient::Tool {
namespace {

const OutputOptions OUTPUT;

TEST(AskForToken, ReturnsTheTokenOfTheCall) {
  const auto token = std::make_shared<const Testing::TokenStandIn>("_1", "<a/>", SamlToken::BEARER);
  EXPECT_EQ(token, AskForToken([&]() -> std::shared_ptr<const SamlToken> { return token; }, nullptr, OUTPUT).token);
}

TEST(AskForToken, RefusesAResponseWithoutAToken) {
  EXPECT_THROWS_MESSAGE(AskForToken([] { return nullptr; }, nullptr, OUTPUT), SsoException,
                        "The response holds no token");
}

TEST(CallService, PassesOnFailuresThatAreNotAboutTheAnswer) {
  EXPECT_THROWS_MESSAGE(CallService([]() -> bool { throw InvalidSignatureException("wrong"); }),
                        InvalidSignatureException, "wrong");
  EXPECT_THROWS_MESSAGE(CallService([]() -> bool { throw Tarvel::Xml::Security::XmlSecurityException("no key"); }),
                        Tarvel::Xml::Security::XmlSecurityException, "no key");
  EXPECT_THROWS_MESSAGE(CallService([]() -> bool { throw std::runtime_error("exhausted"); }), std::runtime_error,
                        "exhausted");
}

TEST(CallService, ReportsAnUnreadableAnswerAsAFaultOfTheService) {
  EXPECT_THROWS_MESSAGE(CallService([]() -> bool { throw ParseException("no element"); }), SsoException, "no element");
  EXPECT_THROWS_MESSAGE(CallService([]() -> bool { throw Tarvel::Xml::XMLParseException("no XML", 1, 2); }),
                        SsoException, "no XML at line 1, column 2");
}

} // namespace
} // namespace SsoClient::Tool
