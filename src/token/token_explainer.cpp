// SPDX-License-Identifier: Apache-2.0

#include "token/token_explainer.h"

#include "token/assertion_explainer.h"
#include "token/report_recorder.h"
#include "token/trusted_keys.h"
#include "xml/xml_text.h"

#include <tarvel/xml/document.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/exceptions.h>

#include <algorithm>

namespace SsoClient {

namespace {

using Check = TokenReport::Check;
using CheckResult = TokenReport::CheckResult;
using Tarvel::Ref;
using Tarvel::Xml::Document;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Security::KeyInfoResolver;

/// Null if the text is not well-formed.
Ref<Document> ExplainText(const std::string &xml, ReportRecorder &recorder) {
  Ref<Document> document;
  recorder.Begin(Check::WELL_FORMED);
  try {
    ParseXML(xml, document);
    recorder.Summarize("The text is a well-formed XML document of " + std::to_string(xml.size()) + " bytes.");
  } catch (const Tarvel::Xml::XMLParseException &error) {
    recorder.AddAt({error.what(), nullptr, {}, {}, {}, 0}, error.GetLine(), error.GetColumn());
    recorder.Summarize("The text of " + std::to_string(xml.size()) +
                       " bytes is not a well-formed XML document within the limits.");
  }
  return document;
}

/// The token's text would be the element's canonical form, so `Verify` makes this form before it checks anything.
void ExplainCanonicalForm(const ElementNode &element, ReportRecorder &recorder) {
  recorder.Begin(Check::WELL_FORMED);
  try {
    CanonicalElementText(element);
    recorder.Summarize("The element is parsed already and has a canonical form.");
  } catch (const Tarvel::Xml::Security::XmlSecurityException &error) {
    recorder.Add({error.what(), &element, {}, {}, {}, 0});
    recorder.Summarize("The element has no canonical form.");
  }
}

/// Sets what is the same for every report; `explain` runs the checks.
template <typename ExplainChecks>
TokenReport MakeReport(const KeyInfoResolver &resolver, const ExplainChecks &explain) {
  TokenReport report;
  report.checkedAt = Tarvel::System::GetUtcDateTime();
  report.trustedKeys = DescribeTrustedKeys(resolver);
  ReportRecorder recorder(report);
  explain(report, recorder);
  report.accepted = std::all_of(report.checks.begin(), report.checks.end(), [](const CheckResult &result) {
    return result.outcome == TokenReport::Outcome::PASSED;
  });
  return report;
}

} // namespace

TokenReport ExplainToken(const std::string &xml, const KeyInfoResolver &resolver, const VerifyOptions &options) {
  return MakeReport(resolver, [&](TokenReport &report, ReportRecorder &recorder) {
    const Ref<Document> document = ExplainText(xml, recorder);
    if (document) {
      ExplainAssertion(*document->GetDocumentElement(), resolver, options, report, recorder);
    } else {
      recorder.SkipFrom(Check::FORM, "The text could not be parsed.");
    }
  });
}

TokenReport ExplainToken(const ElementNode &element, const KeyInfoResolver &resolver, const VerifyOptions &options) {
  return MakeReport(resolver, [&](TokenReport &report, ReportRecorder &recorder) {
    ExplainCanonicalForm(element, recorder);
    ExplainAssertion(element, resolver, options, report, recorder);
  });
}

} // namespace SsoClient
