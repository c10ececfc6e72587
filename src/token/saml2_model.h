// SPDX-License-Identifier: Apache-2.0
/// @file
/// `Saml2Assertion`, what the profile SAML2 reads of an assertion.

#pragma once

#include "token/assertion_model.h"

#include <ssoclient/saml_token.h>
#include <ssoclient/token_details.h>
#include <tarvel/xml/node.h>

#include <boost/optional.hpp>

#include <cstddef>
#include <vector>

namespace SsoClient {

/// How many elements of each of these kinds an assertion may have: `SubjectConfirmation`, `AuthnStatement`,
/// `AudienceRestriction`. Their records are large, so without a limit a small document could take much memory.
constexpr std::size_t MAX_REPEATED_ELEMENTS = 1000;

/// What belongs to the confirmation of the same index in `TokenDetails::confirmations`.
struct Saml2Confirmation {
  boost::optional<SamlToken::ConfirmationType> type; ///< empty for a method that is not known, which is never used
  const Tarvel::Xml::ElementNode *element = nullptr; ///< the `SubjectConfirmation`
  const Tarvel::Xml::ElementNode *nameId = nullptr;  ///< its `NameID`; null if there is none
  const Tarvel::Xml::ElementNode *data = nullptr;    ///< its `SubjectConfirmationData`; null if there is none
  const Tarvel::Xml::ElementNode *bearerKey =
      nullptr; ///< a `ds:KeyInfo` of a bearer confirmation, which contradicts its method
};

/// An assertion in the profile SAML2. It exists only while a token is made. Pointers are valid as long as the tree.
struct Saml2Assertion {
  /// What both profiles have. The parser fills it, but `ChooseConfirmation` sets the confirmation of the subject. Other
  /// differences: `AuthnStatement` stays empty; a missing `NotBefore` is the `IssueInstant`; the audiences of all
  /// restrictions are only in `details`; the qualifiers of delegates are only in their elements; `values` has only
  /// values that are texts.
  SamlAssertionType common;
  /// Everything else. `attributes` stays empty: `ReadAttributes` reads them again if a caller wants them, because most
  /// callers do not.
  TokenDetails details;
  std::vector<Saml2Confirmation> confirmations; ///< one for each of `details.confirmations`
};

} // namespace SsoClient
