// SPDX-License-Identifier: Apache-2.0
/// @file
/// A program that is built only against the installed package: prints a token's subject, or why the token is refused.

#include <ssoclient/create_saml_token.h>
#include <ssoclient/exceptions.h>

#include <tarvel/crypto/certificate.h>

#include <exception>
#include <fstream>
#include <iostream>
#include <iterator>
#include <string>

namespace {

std::string ReadFile(const char *path) {
  std::ifstream stream(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(stream), std::istreambuf_iterator<char>()};
}

} // namespace

int main(int argc, char **argv) {
  if (argc != 3) {
    std::cerr << "usage: consumer CERTIFICATE TOKEN\n";
    return 2;
  }
  try {
    const auto trusted = Tarvel::Crypto::LoadCertificates(argv[1]);
    const auto token = SsoClient::CreateSamlToken(ReadFile(argv[2]), trusted);
    std::cout << token->GetSubject().name << '@' << token->GetSubject().domain << '\n';
    return 0;
  } catch (const SsoClient::InvalidTokenException &error) {
    std::cerr << "refused: " << error.what() << '\n';
    return 1;
  } catch (const std::exception &error) {
    std::cerr << "failed: " << error.what() << '\n';
    return 3;
  }
}
