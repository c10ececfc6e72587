// SPDX-License-Identifier: Apache-2.0
/// @file
/// `HandshakeRecord`, what a probe records of a handshake.

#pragma once

#include "ssl/ssl_handles.h"

#include <tarvel/ssl/server_probe.h>

#include <cstddef>
#include <string>

namespace Tarvel::Ssl {

/// The connection fills it in during its handshake, under the lock of its stream. Read it after the handshake's end.
class HandshakeRecord {
public:
  /// Notes the first octets that the server sends.
  void NoteInput(const char *bytes, std::size_t count);

  /// Notes the version and the cipher suite, as far as they are known.
  void NoteProtocol(const SSL *connection);

  /// Notes the server's certificates, before they are verified. @throws OutOfMemoryException, InvalidStateException
  void NoteChain(X509_STORE_CTX *verification);

  /// Notes the trusted certificate at which the verified chain ends, if there is one.
  /// @throws OutOfMemoryException, InvalidStateException
  void NoteAnchor(X509_STORE_CTX *verification);

  /// Notes why OpenSSL has just refused a certificate. @param text describes the reason.
  void NoteRefusal(X509_STORE_CTX *verification, std::string text);

  void NoteOtherThumbprint(std::string text);

  /// Notes OpenSSL's code for the error that ended the handshake.
  void NoteError(unsigned long code) noexcept { m_error = code; }

  /// Whether a certificate was refused.
  bool HasRefusals() const noexcept { return !m_probe.refusals.empty(); }
  /// OpenSSL's code for the first refusal, and the refusal's text. `HasRefusals` must be true.
  int GetFirstCode() const noexcept { return m_firstCode; }
  const std::string &GetFirstText() const noexcept { return m_probe.refusals.front().text; }

  /// The whole record. @param failure the text of the handshake's exception; empty when the server was accepted.
  HandshakeProbe Take(const std::string &failure);

private:
  HandshakeProbe::Outcome Classify() const noexcept;
  void AddRefusal(ServerRefusal refusal);

  HandshakeProbe m_probe;
  int m_firstCode = X509_V_OK;
  unsigned long m_error = 0;
  std::string m_begin; // the first octets that the server sent
};

} // namespace Tarvel::Ssl
