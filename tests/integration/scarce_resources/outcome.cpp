// SPDX-License-Identifier: Apache-2.0

#include "outcome.h"

#include "support/completion.h"
#include "support/posting_server.h"
#include "support/service_stand_ins.h"

#include "core/demangle.h"

#include <future>
#include <memory>
#include <typeinfo>

namespace Testing {

namespace {

std::string Describe(const std::exception &failure) {
  return Tarvel::Demangle(typeid(failure).name()) + ": " + failure.what();
}

} // namespace

ServicePtr ServiceAt(const std::string &url) {
  return SsoClient::CreateSecurityTokenService(ConfigFor(url));
}

std::string Acquire(const ServicePtr &service) {
  try {
    return service->AcquireToken("alice", "secret", SpecFor(3600))->GetSubject().ToString();
  } catch (const std::exception &failure) {
    return Describe(failure);
  }
}

std::string AcquireAsynchronously(const ServicePtr &service) {
  const auto outcome = std::make_shared<std::promise<std::string>>();
  try {
    service->AcquireTokenAsync(
        "alice", "secret", SpecFor(3600),
        [outcome](const std::shared_ptr<const SsoClient::SamlToken> &token, const Tarvel::Exception *failure) {
          outcome->set_value(failure ? Describe(*failure) : token->GetSubject().ToString());
        });
  } catch (const std::exception &failure) {
    return "thrown " + Describe(failure);
  }
  std::future<std::string> future = outcome->get_future();
  return future.wait_for(PATIENCE) == std::future_status::ready ? future.get() : "(never called)";
}

} // namespace Testing
