// SPDX-License-Identifier: Apache-2.0
// The asynchronous operations of `SecurityTokenServiceImpl`: each queues a call of its synchronous counterpart.
#include "service/security_token_service_impl.h"
#include "service/sync_to_async_call.h"

#include <tarvel/core/secret_text.h>

namespace SsoClient {

void SecurityTokenServiceImpl::AcquireTokenAsync(const std::string &username, const std::string &password,
                                                 const TokenSpec &spec, const TokenCompletion &completion) const {
  SyncToAsyncCall([service = ShareCopy(), username, secret = Tarvel::SecretText(password),
                   spec] { return service->AcquireToken(username, secret.Get(), spec); },
                  completion);
}

void SecurityTokenServiceImpl::AcquireTokenByGssAsync(const TokenSpec &spec,
                                                      const std::shared_ptr<NegotiationHandler> &handler,
                                                      const TokenCompletion &completion) const {
  SyncToAsyncCall(
      [service = ShareCopy(), spec, handler = PassByRefHelper<NegotiationHandler>(handler)] {
        return service->AcquireTokenByGSS(spec, handler);
      },
      completion);
}

void SecurityTokenServiceImpl::AcquireTokenByCertificateAsync(const TokenSpec &spec,
                                                              const TokenCompletion &completion) const {
  SyncToAsyncCall([service = ShareCopy(), spec] { return service->AcquireTokenByCertificate(spec); }, completion);
}

void SecurityTokenServiceImpl::AcquireTokenByTokenAsync(const std::shared_ptr<const SamlToken> &token,
                                                        const TokenSpec &spec,
                                                        const TokenCompletion &completion) const {
  SyncToAsyncCall([service = ShareCopy(), token = PassByRefHelper<const SamlToken>(token),
                   spec] { return service->AcquireTokenByToken(token, spec); },
                  completion);
}

void SecurityTokenServiceImpl::ValidateSubjectAsync(const std::shared_ptr<const SamlToken> &token,
                                                    const ValidityCompletion &completion) const {
  SyncToAsyncCall([service = ShareCopy(),
                   token = PassByRefHelper<const SamlToken>(token)] { return service->ValidateSubject(token); },
                  completion, boost::optional<bool>());
}

void SecurityTokenServiceImpl::RenewTokenAsync(const std::shared_ptr<const SamlToken> &token, std::int64_t lifetimeSec,
                                               const TokenCompletion &completion) const {
  SyncToAsyncCall([service = ShareCopy(), token = PassByRefHelper<const SamlToken>(token),
                   lifetimeSec] { return service->RenewToken(token, lifetimeSec); },
                  completion);
}

std::shared_ptr<const SecurityTokenService> SecurityTokenServiceImpl::ShareCopy() const {
  return std::make_shared<const SecurityTokenServiceImpl>(*this);
}

} // namespace SsoClient
