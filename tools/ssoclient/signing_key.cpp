// SPDX-License-Identifier: Apache-2.0

#include "signing_key.h"

#include "exit_code.h"
#include "option.h"

namespace SsoClient::Tool {
namespace {

constexpr const char *GROUP = "Key";

} // namespace

void AddSigningKeyOptions(CLI::App &app, SigningKeyOptions &options) {
  const Option key = AddOption(app, "--key", options.key, "Private key of the token, a file or a key URI")
                         .TypeName("FILE")
                         .Group(GROUP);
  AddOption(app, "--p12", options.p12File, "PKCS#12 file with the private key of the token")
      .TypeName("FILE")
      .Group(GROUP)
      .Excludes(key);
  AddSecretOptions(app, options.passphrase, GROUP);
}

void CheckSigningKey(const SigningKeyOptions &options, InputClaims &claims) {
  if (options.passphrase.IsGiven() && !options.HasKey()) {
    throw UsageException("there is no key for the passphrase; give --key or --p12");
  }
  ClaimInput(options.passphrase, claims);
}

Tarvel::Ref<const Tarvel::Crypto::PrivateKey> LoadSigningKey(const SigningKeyOptions &options) {
  if (!options.p12File.empty()) {
    return Tarvel::Crypto::LoadKeyStore(options.p12File, AskForPassphrase(options.passphrase, options.p12File))
        .privateKey;
  }
  return Tarvel::Crypto::LoadPrivateKey(options.key, AskForPassphrase(options.passphrase, options.key));
}

Tarvel::Crypto::PassphraseCallback AskForPassphrase(const SecretOptions &options, const std::string &place) {
  return [&options, place] { return ReadSecret(options, "Passphrase for " + place + ": ").Get(); };
}

} // namespace SsoClient::Tool
