// SPDX-License-Identifier: Apache-2.0
/// @file
/// The rules of the profile SAML2 that differ from those of the profile STRICT: which confirmation is used, and how long.

#pragma once

#include "token/saml2_model.h"
#include "xml/deviation_sink.h"

#include <ssoclient/verify_options.h>
#include <tarvel/system/date_time.h>

namespace SsoClient {

/// Chooses the confirmation that is used: in document order, the first bearer confirmation that fits `options` and `now` or,
/// if none fits, the first holder-of-key confirmation that does. If `options` require a kind and the assertion has it,
/// only that kind is considered. Sets `details.usedConfirmation`, and the confirmation in `common.Subject`. If none fits,
/// the reason of the first known confirmation is reported.
void ChooseConfirmation(Saml2Assertion &assertion, const VerifyOptions &options, const Tarvel::System::DateTime &now,
                        DeviationSink &sink);

} // namespace SsoClient
