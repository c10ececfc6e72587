// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ParseKeyInfo`, which reads the key of a holder-of-key confirmation.

#pragma once

#include "xml/deviation_sink.h"
#include "xml/node_filter_iterator.h"

#include <ssoclient/token_details.h>

namespace SsoClient {

/// Reads the `ds:KeyInfo` at the cursor. The key is that of its first certificate or, if there is none, its first key
/// value (`RSAKeyValue`, or `ECKeyValue` with a named curve). If there are both, their keys must be the same, unless the key
/// value has a size or a curve that is not read. Everything else in a `ds:KeyInfo` is ignored.
///
/// If there is no key, or a key value of a size or a curve with which no signature is accepted, `details.publicKey` stays
/// empty. The key of a certificate may have any kind and size, as in the profile STRICT.
///
/// Returns whether there is a certificate or such a key value, even if it is refused. If so, the caller should not read
/// another `ds:KeyInfo`, because keys take long to read.
bool ParseKeyInfo(const NodeFilterIterator &iterator, ConfirmationDetails &details,
                  DeviationSink &sink = ThrowingSink());

} // namespace SsoClient
