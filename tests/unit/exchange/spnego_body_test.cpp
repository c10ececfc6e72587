// SPDX-License-Identifier: Apache-2.0

#include "exchange/spnego_body.h"

#include <gtest/gtest.h>

namespace SsoClient {
namespace {

using Leg = std::vector<std::uint8_t>;

const std::string EXCHANGE_START = "<wst:BinaryExchange EncodingType=\"http://docs.oasis-open.org/wss/2004/01/"
                                   "oasis-200401-wss-soap-message-security-1.0#Base64Binary\" "
                                   "ValueType=\"http://schemas.xmlsoap.org/ws/2005/02/trust/spnego\">";

std::string ContextOf(const XMLBaseBuilder &builder) {
  Tarvel::Ref<Tarvel::Xml::ElementNode> element;
  builder.build(element);
  const auto *const context = element->FindAttribute("", "Context");
  return context ? std::string(context->GetValue()) : "(none)";
}

TEST(XMLBodyBuilderInitialSPNego, GivesEveryBuildANewContext) {
  const XMLBodyBuilderInitialSPNego builder(SamlToken::BEARER, TokenSpec(), {1, 2, 3});
  const std::string first = ContextOf(builder);
  const std::string second = ContextOf(builder);
  EXPECT_NE(first, second);
  for (const std::string &context : {first, second}) {
    EXPECT_EQ(context.substr(0, 9), "urn:uuid:");
    EXPECT_EQ(context.size(), std::string("urn:uuid:").size() + 36);
  }
}

TEST(XMLBodyBuilderInitialSPNego, EndsTheRequestWithTheLegAfterUseKey) {
  const auto builder =
      std::make_shared<const XMLBodyBuilderInitialSPNego>(SamlToken::HOLDER_OF_KEY, TokenSpec(), Leg{1, 2, 3});
  const std::string text = SerializeToXML(builder);
  const std::string end = "<wst:UseKey Sig=\"holderOfKeyProofSignature\"></wst:UseKey>" + EXCHANGE_START +
                          "AQID</wst:BinaryExchange></wst:RequestSecurityToken>";
  ASSERT_GT(text.size(), end.size());
  EXPECT_EQ(text.substr(text.size() - end.size()), end);
}

TEST(XMLBodyBuilderInitialSPNego, KeepsItsOwnCopyOfTheSpecAndTheLeg) {
  TokenSpec spec;
  spec.audienceRestriction = {"urn:a"};
  spec.advice = {{"source", {{"name", {"value"}}}}};
  Leg leg = {1, 2, 3};
  const auto builder = std::make_shared<const XMLBodyBuilderInitialSPNego>(SamlToken::BEARER, spec, leg);
  spec.audienceRestriction.clear();
  spec.advice.clear();
  leg.clear();
  const std::string text = SerializeToXML(builder);
  EXPECT_NE(text.find("<wsa:Address>urn:a</wsa:Address>"), std::string::npos);
  EXPECT_NE(text.find(">value</rsa-advice:AttributeValue>"), std::string::npos);
  EXPECT_NE(text.find(">AQID</wst:BinaryExchange>"), std::string::npos);
}

TEST(XMLBodyBuilderContinuedSPNego, ContainsOnlyTheLegInTheGivenContext) {
  const auto builder = std::make_shared<const XMLBodyBuilderContinuedSPNego>("ctx<&", Leg{1, 2, 3});
  EXPECT_EQ(SerializeToXML(builder), "<wst:RequestSecurityTokenResponse Context=\"ctx&lt;&amp;\">" + EXCHANGE_START +
                                         "AQID</wst:BinaryExchange></wst:RequestSecurityTokenResponse>");
}

TEST(XMLBodyBuilderContinuedSPNego, WritesEvenAnEmptyContext) {
  EXPECT_EQ(ContextOf(XMLBodyBuilderContinuedSPNego("", {})), "");
}

} // namespace
} // namespace SsoClient
