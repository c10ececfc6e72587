// SPDX-License-Identifier: Apache-2.0

#include "client/client_task.h"

#include "operation/required_object.h"

namespace SsoClient {

namespace {

/// Composes the request for each kind of task and credential.
struct Composer {
  void operator()(const Acquisition &acquisition) const {
    std::visit([&](const auto &credential) { Acquire(credential, acquisition.spec); }, acquisition.credential);
  }
  void operator()(const Renewal &renewal) const {
    steps.ComposeRenewal(Required(renewal.token), renewal.lifetimeSec, request, events);
  }
  void operator()(const Validation &validation) const {
    steps.ComposeValidation(Required(validation.token), request, events);
  }

  void Acquire(const PasswordCredential &credential, const TokenSpec &spec) const {
    steps.ComposeByPassword(credential.username, credential.password.Get(), spec, request, events);
  }
  void Acquire(const CertificateCredential &, const TokenSpec &spec) const {
    steps.ComposeByCertificate(spec, request);
  }
  void Acquire(const TokenCredential &credential, const TokenSpec &spec) const {
    steps.ComposeByToken(Required(credential.token), spec, request, events);
  }
  void Acquire(const NegotiationCredential &, const TokenSpec &) const {
    // Its requests are composed leg by leg.
  }

  const TokenSteps &steps;
  Request &request;
  OperationEvents &events;
};

const char *NameOfAcquisition(const Credential &credential) noexcept {
  if (std::holds_alternative<PasswordCredential>(credential)) {
    return "AcquireToken";
  }
  if (std::holds_alternative<CertificateCredential>(credential)) {
    return "AcquireTokenByCertificate";
  }
  return std::holds_alternative<TokenCredential>(credential) ? "AcquireTokenByToken" : "AcquireTokenByGSS";
}

} // namespace

TaskKind KindOf(const ClientTask &task) noexcept {
  if (const auto *const acquisition = std::get_if<Acquisition>(&task)) {
    return std::holds_alternative<NegotiationCredential>(acquisition->credential) ? TaskKind::NEGOTIATE
                                                                                  : TaskKind::ISSUE;
  }
  return std::holds_alternative<Renewal>(task) ? TaskKind::RENEW : TaskKind::VALIDATE;
}

const char *NameOf(const ClientTask &task) noexcept {
  if (const auto *const acquisition = std::get_if<Acquisition>(&task)) {
    return NameOfAcquisition(acquisition->credential);
  }
  return std::holds_alternative<Renewal>(task) ? "RenewToken" : "ValidateSubject";
}

void ComposeRequest(const ClientTask &task, const TokenSteps &steps, Request &request, OperationEvents &events) {
  std::visit(Composer{steps, request, events}, task);
}

} // namespace SsoClient
