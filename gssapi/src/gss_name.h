// SPDX-License-Identifier: Apache-2.0
/// @file
/// The names of principals and of mechanisms, in the form that the GSSAPI uses.

#pragma once

#include "gss_handles.h"

#include <string>

namespace SsoClient::Gssapi {

/// Converts `text`, a name of the form `form`, and stores the result in `name`, which must be empty.
/// @throws Tarvel::InvalidArgumentException when `text` does not have that form. The GSSAPI checks this without asking
///         the realm.
void ImportName(const std::string &text, gss_const_OID form, NameHandle &name);

/// The same for the name of a service, host-based such as "HTTP@host" or a Kerberos principal such as
/// "HTTP/host@REALM".
/// @throws Tarvel::InvalidArgumentException as above, and when a part of the name is missing.
void ImportServiceName(const std::string &service, NameHandle &name);

/// The mechanism SPNEGO, 1.3.6.1.5.5.2 (RFC 4178). The GSSAPI's declarations require a pointer to non-const, but the
/// GSSAPI does not write through it.
gss_OID SpnegoMechanism() noexcept;

/// The mechanism Kerberos, 1.2.840.113554.1.2.2 (RFC 1964).
gss_OID KerberosMechanism() noexcept;

} // namespace SsoClient::Gssapi
