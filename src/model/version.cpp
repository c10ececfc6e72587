// SPDX-License-Identifier: Apache-2.0
#include <ssoclient/version.h>

namespace SsoClient {

const char *GetLibraryVersion() noexcept {
  return SSOCLIENT_VERSION_STRING;
}

int GetLibraryVersionNumber() noexcept {
  return SSOCLIENT_VERSION_NUMBER;
}

} // namespace SsoClient
