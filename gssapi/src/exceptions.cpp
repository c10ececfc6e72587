// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/gssapi/exceptions.h>

namespace SsoClient::Gssapi {

TARVEL_DEFINE_EXCEPTION(GssCredentialException)
TARVEL_DEFINE_EXCEPTION(GssNegotiationException)
TARVEL_DEFINE_EXCEPTION(GssLimitException)

} // namespace SsoClient::Gssapi
