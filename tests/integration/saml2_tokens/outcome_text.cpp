// SPDX-License-Identifier: Apache-2.0

#include "outcome_text.h"

#include "support/data_file.h"
#include "support/exception_class.h"
#include "xml/date_time_text.h"

#include <ssoclient/token_details.h>

#include <set>

namespace Testing {

using namespace SsoClient;

VerifyOptions Saml2Options() {
  VerifyOptions options;
  options.profile = TokenProfile::SAML2;
  return options;
}

TokenVerifier VerifierWith(const VerifyOptions &options) {
  return TokenVerifier({Tarvel::Crypto::CreateCertificateFromPem(ReadDataFile("tokens/sts-rsa.crt"))}, options);
}

std::string OutcomeOf(const TokenVerifier &verifier, const std::string &xml) {
  try {
    return "accepted\t" + DescribeOutcome(*verifier.Verify(xml));
  } catch (const std::exception &failure) {
    return ClassOf(failure) + '\t' + failure.what();
  }
}

std::string DescribeOutcome(const SamlToken &token) {
  std::set<std::string> audience;
  token.GetAudience(audience);
  std::string text = '{' + token.GetSubject().name + "} {" + token.GetSubject().domain + "} " +
                     (token.GetConfirmationMethod() == SamlToken::BEARER ? "bearer" : "holder-of-key") + ' ' +
                     std::to_string(GetTokenDetails(token).usedConfirmation) + ' ' +
                     DateTimeFormatter(token.GetStartDate()) + ' ' + DateTimeFormatter(token.GetEndDate());
  for (const std::string &one : audience) {
    text += " {" + one + '}';
  }
  return text;
}

} // namespace Testing
