// SPDX-License-Identifier: Apache-2.0
/// @file
/// Readers of the conditions under which a token is valid.
///
/// A `TryParse` function returns whether its element was at the cursor. If not, the cursor and the record stay
/// unchanged. `ParseDelegate` returns whether it found its element. If not, it has skipped another node.

#pragma once

#include "model/namespaces.h"
#include "token/assertion_model.h"
#include "xml/deviation_sink.h"
#include "xml/node_filter_iterator.h"
#include "xml/qualified_name.h"

#include <boost/optional.hpp>

namespace SsoClient {

/// The types of `saml:Condition` that are read.
constexpr QNameView DELEGATION_RESTRICTION_TYPE(Namespaces::DELEGATION, "DelegationRestrictionType");
constexpr QNameView RENEW_RESTRICTION_TYPE(Namespaces::RSA_SAML2, "RenewRestrictionType");

/// Reads a `saml:Conditions`: restrictions in any order, each kind at most once.
void ParseConditionsElement(NodeFilterIterator &iterator, ConditionsType &conditions,
                            DeviationSink &sink = ThrowingSink());

/// Reads a `Delegate` of the delegation restriction.
bool ParseDelegate(NodeFilterIterator &iterator, DelegateType &delegate, DeviationSink &sink = ThrowingSink());

/// A function with the contract of `ParseDelegate`.
using DelegateParser = bool (*)(NodeFilterIterator &iterator, DelegateType &delegate, DeviationSink &sink);

/// Reads a `saml:Condition` of the type DelegationRestrictionType, and each delegate with `parseDelegate`.
bool TryParseDelegationRestriction(NodeFilterIterator &iterator,
                                   boost::optional<DelegationRestrictionType> &restriction,
                                   DeviationSink &sink = ThrowingSink(), DelegateParser parseDelegate = ParseDelegate);

/// Reads a `saml:AudienceRestriction`.
bool TryParseAudienceRestriction(NodeFilterIterator &iterator, boost::optional<AudienceRestrictionType> &restriction,
                                 DeviationSink &sink = ThrowingSink());

/// Reads a `saml:ProxyRestriction`.
bool TryParseProxyRestriction(NodeFilterIterator &iterator, boost::optional<ProxyRestrictionType> &restriction,
                              DeviationSink &sink = ThrowingSink());

/// Reads a `saml:Condition` of the type RenewRestrictionType.
bool TryParseRenewRestriction(NodeFilterIterator &iterator, boost::optional<RenewRestrictionType> &restriction,
                              DeviationSink &sink = ThrowingSink());

} // namespace SsoClient
