// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ssoclient verify`: accepts a token exactly as the library does, and tells what is in it.

#include "command.h"
#include "token_report.h"

#include <ssoclient/create_saml_token.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/system/date_time.h>
#include <tarvel/xml/parser.h>

#include <memory>

namespace SsoClient::Tool {
namespace {

struct VerifyOptions {
  std::vector<std::string> trustFiles;
  std::int64_t toleranceSec = DEFAULT_CLOCK_TOLERANCE_SEC;
  std::string file;
};

Tarvel::Crypto::CertificateList LoadTrusted(const std::vector<std::string> &files) {
  Tarvel::Crypto::CertificateList trusted;
  for (const std::string &file : files) {
    const Tarvel::Crypto::CertificateList some = Tarvel::Crypto::LoadCertificates(file);
    trusted.insert(trusted.end(), some.begin(), some.end());
  }
  return trusted;
}

void WarnOfDates(const Tarvel::Crypto::CertificateList &trusted) {
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
    Warn("the trusted certificate " + certificate->GetSubject() + " " + when + "; its key is trusted all the same");
  }
}

void Verify(const VerifyOptions &options, const OutputOptions &output) {
  const Tarvel::Crypto::CertificateList trusted = LoadTrusted(options.trustFiles);
  if (output.format == Format::TEXT || output.verbose) {
    WarnOfDates(trusted);
  }
  // One octet more than the parser takes, so that the parser is the one to refuse it.
  const std::string xml = ReadInput(options.file, Tarvel::Xml::MAX_DOCUMENT_BYTES + 1);
  WriteOutput(Render(ReportOf(*CreateSamlToken(xml, trusted, options.toleranceSec)), output.format));
}

} // namespace

Action DefineVerify(CLI::App &app, const OutputOptions &output) {
  const auto options = std::make_shared<VerifyOptions>();
  app.add_option("--trust", options->trustFiles,
                 "File with certificates of the service whose keys are trusted, PEM or DER; may be given again")
      ->required()
      ->allow_extra_args(false)
      ->type_name("CERT");
  app.add_option("--tolerance", options->toleranceSec, "How far this machine's clock may be off, in seconds")
      ->capture_default_str()
      ->type_name("S");
  app.add_option("FILE", options->file, "The token, an XML file; \"-\" is standard input")->required()->type_name("");
  return [options, &output] { Verify(*options, output); };
}

} // namespace SsoClient::Tool
