// SPDX-License-Identifier: Apache-2.0
/// @file
/// The service that `Front` calls. It accepts only callers for whom the front acts.

#pragma once

#include "http.h"

#include <ssoclient/token_verifier.h>

namespace Example {

constexpr const char *FILES_AUDIENCE = "https://files.corp.example/";
constexpr const char *FRONT_NAME = "front@corp.example";

class Files {
public:
  /// @param trusted the certificates that the token service signs with
  explicit Files(const Tarvel::Crypto::CertificateList &trusted);

  /// Answers a request whose body is a token.
  boost::asio::awaitable<Reply> Answer(std::string body, TimePoint deadline) const;

private:
  const SsoClient::TokenVerifier m_verifier;
};

} // namespace Example
