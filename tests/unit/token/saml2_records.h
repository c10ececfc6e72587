// SPDX-License-Identifier: Apache-2.0
/// @file
/// Assertions of the profile SAML2 as records, made of pieces, for tests of the rules after the parser.

#pragma once

#include "token/saml2_model.h"

#include <ssoclient/token_details.h>
#include <tarvel/system/date_time.h>

#include <boost/optional.hpp>

#include <cstdint>
#include <string>
#include <vector>

namespace Testing {

/// The time of the tests, 2026-01-02T03:04:05.006Z, plus `second` seconds.
Tarvel::System::DateTime AtSecond(std::int64_t second);

/// A confirmation: what the rules use, and what the token states.
struct Confirmation {
  SsoClient::Saml2Confirmation record;
  SsoClient::ConfirmationDetails details;

  /// The same confirmation with a start, or with an end.
  Confirmation From(const Tarvel::System::DateTime &notBefore) const;
  Confirmation Until(const Tarvel::System::DateTime &notOnOrAfter) const;
};

/// Confirmations without dates. `HolderOfKey` has a certificate, and the method of `SenderVouches` is always refused.
Confirmation Bearer();
Confirmation HolderOfKey();
Confirmation SenderVouches();

/// An assertion about `SUBJECT`, with these confirmations. It is valid for two hours, and one of them has passed.
SsoClient::Saml2Assertion AssertionWith(const std::vector<Confirmation> &confirmations);

/// Replaces the confirmations. None of them is chosen.
void Put(SsoClient::Saml2Assertion &assertion, const std::vector<Confirmation> &confirmations);

/// A bearer assertion with these conditions.
SsoClient::Saml2Assertion ValidBetween(const Tarvel::System::DateTime &notBefore,
                                       const Tarvel::System::DateTime &notOnOrAfter);

/// A bearer assertion with one statement for each end of a session; `boost::none` for a statement without an end.
SsoClient::Saml2Assertion WithSessions(const std::vector<boost::optional<Tarvel::System::DateTime>> &ends);

extern const SsoClient::NameId SUBJECT;
extern const SsoClient::NameId DELEGATE;

/// Copies of `nameId`, each with another value, format or qualifier.
std::vector<SsoClient::NameId> IdentifiersThatDifferFrom(const SsoClient::NameId &nameId);

/// A bearer assertion with these delegates; without any, it has no delegation restriction. Its confirmation has been
/// chosen, and states the party `confirming`.
SsoClient::Saml2Assertion Delegated(const boost::optional<SsoClient::NameId> &confirming,
                                    const std::vector<SsoClient::NameId> &delegates);

} // namespace Testing
