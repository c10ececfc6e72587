// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/proof/exceptions.h>

namespace SsoClient {

TARVEL_DEFINE_EXCEPTION(InvalidMessageException)
TARVEL_DEFINE_EXCEPTION(InvalidProofException)
TARVEL_DEFINE_EXCEPTION(StaleMessageException)
TARVEL_DEFINE_EXCEPTION(RepeatedMessageException)
TARVEL_DEFINE_EXCEPTION(ReplayGuardException)

} // namespace SsoClient
