// SPDX-License-Identifier: Apache-2.0

#include <tarvel/http/user_agent.h>

#include "http/client_request_impl.h"
#include "http/http_exchange.h"

#include <chrono>
#include <utility>

namespace Tarvel::Http {

TARVEL_DEFINE_EXCEPTION(HttpException)

ClientRequest::~ClientRequest() = default;

ClientResponse::~ClientResponse() = default;

PendingRequestItem::~PendingRequestItem() = default;

ConnectionPool::~ConnectionPool() = default;

UserAgent::~UserAgent() = default;

namespace {

class UserAgentImpl final : public UserAgent {
public:
  UserAgentImpl(const Ref<ConnectionSpec> &spec, const Ref<CookieStore> &cookies) : m_spec(spec), m_cookies(cookies) {}

  void StartRequest(const Ref<ClientRequest> &request, CompletionFunction completion,
                    Ref<PendingRequestItem> &pending) override {
    auto *const impl = dynamic_cast<ClientRequestImpl *>(request.get());
    if (!impl) {
      throw InvalidArgumentException("the HTTP request was not made by CreateHttpRequest.");
    }
    const auto exchange = MakeRef<HttpExchange>(m_spec, m_cookies, impl->Take(), std::move(completion));
    pending = exchange; // before the completion function can run and use it
    try {
      exchange->Start();
    } catch (...) {
      pending.reset();
      throw;
    }
  }

  void WaitForRequest(const Ref<PendingRequestItem> &pending, std::int64_t timeoutMicroseconds,
                      Ref<ClientResponse> &response) override {
    auto *const exchange = dynamic_cast<HttpExchange *>(pending.get());
    if (!exchange) {
      throw InvalidArgumentException("the item to wait for is not a started HTTP request.");
    }
    response = exchange->Wait(std::chrono::microseconds(timeoutMicroseconds));
  }

private:
  ~UserAgentImpl() override = default;

  const Ref<ConnectionSpec> m_spec;
  const Ref<CookieStore> m_cookies;
};

} // namespace

void CreateHttpUserAgent(const Ref<ConnectionSpec> &spec, const Ref<CookieStore> &cookies,
                         const Ref<ConnectionPool> &pool, Ref<UserAgent> &out) {
  if (!spec || !cookies) {
    throw InvalidArgumentException("a user agent needs a connection specification and a cookie store.");
  }
  if (pool) {
    throw InvalidArgumentException(
        "a user agent opens one connection for each request; connection pools are not offered.");
  }
  out = MakeRef<UserAgentImpl>(spec, cookies);
}

void CreateHttpRequest(std::string_view method, std::string_view path, Ref<ClientRequest> &out) {
  out = MakeRef<ClientRequestImpl>(method, path);
}

} // namespace Tarvel::Http
