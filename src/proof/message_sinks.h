// SPDX-License-Identifier: Apache-2.0
/// @file
/// `MessageSinks`, which receive each deviation of a message from what is accepted.

#pragma once

#include "xml/deviation_sink.h"

namespace SsoClient {

/// One sink for each exception with which a message is refused. Verification and reports run the same rules: the sinks
/// of a verification throw at the first deviation, and those of a report are all the same sink, which keeps it.
struct MessageSinks {
  DeviationSink &form;  ///< throws `InvalidMessageException`
  DeviationSink &proof; ///< throws `InvalidProofException`
  DeviationSink &time;  ///< throws `StaleMessageException`
};

/// The sinks of verifications. They have no state, so all threads may use them.
const MessageSinks &ThrowingMessageSinks() noexcept;

} // namespace SsoClient
