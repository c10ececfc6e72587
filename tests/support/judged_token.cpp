// SPDX-License-Identifier: Apache-2.0

#include "support/judged_token.h"

#include "support/exception_class.h"
#include "support/report_places.h"
#include "support/report_rules.h"
#include "support/report_texts.h"
#include "xml/xml_text.h"

#include <tarvel/xml/parser.h>

namespace Testing {

using namespace SsoClient;

namespace {

template <typename Input>
Verification TryToVerify(const TokenVerifier &verifier, const Input &input) {
  Verification verification;
  try {
    verification.token = verifier.Verify(input);
  } catch (const Tarvel::Xml::XMLParseException &failure) {
    verification.line = failure.GetLine();
    verification.column = failure.GetColumn();
    verification.exceptionClass = ClassOf(failure);
    verification.refusal = failure.what();
  } catch (const std::exception &failure) {
    verification.exceptionClass = ClassOf(failure);
    verification.refusal = failure.what();
  }
  return verification;
}

template <typename Input>
Judgement Judge(const JudgedVerifier &verifier, const Input &input) {
  Judgement judgement;
  judgement.verification = TryToVerify(verifier.verifier, input);
  try {
    judgement.report = verifier.verifier.Explain(input);
    const TokenReport again = verifier.verifier.Explain(input);
    judgement.contradictions = FindContradictions(judgement.report, judgement.verification, verifier);
    if (DescribeReport(again) != DescribeReport(judgement.report)) {
      judgement.contradictions += "a second report differs\n";
    }
  } catch (const std::exception &failure) {
    judgement.contradictions += std::string("Explain throws: ") + failure.what() + '\n';
  }
  return judgement;
}

} // namespace

Judgement JudgeText(const JudgedVerifier &verifier, const std::string &xml) {
  Judgement judgement = Judge(verifier, xml);
  if (judgement.verification.exceptionClass == "XmlSecurityException") {
    judgement.contradictions += "Verify throws XmlSecurityException for a text\n";
  }
  if (judgement.verification.token && judgement.verification.token->ToXml() != xml) {
    judgement.contradictions += "the token's text is not the verified text\n";
  }
  if (judgement.verification.exceptionClass != "XMLParseException") {
    Tarvel::Ref<Tarvel::Xml::Document> document;
    ParseXML(xml, document);
    judgement.contradictions += FindWrongPlaces(judgement.report, *document);
  }
  return judgement;
}

Judgement JudgeElement(const JudgedVerifier &verifier, const Tarvel::Xml::ElementNode &element) {
  Judgement judgement = Judge(verifier, element);
  if (judgement.verification.exceptionClass == "XMLParseException") {
    judgement.contradictions += "Verify throws XMLParseException for an element\n";
  }
  return judgement;
}

} // namespace Testing
