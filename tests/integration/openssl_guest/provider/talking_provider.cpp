// SPDX-License-Identifier: Apache-2.0
// A provider of OpenSSL's that a configuration file can name. It offers nothing.
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
