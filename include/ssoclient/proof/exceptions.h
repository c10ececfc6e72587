// SPDX-License-Identifier: Apache-2.0
/// @file
/// The exceptions of messages and requests that prove the possession of a token's key.

#pragma once

#include <ssoclient/exceptions.h>

namespace SsoClient {

/// A message or request that is not accepted: it does not have the form of a message with one token, or a part that
/// must be covered is missing, is there twice or is not covered. A token in it that is refused is reported by the
/// exception of `TokenVerifier::Verify` instead.
class SSOCLIENT_API InvalidMessageException : public SsoException {
  TARVEL_EXCEPTION_BODY(InvalidMessageException, SsoException);
};

/// The sender did not prove possession of the token's key: no signature was made with it, another key was used, or
/// something that the signature covers was changed.
class SSOCLIENT_API InvalidProofException : public InvalidMessageException {
  TARVEL_EXCEPTION_BODY(InvalidProofException, InvalidMessageException);
};

/// The message was created too long ago or in the future, or it has expired.
class SSOCLIENT_API StaleMessageException : public InvalidMessageException {
  TARVEL_EXCEPTION_BODY(StaleMessageException, InvalidMessageException);
};

/// The replay guard has received the same message before.
class SSOCLIENT_API RepeatedMessageException : public InvalidMessageException {
  TARVEL_EXCEPTION_BODY(RepeatedMessageException, InvalidMessageException);
};

/// The replay guard is full, cannot be reached or has thrown an exception, so the message is refused. This says nothing
/// about the message: the sender may try again later.
class SSOCLIENT_API ReplayGuardException : public SsoException {
  TARVEL_EXCEPTION_BODY(ReplayGuardException, SsoException);
};

} // namespace SsoClient
