// SPDX-License-Identifier: Apache-2.0
/// @file
/// `GssStatus`, what a function of the GSSAPI returned, and its words.

#pragma once

#include <gssapi/gssapi.h>

#include <string>

namespace SsoClient::Gssapi {

struct GssStatus {
  OM_uint32 major = GSS_S_COMPLETE;
  OM_uint32 minor = 0;

  bool IsError() const noexcept { return GSS_ERROR(major) != 0; }
};

/// All that the GSSAPI says of a failure: the texts of the major status, ": ", and the texts of the minor status, which is
/// the mechanism's; several texts are put one behind the other with "; ". What it says of a minor status may belong to the
/// last failure of this thread, so it is asked before any other call.
std::string DescribeStatus(const GssStatus &status, gss_OID mechanism);

} // namespace SsoClient::Gssapi
