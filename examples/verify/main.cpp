// SPDX-License-Identifier: Apache-2.0
/// @file
/// What a service does with a token that a caller presents: verifies it, checks that it is meant for this service, and
/// decides by its subject and groups.
///
/// Usage: verify sts.pem https://files.corp.example/ admins@corp.example <token.xml

#include <ssoclient/create_saml_token.h>
#include <ssoclient/exceptions.h>
#include <ssoclient/principal_id.h>

#include <tarvel/core/exception.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/xml/parser.h>

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

/// Reads a principal such as "admins@corp.example".
SsoClient::PrincipalId ParsePrincipal(const std::string &text) {
  const std::size_t at = text.rfind('@');
  return at == std::string::npos ? SsoClient::PrincipalId{text, ""}
                                 : SsoClient::PrincipalId{text.substr(0, at), text.substr(at + 1)};
}

/// A token may be restricted to audiences. If this service accepted a token that is meant for another service, that
/// service could act here as the token's subject.
bool IsForUs(const SsoClient::SamlToken &token, const std::string &audience) {
  std::set<std::string> audiences;
  token.GetAudience(audiences);
  return audiences.empty() || audiences.count(audience) > 0;
}

bool IsMember(const SsoClient::SamlToken &token, const SsoClient::PrincipalId &group) {
  std::vector<SsoClient::PrincipalId> groups;
  token.GetGroups(groups);
  return std::find(groups.begin(), groups.end(), group) != groups.end(); // ignores letter case
}

/// Why the caller is refused; empty when the caller is admitted.
std::string FindRefusal(const SsoClient::SamlToken &token, const std::string &audience,
                        const SsoClient::PrincipalId &group) {
  if (!IsForUs(token, audience)) {
    return "the token is not for " + audience;
  }
  if (token.GetConfirmationMethod() != SsoClient::SamlToken::BEARER) {
    // Such a token counts only with a proof of the key in GetConfirmationCertificate: the caller signs its message or
    // authenticates by TLS with that key. This program sees neither.
    return "the token is bound to a key, and the caller has not proved that it has the key";
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
    // A service does this for each request, on any number of threads at once.
    const std::shared_ptr<const SsoClient::SamlToken> token = SsoClient::CreateSamlToken(xml, trusted);
    const std::string refusal = FindRefusal(*token, argv[2], ParsePrincipal(argv[3]));
    if (!refusal.empty()) {
      std::cerr << "refused: " << refusal << '\n';
      return REFUSED;
    }
    std::cout << "admitted " << token->GetSubject().name << " of " << token->GetSubject().domain << '\n';
    return ADMITTED;
  } catch (const SsoClient::InvalidSignatureException &error) {
    std::cerr << "refused: " << error.what() << '\n'; // changed, or signed with a key that is not trusted
  } catch (const SsoClient::ParseException &error) {
    std::cerr << "refused: " << error.what() << '\n'; // not a token, expired, or not valid yet
  } catch (const Tarvel::Xml::XMLParseException &error) {
    std::cerr << "refused: " << error.what() << '\n'; // not well-formed XML
  } catch (const std::exception &error) {
    std::cerr << "failed: " << error.what() << '\n'; // not a verdict: out of memory, or the process is about to end
    return FAILED;
  }
  return REFUSED; // Say no more than this to the caller: the reason is for your own log.
}
