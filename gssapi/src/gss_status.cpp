// SPDX-License-Identifier: Apache-2.0

#include "gss_status.h"

#include "gss_handles.h"

namespace SsoClient::Gssapi {

namespace {

/// A status has a few texts, one for each of its parts. The limit ends the loop even if the GSSAPI always reports
/// another one.
constexpr int MAX_TEXTS = 16;

/// The texts of a major or a minor status.
std::string DescribeCode(OM_uint32 code, int kind, gss_OID mechanism) {
  std::string all;
  OM_uint32 rest = 0; // the GSSAPI's mark for the next text; 0 again after the last
  for (int i = 0; i < MAX_TEXTS; ++i) {
    GssOctets octets;
    OM_uint32 minor = 0;
    if (GSS_ERROR(gss_display_status(&minor, code, kind, mechanism, &rest, octets.Slot())) != 0) {
      break;
    }
    std::string text(octets.begin(), octets.end());
    text.erase(text.find_last_not_of('\0') + 1); // some mechanisms count the terminating null
    all += (all.empty() ? "" : "; ") + text;
    if (rest == 0) {
      break;
    }
  }
  return all;
}

} // namespace

std::string DescribeStatus(const GssStatus &status, gss_OID mechanism) {
  // Asks for the mechanism's texts first, because the next failure may overwrite them.
  const std::string minorText = status.minor == 0 ? "" : DescribeCode(status.minor, GSS_C_MECH_CODE, mechanism);
  std::string text = DescribeCode(status.major, GSS_C_GSS_CODE, GSS_C_NO_OID);
  if (!minorText.empty()) {
    text += ": " + minorText;
  }
  return text;
}

} // namespace SsoClient::Gssapi
