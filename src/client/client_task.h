// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ClientTask`, what one operation asks of the service.

#pragma once

#include "exchange/request.h"
#include "operation/operation_events.h"
#include "operation/token_steps.h"

#include <ssoclient/client/credential.h>
#include <ssoclient/saml_token.h>
#include <ssoclient/token_spec.h>

#include <cstdint>
#include <memory>
#include <variant>

namespace SsoClient {

/// Asks the service to issue a token.
struct Acquisition {
  Credential credential;
  TokenSpec spec;
};

/// Asks the service to renew a token.
struct Renewal {
  std::shared_ptr<const SamlToken> token; ///< null is refused when the operation runs
  std::int64_t lifetimeSec = 0;
};

/// Asks the service whether a token is valid.
struct Validation {
  std::shared_ptr<const SamlToken> token; ///< null is refused when the operation runs
};

/// Any of these tasks.
using ClientTask = std::variant<Acquisition, Renewal, Validation>;

/// How the messages of an operation are made and read.
enum class TaskKind : unsigned char { ISSUE, NEGOTIATE, RENEW, VALIDATE };

/// The kind of `task`.
TaskKind KindOf(const ClientTask &task) noexcept;

/// The name of the operation in the log and for observers: the name of the function of `SecurityTokenService`.
const char *NameOf(const ClientTask &task) noexcept;

/// Composes the only request of `task`, which is not a negotiation.
/// @throws Tarvel::InvalidArgumentException for a null token; what `TokenSteps` throws.
void ComposeRequest(const ClientTask &task, const TokenSteps &steps, Request &request, OperationEvents &events);

} // namespace SsoClient
