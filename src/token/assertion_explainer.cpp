// SPDX-License-Identifier: Apache-2.0

#include "token/assertion_explainer.h"

#include "token/saml2_explainer.h"
#include "token/strict_explainer.h"

namespace SsoClient {

void ExplainAssertion(const Tarvel::Xml::ElementNode &root, const Tarvel::Xml::Security::KeyInfoResolver &resolver,
                      const VerifyOptions &options, TokenReport &report, ReportRecorder &recorder) {
  const ExplainContext context{resolver, options, report, recorder};
  if (options.profile == TokenProfile::SAML2) {
    Saml2Explainer(context).Explain(root);
  } else {
    StrictExplainer(context).Explain(root);
  }
}

} // namespace SsoClient
