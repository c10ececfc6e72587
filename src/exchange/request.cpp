// SPDX-License-Identifier: Apache-2.0

#include "exchange/request.h"

#include "model/namespaces.h"

#include <tarvel/core/secure_wipe.h>

#include <string_view>
#include <utility>

namespace SsoClient {

namespace {

constexpr char ISSUE_ACTION[] = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue";
constexpr char RENEW_ACTION[] = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Renew";
constexpr char VALIDATE_ACTION[] = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Validate";
constexpr char CHALLENGE_ACTION[] = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RSTR/Issue";

constexpr bool IsInWst(std::string_view action, std::string_view path) {
  return action.substr(0, Namespaces::WST.size()) == Namespaces::WST && action.substr(Namespaces::WST.size()) == path;
}
static_assert(IsInWst(ISSUE_ACTION, "/RST/Issue"));
static_assert(IsInWst(RENEW_ACTION, "/RST/Renew"));
static_assert(IsInWst(VALIDATE_ACTION, "/RST/Validate"));
static_assert(IsInWst(CHALLENGE_ACTION, "/RSTR/Issue"));

} // namespace

const char *const Request::ISSUE = ISSUE_ACTION;
const char *const Request::RENEW = RENEW_ACTION;
const char *const Request::VALIDATE = VALIDATE_ACTION;
const char *const Request::CHALLANGE = CHALLENGE_ACTION;

Request &Request::operator=(Request other) noexcept {
  soapAction.swap(other.soapAction);
  body.swap(other.body);
  return *this;
}

Request::~Request() {
  Tarvel::SecureWipe(body);
}

} // namespace SsoClient
