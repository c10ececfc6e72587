// SPDX-License-Identifier: Apache-2.0

#include "crypto/key_uri.h"

#include "crypto/library_context.h"
#include "crypto/openssl_errors.h"
#include "crypto/openssl_handles.h"
#include "crypto/passphrase.h"
#include "crypto/private_key_impl.h"

#include <openssl/err.h>

#include <algorithm>
#include <exception>

namespace Tarvel::Crypto {

namespace {

constexpr std::string_view SCHEME_LETTERS = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz";
constexpr std::string_view SCHEME_CHARACTERS = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+-.";

// The state of the callback for a passphrase. An exception of the callback is stored here, because it must not pass
// through OpenSSL's stack frames.
struct PassphraseRequest {
  Passphrase passphrase;
  bool asked = false;
  std::exception_ptr failure;
};

int SupplyPassphrase(char *buffer, int size, int, void *data) noexcept {
  auto &question = *static_cast<PassphraseRequest *>(data);
  question.asked = true;
  try {
    const std::string &text = question.passphrase.Get();
    if (text.size() > static_cast<std::size_t>(size)) {
      return -1;
    }
    std::copy(text.begin(), text.end(), buffer);
    return static_cast<int>(text.size());
  } catch (...) {
    question.failure = std::current_exception();
    return -1;
  }
}

[[noreturn]] void ThrowStoreFailure(const OpenSslErrorScope &errors, const PassphraseRequest &question) {
  constexpr const char *NOT_READABLE = "The key store cannot be read";
  if (question.failure) {
    std::rethrow_exception(question.failure);
  }
  errors.RequireMemory();
  if (question.asked) {
    throw WrongPassphraseException(errors.Describe("The passphrase of the private key is wrong"));
  }
  if (ERR_SYSTEM_ERROR(errors.PeekNewest())) {
    throw IOException(errors.Describe(NOT_READABLE));
  }
  errors.Throw(NOT_READABLE);
}

// Null at the end of the store.
KeyHandle LoadNextKey(OSSL_STORE_CTX *store, const OpenSslErrorScope &errors, const PassphraseRequest &question) {
  while (!OSSL_STORE_eof(store)) {
    const StoreInfoHandle info(OSSL_STORE_load(store));
    if (!info && (errors.PeekNewest() != 0 || errors.RanOutOfMemory() || question.failure)) {
      ThrowStoreFailure(errors, question);
    }
    if (!info && OSSL_STORE_error(store)) {
      return nullptr; // an error without a code: the content is not a key
    }
    if (info && OSSL_STORE_INFO_get_type(info.get()) == OSSL_STORE_INFO_PKEY) {
      return KeyHandle(OSSL_STORE_INFO_get1_PKEY(info.get()));
    }
  }
  return nullptr;
}

} // namespace

bool IsKeyUri(const std::string &text) {
  const std::size_t colon = text.find(':');
  if (colon == std::string::npos || colon < 2) {
    return false;
  }
  const std::string_view scheme = std::string_view(text).substr(0, colon);
  return SCHEME_LETTERS.find(scheme.front()) != std::string_view::npos &&
         scheme.find_first_not_of(SCHEME_CHARACTERS) == std::string_view::npos;
}

Ref<const PrivateKey> LoadPrivateKeyFromUri(const std::string &uri, const PassphraseCallback &passphrase) {
  OpenSslGuard::Prepare();
  OpenSslGuard guard;
  guard.Require();
  const OpenSslErrorScope errors;
  ProviderTurn turn(UsesSystemConfiguration());
  PassphraseRequest question{Passphrase(passphrase, guard, &turn), false, nullptr};
  // Without this user-interface method, a loader would ask for the passphrase on the host's terminal.
  const UiMethodHandle ui(UI_UTIL_wrap_read_pem_callback(SupplyPassphrase, 0));
  if (!ui) {
    throw OutOfMemoryException();
  }
  const StoreHandle store(
      OSSL_STORE_open_ex(uri.c_str(), GetLibraryContext(), nullptr, ui.get(), &question, nullptr, nullptr, nullptr));
  if (!store || OSSL_STORE_expect(store.get(), OSSL_STORE_INFO_PKEY) != 1) {
    ThrowStoreFailure(errors, question);
  }
  KeyHandle key = LoadNextKey(store.get(), errors, question);
  if (!key && (question.asked || errors.RanOutOfMemory())) {
    ThrowStoreFailure(errors, question);
  }
  if (!key) {
    throw NoKeyException("There is no private key in the store");
  }
  return MakeRef<PrivateKeyImpl>(std::move(key));
}

} // namespace Tarvel::Crypto
