// SPDX-License-Identifier: Apache-2.0
/// @file
/// A program that is built only against the installed package. A static object verifies a token before main: the
/// environment variable TOKEN is the token's file, CERTIFICATE the trusted certificate. Prints the token's subject.

#include <ssoclient/create_saml_token.h>

#include <tarvel/crypto/certificate.h>

#include <cstdio>
#include <cstdlib>
#include <exception>
#include <fstream>
#include <iterator>
#include <string>

namespace {

std::string VerifyFromEnvironment() {
  try {
    std::ifstream stream(std::getenv("TOKEN"), std::ios::binary);
    const std::string text{std::istreambuf_iterator<char>(stream), std::istreambuf_iterator<char>()};
    const auto trusted = Tarvel::Crypto::LoadCertificates(std::getenv("CERTIFICATE"));
    const auto token = SsoClient::CreateSamlToken(text, trusted);
    return token->GetSubject().name + '@' + token->GetSubject().domain;
  } catch (const std::exception &error) {
    return std::string("failed: ") + error.what();
  }
}

const std::string SUBJECT = VerifyFromEnvironment();

} // namespace

int main() {
  std::puts(SUBJECT.c_str());
}
