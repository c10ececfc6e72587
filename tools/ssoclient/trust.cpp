// SPDX-License-Identifier: Apache-2.0

#include "trust.h"

#include "exit_code.h"

#include <ssoclient/exceptions.h>
#include <ssoclient/token_verifier.h>
#include <tarvel/system/date_time.h>
#include <tarvel/xml/parser.h>

namespace SsoClient::Tool {
namespace {

constexpr const char *HINT_SEPARATOR = "; ";
constexpr const char *EXPLAIN_HINT = "ssoclient verify --explain shows each check of the token, and what to do";

void WarnOfDates(const Tarvel::Crypto::CertificateList &trusted, const OutputOptions &output) {
  const Tarvel::System::DateTime now = Tarvel::System::GetUtcDateTime();
  for (const auto &certificate : trusted) {
    std::string when;
    if (now < certificate->GetNotBefore()) {
      when = "is not valid before " + certificate->GetNotBefore().ToString();
    } else if (certificate->GetNotAfter() < now) {
      when = "is not valid after " + certificate->GetNotAfter().ToString();
    } else {
      continue;
    }
    Warn("the trusted certificate " + certificate->GetSubject() + " " + when + "; its key is trusted all the same",
         output);
  }
}

/// What to do about a token that is refused.
std::string HintFor(const std::string &xml, const Tarvel::Crypto::CertificateList &trusted,
                    const VerifyOptions &options) {
  const std::string otherProfile = OtherProfileHint(xml, trusted, options);
  return otherProfile.empty() ? EXPLAIN_HINT : otherProfile + HINT_SEPARATOR + EXPLAIN_HINT;
}

} // namespace

void AddTrustOptions(CLI::App &app, TrustOptions &options) {
  AddTrustOption(app, options, "File of the service's certificates whose keys are trusted, PEM or DER; may be repeated")
      .Required();
  AddTokenFormOptions(app, options);
}

Option AddTrustOption(CLI::App &app, TrustOptions &options, const std::string &help) {
  return AddOption(app, "--trust", options.files, help).TypeName("CERT");
}

void AddTokenFormOptions(CLI::App &app, TrustOptions &options) {
  AddOption(app, "--tolerance", options.toleranceSec, "By how many seconds this machine's clock may be wrong")
      .ShowDefault()
      .TypeName("S");
  AddProfileOption(app, options.profile);
}

VerifyOptions VerifyOptionsOf(const TrustOptions &options) {
  VerifyOptions verifyOptions;
  verifyOptions.clockToleranceSec = options.toleranceSec;
  verifyOptions.profile = ProfileOf(options.profile);
  return verifyOptions;
}

void AddTokenArgument(CLI::App &app, std::string &file) {
  AddOption(app, "FILE", file, "The token, an XML file; \"-\" is standard input").Required().TypeName("");
}

Tarvel::Crypto::CertificateList LoadTrusted(const TrustOptions &options, const OutputOptions &output) {
  Tarvel::Crypto::CertificateList trusted;
  for (const std::string &file : options.files) {
    const Tarvel::Crypto::CertificateList some = Tarvel::Crypto::LoadCertificates(file);
    trusted.insert(trusted.end(), some.begin(), some.end());
  }
  WarnOfDates(trusted, output);
  return trusted;
}

std::string ReadTokenText(const std::string &file) {
  // One octet more than the parser accepts, so that the parser refuses what is too long.
  return ReadInput(file, Tarvel::Xml::MAX_DOCUMENT_BYTES + 1);
}

std::shared_ptr<const SamlToken> ReadToken(const std::string &file, const Tarvel::Crypto::CertificateList &trusted,
                                           const VerifyOptions &options) {
  return VerifyToken(ReadTokenText(file), trusted, options);
}

std::shared_ptr<const SamlToken> VerifyToken(const std::string &xml, const Tarvel::Crypto::CertificateList &trusted,
                                             const VerifyOptions &options) {
  try {
    return TokenVerifier(trusted, options).Verify(xml);
  } catch (const InvalidTokenException &refusal) {
    throw HintedException(refusal, HintFor(xml, trusted, options));
  } catch (const Tarvel::Xml::XMLParseException &refusal) {
    throw HintedException(refusal, HintFor(xml, trusted, options));
  }
}

void RequireWithinTolerance(const SamlToken &token, const Tarvel::Crypto::CertificateList &trusted,
                            const VerifyOptions &options, const ServiceOptions::RefusedTokenSink &sink) {
  if (options.clockToleranceSec >= DEFAULT_CLOCK_TOLERANCE_SEC) {
    return;
  }
  try {
    TokenVerifier(trusted, options).Verify(token.ToXml());
  } catch (const InvalidTokenException &) {
    sink(token.ToXml());
    throw;
  }
}

} // namespace SsoClient::Tool
