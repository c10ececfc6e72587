// SPDX-License-Identifier: Apache-2.0

#include "exit_code.h"
#include "gss_credentials.h"

namespace SsoClient::Tool {

void RequireGss() {
  throw UsageException("--gss is not available: this ssoclient is built without the GSSAPI");
}

NegotiationCredential ToCredential(const GssOptions & /*options*/, const std::string & /*url*/) {
  RequireGss();
  return {};
}

} // namespace SsoClient::Tool
