// SPDX-License-Identifier: Apache-2.0
/// @file
/// `CheckTokenSource`, which checks the arguments of a token source.

#pragma once

#include <ssoclient/client/token_source.h>

namespace SsoClient {

/// Checks the arguments of the constructor of `TokenSource`.
/// @throws Tarvel::InvalidArgumentException for the first one that is not valid
void CheckTokenSource(bool hasClient, const CredentialProvider &provider, const TokenSpec &spec,
                      const TokenSourceOptions &options);

} // namespace SsoClient
