// SPDX-License-Identifier: Apache-2.0

#include "support/dialect_requests.h"

#include "exchange/request_builder_impl.h"
#include "support/identity.h"
#include "support/token_stand_in.h"

#include <memory>
#include <string>

namespace Testing {

namespace {

using SsoClient::Request;
using SsoClient::RequestBuilderImpl;
using SsoClient::ServiceDialect;
using SsoClient::TokenSpec;

const std::string USER = "alice@corp.example";
const std::string PASSWORD = "pass";
const std::vector<std::uint8_t> LEG = {0x60, 0x03, 0x06, 0x01, 0x2a};

ServiceDialect With(void (*change)(ServiceDialect &)) {
  ServiceDialect dialect;
  change(dialect);
  return dialect;
}

std::shared_ptr<RequestBuilderImpl> Identified(const ServiceDialect &dialect) {
  return std::make_shared<RequestBuilderImpl>(HolderIdentity(), dialect, SAMPLE_SERVICE);
}

SampleRequest ByPassword(const char *name, const ServiceDialect &dialect, const TokenSpec &spec) {
  const auto builder = std::make_shared<RequestBuilderImpl>(boost::none, dialect, SAMPLE_SERVICE);
  return {name, false, [=](Request &r) { builder->BuildUserPassTokenRequest(USER, PASSWORD, spec, r); }};
}

SampleRequest ByPasswordAndKey(const char *name, const ServiceDialect &dialect, const TokenSpec &spec) {
  const auto builder = Identified(dialect);
  const bool isSigned = !spec.delegateTo;
  return {name, isSigned, [=](Request &r) { builder->BuildUserPassTokenRequest(USER, PASSWORD, spec, r); }};
}

SampleRequest ByToken(const char *name, const ServiceDialect &dialect, const TokenSpec &spec) {
  const auto builder = Identified(dialect);
  const auto token = std::make_shared<TokenStandIn>("_0001", SampleTokenXml(), SsoClient::SamlToken::HOLDER_OF_KEY);
  return {name, true, [=](Request &r) { builder->BuildExchangeTokenRequest(*token, spec, r); }};
}

SampleRequest Renewal(const char *name, const ServiceDialect &dialect) {
  const auto builder = Identified(dialect);
  const auto token = std::make_shared<TokenStandIn>("_0001", SampleTokenXml(), SsoClient::SamlToken::HOLDER_OF_KEY);
  return {name, true, [=](Request &r) { builder->BuildRenewRequest(*token, 3600, r); }};
}

SampleRequest Validation(const char *name, const ServiceDialect &dialect) {
  const auto builder = Identified(dialect);
  const auto token = std::make_shared<TokenStandIn>("_0001", SampleTokenXml(), SsoClient::SamlToken::HOLDER_OF_KEY);
  return {name, false, [=](Request &r) { builder->BuildValidateSubjectRequest(*token, r); }};
}

SampleRequest FirstLeg(const char *name, const ServiceDialect &dialect) {
  const auto builder = Identified(dialect);
  return {name, true, [=](Request &r) { builder->BuildInitialSPNegoRequest(PlainSpec(), LEG, r); }};
}

SampleRequest LaterLeg(const char *name, const ServiceDialect &dialect) {
  const auto builder = Identified(dialect);
  return {name, false, [=](Request &r) { builder->BuildContinuedSPNegoRequest("urn:uuid:context", LEG, r); }};
}

} // namespace

const char *const SAMPLE_SERVICE = "https://sts.example:8443/sts?realm=a&kind=b";

ServiceDialect FullDialect() {
  ServiceDialect dialect;
  dialect.declaresCharset = true;
  dialect.appliesTo = std::string("https://service.example/path?a=1&b=2");
  dialect.addressing = true;
  dialect.delegatable = ServiceDialect::Statement::WHEN_TRUE;
  dialect.renewing = ServiceDialect::Statement::WHEN_TRUE;
  dialect.useKey = ServiceDialect::UseKey::CERTIFICATE;
  dialect.delegation = ServiceDialect::Delegation::ON_BEHALF_OF;
  dialect.tokenType = "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLV2.0";
  dialect.standardTokenTypeReference = true;
  dialect.credentialFaults = {{"urn:faults", "Denied"}};
  dialect.acceptsAnyResponse = true;
  return dialect;
}

std::vector<SampleRequest> DialectRequests() {
  using Statement = ServiceDialect::Statement;
  using UseKey = ServiceDialect::UseKey;
  using Delegation = ServiceDialect::Delegation;
  const ServiceDialect addressing = With([](ServiceDialect &d) { d.addressing = true; });
  const ServiceDialect certificate = With([](ServiceDialect &d) { d.useKey = UseKey::CERTIFICATE; });
  const ServiceDialect whenTrue = With([](ServiceDialect &d) { d.delegatable = d.renewing = Statement::WHEN_TRUE; });
  return {
      ByPassword("dialect-applies-to", With([](ServiceDialect &d) { d.appliesTo = std::string("urn:service"); }),
                 PlainSpec()),
      ByPassword("dialect-addressing", addressing, PlainSpec()),
      ByPasswordAndKey("dialect-addressing-signed", addressing, PlainSpec()),
      LaterLeg("dialect-addressing-spnego-continued", addressing),
      Validation("dialect-addressing-validate", addressing),
      ByPassword("dialect-when-true-not-asked-for", whenTrue, PlainSpec()),
      ByPassword("dialect-when-true-asked-for", whenTrue, FullSpec()),
      ByPassword("dialect-never-stated", With([](ServiceDialect &d) { d.delegatable = d.renewing = Statement::NEVER; }),
                 PlainSpec()),
      ByPasswordAndKey("dialect-use-key-certificate", certificate, PlainSpec()),
      ByPasswordAndKey("dialect-use-key-certificate-delegated", certificate, DelegatedSpec()),
      ByToken("dialect-use-key-certificate-exchange", certificate, PlainSpec()),
      ByPasswordAndKey("dialect-use-key-never", With([](ServiceDialect &d) { d.useKey = UseKey::NEVER; }), PlainSpec()),
      ByPassword("dialect-on-behalf-of", With([](ServiceDialect &d) { d.delegation = Delegation::ON_BEHALF_OF; }),
                 DelegatedSpec()),
      ByPassword("dialect-act-as", With([](ServiceDialect &d) { d.delegation = Delegation::ACT_AS; }), DelegatedSpec()),
      Renewal("dialect-token-type", With([](ServiceDialect &d) {
                d.tokenType = "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLV2.0";
              })),
      ByToken("dialect-token-type-reference", With([](ServiceDialect &d) { d.standardTokenTypeReference = true; }),
              PlainSpec()),
      ByToken("dialect-full-exchange", FullDialect(), DelegatedSpec()),
      FirstLeg("dialect-full-spnego-initial", FullDialect()),
      ByPasswordAndKey("dialect-cxf", SsoClient::GetServiceDialect("cxf"), PlainSpec()),
  };
}

std::vector<SampleRequest> SampleRequestsInAllDialects() {
  std::vector<SampleRequest> samples = SampleRequests();
  for (SampleRequest &sample : DialectRequests()) {
    samples.push_back(std::move(sample));
  }
  return samples;
}

} // namespace Testing
