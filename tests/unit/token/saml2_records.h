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

/// The time of the tests, 2026-01-02T03:04:05.006Z, and `second` seconds.
Tarvel::System::DateTime AtSecond(std::int64_t second);

/// A confirmation: what the rules use, and what the token states.
struct Confirmation {
  SsoClient::Saml2Confirmation record;
  SsoClient::ConfirmationDetails details;

  /// The same with a limit.
  Confirmation From(const Tarvel::System::DateTime &notBefore) const;
  Confirmation Until(const Tarvel::System::DateTime &notOnOrAfter) const;
};

/// Confirmations without limits. That of a holder of key has a certificate, and that of sender-vouches is not known.
Confirmation Bearer();
Confirmation HolderOfKey();
Confirmation SenderVouches();

/// An assertion with these confirmations, about `SUBJECT`, that is valid from an hour ago for two hours.
SsoClient::Saml2Assertion AssertionWith(const std::vector<Confirmation> &confirmations);

/// Replaces the confirmations. None of them is chosen.
void Put(SsoClient::Saml2Assertion &assertion, const std::vector<Confirmation> &confirmations);

/// A bearer assertion with these conditions.
SsoClient::Saml2Assertion ValidBetween(const Tarvel::System::DateTime &notBefore,
                                       const Tarvel::System::DateTime &notOnOrAfter);

/// A bearer assertion with these ends of sessions. Each statement that has none is `boost::none`.
SsoClient::Saml2Assertion WithSessions(const std::vector<boost::optional<Tarvel::System::DateTime>> &ends);

extern const SsoClient::NameId SUBJECT;
extern const SsoClient::NameId DELEGATE;

/// `nameId` with another value, format or qualifier.
std::vector<SsoClient::NameId> IdentifiersThatDifferFrom(const SsoClient::NameId &nameId);

/// A bearer assertion whose confirmation, which is chosen, is that of the party `confirming`, and with these delegates. If there
/// are none, there is no delegation restriction.
SsoClient::Saml2Assertion Delegated(const boost::optional<SsoClient::NameId> &confirming,
                                    const std::vector<SsoClient::NameId> &delegates);

} // namespace Testing
