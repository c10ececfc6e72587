// SPDX-License-Identifier: Apache-2.0

#include "memory_cache.h"

#include <ssoclient/gssapi/exceptions.h>

namespace SsoClient::Gssapi {

namespace {

void RequireSuccess(krb5_context context, krb5_error_code code) {
  if (code == 0) {
    return;
  }
  const char *text = krb5_get_error_message(context, code);
  const std::string message = std::string("No credential cache can be made in memory: ") + text;
  krb5_free_error_message(context, text);
  throw GssCredentialException(message);
}

} // namespace

MemoryCache::MemoryCache() {
  krb5_context context = nullptr;
  RequireSuccess(nullptr, krb5_init_context(&context));
  m_context.reset(context);

  krb5_ccache cache = nullptr;
  RequireSuccess(context, krb5_cc_new_unique(context, "MEMORY", nullptr, &cache));
  m_cache = {cache, KerberosCacheDeleter{context}};

  char *name = nullptr;
  RequireSuccess(context, krb5_cc_get_full_name(context, cache, &name));
  const auto freeName = [context](char *text) { krb5_free_string(context, text); };
  const std::unique_ptr<char, decltype(freeName)> owner(name, freeName);
  m_name = name;
}

} // namespace SsoClient::Gssapi
