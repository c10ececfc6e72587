// SPDX-License-Identifier: Apache-2.0
// A foreign engine reads from a text field exactly what the caller wrote into it.
#include "exchange/request_builder_impl.h"
#include "integration/signed_requests/foreign_document.h"
#include "support/identity.h"

#include <tarvel/core/exception.h>

#include <gtest/gtest.h>

#include <algorithm>

namespace SsoClient {
namespace {

using namespace Testing;

const std::string TEXTS[] = {
    "",
    " ",
    "plain",
    "<&>\"'",
    "]]>",
    "<![CDATA[x]]>",
    "<!-- x -->",
    "<?x y?>",
    "&amp;&#65;&lt;",
    "</wsse:Username>",
    "a\nb",
    "a\rb",
    "a\r\nb",
    "a\tb",
    "\n\r\t leading and trailing \t\r\n",
    "Grüße, señor Ærø",
    "имя пользователя",
    "用户名 パスワード",
    "😀 👩‍👩‍👧‍👦 𝔘𝔫𝔦𝔠𝔬𝔡𝔢",
    "\xc2\x85 and \xe2\x80\xa8", // next line and line separator
    "\x7f\xc2\x80\xc2\x9f",      // the control characters that XML 1.0 allows
    "\xee\x80\x80\xef\xbf\xbd\xf4\x8f\xbf\xbf",
    "%s %1 ${x} \\n \\",
};

TokenSpec SpecWith(const std::string &text) {
  TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  spec.delegateTo = text;
  spec.audienceRestriction = {text};
  spec.advice = {{text, {{text, {text, text}}}}};
  return spec;
}

class TextField : public testing::TestWithParam<bool> {
protected:
  const RequestBuilderImpl m_builder =
      GetParam() ? RequestBuilderImpl(HolderIdentity()) : RequestBuilderImpl(boost::none);
};

TEST_P(TextField, SurvivesTheRoundTrip) {
  for (const std::string &text : TEXTS) {
    Request request;
    m_builder.BuildUserPassTokenRequest(text, text, SpecWith(text), request);
    const ForeignDocument document(request.body);
    const xmlNodePtr root = document.Root();
    EXPECT_EQ(TextOf(Find(Find(root, "Security"), "Username")), text);
    EXPECT_EQ(TextOf(Find(root, "Password")), text);
    EXPECT_EQ(TextOf(Find(Find(root, "DelegateTo"), "Username")), text);
    EXPECT_EQ(TextOf(Find(root, "Address")), text);
    EXPECT_EQ(AttributeOf(Find(root, "Advice"), "AdviceSource"), text);
    EXPECT_EQ(AttributeOf(Find(root, "Attribute"), "Name"), text);
    const auto values = FindAll(root, "AttributeValue");
    ASSERT_EQ(values.size(), 2u);
    EXPECT_EQ(TextOf(values[0]), text);
    EXPECT_EQ(TextOf(values[1]), text);
  }
}

TEST_P(TextField, IsWrittenInAscii) {
  for (const std::string &text : TEXTS) {
    Request request;
    m_builder.BuildUserPassTokenRequest(text, text, SpecWith(text), request);
    const auto isBeyondAscii = [](char c) { return static_cast<unsigned char>(c) > 0x7F; };
    EXPECT_TRUE(std::none_of(request.body.begin(), request.body.end(), isBeyondAscii)) << text;
  }
}

TEST_P(TextField, IsCoveredByTheSignatureAsItWasWritten) {
  for (const std::string &text : TEXTS) {
    TokenSpec spec = SpecWith(text);
    spec.delegateTo = boost::none; // a delegated request by password is not signed
    Request request;
    m_builder.BuildUserPassTokenRequest(text, text, spec, request);
    const ForeignDocument document(request.body);
    const auto signatures = FindAll(document.Root(), "Signature");
    ASSERT_EQ(signatures.size(), GetParam() ? 1u : 0u);
    if (GetParam()) {
      EXPECT_TRUE(IsValidSignature(signatures.front(), ReadDataFile("tokens/holder.crt")))
          << testing::PrintToString(text);
    }
  }
}

TEST_P(TextField, WithACharacterThatXmlCannotRepresentIsRefusedBeforeARequestExists) {
  for (const std::string &text : {std::string("a\0b", 3), std::string("\x01"), std::string("\x1b[0m"),
                                  std::string("\xef\xbf\xbf"), std::string("\xed\xa0\x80"), std::string("\xff")}) {
    TokenSpec plain;
    plain.tokenLifetimeSec = 600;
    std::vector<TokenSpec> specs(4, plain);
    specs[0].delegateTo = text;
    specs[1].audienceRestriction = {text};
    specs[2].advice = {{text, {}}};
    specs[3].advice = {{"s", {{"n", {text}}}}};
    Request request;
    EXPECT_THROW(m_builder.BuildUserPassTokenRequest(text, "p", plain, request), Tarvel::InvalidArgumentException);
    EXPECT_THROW(m_builder.BuildUserPassTokenRequest("u", text, plain, request), Tarvel::InvalidArgumentException);
    EXPECT_THROW(m_builder.BuildContinuedSPNegoRequest(text, {}, request), Tarvel::InvalidArgumentException);
    for (const TokenSpec &spec : specs) {
      EXPECT_THROW(m_builder.BuildUserPassTokenRequest("u", "p", spec, request), Tarvel::InvalidArgumentException);
    }
    EXPECT_EQ(request.body, "");
  }
}

INSTANTIATE_TEST_SUITE_P(PlainAndSigned, TextField, testing::Bool(),
                         [](const auto &isSigned) { return isSigned.param ? "Signed" : "Plain"; });

} // namespace
} // namespace SsoClient
