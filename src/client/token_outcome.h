// SPDX-License-Identifier: Apache-2.0
/// @file
/// Turns the ending of an operation into the outcome that callbacks receive.

#pragma once

#include "client/client_operation.h"

#include <ssoclient/client/outcome.h>

#include <utility>

namespace SsoClient {

/// What `ending` means for an operation whose result is a token.
inline TokenOutcome ToTokenOutcome(OperationEnding &&ending) {
  return ending.failure ? TokenOutcome(std::move(ending.failure)) : TokenOutcome(std::move(ending.token));
}

/// What `ending` means for a validation.
inline ValidityOutcome ToValidityOutcome(OperationEnding &&ending) {
  return ending.failure ? ValidityOutcome(std::move(ending.failure)) : ValidityOutcome(ending.isValid);
}

/// Calls `callback` with the outcome.
inline ClientOperation::Completion CompletionOf(TokenCallback callback) {
  return [callback = std::move(callback)](OperationEnding &&ending) { callback(ToTokenOutcome(std::move(ending))); };
}

/// Calls `callback` with the outcome.
inline ClientOperation::Completion CompletionOf(ValidityCallback callback) {
  return [callback = std::move(callback)](OperationEnding &&ending) { callback(ToValidityOutcome(std::move(ending))); };
}

} // namespace SsoClient
