// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Delegate`, one step of a token's delegation chain.

#pragma once

#include <ssoclient/principal_id.h>
#include <tarvel/system/date_time.h>

namespace SsoClient {

/// One entry of a delegation chain.
struct Delegate {
  PrincipalId subject;                        ///< the principal to which the token was delegated
  Tarvel::System::DateTime delegationInstant; ///< when the delegation took place
};

} // namespace SsoClient
