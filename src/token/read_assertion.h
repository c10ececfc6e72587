// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ReadAssertion`, the parts of an assertion that could be read.

#pragma once

#include "token/assertion_model.h"

#include <ssoclient/token_report.h>

namespace SsoClient {

/// What a parser could read of an assertion. If the assertion has the accepted form, that is everything.
struct ReadAssertion {
  /// Marks the dates of `record` as not read. A parser must fill the record later. The record must outlive this object.
  explicit ReadAssertion(SamlAssertionType &record);

  /// Whether this date of `assertion` could be read.
  bool HasDate(const Tarvel::System::DateTime &date) const noexcept;

  /// Whether this name could be read. Its content may still be malformed.
  bool HasName(const NameIDType &name) const noexcept { return isFormAccepted || !name.value.empty(); }

  bool HasConditions() const noexcept { return isFormAccepted || assertion.Conditions.element; }

  /// Whether the method of the confirmation could be read and is known.
  bool HasMethod() const noexcept { return isFormAccepted || assertion.Subject.SubjectConfirmation.isMethodKnown; }

  /// Removes the delegates that could not be read.
  void RemoveUnreadDelegates();

  SamlAssertionType &assertion;
  bool isFormAccepted = false;
};

/// Sets the claims that need no `TokenFacts`. `read` must have an assertion.
void SetClaims(const ReadAssertion &read, UnverifiedClaims &claims);

} // namespace SsoClient
