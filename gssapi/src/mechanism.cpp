// SPDX-License-Identifier: Apache-2.0

#include "mechanism.h"

namespace SsoClient::Gssapi {

gss_OID SpnegoMechanism() noexcept {
  static char octets[] = "\x2b\x06\x01\x05\x05\x02";
  static gss_OID_desc description = {sizeof octets - 1, octets};
  return &description;
}

gss_OID KerberosMechanism() noexcept {
  static char octets[] = "\x2a\x86\x48\x86\xf7\x12\x01\x02\x02";
  static gss_OID_desc description = {sizeof octets - 1, octets};
  return &description;
}

} // namespace SsoClient::Gssapi
