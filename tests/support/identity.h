// SPDX-License-Identifier: Apache-2.0
/// @file
/// The holder-of-key identity with which tests sign requests.

#pragma once

#include "support/data_file.h"

#include <ssoclient/holder_of_key_config.h>

namespace Testing {

/// The key and the certificate of the fixture tokens' holder.
inline SsoClient::HolderOfKeyConfig HolderIdentity() {
  return {Tarvel::Crypto::CreatePrivateKey(ReadDataFile("tokens/holder.key")),
          Tarvel::Crypto::CreateCertificateFromPem(ReadDataFile("tokens/holder.crt"))};
}

} // namespace Testing
