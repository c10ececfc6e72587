// SPDX-License-Identifier: Apache-2.0
/// @file
/// A web service in which callers that prove who they are write notes.

#pragma once

#include "http_server.h"

#include <ssoclient/proof/http_proof.h>

#include <cstddef>
#include <string>

namespace Example {

class Notes {
public:
  /// @param trusted the certificates that the token service signs with
  /// @param origin how callers address this service, such as "https://notes.corp.example". Tokens have the same audience.
  /// @param remembered how many requests can be remembered at once
  Notes(const Tarvel::Crypto::CertificateList &trusted, const std::string &origin, std::size_t remembered);

  /// Answers one request. Any number of threads may call it at once.
  Response Answer(const Request &request) const;

private:
  SsoClient::HttpRequest ToProve(const Request &request) const;

  const std::string m_origin;
  const SsoClient::TokenVerifier m_tokens;
  const SsoClient::HttpProofOptions m_options;
};

} // namespace Example
