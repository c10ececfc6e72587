// SPDX-License-Identifier: Apache-2.0

#include "compose/advice_elements.h"

#include "model/namespaces.h"

#include <string>

namespace SsoClient {

namespace {

const char RSA_ADVICE_PREFIX[] = "rsa-advice";

} // namespace

XMLBuilderPtr RsaAdviceSetBuilder(const std::vector<Advice> &advices) {
  auto adviceSet =
      std::make_shared<XMLCompositeBuilder>(ElementBuilder(RSA_ADVICE_PREFIX, "AdviceSet",
                                                           {{"xmlns:rsa-advice", std::string(Namespaces::RSA_ADVICE)},
                                                            {"xmlns:saml", std::string(Namespaces::SAML)},
                                                            {"xmlns:xs", std::string(Namespaces::XS)},
                                                            {"xmlns:xsi", std::string(Namespaces::XSI)}}));
  for (const Advice &advice : advices) {
    adviceSet->Add(RsaAdviceBuilder(advice));
  }
  return adviceSet;
}

XMLBuilderPtr RsaAdviceBuilder(const Advice &advice) {
  auto element = std::make_shared<XMLCompositeBuilder>(
      ElementBuilder(RSA_ADVICE_PREFIX, "Advice", {{"AdviceSource", advice.source}}));
  for (const AdviceAttribute &attribute : advice.attributes) {
    element->Add(RsaAttributeBuilder(attribute));
  }
  return element;
}

XMLBuilderPtr RsaAttributeBuilder(const AdviceAttribute &attribute) {
  auto element =
      std::make_shared<XMLCompositeBuilder>(ElementBuilder(RSA_ADVICE_PREFIX, "Attribute", {{"Name", attribute.name}}));
  for (const std::string &value : attribute.values) {
    element->Add(TextElementBuilder(RSA_ADVICE_PREFIX, "AttributeValue", {{"xsi:type", "xs:string"}}, value));
  }
  return element;
}

} // namespace SsoClient
