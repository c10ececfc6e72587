// SPDX-License-Identifier: Apache-2.0

#include "doctor_answer.h"

#include "doctor_namespaces.h"

#include <tarvel/core/checked_cast.h>
#include <tarvel/core/string_util.h>
#include <tarvel/io/reader.h>
#include <tarvel/xml/document.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/parser.h>

#include <algorithm>
#include <initializer_list>
#include <iterator>

namespace SsoClient::Tool {
namespace {

using Kind = ServiceAnswer::Kind;
using Tarvel::Xml::AsElement;
using Tarvel::Xml::AsText;
using Tarvel::Xml::ElementNode;
using Tarvel::Xml::Node;
using Tarvel::Xml::QName;

constexpr const char *WRONG_ADDRESS = "Correct the path in --sts: it must be the address at which the service speaks "
                                      "WS-Trust 1.3 in SOAP 1.1.";

struct KindRow {
  Kind kind;
  const char *name;
  const char *description;
};

constexpr KindRow KINDS[] = {
    {Kind::EMPTY, "empty", "empty"},
    {Kind::HTML, "html", "an HTML page"},
    {Kind::TEXT, "text", "neither XML nor HTML"},
    {Kind::MALFORMED, "malformed xml", "XML that is not well-formed"},
    {Kind::XML, "xml", "XML without SOAP"},
    {Kind::SOAP_12, "soap 1.2", "a message in SOAP 1.2"},
    {Kind::SOAP_11_FAULT, "soap 1.1 fault", "a SOAP 1.1 fault"},
    {Kind::SOAP_11_MESSAGE, "soap 1.1 message", "a SOAP 1.1 message"},
};

const KindRow &RowOf(Kind kind) {
  return *std::find_if(std::begin(KINDS), std::end(KINDS) - 1, [kind](const KindRow &row) { return row.kind == kind; });
}

bool BeginsWith(std::string_view text, std::string_view begin) {
  return text.substr(0, begin.size()) == begin;
}

/// The first characters of the body that are not white space, in lower case.
std::string BeginOf(std::string_view body) {
  constexpr std::size_t ENOUGH = 64;
  const std::size_t start = body.find_first_not_of(" \t\r\n");
  return start == std::string_view::npos ? "" : Tarvel::StringUtil::ToLower(body.substr(start, ENOUGH));
}

bool IsHtml(std::string_view begin, std::string_view contentType) {
  return BeginsWith(begin, "<!doctype html") || BeginsWith(begin, "<html") ||
         BeginsWith(Tarvel::StringUtil::ToLower(contentType.substr(0, 9)), "text/html");
}

const ElementNode *FirstChildElement(const ElementNode &parent) {
  for (const Node *child = parent.GetFirstChild(); child; child = child->GetNextSibling()) {
    if (const ElementNode *const element = AsElement(child)) {
      return element;
    }
  }
  return nullptr;
}

/// The text directly in the child element of that name; empty if that has no text, or if there is no such child.
std::string_view TextOfChild(const ElementNode &parent, std::string_view name, const ElementNode *&child) {
  child = parent.FindChildElement(name);
  for (const Node *node = child ? child->GetFirstChild() : nullptr; node; node = node->GetNextSibling()) {
    if (const auto *const text = AsText(node)) {
      return text->GetValue();
    }
  }
  return {};
}

std::string_view Trim(std::string_view text) {
  constexpr std::string_view BLANKS = " \t\r\n";
  const std::size_t start = text.find_first_not_of(BLANKS);
  return start == std::string_view::npos ? std::string_view()
                                         : text.substr(start, text.find_last_not_of(BLANKS) + 1 - start);
}

/// A code without a prefix is in the namespace of SOAP's own codes.
QName ResolveCode(const ElementNode &element, std::string_view code) {
  const std::size_t colon = code.find(':');
  std::string_view uri = SoapNamespaces::SOAP_11;
  if (colon != std::string_view::npos && !element.LookupNamespace(code.substr(0, colon), uri)) {
    uri = {};
  }
  return {std::string(uri), std::string(colon == std::string_view::npos ? code : code.substr(colon + 1))};
}

void ReadFault(const ElementNode &fault, ServiceAnswer &answer) {
  answer.kind = Kind::SOAP_11_FAULT;
  const ElementNode *element = nullptr;
  answer.faultCode = Trim(TextOfChild(fault, "faultcode", element));
  if (element) {
    answer.faultName = ResolveCode(*element, answer.faultCode);
  }
  answer.faultText = Trim(TextOfChild(fault, "faultstring", element));
}

void ReadTree(const ElementNode &root, ServiceAnswer &answer) {
  answer.element = root.GetQName();
  if (root.HasQName(SoapNamespaces::SOAP_12, "Envelope")) {
    answer.kind = Kind::SOAP_12;
    return;
  }
  answer.kind = Kind::XML;
  if (!root.HasQName(SoapNamespaces::SOAP_11, "Envelope")) {
    return;
  }
  answer.kind = Kind::SOAP_11_MESSAGE;
  const ElementNode *const body = root.FindChildElement(QName(std::string(SoapNamespaces::SOAP_11), "Body"));
  const ElementNode *const first = body ? FirstChildElement(*body) : nullptr;
  answer.element = first ? first->GetQName() : QName();
  if (first && first->HasQName(SoapNamespaces::SOAP_11, "Fault")) {
    ReadFault(*first, answer);
  }
}

bool IsAnyOf(std::string_view name, std::initializer_list<std::string_view> names) {
  return std::find(names.begin(), names.end(), name) != names.end();
}

/// Whether the fault reports that credentials are missing.
bool AsksForCredentials(const ServiceAnswer &answer) {
  if (answer.faultName.namespaceUri == SoapNamespaces::WSSE ||
      answer.faultName.namespaceUri == SoapNamespaces::WSSE_11) {
    return true; // each code of WS-Security is about the security header
  }
  if (answer.faultName.namespaceUri == SoapNamespaces::TRUST) {
    return IsAnyOf(answer.faultName.localName, {"FailedAuthentication", "InvalidSecurityToken"});
  }
  const std::string text = Tarvel::StringUtil::ToLower(std::string_view(answer.faultText).substr(0, 4096));
  const auto says = [&text](const char *word) { return text.find(word) != std::string::npos; };
  return says("security header") || says("authenticat") || says("wsse");
}

std::string DescribeFault(const ServiceAnswer &answer) {
  const std::string code = answer.faultCode.empty()                ? "no code"
                           : answer.faultName.namespaceUri.empty() ? Shown(answer.faultCode) + " (prefix not bound)"
                                                                   : Shown(answer.faultName.ToString());
  return "fault " + code + (answer.faultText.empty() ? "" : ": " + Shown(answer.faultText));
}

void CheckFault(const ServiceAnswer &answer, DoctorCheck &check) {
  check.facts["faultNamespace"] = Shown(answer.faultName.namespaceUri);
  check.facts["faultName"] = Shown(answer.faultName.localName);
  check.facts["faultText"] = Shown(answer.faultText);
  if (AsksForCredentials(answer)) {
    check.found.emplace_back("The service speaks WS-Trust, and asks for credentials.");
  } else if (answer.faultName.namespaceUri == SoapNamespaces::TRUST) {
    check.found.emplace_back("The service speaks WS-Trust, and refuses the empty request.");
  } else {
    check.found.emplace_back("A SOAP 1.1 service answers, but its fault does not say whether it speaks WS-Trust.");
    check.Warn("Make sure that --sts is the address of a token service.");
  }
  check.found.push_back("It answered with the " + DescribeFault(answer) + ".");
}

void CheckMessage(const ServiceAnswer &answer, DoctorCheck &check) {
  const bool isResponse =
      IsAnyOf(answer.element.localName, {"RequestSecurityTokenResponse", "RequestSecurityTokenResponseCollection"});
  if (isResponse && answer.element.namespaceUri == SoapNamespaces::TRUST) {
    check.found.emplace_back("The service speaks WS-Trust, and answered the empty request.");
    return;
  }
  check.found.push_back(
      isResponse ? "The service speaks another version of WS-Trust: " + Shown(answer.element.namespaceUri) + "."
                 : "A SOAP 1.1 service answers, but not with WS-Trust: its message contains " +
                       (answer.element.localName.empty() ? "nothing" : Shown(answer.element.ToString())) + ".");
  check.Fail(ExitCode::SERVICE_FAULT, WRONG_ADDRESS);
}

} // namespace

const char *NameOf(Kind kind) {
  return RowOf(kind).name;
}

const char *DescriptionOf(Kind kind) {
  return RowOf(kind).description;
}

ServiceAnswer ReadAnswer(const std::string &body, std::string_view contentType) {
  ServiceAnswer answer;
  const std::string begin = BeginOf(body);
  if (begin.empty()) {
    return answer;
  }
  if (IsHtml(begin, contentType)) {
    answer.kind = Kind::HTML;
    return answer;
  }
  try {
    const Tarvel::Ref<Tarvel::Reader> reader = Tarvel::CreateStringReader(body);
    const auto parser = Tarvel::Xml::CreateXMLParser(Tarvel::Xml::CreateXMLDocumentHandler());
    const auto document = Tarvel::CheckedCast<Tarvel::Xml::Document>(parser->Parse(*reader));
    ReadTree(*document->GetDocumentElement(), answer);
  } catch (const Tarvel::Xml::XMLParseException &failure) {
    answer.problem = failure.what();
    const bool isMarkup = begin.front() == '<' || BeginsWith(begin, "\xEF\xBB\xBF<");
    answer.kind = isMarkup ? Kind::MALFORMED : Kind::TEXT;
  }
  return answer;
}

DoctorCheck CheckTrust(const ServiceAnswer *answer) {
  DoctorCheck check("ws-trust");
  if (!answer) {
    check.Skip("There is no answer to read.");
    return check;
  }
  switch (answer->kind) {
  case Kind::SOAP_11_FAULT:
    CheckFault(*answer, check);
    break;
  case Kind::SOAP_11_MESSAGE:
    CheckMessage(*answer, check);
    break;
  case Kind::SOAP_12:
    check.found.emplace_back("The service answers in SOAP 1.2, which this client does not speak.");
    check.Fail(ExitCode::SERVICE_FAULT, WRONG_ADDRESS);
    break;
  case Kind::MALFORMED:
    check.found.push_back("The answer is not well-formed XML: " + Shown(answer->problem) + ".");
    check.Fail(ExitCode::SERVICE_FAULT, WRONG_ADDRESS);
    break;
  case Kind::XML:
    check.found.push_back("The answer is not SOAP, but XML with the element " + Shown(answer->element.ToString()) +
                          ".");
    check.Fail(ExitCode::SERVICE_FAULT, WRONG_ADDRESS);
    break;
  case Kind::EMPTY:
  case Kind::HTML:
  case Kind::TEXT:
    check.found.push_back(std::string("The answer is ") + DescriptionOf(answer->kind) + ", and not SOAP.");
    check.Fail(ExitCode::SERVICE_FAULT, WRONG_ADDRESS);
    break;
  }
  return check;
}

} // namespace SsoClient::Tool
