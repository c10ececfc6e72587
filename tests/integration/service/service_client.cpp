// SPDX-License-Identifier: Apache-2.0

#include "integration/service/service_client.h"

#include <ssoclient/create_saml_token.h>
#include <tarvel/system/date_time.h>

#include <utility>

namespace Testing {

namespace {

using SsoClient::PrincipalId;
using SsoClient::SamlToken;
using SsoClient::SecurityTokenServiceConfig;
using Tarvel::Ref;
using Tarvel::Ssl::SSLContext;

std::string Join(const std::vector<std::string> &texts, const char *separator) {
  std::string all;
  for (const std::string &text : texts) {
    all += (all.empty() ? "" : separator) + text;
  }
  return all;
}

std::string NameOf(const PrincipalId &principal) {
  return principal.name + "@" + principal.domain;
}

std::string AdviceOf(const SamlToken &token) {
  std::vector<SsoClient::Advice> advice;
  token.GetAdvice(advice);
  std::vector<std::string> entries;
  for (const SsoClient::Advice &entry : advice) {
    std::vector<std::string> attributes;
    for (const SsoClient::AdviceAttribute &attribute : entry.attributes) {
      attributes.push_back(attribute.name + "=" + Join(attribute.values, ","));
    }
    entries.push_back(entry.source + "{" + Join(attributes, ";") + "}");
  }
  return Join(entries, " ");
}

std::string ConfirmationOf(const SamlToken &token) {
  const Tarvel::Crypto::Certificate *const certificate = token.GetConfirmationCertificate();
  if (token.GetConfirmationMethod() == SamlToken::BEARER) {
    return certificate ? "bearer with a certificate" : "bearer";
  }
  for (const char *identity : {"client", "other-client"}) {
    if (certificate && certificate->GetSha256Thumbprint() == IdentityOf(identity).certificate->GetSha256Thumbprint()) {
      return identity;
    }
  }
  return certificate ? "holder-of-key of an unknown identity" : "holder-of-key without certificate";
}

/// The time of the last delegation, or the token's start if there was none.
std::int64_t LastInstantOf(const SamlToken &token) {
  std::vector<SsoClient::Delegate> chain;
  token.GetDelegationChain(chain);
  return (chain.empty() ? token.GetStartDate() : chain.back().delegationInstant).GetUtcTime();
}

} // namespace

DevSts &RunningService() {
  static DevSts service;
  return service;
}

Tarvel::Crypto::CertificateList TrustedSigners() {
  return {Tarvel::Crypto::CreateCertificateFromPem(RunningService().ReadStateFile("signing.crt"))};
}

SsoClient::HolderOfKeyConfig IdentityOf(const std::string &name) {
  return {Tarvel::Crypto::CreatePrivateKey(RunningService().ReadStateFile(name + ".key")),
          Tarvel::Crypto::CreateCertificateFromPem(RunningService().ReadStateFile(name + ".crt"))};
}

Ref<SSLContext> TrustingContext() {
  const Ref<SSLContext> context = Tarvel::Ssl::CreateSSLContext();
  context->TrustFile(RunningService().PathOf("authority.crt"));
  return context;
}

SecurityTokenServiceConfig ConfigFor(SSLContext &context, const std::string &identity, const std::string &url) {
  SecurityTokenServiceConfig config;
  config.stsUrl = url;
  config.sslContext = &context;
  config.signingCertificates = TrustedSigners();
  if (!identity.empty()) {
    config.holderOfKeyConfig = IdentityOf(identity);
  }
  return config;
}

ServiceClient::ServiceClient(const std::string &identity, const std::string &url)
    : m_context(TrustingContext()),
      m_service(SsoClient::CreateSecurityTokenService(ConfigFor(*m_context, identity, url))) {}

SsoClient::TokenSpec SpecWithEverything() {
  SsoClient::TokenSpec spec = SpecFor(7200);
  spec.audienceRestriction = {"https://b.example/", "https://a.example/"};
  spec.advice = {{"https://advice.example/", {{"colour", {"red", "green"}}, {"size", {"7"}}}},
                 {"urn:more", {{"no value", {}}}}};
  spec.renewable = true;
  spec.delegable = true;
  return spec;
}

ExpectedFields FieldsOfCertificate(const std::string &identity) {
  ExpectedFields fields;
  fields.subject = identity + "@corp.example";
  fields.confirmation = identity;
  fields.solution = true;
  fields.fullName = " ";
  fields.groups = {};
  return fields;
}

std::string Describe(const ExpectedFields &expected) {
  return "subject: " + expected.subject + "\nlifetime: " + std::to_string(expected.lifetimeSec * 1000000) +
         "\nconfirmation: " + expected.confirmation + "\nrenewable: " + std::to_string(expected.renewable) +
         "\ndelegable: " + std::to_string(expected.delegable) + "\nsolution: " + std::to_string(expected.solution) +
         "\nfull name: " + expected.fullName + "\ngroups: " + Join(expected.groups, " ") +
         "\ndelegation: " + Join(expected.delegation, " ") + "\naudience: " + Join(expected.audience, " ") +
         "\nadvice: " + expected.advice + "\n";
}

std::string DescribeFields(const SamlToken &token) {
  ExpectedFields fields;
  fields.subject = NameOf(token.GetSubject());
  fields.confirmation = ConfirmationOf(token);
  fields.renewable = token.IsRenewable();
  fields.delegable = token.IsDelegable();
  fields.solution = token.IsSolution();
  std::pair<std::string, std::string> fullName;
  token.GetFullName(fullName);
  fields.fullName = fullName.first + " " + fullName.second;
  std::vector<PrincipalId> groups;
  token.GetGroups(groups);
  fields.groups.clear();
  for (const PrincipalId &group : groups) {
    fields.groups.push_back(NameOf(group));
  }
  std::vector<SsoClient::Delegate> chain;
  token.GetDelegationChain(chain);
  for (const SsoClient::Delegate &delegate : chain) {
    fields.delegation.push_back(NameOf(delegate.subject));
  }
  std::set<std::string> audience;
  token.GetAudience(audience);
  fields.audience.assign(audience.begin(), audience.end());
  fields.advice = AdviceOf(token);
  const std::int64_t lifetime = token.GetEndDate().GetUtcTime() - token.GetStartDate().GetUtcTime();
  fields.lifetimeSec = lifetime % 1000000 == 0 ? lifetime / 1000000 : -1;
  return Describe(fields);
}

std::string Compare(const std::shared_ptr<const SamlToken> &token, const ExpectedFields &expected,
                    std::int64_t earliest) {
  if (!token) {
    return "no token";
  }
  const std::string fields = DescribeFields(*token);
  if (fields != Describe(expected)) {
    return "the token says\n" + fields + "instead of\n" + Describe(expected);
  }
  const std::string &id = token->GetId();
  if (id.size() < 2 || id[0] != '_' || token->ToXml().find(" ID=\"" + id + "\"") == std::string::npos) {
    return "the identifier is '" + id + "'";
  }
  const std::int64_t now = NowInMilliseconds();
  const auto isFresh = [&](std::int64_t instant) { return earliest <= instant && instant <= now; };
  if (!isFresh(token->GetStartDate().GetUtcTime()) || !isFresh(LastInstantOf(*token))) {
    return "the token begins, or was delegated, at another time: " + token->ToXml();
  }
  const auto again = SsoClient::CreateSamlToken(token->ToXml(), TrustedSigners());
  return DescribeFields(*again) == fields && again->GetId() == id ? "" : "its XML says something else";
}

std::int64_t NowInMilliseconds() {
  return Tarvel::System::GetUtcDateTime().GetUtcTime() / 1000 * 1000;
}

} // namespace Testing
