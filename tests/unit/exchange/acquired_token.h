// SPDX-License-Identifier: Apache-2.0
/// @file
/// Reads the token in a response to a request for a token.

#pragma once

#include "exchange/response_handler_impl.h"

#include <tarvel/core/ref.h>
#include <tarvel/io/reader.h>

#include <string>

namespace Testing {

inline std::string Acquire(const std::string &response) {
  std::string token = "before";
  SsoClient::ResponseHandlerImpl().HandleAcquireTokenResponse(Tarvel::CreateStringReader(response).get(), token);
  return token;
}

} // namespace Testing
