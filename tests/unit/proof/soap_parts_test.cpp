// SPDX-License-Identifier: Apache-2.0

#include "proof/soap_parts.h"

#include "support/xml_tree.h"

#include <gtest/gtest.h>

#include <string>

namespace SsoClient {
namespace {

using Tarvel::Xml::Document;
using Tarvel::Xml::ElementNode;
using ::Testing::ParseDocument;

const std::string SOAP11 = "http://schemas.xmlsoap.org/soap/envelope/";
const std::string SOAP12 = "http://www.w3.org/2003/05/soap-envelope";
const std::string WSSE = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";
const std::string WSU = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";
const std::string ULTIMATE = "http://www.w3.org/2003/05/soap-envelope/role/ultimateReceiver";
const std::string NEXT = "http://www.w3.org/2003/05/soap-envelope/role/next";

/// A parsed document with its envelope.
struct Message {
  explicit Message(const std::string &text)
      : document(ParseDocument(text)), envelope(ReadEnvelope(document->GetDocumentElement())) {}

  Tarvel::Ref<Document> document;
  SoapEnvelope envelope;
};

std::string Envelope(const std::string &content, const std::string &uri = SOAP11) {
  return "<s:Envelope xmlns:s=\"" + uri + "\" xmlns:o=\"urn:other\" xmlns:wsse=\"" + WSSE + "\">" + content +
         "</s:Envelope>";
}

TEST(ReadEnvelope, FindsHeaderAndBodyOfBothVersions) {
  for (const SoapVersion version : {SoapVersion::SOAP11, SoapVersion::SOAP12}) {
    const Message message(Envelope(" <!--c--> <s:Header/><?p i?>\n<s:Body/> ", std::string(GetSoapNamespace(version))));
    EXPECT_EQ(message.envelope.fault, EnvelopeFault::NONE);
    EXPECT_EQ(message.envelope.place, nullptr);
    EXPECT_EQ(message.envelope.version, version);
    EXPECT_EQ(message.envelope.element, message.document->GetDocumentElement());
    EXPECT_EQ(message.envelope.header, message.envelope.element->FindChildElement("Header"));
    EXPECT_EQ(message.envelope.body, message.envelope.element->FindChildElement("Body"));
  }
}

TEST(ReadEnvelope, NeedsNoHeader) {
  const Message message("<Envelope xmlns=\"" + SOAP12 + "\"><Body/></Envelope>");
  EXPECT_EQ(message.envelope.fault, EnvelopeFault::NONE);
  EXPECT_EQ(message.envelope.header, nullptr);
  EXPECT_NE(message.envelope.body, nullptr);
}

TEST(ReadEnvelope, ReportsTheFirstFaultAndItsPlace) {
  struct {
    std::string text;
    EnvelopeFault fault;
    const char *place; // local name of the element, or its text
  } const cases[] = {
      {"<s:Body xmlns:s=\"" + SOAP11 + "\"/>", EnvelopeFault::NOT_AN_ENVELOPE, "Body"},
      {"<Envelope><Body/></Envelope>", EnvelopeFault::OTHER_VERSION, "Envelope"},
      {Envelope("<s:Body/>", SOAP11 + "x"), EnvelopeFault::OTHER_VERSION, "Envelope"},
      {Envelope(""), EnvelopeFault::NO_BODY, "Envelope"},
      {Envelope("<s:Header><s:Body/></s:Header>"), EnvelopeFault::NO_BODY, "Envelope"},
      {Envelope("<s:Header/><s:Header/><s:Body/>"), EnvelopeFault::SECOND_HEADER, "Header"},
      {Envelope("<s:Header/><s:Body/><s:Header/>"), EnvelopeFault::SECOND_HEADER, "Header"},
      {Envelope("<s:Body/><s:Header/>"), EnvelopeFault::HEADER_AFTER_BODY, "Header"},
      {Envelope("<s:Body/><s:Body/>"), EnvelopeFault::SECOND_BODY, "Body"},
      {Envelope("<o:Body/><s:Body/>"), EnvelopeFault::OTHER_CONTENT, "Body"},
      {Envelope("<s:Body/><o:Trailer/>"), EnvelopeFault::OTHER_CONTENT, "Trailer"},
      {Envelope("<s:Header/>text<s:Body/><s:Body/>"), EnvelopeFault::OTHER_CONTENT, "text"},
      {Envelope("<h:Header xmlns:h=\"" + SOAP12 + "\"/><s:Body/>"), EnvelopeFault::OTHER_CONTENT, "Header"},
      {Envelope("<h:Body xmlns:h=\"" + SOAP11 + "\"/>", SOAP12), EnvelopeFault::OTHER_CONTENT, "Body"},
  };
  for (const auto &[text, fault, place] : cases) {
    const Message message(text);
    EXPECT_EQ(message.envelope.fault, fault) << text;
    const ElementNode *const element = AsElement(message.envelope.place);
    const auto *const node = AsText(message.envelope.place);
    EXPECT_EQ(element ? element->GetLocalName() : (node ? node->GetValue() : "(null)"), place) << text;
  }
}

TEST(ReadEnvelope, ReportsThatThereIsNoElement) {
  const SoapEnvelope envelope = ReadEnvelope(nullptr);
  EXPECT_EQ(envelope.fault, EnvelopeFault::NOT_AN_ENVELOPE);
  EXPECT_EQ(envelope.place, nullptr);
}

TEST(ReadEnvelope, KeepsTheFirstHeaderAndTheFirstBody) {
  const Message message(Envelope("<s:Header/><s:Body n=\"1\"/><s:Header/><s:Body n=\"2\"/>"));
  EXPECT_EQ(message.envelope.header, AsElement(message.envelope.element->GetFirstChild()));
  ASSERT_NE(message.envelope.body, nullptr);
  EXPECT_EQ(message.envelope.body->GetFirstAttribute()->GetValue(), "1");
}

TEST(FindHeaderBlocks, FindsTheFirstTwoByTheirQualifiedName) {
  const Message message(Envelope("<s:Header><o:A n=\"1\"/><A/><x:A xmlns:x=\"urn:x\"/><o:B><o:A/></o:B><o:A n=\"2\"/>"
                                 "<o:A n=\"3\"/></s:Header><s:Body><o:B/></s:Body>"));
  const FoundElements a = FindHeaderBlocks(message.envelope, {"urn:other", "A"});
  ASSERT_NE(a.second, nullptr);
  EXPECT_EQ(a.first->GetFirstAttribute()->GetValue(), "1");
  EXPECT_EQ(a.second->GetFirstAttribute()->GetValue(), "2");
  const FoundElements b = FindHeaderBlocks(message.envelope, {"urn:other", "B"});
  EXPECT_EQ(b.first, message.envelope.header->FindChildElement("B"));
  EXPECT_EQ(b.second, nullptr);
  EXPECT_EQ(FindHeaderBlocks(message.envelope, {"", "A"}).first->GetName(), "A");
  EXPECT_EQ(FindHeaderBlocks(message.envelope, {"urn:other", "C"}).first, nullptr);
}

TEST(FindChildren, FindsNothingInANullElement) {
  EXPECT_EQ(FindChildren(nullptr, "", "a").first, nullptr);
}

/// The attribute "n" of the headers that are found for `role`, each followed by a space.
std::string SecurityHeaders(const std::string &headers, const std::string &role, const std::string &uri) {
  const Message message(Envelope("<s:Header>" + headers + "</s:Header><s:Body/>", uri));
  const FoundElements found = FindSecurityHeaders(message.envelope, role);
  std::string numbers;
  for (const ElementNode *const header : {found.first, found.second}) {
    numbers += header ? std::string(header->FindAttribute("", "n")->GetValue()) + " " : std::string();
  }
  return numbers;
}

TEST(FindSecurityHeaders, ComparesTheActorOfSoap11) {
  const std::string headers = "<o:Security n=\"0\"/><wsse:Security n=\"1\" s:actor=\"urn:a\"/>"
                              "<wsse:Security n=\"2\" actor=\"urn:a\"/><wsse:Security n=\"3\" s:role=\"urn:a\"/>"
                              "<wsse:Security n=\"4\" s:actor=\"" +
                              ULTIMATE + "\"/>";
  EXPECT_EQ(SecurityHeaders(headers, "urn:a", SOAP11), "1 ");
  EXPECT_EQ(SecurityHeaders(headers, "", SOAP11), "2 3 ");
  EXPECT_EQ(SecurityHeaders(headers, ULTIMATE, SOAP11), "4 ");
  EXPECT_EQ(SecurityHeaders(headers, "urn:A", SOAP11), "");
}

TEST(FindSecurityHeaders, ComparesTheRoleOfSoap12) {
  const std::string headers = "<wsse:Security n=\"1\" s:role=\"" + NEXT + "\"/><wsse:Security n=\"2\" s:role=\"\n" +
                              ULTIMATE + " \"/><wsse:Security n=\"3\" s:role=\"\"/><wsse:Security n=\"4\"/>";
  EXPECT_EQ(SecurityHeaders(headers, NEXT, SOAP12), "1 ");
  EXPECT_EQ(SecurityHeaders(headers, "", SOAP12), "2 3 ");
  EXPECT_EQ(SecurityHeaders(headers, " " + ULTIMATE, SOAP12), "2 3 ");
  EXPECT_EQ(SecurityHeaders("<wsse:Security n=\"1\" s:actor=\"urn:a\"/>", "urn:a", SOAP12), "");
  EXPECT_EQ(SecurityHeaders("<wsse:Security n=\"1\"/>", " ", SOAP12), "1 ");
}

TEST(FindSecurityHeaders, SearchesTheHeaderOnly) {
  const Message message(Envelope("<s:Header><o:A><wsse:Security/></o:A></s:Header><s:Body><wsse:Security/></s:Body>"));
  EXPECT_EQ(FindSecurityHeaders(message.envelope, "").first, nullptr);
  EXPECT_EQ(FindSecurityHeaders(Message(Envelope("<s:Body/>")).envelope, "").first, nullptr);
}

/// The name of the attribute that identifies an element with these attributes.
std::string IdentifierOf(const std::string &attributes) {
  const auto document = ParseDocument("<a xmlns:u=\"" + WSU + "\" xmlns:o=\"urn:other\" " + attributes + "/>");
  const auto *const attribute = FindIdentifier(*document->GetDocumentElement());
  return attribute ? std::string(attribute->GetName()) : "(none)";
}

TEST(FindIdentifier, PrefersTheIdentifierOfWsSecurity) {
  EXPECT_EQ(IdentifierOf("xml:id=\"d\" ID=\"c\" Id=\"b\" u:Id=\"a\""), "u:Id");
  EXPECT_EQ(IdentifierOf("xml:id=\"d\" ID=\"c\" Id=\"b\""), "Id");
  EXPECT_EQ(IdentifierOf("xml:id=\"d\" ID=\"c\""), "ID");
  EXPECT_EQ(IdentifierOf("xml:id=\"d\""), "xml:id");
}

TEST(FindIdentifier, IgnoresOtherNamesAndValuesThatNoReferenceCanContain) {
  EXPECT_EQ(IdentifierOf("id=\"a\" o:Id=\"b\" u:ID=\"c\" o:ID=\"d\""), "(none)");
  EXPECT_EQ(IdentifierOf("u:Id=\"\" Id=\"b\""), "Id");
  EXPECT_EQ(IdentifierOf("u:Id=\"a(1)\" ID=\"b\""), "ID");
}

TEST(IsIdentifier, AcceptsTheNamesThatReferencesCanResolve) {
  const auto document = ParseDocument("<a xmlns:u=\"" + WSU +
                                      "\" xmlns:o=\"urn:other\" Id=\"1\" ID=\"2\" u:Id=\"3\" xml:id=\"4\" "
                                      "id=\"5\" o:Id=\"6\" u:ID=\"7\" xml:Id=\"8\"/>");
  std::string identifiers;
  const ElementNode &element = *document->GetDocumentElement();
  for (const auto *attribute = element.GetFirstAttribute(); attribute; attribute = attribute->GetNext()) {
    identifiers += IsIdentifier(*attribute, element) ? std::string(attribute->GetValue()) : "";
  }
  EXPECT_EQ(identifiers, "1234");
}

} // namespace
} // namespace SsoClient
