// SPDX-License-Identifier: Apache-2.0

#include "compose/advice_elements.h"

#include "unit/compose/wire_uris.h"

#include <gtest/gtest.h>

namespace SsoClient {
namespace {

using namespace Testing;

std::string Value(const std::string &text) {
  return "<rsa-advice:AttributeValue xsi:type=\"xs:string\">" + text + "</rsa-advice:AttributeValue>";
}

std::string Attribute(const std::string &name, const std::string &content) {
  return "<rsa-advice:Attribute Name=\"" + name + "\">" + content + "</rsa-advice:Attribute>";
}

const std::string ADVICE_SET = "<rsa-advice:AdviceSet" + Declare("rsa-advice", RSA_ADVICE_URI) +
                               Declare("saml", SAML_URI) + Declare("xs", XS_URI) + Declare("xsi", XSI_URI) + ">";

TEST(RsaAdviceSetBuilder, ListsAdvicesAttributesAndValuesInTheirOrder) {
  const std::vector<Advice> advices = {{"s2", {{"b", {"z", "y"}}, {"a", {"2", "1"}}}},
                                       {"s1", {{"d", {"x", "w"}}, {"c", {"4", "3"}}}}};
  EXPECT_EQ(SerializeToXML(RsaAdviceSetBuilder(advices)),
            ADVICE_SET + "<rsa-advice:Advice AdviceSource=\"s2\">" + Attribute("b", Value("z") + Value("y")) +
                Attribute("a", Value("2") + Value("1")) +
                "</rsa-advice:Advice><rsa-advice:Advice AdviceSource=\"s1\">" +
                Attribute("d", Value("x") + Value("w")) + Attribute("c", Value("4") + Value("3")) +
                "</rsa-advice:Advice></rsa-advice:AdviceSet>");
}

TEST(RsaAdviceSetBuilder, MakesAnEmptySetThatDeclaresItsPrefixesFromAnEmptyList) {
  EXPECT_EQ(SerializeToXML(RsaAdviceSetBuilder({})), ADVICE_SET + "</rsa-advice:AdviceSet>");
}

TEST(RsaAttributeBuilder, LeavesMarkupToTheSerialiser) {
  EXPECT_EQ(SerializeToXML(RsaAttributeBuilder({"n<\"&", {"v<&"}})),
            Attribute("n&lt;&quot;&amp;", Value("v&lt;&amp;")));
}

TEST(RsaAttributeBuilder, MakesAnEmptyElementWithoutValues) {
  EXPECT_EQ(SerializeToXML(RsaAttributeBuilder({"n", {}})), Attribute("n", ""));
}

TEST(RsaAttributeBuilder, TypesEveryValueAsString) {
  EXPECT_EQ(SerializeToXML(RsaAttributeBuilder({"n", {"true", "17", ""}})),
            Attribute("n", Value("true") + Value("17") + Value("")));
}

} // namespace
} // namespace SsoClient
