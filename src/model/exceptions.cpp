// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/client/exceptions.h>
#include <ssoclient/exceptions.h>

namespace SsoClient {

TARVEL_DEFINE_EXCEPTION(SsoException)
TARVEL_DEFINE_EXCEPTION(InvalidTokenException)
TARVEL_DEFINE_EXCEPTION(InvalidSignatureException)
TARVEL_DEFINE_EXCEPTION(ParseException)
TARVEL_DEFINE_EXCEPTION(CommunicationException)
TARVEL_DEFINE_EXCEPTION(InvalidCredentialsException)
TARVEL_DEFINE_EXCEPTION(CancelledException)
TARVEL_DEFINE_EXCEPTION(DeadlineExceededException)

} // namespace SsoClient
