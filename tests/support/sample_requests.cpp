// SPDX-License-Identifier: Apache-2.0

#include "support/sample_requests.h"

#include "exchange/request_builder_impl.h"
#include "support/data_file.h"
#include "support/identity.h"
#include "support/token_stand_in.h"
#include "support/wire_layout.h"

#include <algorithm>
#include <memory>
#include <ostream>

namespace Testing {

void PrintTo(const SampleRequest &sample, std::ostream *out) {
  *out << sample.name;
}

std::string TestName(const SampleRequest &sample) {
  std::string name = sample.name;
  std::replace(name.begin(), name.end(), '-', '_');
  return name;
}

std::string SampleTokenXml() {
  return ToWire(ReadDataFile("requests/token.xml"));
}

SsoClient::TokenSpec PlainSpec() {
  SsoClient::TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  return spec;
}

SsoClient::TokenSpec FullSpec() {
  SsoClient::TokenSpec spec = PlainSpec();
  spec.audienceRestriction = {"https://b.example/", "https://a.example/"};
  spec.advice = {{"https://advice.example/", {{"colour", {"red", "green"}}, {"size", {"7"}}}}};
  spec.renewable = true;
  spec.delegable = true;
  return spec;
}

SsoClient::TokenSpec BeyondAsciiSpec() {
  SsoClient::TokenSpec spec = PlainSpec();
  spec.audienceRestriction = {"https://grün.example/ł"};
  spec.advice = {{"https://advice.example/語", {{"größe", {"rød", "😀"}}}}};
  return spec;
}

SsoClient::TokenSpec DelegatedSpec() {
  SsoClient::TokenSpec spec = FullSpec();
  spec.delegateTo = std::string("bob@corp.example");
  return spec;
}

std::vector<SampleRequest> SampleRequests() {
  using SsoClient::Request;
  const auto plain = std::make_shared<SsoClient::RequestBuilderImpl>(boost::none);
  const auto identified = std::make_shared<SsoClient::RequestBuilderImpl>(HolderIdentity());
  const auto token = std::make_shared<TokenStandIn>("_0001", SampleTokenXml(), SsoClient::SamlToken::HOLDER_OF_KEY);
  const std::vector<std::uint8_t> leg = {0x60, 0x03, 0x06, 0x01, 0x2a};
  const std::string user = "alice@corp.example";
  const std::string password = "correct horse & battery <staple>";
  return {
      {"user-password", false, [=](Request &r) { plain->BuildUserPassTokenRequest(user, password, PlainSpec(), r); }},
      {"user-password-signed", true,
       [=](Request &r) { identified->BuildUserPassTokenRequest(user, password, FullSpec(), r); }},
      {"user-password-beyond-ascii", true,
       [=](Request &r) {
         identified->BuildUserPassTokenRequest("jürgen@łódź.example", "語 & 😀", BeyondAsciiSpec(), r);
       }},
      {"user-password-delegated", false,
       [=](Request &r) { identified->BuildUserPassTokenRequest(user, password, DelegatedSpec(), r); }},
      {"spnego-initial", false, [=](Request &r) { plain->BuildInitialSPNegoRequest(PlainSpec(), leg, r); }},
      {"spnego-initial-signed", true, [=](Request &r) { identified->BuildInitialSPNegoRequest(PlainSpec(), leg, r); }},
      {"spnego-continued", false,
       [=](Request &r) { identified->BuildContinuedSPNegoRequest("urn:uuid:context", leg, r); }},
      {"certificate", true, [=](Request &r) { identified->BuildCertificateTokenRequest(PlainSpec(), r); }},
      {"certificate-delegated", true,
       [=](Request &r) { identified->BuildCertificateTokenRequest(DelegatedSpec(), r); }},
      {"exchange", true, [=](Request &r) { identified->BuildExchangeTokenRequest(*token, PlainSpec(), r); }},
      {"exchange-delegated", true,
       [=](Request &r) { identified->BuildExchangeTokenRequest(*token, DelegatedSpec(), r); }},
      {"validate", false, [=](Request &r) { plain->BuildValidateSubjectRequest(*token, r); }},
      {"renew", true, [=](Request &r) { identified->BuildRenewRequest(*token, 3600, r); }},
  };
}

} // namespace Testing
