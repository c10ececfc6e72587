// SPDX-License-Identifier: Apache-2.0
// A provider for OpenSSL that a configuration file can load. It writes a line and offers no algorithm.
#include <openssl/core.h>

#include <cstdio>

extern "C" __attribute__((visibility("default"))) int
OSSL_provider_init(const OSSL_CORE_HANDLE *, const OSSL_DISPATCH *, const OSSL_DISPATCH **out, void **context) {
  static const OSSL_DISPATCH NOTHING[] = {{0, nullptr}};
  std::fputs("provider loaded\n", stdout);
  std::fflush(stdout);
  *out = NOTHING;
  *context = nullptr;
  return 1;
}
