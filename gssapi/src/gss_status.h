// SPDX-License-Identifier: Apache-2.0
/// @file
/// `GssStatus`, the status that a function of the GSSAPI returns, and its texts.

#pragma once

#include <gssapi/gssapi.h>

#include <string>

namespace SsoClient::Gssapi {

struct GssStatus {
  OM_uint32 major = GSS_S_COMPLETE;
  OM_uint32 minor = 0;

  bool IsError() const noexcept { return GSS_ERROR(major) != 0; }
};

/// Everything that the GSSAPI reports about a failure: the texts of the major status, ": ", and the texts of the minor
/// status, which is the mechanism's. Several texts of one status are separated by "; ". Call it right after the
/// failure: the texts of a minor status may be those of this thread's last failure.
std::string DescribeStatus(const GssStatus &status, gss_OID mechanism);

} // namespace SsoClient::Gssapi
