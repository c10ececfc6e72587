// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/operation_observer.h>

namespace SsoClient {

void OperationObserver::OnStarted(const OperationInfo &) {}
void OperationObserver::OnRequestSent(const OperationInfo &, const RequestSentEvent &) {}
void OperationObserver::OnResponseReceived(const OperationInfo &, const ResponseReceivedEvent &) {}
void OperationObserver::OnFault(const OperationInfo &, const FaultEvent &) {}
void OperationObserver::OnEnded(const OperationInfo &, const OperationEndedEvent &) {}

} // namespace SsoClient
