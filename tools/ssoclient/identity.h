// SPDX-License-Identifier: Apache-2.0
/// @file
/// The key and certificate that sign a command's requests. Holder-of-key tokens are bound to that key.

#pragma once

#include "input_descriptor.h"
#include "signing_key.h"

#include <ssoclient/holder_of_key_config.h>

#include <boost/optional.hpp>

#include <string>

namespace CLI {
class App;
}

namespace SsoClient::Tool {

struct IdentityOptions : SigningKeyOptions {
  std::string certificateFile;

  bool IsGiven() const { return !certificateFile.empty() || !p12File.empty(); }
};

void AddIdentityOptions(CLI::App &app, IdentityOptions &options);

/// @throws UsageException for a passphrase without a key, or when another option reads the same descriptor.
void CheckIdentity(const IdentityOptions &options, InputClaims &claims);

/// The identity; `boost::none` when no option states one. The passphrase is read only if the key needs it.
/// @throws Tarvel::IOException, Tarvel::Crypto::CryptoException, and what `ReadSecret` throws
boost::optional<HolderOfKeyConfig> LoadIdentity(const IdentityOptions &options);

} // namespace SsoClient::Tool
