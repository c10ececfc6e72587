// SPDX-License-Identifier: Apache-2.0

#include <ssoclient/gssapi/negotiation_observer.h>

namespace SsoClient::Gssapi {

void NegotiationObserver::OnLeg(const NegotiationLegEvent &) {}
void NegotiationObserver::OnFailed(int, const std::exception &) {}

} // namespace SsoClient::Gssapi
