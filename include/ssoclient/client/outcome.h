// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Outcome`, the end of an asynchronous operation: its result, or the exception that ended it.

#pragma once

#include <ssoclient/saml_token.h>

#include <boost/optional.hpp>

#include <exception>
#include <functional>
#include <memory>
#include <utility>

namespace SsoClient {

/// A result, or an exception in its own class. A value: copies share the exception. Any number of threads may read it.
template <typename Value>
class Outcome {
public:
  /// A success. Implicit, so that a result can be passed as an outcome.
  Outcome(Value value) : m_value(std::move(value)) {}

  /// A failure.
  /// @param exception not null
  Outcome(std::exception_ptr exception) noexcept : m_exception(std::move(exception)) {}

  /// Whether there is a result.
  bool HasValue() const noexcept { return m_value.has_value(); }

  /// The result.
  /// @throws the exception of a failure, in its own class.
  const Value &Get() const {
    if (!m_value) {
      std::rethrow_exception(m_exception);
    }
    return *m_value;
  }

  /// The exception of a failure; null for a success.
  const std::exception_ptr &GetException() const noexcept { return m_exception; }

private:
  boost::optional<Value> m_value;
  std::exception_ptr m_exception;
};

/// How an operation that returns a token ended. The token is never null.
using TokenOutcome = Outcome<std::shared_ptr<const SamlToken>>;

/// How a validation ended: whether the token is valid, or why this is not known.
using ValidityOutcome = Outcome<bool>;

/// Called once with the outcome of an operation.
using TokenCallback = std::function<void(const TokenOutcome &outcome)>;

/// Called once with the outcome of a validation.
using ValidityCallback = std::function<void(const ValidityOutcome &outcome)>;

} // namespace SsoClient
