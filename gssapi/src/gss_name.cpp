// SPDX-License-Identifier: Apache-2.0

#include "gss_name.h"

#include "gss_status.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <gssapi/gssapi_krb5.h>

namespace SsoClient::Gssapi {

void ImportName(const std::string &text, gss_const_OID form, NameHandle &name) {
  std::string octets = text;
  gss_buffer_desc buffer = {octets.size(), octets.data()};
  // A copy, because the GSSAPI's declarations do not use const. The form is only read.
  gss_OID_desc writableForm = *form;
  GssStatus status;
  status.major = gss_import_name(&status.minor, &buffer, &writableForm, name.Slot());
  if (status.IsError()) {
    throw Tarvel::InvalidArgumentException("'" + Tarvel::StringUtil::Shorten(text) +
                                           "' is not a valid name: " + DescribeStatus(status, GSS_C_NO_OID));
  }
}

void ImportServiceName(const std::string &service, NameHandle &name) {
  const bool isPrincipal = service.find('/') != std::string::npos;
  const std::size_t separator = service.find(isPrincipal ? '/' : '@');
  if (separator == 0 || separator == std::string::npos || separator + 1 == service.size()) {
    throw Tarvel::InvalidArgumentException("'" + Tarvel::StringUtil::Shorten(service) +
                                           "' is not a service name such as HTTP@host or HTTP/host@REALM");
  }
  ImportName(service, isPrincipal ? GSS_KRB5_NT_PRINCIPAL_NAME : GSS_C_NT_HOSTBASED_SERVICE, name);
}

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
