// SPDX-License-Identifier: Apache-2.0
// The only source that is compiled with SSOCLIENT_DEVSTS and SSOCLIENT_DEVSTS_STATE, the paths of the service's program
// and of its usual state folder. Neither is defined when the service is not built.

#include "support/dev_sts.h"

namespace Testing {

const char *DevSts::GetProgram() noexcept {
#ifdef SSOCLIENT_DEVSTS
  return SSOCLIENT_DEVSTS;
#else
  return "";
#endif
}

const char *DevSts::GetUsualState() noexcept {
#ifdef SSOCLIENT_DEVSTS_STATE
  return SSOCLIENT_DEVSTS_STATE;
#else
  return "";
#endif
}

} // namespace Testing
