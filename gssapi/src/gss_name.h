// SPDX-License-Identifier: Apache-2.0
/// @file
/// Names as the GSSAPI takes them.

#pragma once

#include "gss_handles.h"

#include <string>

namespace SsoClient::Gssapi {

/// Puts the name into the empty handle.
/// @throws Tarvel::InvalidArgumentException for a text that is no name of that form, as far as the GSSAPI can tell
///         without asking anybody.
void ImportName(const std::string &text, gss_const_OID form, NameHandle &name);

/// A service's name, host-based as "HTTP@host" or a Kerberos principal as "HTTP/host@REALM".
/// @throws Tarvel::InvalidArgumentException as above, and when one of its parts is missing.
void ImportServiceName(const std::string &service, NameHandle &name);

} // namespace SsoClient::Gssapi
