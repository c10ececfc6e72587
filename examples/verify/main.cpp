// SPDX-License-Identifier: Apache-2.0
/// @file
/// What a service does with a token that a caller shows it: verifies it, asks whether it is meant for this service, and
/// decides by its subject and groups.
///
/// As: verify sts.pem https://files.corp.example/ admins@corp.example <token.xml

#include <ssoclient/create_saml_token.h>
#include <ssoclient/principal_id.h>

#include <tarvel/core/exception.h>
#include <tarvel/crypto/certificate.h>

#include <algorithm>
#include <exception>
#include <iostream>
#include <iterator>
#include <memory>
#include <set>
#include <string>
#include <vector>

namespace {

enum ExitCode { ADMITTED = 0, REFUSED = 1, USAGE = 2, FAILED = 3 };

/// "admins@corp.example".
SsoClient::PrincipalId ParsePrincipal(const std::string &text) {
  const std::size_t at = text.rfind('@');
  return at == std::string::npos ? SsoClient::PrincipalId{text, ""}
                                 : SsoClient::PrincipalId{text.substr(0, at), text.substr(at + 1)};
}

/// A token may name whom it is for. To take one that is for somebody else would let them pose as its subject here.
bool IsForUs(const SsoClient::SamlToken &token, const std::string &audience) {
  std::set<std::string> audiences;
  token.GetAudience(audiences);
  return audiences.empty() || audiences.count(audience) > 0;
}

bool IsMember(const SsoClient::SamlToken &token, const SsoClient::PrincipalId &group) {
  std::vector<SsoClient::PrincipalId> groups;
  token.GetGroups(groups);
  return std::find(groups.begin(), groups.end(), group) != groups.end(); // without regard to letter case
}

/// Why the caller is refused; empty when the caller is admitted.
std::string Judge(const SsoClient::SamlToken &token, const std::string &audience, const SsoClient::PrincipalId &group) {
  if (!IsForUs(token, audience)) {
    return "the token is not for " + audience;
  }
  if (token.GetConfirmationMethod() != SsoClient::SamlToken::BEARER) {
    // Worth something only with proof of the key in GetConfirmationCertificate, which a caller gives by signing its
    // message, or in the TLS handshake. This program sees neither.
    return "the token is bound to a key, and the caller has not proved to hold it";
  }
  if (!IsMember(token, group)) {
    return token.GetSubject().name + " is not in " + group.name;
  }
  return "";
}

} // namespace

int main(int argc, char **argv) {
  if (argc != 4) {
    std::cerr << "usage: verify SIGNER-FILE OUR-AUDIENCE GROUP <TOKEN-FILE\n";
    return USAGE;
  }
  Tarvel::Crypto::CertificateList trusted;
  try {
    trusted = Tarvel::Crypto::LoadCertificates(argv[1]); // once, when the service starts
  } catch (const Tarvel::Exception &error) {
    std::cerr << "failed: " << error.what() << '\n';
    return FAILED;
  }

  const std::string xml{std::istreambuf_iterator<char>(std::cin), {}};
  try {
    // From here on for each request, on any number of threads at once.
    const std::shared_ptr<const SsoClient::SamlToken> token = SsoClient::CreateSamlToken(xml, trusted);
    const std::string refusal = Judge(*token, argv[2], ParsePrincipal(argv[3]));
    if (!refusal.empty()) {
      std::cerr << "refused: " << refusal << '\n';
      return REFUSED;
    }
    std::cout << "admitted " << token->GetSubject().name << " of " << token->GetSubject().domain << '\n';
    return ADMITTED;
  } catch (const std::exception &error) {
    // Not well-formed, not a token, expired, changed, or signed with a key that we do not trust. A caller is best told
    // no more than that it is refused; the reason is for our own log.
    std::cerr << "refused: " << error.what() << '\n';
    return REFUSED;
  }
}
