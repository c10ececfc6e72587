// SPDX-License-Identifier: Apache-2.0

#include "identity.h"

#include "exit_code.h"
#include "option.h"

#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>

namespace SsoClient::Tool {
namespace {

namespace Crypto = Tarvel::Crypto;

constexpr const char *GROUP = "Identity";

HolderOfKeyConfig LoadStore(const IdentityOptions &options) {
  const Crypto::KeyStore store =
      Crypto::LoadKeyStore(options.p12File, AskForPassphrase(options.passphrase, options.p12File));
  return {store.privateKey, store.certificate};
}

HolderOfKeyConfig LoadPair(const IdentityOptions &options) {
  // A file with a chain begins with the certificate of the key.
  const auto certificate = Crypto::LoadCertificates(options.certificateFile).front();
  return {LoadSigningKey(options), certificate};
}

} // namespace

void AddIdentityOptions(CLI::App &app, IdentityOptions &options) {
  const Option certificate =
      AddOption(app, "--cert", options.certificateFile, "Certificate of the key, PEM or DER; of a chain, the first")
          .TypeName("FILE")
          .Group(GROUP);
  const Option key = AddOption(app, "--key", options.key, "Private key that signs requests, a file or a key URI")
                         .TypeName("FILE")
                         .Group(GROUP);
  const Option p12 =
      AddOption(app, "--p12", options.p12File, "Key and certificate in one PKCS#12 file").TypeName("FILE").Group(GROUP);
  certificate.Needs(key).Excludes(p12);
  key.Needs(certificate).Excludes(p12);
  AddSecretOptions(app, options.passphrase, GROUP);
}

void CheckIdentity(const IdentityOptions &options, InputClaims &claims) {
  if (options.passphrase.IsGiven() && !options.IsGiven()) {
    throw UsageException("there is no key for the passphrase; give --cert and --key, or --p12");
  }
  ClaimInput(options.passphrase, claims);
}

boost::optional<HolderOfKeyConfig> LoadIdentity(const IdentityOptions &options) {
  if (!options.IsGiven()) {
    return boost::none;
  }
  const HolderOfKeyConfig identity = options.p12File.empty() ? LoadPair(options) : LoadStore(options);
  if (identity.privateKey->GetAlgorithm() != "RSA") {
    throw Crypto::CryptoException((options.p12File.empty() ? options.key : options.p12File) +
                                  ": only an RSA key signs requests, and this is " +
                                  identity.privateKey->GetAlgorithm());
  }
  Crypto::RequireKeyMatchesCertificate(*identity.privateKey, *identity.certificate);
  return identity;
}

} // namespace SsoClient::Tool
