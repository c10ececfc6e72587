// SPDX-License-Identifier: Apache-2.0
/// @file
/// The qualified names of attributes and types that the parsers compare against.

#pragma once

#include <tarvel/xml/qname.h>

namespace SsoClient::SchemaNames {

extern const Tarvel::Xml::QName &XSI_TYPE;
extern const Tarvel::Xml::QName &KEY_INFO_CONFIRMATION_DATA_TYPE;
extern const Tarvel::Xml::QName &DELEGATION_RESTRICTION_TYPE;
extern const Tarvel::Xml::QName &RENEW_RESTRICTION_TYPE;

} // namespace SsoClient::SchemaNames
