// SPDX-License-Identifier: Apache-2.0
/// @file
/// The private key that a command signs with, and the passphrase for it.

#pragma once

#include "input_descriptor.h"
#include "secret_input.h"

#include <tarvel/crypto/private_key.h>

#include <string>

namespace CLI {
class App;
}

namespace SsoClient::Tool {

struct SigningKeyOptions {
  std::string key; ///< a file or a key URI
  std::string p12File;
  SecretOptions passphrase{"passphrase", {}, -1};

  bool HasKey() const { return !key.empty() || !p12File.empty(); }
};

void AddSigningKeyOptions(CLI::App &app, SigningKeyOptions &options);

/// @throws UsageException for a passphrase without a key, or when another option reads the same descriptor.
void CheckSigningKey(const SigningKeyOptions &options, InputClaims &claims);

/// The key; at least one option states one. The passphrase is read only if the key needs it.
/// @throws Tarvel::IOException, Tarvel::Crypto::CryptoException, and what `ReadSecret` throws
Tarvel::Ref<const Tarvel::Crypto::PrivateKey> LoadSigningKey(const SigningKeyOptions &options);

/// Reads the passphrase for the key in `place` from the source that `options` choose. `options` outlive it.
Tarvel::Crypto::PassphraseCallback AskForPassphrase(const SecretOptions &options, const std::string &place);

} // namespace SsoClient::Tool
