// SPDX-License-Identifier: Apache-2.0
/// @file
/// Runs what the README shows: acquires a first token with the password from standard input, and admits its bearer.

#include <ssoclient/saml_token.h>
#include <tarvel/core/secret_text.h>

#include <exception>
#include <iostream>
#include <memory>
#include <string>
#include <utility>

std::shared_ptr<const SsoClient::SamlToken> FirstToken(const Tarvel::SecretText &password);
void Admit(const std::string &xml);

int main() {
  try {
    std::string password;
    std::getline(std::cin, password);
    const auto token = FirstToken(Tarvel::SecretText(std::move(password)));
    if (!token) {
      return 1;
    }
    Admit(token->ToXml());
    return 0;
  } catch (const std::exception &error) {
    std::cerr << "not handled: " << error.what() << '\n';
    return 2;
  }
}
