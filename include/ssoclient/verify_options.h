// SPDX-License-Identifier: Apache-2.0
/// @file
/// `VerifyOptions`, what a relying party requires of a token in addition to a valid signature.

#pragma once

#include <ssoclient/saml_token.h>

#include <boost/optional.hpp>

#include <cstdint>
#include <set>
#include <string>

namespace SsoClient {

/// The default clock tolerance, in seconds.
constexpr std::int64_t DEFAULT_CLOCK_TOLERANCE_SEC = 600;

/// The form of assertion that is accepted.
enum class TokenProfile : std::int32_t {
  STRICT = 0, ///< the form that the token service issues: its elements and attributes in their order, and no others

  /// What SAML 2.0 core lets an issuer of authentication and attribute assertions write. Reads all that STRICT reads.
  ///
  /// An identifier that is not of the form `name@domain` becomes a principal whose domain begins with "nameid:" and
  /// states the format and the qualifiers; `docs/interoperate.md` has the table. Where a format is case-sensitive, such as
  /// persistent and transient, compare `GetNameId`: `PrincipalId` ignores letter case.
  ///
  /// A token is valid while its conditions hold, the confirmation that is used can be used, and no session in it has ended.
  SAML2
};

/// What is checked of a token, in addition to its form, its consistency and its signature. The defaults are those of
/// `CreateSamlToken`.
struct VerifyOptions {
  /// The form that a token must have.
  TokenProfile profile = TokenProfile::STRICT;

  /// How far this machine's clock may be wrong, in seconds. A negative tolerance shortens the time in which a token is
  /// accepted.
  std::int64_t clockToleranceSec = DEFAULT_CLOCK_TOLERANCE_SEC;

  /// The audiences to which this program belongs, compared byte for byte. A token that is restricted to other audiences
  /// only is refused. If the set is empty, the audience of a token is not checked.
  std::set<std::string> acceptedAudiences;

  /// Whether a token without a restriction to audiences is accepted. Only used if `acceptedAudiences` is not empty.
  bool acceptUnrestrictedAudience = true;

  /// The confirmation that a token must have; `boost::none` accepts bearer and holder-of-key tokens. With the profile
  /// SAML2, a token may have several confirmations. Only those of the required kind are then used.
  boost::optional<SamlToken::ConfirmationType> requiredConfirmation;

  /// The addresses of this program (`Recipient`), compared byte for byte. If the set is not empty, a bearer confirmation is
  /// used only if it names one of them, and a holder-of-key confirmation only if it does not name another; if it is empty, a
  /// recipient is not checked. Only for the profile SAML2.
  std::set<std::string> acceptedRecipients;

  /// The identifier of the request that the token must answer (`InResponseTo`). If set, a bearer confirmation is used
  /// only if it states exactly this identifier, and a holder-of-key confirmation only if it does not state another; if not
  /// set, what it states is not checked. Only for the profile SAML2.
  boost::optional<std::string> expectedInResponseTo;

  /// The network address of the token's sender. If set, a confirmation that states another `Address` is not used; if
  /// not, the address is not checked. Only for the profile SAML2.
  boost::optional<std::string> senderAddress;
};

} // namespace SsoClient
