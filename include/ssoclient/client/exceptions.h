// SPDX-License-Identifier: Apache-2.0
/// @file
/// The exceptions of operations that are cancelled or late.

#pragma once

#include <ssoclient/exceptions.h>

namespace SsoClient {

/// The operation was cancelled: by its token, or because its client or its token source was destroyed. The service may
/// have acted upon the request.
class SSOCLIENT_API CancelledException : public CommunicationException {
  TARVEL_EXCEPTION_BODY(CancelledException, CommunicationException);
};

/// The deadline passed before the operation ended. The service may have acted upon the request.
class SSOCLIENT_API DeadlineExceededException : public CommunicationException {
  TARVEL_EXCEPTION_BODY(DeadlineExceededException, CommunicationException);
};

} // namespace SsoClient
