// SPDX-License-Identifier: Apache-2.0
/// @file
/// Runs what the README shows: acquires a first token with the password from standard input and admits its bearer. Then
/// does the same with a token of a source.

#include <ssoclient/client/token_source.h>
#include <ssoclient/saml_token.h>
#include <tarvel/core/secret_text.h>

#include <exception>
#include <functional>
#include <iostream>
#include <memory>
#include <string>
#include <utility>

std::shared_ptr<const SsoClient::SamlToken> FirstToken(const Tarvel::SecretText &password);
std::shared_ptr<const SsoClient::TokenSource> FreshTokens(std::function<Tarvel::SecretText()> readPassword);
std::string Authorization(const SsoClient::TokenSource &tokens);
void Admit(const std::string &xml);

int main() {
  try {
    std::string password;
    std::getline(std::cin, password);
    const Tarvel::SecretText secret(std::move(password));
    const auto token = FirstToken(secret);
    if (!token) {
      return 1;
    }
    Admit(token->ToXml());
    const auto tokens = FreshTokens([secret] { return secret; });
    const std::string first = Authorization(*tokens);
    if (first != Authorization(*tokens)) {
      std::cerr << "the second token is another one\n";
      return 1;
    }
    Admit(first);
    return 0;
  } catch (const std::exception &error) {
    std::cerr << "not handled: " << error.what() << '\n';
    return 2;
  }
}
