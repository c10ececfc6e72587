// SPDX-License-Identifier: Apache-2.0
// Validates each request against the schemas of its standards: those in packages of Debian, and those in
// tests/data/schemas.
//
// Every element of every request is valid. These differences from the standards remain, which the schemas do not
// detect:
// - wst:UseKey/@Sig is a plain identifier, although WS-Trust 1.3 requires a URI reference to the signature ("#...").
//   As an xs:anyURI it is still valid.
// - wst:BinaryExchange/@ValueType is the SPNEGO URI of WS-Trust of February 2005: WS-Trust 1.3 allows any URI.
// - wsse11:TokenType has "tokenprofile", but the SAML Token Profile 1.1 has "token-profile". The schema allows any URI.
// - an audience or an advice source that is not a URI is sent as it is, although its type in the schemas is xs:anyURI.
//   The samples have URIs.
#include "exchange/request_builder_impl.h"
#include "integration/signed_requests/foreign_document.h"
#include "integration/signed_requests/schemas.h"
#include "support/data_file.h"
#include "support/dialect_requests.h"
#include "support/identity.h"
#include "support/token_stand_in.h"

#include <gtest/gtest.h>

namespace SsoClient {
namespace {

using namespace Testing;

class ValidRequest : public testing::TestWithParam<SampleRequest> {
protected:
  static const Schemas &GetSchemas() {
    static const Schemas schemas;
    return schemas;
  }
};

TEST_P(ValidRequest, ValidatesAgainstTheSchemas) {
  Request request;
  GetParam().build(request);
  EXPECT_EQ(GetSchemas().Judge(request.body), "");
}

TEST_P(ValidRequest, ValidatesWithTheRealClockAndIdentifiers) {
  for (int i = 0; i < 20; ++i) { // a UUID may begin with a digit or a letter
    Request request;
    GetParam().build(request);
    EXPECT_EQ(GetSchemas().Judge(request.body), "");
  }
}

INSTANTIATE_TEST_SUITE_P(EveryRequest, ValidRequest, testing::ValuesIn(SampleRequestsInAllDialects()),
                         [](const auto &sample) { return TestName(sample.param); });

TEST_F(ValidRequest, MayContainEveryKindOfIssuedToken) {
  const RequestBuilderImpl builder{HolderIdentity()};
  for (const char *const name :
       {"bearer", "holder-of-key", "full", "delegated", "bearer-5k", "style-default-namespace"}) {
    const std::string xml = ReadDataFile(std::string("tokens/") + name + ".xml");
    const TokenStandIn token(AttributeOf(ForeignDocument(xml).Root(), "ID"), xml, SamlToken::HOLDER_OF_KEY);
    Request request;
    builder.BuildExchangeTokenRequest(token, DelegatedSpec(), request);
    EXPECT_EQ(GetSchemas().Judge(request.body), "") << name;
    builder.BuildRenewRequest(token, 600, request);
    EXPECT_EQ(GetSchemas().Judge(request.body), "") << name;
    builder.BuildValidateSubjectRequest(token, request);
    EXPECT_EQ(GetSchemas().Judge(request.body), "") << name;
  }
}

/// Shows that the schemas detect mistakes: each replacement makes the request with the most elements invalid.
TEST_F(ValidRequest, IsInvalidAfterASmallMistake) {
  const std::pair<const char *, const char *> mistakes[] = {
      {"wsu:Created", "wsu:Make"},
      {"wsse:Username>", "wsse:UserName>"},
      {"wsse:BinarySecurityToken", "wsse:BinarySecurity"},
      {"URI=\"#holder", "uri=\"#holder"},
      {"wst:Lifetime", "wst:LifeTime"},
      {"wst:Delegatable", "wst:Delegable"},
      {">true</wst:Delegatable>", ">yes</wst:Delegatable>"},
      {"OK=\"false\"", "Ok=\"false\""},
      {"200512/Issue", "200512/issue"},
      {"200512/PublicKey", "200512/Publickey"},
      {"wst:Participants", "wst:Participant"},
      {"wsa:Address", "wsa:Adress"},
      {"AdviceSource", "Source"},
      {"xsi:type=\"xs:string\"", "xsi:type=\"xs:text\""},
      {"wst:UseKey", "wst:Usekey"},
      {"Sig=\"", "sig=\""},
      {"ds:DigestMethod", "ds:DigestMetod"},
      {"Z</wsu:Created>", "</wsu:Created>"},
      {"soapenv:Header>", "soapenv:Heading>"},
  };
  Request request;
  const RequestBuilderImpl builder{HolderIdentity()};
  builder.BuildUserPassTokenRequest("alice", "password", FullSpec(), request);
  ASSERT_EQ(GetSchemas().Judge(request.body), "");
  for (const auto &[right, wrong] : mistakes) {
    std::string changed = request.body;
    std::size_t count = 0;
    for (std::size_t at = 0; (at = changed.find(right, at)) != std::string::npos; at += std::string(wrong).size()) {
      changed.replace(at, std::string(right).size(), wrong);
      ++count;
    }
    EXPECT_GT(count, 0u) << right;
    EXPECT_NE(GetSchemas().Judge(changed), "") << right << " written as " << wrong;
  }
}

} // namespace
} // namespace SsoClient
