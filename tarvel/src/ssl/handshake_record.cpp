// SPDX-License-Identifier: Apache-2.0

#include "ssl/handshake_record.h"

#include "crypto/openssl_errors.h"

#include <openssl/err.h>

#include <algorithm>
#include <string_view>
#include <utility>

namespace Tarvel::Ssl {

namespace {

using Kind = ServerRefusal::Kind;
using Outcome = HandshakeProbe::Outcome;

constexpr std::size_t BEGIN_BYTES = 8;
constexpr std::string_view HTTP_BEGIN = "HTTP/";
/// The first octet of a record of TLS (RFC 8446, section 5.1): change_cipher_spec to application_data.
constexpr unsigned char FIRST_CONTENT_TYPE = 20;
constexpr unsigned char LAST_CONTENT_TYPE = 23;

struct KindOfCode {
  int code;
  Kind kind;
};

constexpr KindOfCode KINDS[] = {
    {X509_V_ERR_CERT_HAS_EXPIRED, Kind::EXPIRED},
    {X509_V_ERR_CERT_NOT_YET_VALID, Kind::NOT_YET_VALID},
    {X509_V_ERR_HOSTNAME_MISMATCH, Kind::OTHER_NAME},
    {X509_V_ERR_IP_ADDRESS_MISMATCH, Kind::OTHER_NAME},
    {X509_V_ERR_UNABLE_TO_GET_ISSUER_CERT, Kind::UNKNOWN_ISSUER},
    {X509_V_ERR_UNABLE_TO_GET_ISSUER_CERT_LOCALLY, Kind::UNKNOWN_ISSUER},
    {X509_V_ERR_UNABLE_TO_VERIFY_LEAF_SIGNATURE, Kind::UNKNOWN_ISSUER},
    {X509_V_ERR_DEPTH_ZERO_SELF_SIGNED_CERT, Kind::SELF_SIGNED},
    {X509_V_ERR_SELF_SIGNED_CERT_IN_CHAIN, Kind::SELF_SIGNED},
    {X509_V_ERR_EE_KEY_TOO_SMALL, Kind::WEAK_KEY},
    {X509_V_ERR_CA_KEY_TOO_SMALL, Kind::WEAK_KEY},
    {X509_V_ERR_CA_MD_TOO_WEAK, Kind::WEAK_SIGNATURE},
    {X509_V_ERR_INVALID_PURPOSE, Kind::WRONG_PURPOSE},
    {X509_V_ERR_INVALID_CA, Kind::WRONG_PURPOSE},
    {X509_V_ERR_KEYUSAGE_NO_CERTSIGN, Kind::WRONG_PURPOSE},
};

Kind KindOf(int code) noexcept {
  const auto *const found =
      std::find_if(std::begin(KINDS), std::end(KINDS), [code](const KindOfCode &known) { return known.code == code; });
  return found == std::end(KINDS) ? Kind::OTHER : found->kind;
}

/// Null for a certificate that OpenSSL reads and this library refuses.
Ref<const Crypto::Certificate> Copy(const X509 *certificate) {
  const Crypto::OpenSslErrorScope errors;
  unsigned char *der = nullptr;
  const int length = i2d_X509(certificate, &der);
  const Crypto::MemoryHandle owner(der);
  if (length <= 0) {
    errors.RequireMemory();
    return nullptr;
  }
  try {
    return Crypto::CreateCertificateFromDer(der, static_cast<std::size_t>(length));
  } catch (const Crypto::CryptoException &) {
    return nullptr;
  }
}

bool IsNoCommonVersion(int reason) noexcept {
  return reason == SSL_R_UNSUPPORTED_PROTOCOL || reason == SSL_R_TLSV1_ALERT_PROTOCOL_VERSION ||
         reason == SSL_R_WRONG_SSL_VERSION;
}

} // namespace

void HandshakeRecord::NoteInput(const char *bytes, std::size_t count) {
  m_begin.append(bytes, std::min(count, BEGIN_BYTES - m_begin.size()));
}

void HandshakeRecord::NoteProtocol(const SSL *connection) {
  const SSL_CIPHER *const agreed = SSL_get_current_cipher(connection);
  const SSL_CIPHER *const cipher = agreed ? agreed : SSL_get_pending_cipher(connection);
  if (cipher) {
    m_probe.version = SSL_get_version(connection); // only a guess until a cipher suite is chosen
    m_probe.cipher = SSL_CIPHER_get_name(cipher);
  }
}

void HandshakeRecord::NoteChain(X509_STORE_CTX *verification) {
  const STACK_OF(X509) *const sent = X509_STORE_CTX_get0_untrusted(verification);
  m_probe.chainLength = static_cast<std::size_t>(std::max(sk_X509_num(sent), 0));
  const std::size_t kept = std::min(m_probe.chainLength, MAX_PROBED_CERTIFICATES);
  for (std::size_t i = 0; i < kept; ++i) {
    m_probe.chain.push_back(Copy(sk_X509_value(sent, static_cast<int>(i))));
  }
}

void HandshakeRecord::NoteAnchor(X509_STORE_CTX *verification) {
  const STACK_OF(X509) *const chain = X509_STORE_CTX_get0_chain(verification);
  const int length = sk_X509_num(chain);
  // The server sent this number of certificates at the beginning of the chain; the others are from the trust store.
  if (length > 0 && X509_STORE_CTX_get_num_untrusted(verification) < length) {
    m_probe.anchor = Copy(sk_X509_value(chain, length - 1));
  }
}

void HandshakeRecord::NoteRefusal(X509_STORE_CTX *verification, std::string text) {
  const int code = X509_STORE_CTX_get_error(verification);
  if (!HasRefusals()) {
    m_firstCode = code;
  } else if (code == X509_V_ERR_UNABLE_TO_VERIFY_LEAF_SIGNATURE) {
    return; // repeats that the issuer is not known
  }
  ServerRefusal refusal;
  refusal.kind = KindOf(code);
  refusal.text = std::move(text);
  refusal.depth = static_cast<std::size_t>(std::max(X509_STORE_CTX_get_error_depth(verification), 0));
  const X509 *const certificate = X509_STORE_CTX_get_current_cert(verification);
  if (certificate) {
    refusal.certificate = Copy(certificate);
  }
  AddRefusal(std::move(refusal));
}

void HandshakeRecord::NoteOtherThumbprint(std::string text) {
  ServerRefusal refusal;
  refusal.kind = Kind::OTHER_THUMBPRINT;
  refusal.text = std::move(text);
  AddRefusal(std::move(refusal));
}

void HandshakeRecord::AddRefusal(ServerRefusal refusal) {
  if (m_probe.refusals.size() < MAX_PROBED_REFUSALS) {
    m_probe.refusals.push_back(std::move(refusal));
  }
}

HandshakeProbe HandshakeRecord::Take(const std::string &failure) {
  m_probe.failure = failure;
  m_probe.outcome = failure.empty() ? Outcome::ACCEPTED : Classify();
  return std::move(m_probe);
}

Outcome HandshakeRecord::Classify() const noexcept {
  if (HasRefusals()) {
    return Outcome::CERTIFICATE_REFUSED;
  }
  if (m_begin.compare(0, HTTP_BEGIN.size(), HTTP_BEGIN) == 0) {
    return Outcome::PLAIN_HTTP;
  }
  const unsigned char first = m_begin.empty() ? FIRST_CONTENT_TYPE : static_cast<unsigned char>(m_begin.front());
  if (first < FIRST_CONTENT_TYPE || first > LAST_CONTENT_TYPE) {
    return Outcome::NOT_TLS;
  }
  const int reason = ERR_GET_LIB(m_error) == ERR_LIB_SSL ? ERR_GET_REASON(m_error) : 0;
  if (IsNoCommonVersion(reason)) {
    return Outcome::NO_COMMON_VERSION;
  }
  return reason == SSL_R_EXCESSIVE_MESSAGE_SIZE ? Outcome::TOO_LONG : Outcome::FAILED;
}

} // namespace Tarvel::Ssl
