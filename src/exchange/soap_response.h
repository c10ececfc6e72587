// SPDX-License-Identifier: Apache-2.0
/// @file
/// The document of a response, and the SOAP fault that may be in it.

#pragma once

#include "exchange/fault_listener.h"

#include <ssoclient/service_dialect.h>
#include <tarvel/core/ref.h>
#include <tarvel/io/reader.h>
#include <tarvel/xml/node.h>

#include <initializer_list>
#include <string_view>

namespace SsoClient {

/// The document element of the response. The reference keeps the whole tree alive.
/// @throws SsoException when the response is not well-formed XML. The message ends with the charset that the response
///         declares, unless that is UTF-8.
Tarvel::Ref<const Tarvel::Xml::ElementNode> ParseResponseDocument(Tarvel::Reader &response);

/// Checks that there is no SOAP 1.1 fault in the body of `envelope`.
/// @param listener receives the fault before the exception is thrown; null for none
/// @param dialect has further faults with which the service refuses credentials
/// @throws InvalidCredentialsException for a fault that says that authentication failed.
/// @throws SsoException for every other fault.
/// @throws ParseException for a fault code whose prefix is not bound.
void CheckSoapFault(const Tarvel::Xml::ElementNode &envelope, FaultListener *listener = nullptr,
                    const ServiceDialect &dialect = {});

/// Follows a path of local names down from `start`, to the first child with each name. Null when there is no such
/// child, and when `start` is null.
const Tarvel::Xml::ElementNode *FindDescendant(const Tarvel::Xml::ElementNode *start,
                                               std::initializer_list<std::string_view> localNames) noexcept;

} // namespace SsoClient
