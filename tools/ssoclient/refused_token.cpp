// SPDX-License-Identifier: Apache-2.0

#include "refused_token.h"

#include "atomic_file.h"
#include "profile.h"

#include <tarvel/core/exception.h>

namespace SsoClient::Tool {

RefusedToken::RefusedToken(const TokenOutputOptions &options, const Tarvel::Crypto::CertificateList &trusted,
                           const VerifyOptions &verifyOptions, const OutputOptions &output)
    : m_options(options), m_trusted(trusted), m_verifyOptions(verifyOptions), m_output(output) {}

ServiceOptions::RefusedTokenSink RefusedToken::GetSink() {
  return [this](const std::string &xml) { Keep(xml); };
}

void RefusedToken::Keep(const std::string &xml) {
  const std::string otherProfile = OtherProfileHint(xml, m_trusted, m_verifyOptions);
  m_hint = (otherProfile.empty() ? "" : otherProfile + "; ") + Save(xml);
}

std::string RefusedToken::Save(const std::string &xml) {
  const std::string &file = m_options.refusedFile;
  if (file.empty()) {
    return "--save-refused FILE keeps the refused token; ssoclient verify --explain then shows each check of it";
  }
  try {
    WriteFileWhole(file, xml + "\n", m_options.replace);
  } catch (const Tarvel::IOException &failure) {
    std::string warning = std::string("the refused token could not be saved: ") + failure.what();
    Warn(warning, m_output);
    return warning;
  }
  const std::string place = "the refused token is in " + file + ", which is secret: it may be valid elsewhere";
  Note(place, m_output);
  return place + "; ssoclient verify --explain shows each check of it";
}

} // namespace SsoClient::Tool
