// SPDX-License-Identifier: Apache-2.0

#include "refused_token.h"

#include "atomic_file.h"
#include "profile.h"

#include <tarvel/core/exception.h>

#include <mutex>
#include <utility>

namespace SsoClient::Tool {

class RefusedToken::Keeper {
public:
  Keeper(TokenOutputOptions options, Tarvel::Crypto::CertificateList trusted, VerifyOptions verifyOptions,
         const OutputOptions &output)
      : m_options(std::move(options)), m_trusted(std::move(trusted)), m_verifyOptions(std::move(verifyOptions)),
        m_output(output) {}

  void Keep(const std::string &xml) {
    const std::string otherProfile = OtherProfileHint(xml, m_trusted, m_verifyOptions);
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_hint = (otherProfile.empty() ? "" : otherProfile + "; ") + Save(xml);
  }

  std::string GetHint() const {
    const std::lock_guard<std::mutex> lock(m_mutex);
    return m_hint;
  }

private:
  /// Saves the token, and returns a hint: where the token is, and what to do next.
  std::string Save(const std::string &xml) const {
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

  const TokenOutputOptions m_options;
  const Tarvel::Crypto::CertificateList m_trusted;
  const VerifyOptions m_verifyOptions;
  const OutputOptions m_output;
  mutable std::mutex m_mutex;
  std::string m_hint; // empty: no token was refused
};

RefusedToken::RefusedToken(const TokenOutputOptions &options, const Tarvel::Crypto::CertificateList &trusted,
                           const VerifyOptions &verifyOptions, const OutputOptions &output)
    : m_keeper(std::make_shared<Keeper>(options, trusted, verifyOptions, output)) {}

ServiceOptions::RefusedTokenSink RefusedToken::GetSink() const {
  return [keeper = m_keeper](const std::string &xml) { keeper->Keep(xml); };
}

std::string RefusedToken::GetHint() const {
  return m_keeper->GetHint();
}

} // namespace SsoClient::Tool
