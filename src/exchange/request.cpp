// SPDX-License-Identifier: Apache-2.0

#include "exchange/request.h"

#include "model/namespaces.h"

#include <tarvel/core/secure_wipe.h>

namespace SsoClient {

const char *const Request::ISSUE = WstUris::ISSUE_ACTION;
const char *const Request::RENEW = WstUris::RENEW_ACTION;
const char *const Request::VALIDATE = WstUris::VALIDATE_ACTION;
const char *const Request::CHALLANGE = WstUris::CHALLENGE_ACTION;

Request &Request::operator=(Request other) noexcept {
  soapAction.swap(other.soapAction);
  body.swap(other.body);
  declaresCharset = other.declaresCharset;
  facts.swap(other.facts);
  return *this;
}

Request::~Request() {
  Tarvel::SecureWipe(body);
}

} // namespace SsoClient
