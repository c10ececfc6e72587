// SPDX-License-Identifier: Apache-2.0
/// @file
/// Turns the ending of an operation into the outcome that callbacks receive.

#pragma once

#include "client/client_operation.h"

#include <ssoclient/client/outcome.h>

#include <utility>

namespace SsoClient {

/// What `ending` means for an operation whose result is a token.
inline TokenOutcome ToTokenOutcome(const OperationEnding &ending) {
  return ending.failure ? TokenOutcome(ending.failure) : TokenOutcome(ending.token);
}

/// What `ending` means for a validation.
inline ValidityOutcome ToValidityOutcome(const OperationEnding &ending) {
  return ending.failure ? ValidityOutcome(ending.failure) : ValidityOutcome(ending.isValid);
}

/// Calls `callback` with the outcome.
inline ClientOperation::Completion CompletionOf(TokenCallback callback) {
  return [callback = std::move(callback)](const OperationEnding &ending) { callback(ToTokenOutcome(ending)); };
}

/// Calls `callback` with the outcome.
inline ClientOperation::Completion CompletionOf(ValidityCallback callback) {
  return [callback = std::move(callback)](const OperationEnding &ending) { callback(ToValidityOutcome(ending)); };
}

} // namespace SsoClient
