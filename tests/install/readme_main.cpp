// SPDX-License-Identifier: Apache-2.0
/// @file
/// Runs what the README shows: acquires a first token with the password in standard input, and admits its bearer.

#include <ssoclient/saml_token.h>

#include <exception>
#include <iostream>
#include <memory>
#include <string>

std::shared_ptr<const SsoClient::SamlToken> FirstToken(const std::string &password);
void Admit(const std::string &xml);

int main() {
  try {
    std::string password;
    std::getline(std::cin, password);
    Admit(FirstToken(password)->ToXml());
    return 0;
  } catch (const std::exception &error) {
    std::cerr << "failed: " << error.what() << '\n';
    return 1;
  }
}
