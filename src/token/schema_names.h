// SPDX-License-Identifier: Apache-2.0
/// @file
/// The qualified names of attributes and types that the parsers compare against.

#pragma once

#include <tarvel/xml/qname.h>

namespace SsoClient::SchemaNames {

// Built with the first use, so that a static object of the host may read a token before this library's files have been
// initialised; and never destroyed, for a token may be read while the process ends.

const Tarvel::Xml::QName &XsiType();
const Tarvel::Xml::QName &KeyInfoConfirmationDataType();
const Tarvel::Xml::QName &DelegationRestrictionType();
const Tarvel::Xml::QName &RenewRestrictionType();

} // namespace SsoClient::SchemaNames
