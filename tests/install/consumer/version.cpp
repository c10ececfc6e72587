// SPDX-License-Identifier: Apache-2.0
/// @file
/// Prints the versions of the headers, of the library and of the CMake package, each on one line.

#include <ssoclient/version.h>

#include <cstdio>

int main() {
  std::printf("%s\n%s\n%s\n", SSOCLIENT_VERSION_STRING, SsoClient::GetLibraryVersion(), PACKAGE_VERSION);
  return SsoClient::GetLibraryVersionNumber() == SSOCLIENT_VERSION_NUMBER ? 0 : 1;
}
