// SPDX-License-Identifier: Apache-2.0
// Which canonicalizer the platform is asked for when a token is made from a tree.
#include <ssoclient/create_saml_token.h>

#include "support/data_file.h"
#include "support/fixed_environment.h"
#include "support/parsed_document.h"

#include <tarvel/xml/security/canonicalizer.h>

#include <gtest/gtest.h>

#include <string>
#include <string_view>
#include <vector>

using Tarvel::Ref;
using Tarvel::Xml::Security::Canonicalizer;

namespace {

std::vector<std::string> g_askedFor;

} // namespace

// The first of these is the platform's function. The linker redirects the library's calls of it to the second.

#define CREATE_CANONICALIZER                                                                                           \
  "_ZN6Tarvel3Xml8Security19CreateCanonicalizerESt17basic_string_viewIcSt11char_traitsIcEERKSt6vectorINSt7__cxx1112"   \
  "basic_stringIcS4_SaIcEEESaISA_EE"

Ref<Canonicalizer>
RealCreateCanonicalizer(std::string_view uri,
                        const std::vector<std::string> &prefixes) asm("__real_" CREATE_CANONICALIZER);
Ref<Canonicalizer>
NotedCreateCanonicalizer(std::string_view uri,
                         const std::vector<std::string> &prefixes) asm("__wrap_" CREATE_CANONICALIZER);
Ref<Canonicalizer> NotedCreateCanonicalizer(std::string_view uri, const std::vector<std::string> &prefixes) {
  g_askedFor.emplace_back(uri);
  EXPECT_TRUE(prefixes.empty());
  return RealCreateCanonicalizer(uri, prefixes);
}

namespace {

TEST(CreateSamlTokenFromDom, AsksForInclusiveCanonicalXmlByAUriThatEndsInANumberSign) {
  const Testing::FixedEnvironment environment;
  const Testing::ParsedDocument document(Testing::ReadDataFile("tokens/bearer.xml"));
  const auto trusted = Tarvel::Crypto::LoadCertificates(Testing::DataPath("tokens/sts-rsa.crt"));
  g_askedFor.clear();
  EXPECT_TRUE(SsoClient::CreateSamlTokenFromDom(document.Root(), trusted));
  EXPECT_EQ(std::vector<std::string>{"http://www.w3.org/TR/2001/REC-xml-c14n-20010315#"}, g_askedFor);
}

} // namespace
