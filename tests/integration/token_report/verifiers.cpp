// SPDX-License-Identifier: Apache-2.0

#include "verifiers.h"

#include "support/data_file.h"

namespace Reports {

using SsoClient::SamlToken;
using SsoClient::VerifyOptions;
using Tarvel::Crypto::CertificateList;
using Testing::JudgedVerifier;

namespace {

CertificateList KeysOfTheService() {
  CertificateList trusted;
  for (const char *const name : {"sts-rsa", "sts-rsa3072", "sts-rsa1024", "sts-ec256", "sts-ec384", "sts-ec521"}) {
    trusted.push_back(Certificate(name));
  }
  return trusted;
}

std::vector<CertificateList> TrustLists() {
  return {{},
          {Certificate("sts-rsa")},
          {Certificate("other"), nullptr, Certificate("sts-rsa"), Certificate("other")},
          KeysOfTheService()};
}

VerifyOptions WithTolerance(std::int64_t seconds) {
  VerifyOptions options;
  options.clockToleranceSec = seconds;
  return options;
}

VerifyOptions WithAudience(const std::string &audience, bool acceptUnrestricted) {
  VerifyOptions options;
  options.acceptedAudiences = {"https://one.example/", audience};
  options.acceptUnrestrictedAudience = acceptUnrestricted;
  return options;
}

VerifyOptions WithConfirmation(SamlToken::ConfirmationType confirmation) {
  VerifyOptions options;
  options.requiredConfirmation = confirmation;
  return options;
}

std::vector<VerifyOptions> Choices() {
  constexpr std::int64_t CENTURY_SEC = 3'155'760'000;
  return {VerifyOptions(),
          WithTolerance(0),
          WithTolerance(-CENTURY_SEC), // no token is valid that long
          WithTolerance(CENTURY_SEC),
          WithAudience("https://files.corp.example/", true),
          WithAudience("https://elsewhere.example/", true),
          WithAudience("https://files.corp.example/", false),
          WithConfirmation(SamlToken::BEARER),
          WithConfirmation(SamlToken::HOLDER_OF_KEY)};
}

/// The choices for the profile STRICT, and some with options that only the profile SAML2 checks.
std::vector<VerifyOptions> Saml2Choices() {
  std::vector<VerifyOptions> choices = Choices();
  VerifyOptions options;
  options.acceptedRecipients = {"https://elsewhere.example/", "https://files.corp.example/consume"};
  choices.push_back(options);
  options.expectedInResponseTo = "_request-1";
  options.senderAddress = "192.0.2.7";
  choices.push_back(options);
  options.expectedInResponseTo = "_request-2";
  options.requiredConfirmation = SamlToken::HOLDER_OF_KEY;
  choices.push_back(options);
  VerifyOptions otherRequest;
  otherRequest.expectedInResponseTo = "_request-2";
  choices.push_back(otherRequest);
  VerifyOptions otherSender;
  otherSender.senderAddress = "192.0.2.8";
  choices.push_back(otherSender);
  choices.push_back(WithAudience("urn:a", true)); // one of two restrictions, or both
  for (VerifyOptions &one : choices) {
    one.profile = SsoClient::TokenProfile::SAML2;
  }
  return choices;
}

} // namespace

Tarvel::Ref<const Tarvel::Crypto::Certificate> Certificate(const std::string &name) {
  return Tarvel::Crypto::CreateCertificateFromPem(Testing::ReadDataFile("tokens/" + name + ".crt"));
}

const std::vector<JudgedVerifier> &AllVerifiers() {
  static const std::vector<JudgedVerifier> all = [] {
    std::vector<JudgedVerifier> verifiers;
    for (const CertificateList &trusted : TrustLists()) {
      for (const VerifyOptions &options : Choices()) {
        verifiers.emplace_back(trusted, options);
      }
    }
    for (const VerifyOptions &options : Saml2Choices()) {
      verifiers.emplace_back(KeysOfTheService(), options);
    }
    return verifiers;
  }();
  return all;
}

const JudgedVerifier &UsualVerifier() {
  static const JudgedVerifier usual(KeysOfTheService(), VerifyOptions());
  return usual;
}

} // namespace Reports
