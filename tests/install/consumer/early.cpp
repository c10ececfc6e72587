// SPDX-License-Identifier: Apache-2.0
/// @file
/// A program that is built against the installed package alone, with a static object that verifies a token before main: TOKEN
/// by CERTIFICATE, both of the environment. Prints who the token speaks for.

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
