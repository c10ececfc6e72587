// SPDX-License-Identifier: Apache-2.0
/// @file
/// The mechanisms' object identifiers.

#pragma once

#include <gssapi/gssapi.h>

namespace SsoClient::Gssapi {

/// 1.3.6.1.5.5.2 (RFC 4178). The GSSAPI takes descriptions that it could write to, and does not.
gss_OID SpnegoMechanism() noexcept;

/// 1.2.840.113554.1.2.2 (RFC 1964).
gss_OID KerberosMechanism() noexcept;

} // namespace SsoClient::Gssapi
