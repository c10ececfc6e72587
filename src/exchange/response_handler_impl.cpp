// SPDX-License-Identifier: Apache-2.0

#include "exchange/response_handler_impl.h"

#include "exchange/response_extractors.h"
#include "exchange/soap_response.h"

#include <ssoclient/exceptions.h>
#include <tarvel/core/ref.h>
#include <tarvel/xml/node.h>

namespace SsoClient {

using Tarvel::Xml::ElementNode;

/// The result of `extractor` for the body of a response that is not a fault. The name of the root element is ignored.
template <typename Extractor>
auto ResponseHandlerImpl::ProcessResponseWith(Tarvel::Reader &response, const Extractor &extractor) const {
  const Tarvel::Ref<const ElementNode> envelope = ParseResponseDocument(response);
  CheckSoapFault(*envelope, m_listener, m_dialect);
  const ElementNode *const body = envelope->FindChildElement("Body");
  if (!body) {
    // "SAOP" is the established spelling of the message.
    throw SsoException("Unexpected response format: missing SAOP Body.");
  }
  return extractor(*body, m_dialect);
}

void ResponseHandlerImpl::HandleAcquireTokenResponse(Tarvel::Reader *response, std::string &tokenXml) const {
  tokenXml = ProcessResponseWith(*response, ExtractIssuedToken);
}

bool ResponseHandlerImpl::HandleValidateSubjectResponse(Tarvel::Reader *response) const {
  return ProcessResponseWith(*response, ExtractValidationStatus);
}

void ResponseHandlerImpl::HandleRenewTokenResponse(Tarvel::Reader *response, std::string &tokenXml) const {
  tokenXml = ProcessResponseWith(*response, ExtractRenewedToken);
}

void ResponseHandlerImpl::HandleSPNegoResponse(Tarvel::Reader *response, SPNegoResponse &spnego) const {
  SPNegoResponse leg = ProcessResponseWith(*response, ExtractSPNegoLeg);
  spnego.contextId.swap(leg.contextId);
  spnego.leg.swap(leg.leg);
  spnego.tokenXml.swap(leg.tokenXml);
}

std::shared_ptr<const ResponseHandler> ResponseHandlerImpl::WithFaultListener(FaultListener &listener) const {
  return std::make_shared<const ResponseHandlerImpl>(m_dialect, &listener);
}

} // namespace SsoClient
