// SPDX-License-Identifier: Apache-2.0

#include "ssl/tls_policy.h"

#include "crypto/library_context.h"
#include "crypto/openssl_errors.h"
#include "ssl/ssl_handles.h"

#include <algorithm>
#include <cstdint>
#include <string>
#include <vector>

namespace Tarvel::Ssl {

namespace {

constexpr int MIN_VERSION = TLS1_2_VERSION;
/// 112 bits: RSA and DH from 2048 bits, curves from 224, no SHA-1 in signatures.
constexpr int MIN_SECURITY_LEVEL = 2;

/// The suites of TLS 1.2. Each connection has a fresh key, so that an attacker that gets the server's key later cannot
/// read what was recorded. Authenticated encryption is first; CBC is for servers that offer nothing else.
constexpr const char *CIPHERS = "ECDHE+AESGCM:ECDHE+CHACHA20:DHE+AESGCM:DHE+CHACHA20:ECDHE+AES:DHE+AES:"
                                "!aNULL:!eNULL:!aDSS:!AESCCM:!PSK:!SRP";
constexpr const char *CIPHERS_OF_TLS_1_3 = "TLS_AES_256_GCM_SHA384:TLS_CHACHA20_POLY1305_SHA256:TLS_AES_128_GCM_SHA256";
constexpr const char *GROUPS = "X25519:P-256:X448:P-384:P-521:ffdhe2048:ffdhe3072:ffdhe4096";
constexpr const char *SIGNATURE_ALGORITHMS = "ECDSA+SHA256:ECDSA+SHA384:ECDSA+SHA512:ed25519:ed448:"
                                             "rsa_pss_rsae_sha256:rsa_pss_rsae_sha384:rsa_pss_rsae_sha512:rsa_pss_pss_"
                                             "sha256:rsa_pss_pss_sha384:rsa_pss_pss_sha512:"
                                             "RSA+SHA256:RSA+SHA384:RSA+SHA512";

constexpr const char *NO_VERSION = "Cannot require TLS 1.2";
constexpr const char *NO_CIPHERS = "Cannot choose cipher suites";

constexpr std::uint64_t OPTIONS = SSL_OP_NO_RENEGOTIATION | SSL_OP_NO_COMPRESSION | SSL_OP_CLEANSE_PLAINTEXT;
constexpr std::uint64_t UNSAFE_OPTIONS = SSL_OP_ALLOW_UNSAFE_LEGACY_RENEGOTIATION | SSL_OP_LEGACY_SERVER_CONNECT |
                                         SSL_OP_IGNORE_UNEXPECTED_EOF | SSL_OP_ALLOW_NO_DHE_KEX |
                                         SSL_OP_NO_EXTENDED_MASTER_SECRET | SSL_OP_NO_ENCRYPT_THEN_MAC;

void Require(bool isSet, const Crypto::OpenSslErrorScope &errors, const char *failure) {
  if (!isSet) {
    errors.Throw(failure);
  }
}

/// Does what OpenSSL's macros do, with a copy of the list: the macros require one that is not constant.
bool SetList(SSL_CTX *context, int command, std::string list) {
  return SSL_CTX_ctrl(context, command, 0, list.data()) == 1;
}

/// Replaces all settings, because OpenSSL has applied the section "system_default" of the process's configuration to
/// the new context.
void ApplyOwnPolicy(SSL_CTX *context, const Crypto::OpenSslErrorScope &errors) {
  SSL_CTX_clear_options(context, SSL_CTX_get_options(context));
  SSL_CTX_set_options(context, OPTIONS | SSL_OP_ENABLE_MIDDLEBOX_COMPAT);
  Require(SSL_CTX_set_min_proto_version(context, MIN_VERSION) == 1 && SSL_CTX_set_max_proto_version(context, 0) == 1,
          errors, NO_VERSION);
  Require(SSL_CTX_set_cipher_list(context, CIPHERS) == 1 && SSL_CTX_set_ciphersuites(context, CIPHERS_OF_TLS_1_3) == 1,
          errors, NO_CIPHERS);
  SSL_CTX_set_security_level(context, MIN_SECURITY_LEVEL); // after the list of suites, which may contain a level
  Require(SetList(context, SSL_CTRL_SET_GROUPS_LIST, GROUPS), errors, "Cannot choose groups");
  Require(SetList(context, SSL_CTRL_SET_SIGALGS_LIST, SIGNATURE_ALGORITHMS) &&
              SetList(context, SSL_CTRL_SET_CLIENT_SIGALGS_LIST, SIGNATURE_ALGORITHMS),
          errors, "Cannot choose signature algorithms");
  SSL_CTX_set_block_padding(context, 0);
}

/// The suites of TLS 1.2; those of TLS 1.3 are chosen separately.
std::vector<std::string> GetCipherNames(const SSL_CTX *context) {
  std::vector<std::string> names;
  const STACK_OF(SSL_CIPHER) *const ciphers = SSL_CTX_get_ciphers(context);
  for (int i = 0; i < sk_SSL_CIPHER_num(ciphers); ++i) {
    const SSL_CIPHER *const cipher = sk_SSL_CIPHER_value(ciphers, i);
    if (SSL_CIPHER_get_kx_nid(cipher) != NID_kx_any) {
      names.emplace_back(SSL_CIPHER_get_name(cipher));
    }
  }
  return names;
}

/// The machine's suites that are also our suites, in the machine's order.
std::string KeepOurCiphers(SSL_CTX *context, const Crypto::OpenSslErrorScope &errors) {
  const std::vector<std::string> ofMachine = GetCipherNames(context);
  Require(SSL_CTX_set_cipher_list(context, CIPHERS) == 1, errors, NO_CIPHERS);
  const std::vector<std::string> ours = GetCipherNames(context);
  std::string kept;
  for (const std::string &name : ofMachine) {
    if (std::find(ours.begin(), ours.end(), name) != ours.end()) {
      kept.append(kept.empty() ? "" : ":").append(name);
    }
  }
  return kept;
}

/// Keeps the machine's settings where they are stricter than ours.
void RestrictPolicyOfMachine(SSL_CTX *context, const Crypto::OpenSslErrorScope &errors) {
  SSL_CTX_clear_options(context, UNSAFE_OPTIONS);
  SSL_CTX_set_options(context, OPTIONS);
  const std::string ciphers = KeepOurCiphers(context, errors);
  const int minVersion = ciphers.empty() ? TLS1_3_VERSION : MIN_VERSION; // without a suite for it, no TLS 1.2
  if (SSL_CTX_get_min_proto_version(context) < minVersion) {
    Require(SSL_CTX_set_min_proto_version(context, minVersion) == 1, errors, NO_VERSION);
  }
  if (!ciphers.empty()) {
    Require(SSL_CTX_set_cipher_list(context, ciphers.c_str()) == 1, errors, NO_CIPHERS);
  }
  SSL_CTX_set_security_level(context, std::max(SSL_CTX_get_security_level(context), MIN_SECURITY_LEVEL));
}

} // namespace

void ApplyTlsPolicy(SSL_CTX *context) {
  const Crypto::OpenSslErrorScope errors;
  if (Crypto::UsesSystemConfiguration()) {
    RestrictPolicyOfMachine(context, errors);
  } else {
    ApplyOwnPolicy(context, errors);
  }
}

} // namespace Tarvel::Ssl
