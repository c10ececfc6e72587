// SPDX-License-Identifier: Apache-2.0

#include "documents.h"
#include "support/throws_message.h"

#include <tarvel/xml/security/exceptions.h>
#include <tarvel/xml/security/signature.h>

#include <gtest/gtest.h>

namespace {

using Tarvel::Xml::Security::SignatureSyntaxException;
using Testing::ParseDocument;
using Testing::Replaced;
using Testing::SignatureOf;

// The smallest signature that is well-formed, on one line.
const std::string MINIMAL =
    "<r><ds:Signature xmlns:ds='http://www.w3.org/2000/09/xmldsig#'><ds:SignedInfo>"
    "<ds:CanonicalizationMethod Algorithm='urn:c'/><ds:SignatureMethod Algorithm='urn:s'/>"
    "<ds:Reference URI='#a'><ds:DigestMethod Algorithm='urn:d'/><ds:DigestValue>AAAA</ds:DigestValue></ds:Reference>"
    "</ds:SignedInfo><ds:SignatureValue>AAAA</ds:SignatureValue></ds:Signature></r>";

void ReadSyntax(const std::string &text) {
  SignatureOf(*ParseDocument(text));
}

/// The message for `MINIMAL` with one text replaced, without the line and column at its end.
std::string SyntaxMessage(std::string_view from, std::string_view to) {
  try {
    ReadSyntax(Replaced(MINIMAL, from, to));
  } catch (const SignatureSyntaxException &exception) {
    const std::string message = exception.what();
    return message.substr(0, message.find(" at line 1, column "));
  }
  return "accepted";
}

TEST(CreateSignatureFromDom, AcceptsAWellFormedSignatureWithUnknownAlgorithms) {
  const auto signature = SignatureOf(*ParseDocument(MINIMAL));
  ASSERT_EQ(1u, signature->GetReferences().size());
  EXPECT_EQ("#a", signature->GetReferences().front().uri);
}

TEST(CreateSignatureFromDom, ListsReferencesInDocumentOrder) {
  const std::string second =
      "<ds:Reference URI=''><ds:Transforms><ds:Transform Algorithm='urn:t'><p x='y'/></ds:Transform>"
      "</ds:Transforms><ds:DigestMethod Algorithm='urn:d'/><ds:DigestValue>AA==</ds:DigestValue>"
      "</ds:Reference></ds:SignedInfo>";
  const auto signature = SignatureOf(*ParseDocument(Replaced(MINIMAL, "</ds:SignedInfo>", second)));
  ASSERT_EQ(2u, signature->GetReferences().size());
  EXPECT_EQ("#a", signature->GetReferences()[0].uri);
  EXPECT_EQ("", signature->GetReferences()[1].uri);
}

// A program can query what a signature covers before it verifies the signature. This one covers nothing.
TEST(CreateSignatureFromDom, AcceptsASignatureWithoutReferences) {
  const std::size_t begin = MINIMAL.find("<ds:Reference");
  const std::size_t end = MINIMAL.find("</ds:SignedInfo>");
  const auto signature = SignatureOf(*ParseDocument(std::string(MINIMAL).erase(begin, end - begin)));
  EXPECT_TRUE(signature->GetReferences().empty());
}

TEST(CreateSignatureFromDom, AcceptsWhiteSpaceAndCommentsBetweenElements) {
  EXPECT_EQ("accepted", SyntaxMessage("<ds:SignedInfo>", "\n <!-- a -->\t<ds:SignedInfo><!--b-->\n"));
  EXPECT_EQ("accepted", SyntaxMessage("'><ds:DigestMethod", "'>\r\n  <ds:DigestMethod"));
}

TEST(CreateSignatureFromDom, AcceptsIdsKeyInfoAndObjects) {
  EXPECT_EQ("accepted", SyntaxMessage("<ds:SignedInfo>", "<ds:SignedInfo Id='i'>"));
  EXPECT_EQ("accepted", SyntaxMessage("<ds:SignatureValue>", "<ds:SignatureValue Id='i'>"));
  EXPECT_EQ("accepted", SyntaxMessage("</ds:Signature>", "<ds:KeyInfo><a/>text</ds:KeyInfo></ds:Signature>"));
  EXPECT_EQ("accepted", SyntaxMessage("</ds:Signature>", "<ds:Object/><ds:Object/></ds:Signature>"));
}

TEST(CreateSignatureFromDom, ReportsWhereTheSyntaxIsWrong) {
  EXPECT_THROWS_MESSAGE(ReadSyntax(Replaced(MINIMAL, "<ds:SignedInfo>", "\n  <ds:Foo/><ds:SignedInfo>")),
                        SignatureSyntaxException,
                        "Expected ds:SignedInfo in \"ds:Signature\", but found \"ds:Foo\" at line 2, column 3");
}

TEST(CreateSignatureFromDom, RefusesAnElementThatIsNotASignature) {
  const auto document = ParseDocument("<a><Signature/></a>");
  EXPECT_THROWS_MESSAGE(SignatureOf(*document), SignatureSyntaxException,
                        "Expected ds:Signature, found \"Signature\" at line 1, column 4");
}

struct SyntaxFault {
  const char *from;
  const char *to;
  const char *message;
};

constexpr SyntaxFault FAULTS[] = {
    {"<ds:Signature xmlns:ds='http://www.w3.org/2000/09/xmldsig#'>", "<ds:Signature xmlns:ds='urn:other'>",
     "Expected ds:Signature, found \"ds:Signature\""},
    {"<ds:SignedInfo>", "<ds:SignedInfo xmlns:ds='urn:other'>",
     "Expected ds:SignedInfo in \"ds:Signature\", but found \"ds:SignedInfo\""},
    {"<ds:SignatureValue>AAAA</ds:SignatureValue>", "",
     "Expected ds:SignatureValue in \"ds:Signature\", but nothing follows"},
    {"</ds:Signature>", "<ds:Foo/></ds:Signature>", "Unexpected element \"ds:Foo\" in \"ds:Signature\""},
    {"</ds:Signature>", "<ds:KeyInfo/><ds:KeyInfo/></ds:Signature>",
     "Unexpected element \"ds:KeyInfo\" in \"ds:Signature\""},
    {"<ds:SignatureValue>", "<ds:KeyInfo/><ds:SignatureValue>",
     "Expected ds:SignatureValue in \"ds:Signature\", but found \"ds:KeyInfo\""},
    {"</ds:SignedInfo>", "text</ds:SignedInfo>", "Unexpected content in \"ds:SignedInfo\""},
    {"</ds:SignedInfo>", "<?pi?></ds:SignedInfo>", "Unexpected content in \"ds:SignedInfo\""},
    {"</ds:SignedInfo>", "<ds:KeyInfo/></ds:SignedInfo>", "Unexpected element \"ds:KeyInfo\" in \"ds:SignedInfo\""},
    {"<ds:SignatureMethod Algorithm='urn:s'/>", "",
     "Expected ds:SignatureMethod in \"ds:SignedInfo\", but found \"ds:Reference\""},
    {"<ds:SignatureMethod Algorithm='urn:s'/>", "<ds:SignatureMethod/>",
     "The element \"ds:SignatureMethod\" has no attribute \"Algorithm\""},
    {"<ds:SignatureMethod Algorithm='urn:s'/>", "<ds:SignatureMethod Algorithm='urn:s' Other=''/>",
     "Unexpected attribute \"Other\" of \"ds:SignatureMethod\""},
    {"<ds:SignatureMethod Algorithm='urn:s'/>", "<ds:SignatureMethod Algorithm='urn:s'>x</ds:SignatureMethod>",
     "Unexpected content in \"ds:SignatureMethod\""},
    {"<ds:SignatureMethod Algorithm", "<ds:SignatureMethod ds:Algorithm",
     "Unexpected attribute \"ds:Algorithm\" of \"ds:SignatureMethod\""},
    {"<ds:Reference URI='#a'>", "<ds:Reference>", "The element \"ds:Reference\" has no attribute \"URI\""},
    {"<ds:Reference URI='#a'>", "<ds:Reference URI='#a'><ds:Transforms/>",
     "Expected ds:Transform in \"ds:Transforms\", but nothing follows"},
    {"<ds:Reference URI='#a'>", "<ds:Reference URI='#a' xml:lang='en'>",
     "Unexpected attribute \"xml:lang\" of \"ds:Reference\""},
    {"<ds:DigestMethod Algorithm='urn:d'/>", "",
     "Expected ds:DigestMethod in \"ds:Reference\", but found \"ds:DigestValue\""},
    {"<ds:DigestValue>AAAA<", "<ds:DigestValue>AAA<", "The text of \"ds:DigestValue\" is not Base64"},
    {"<ds:DigestValue>AAAA<", "<ds:DigestValue> <", "The element \"ds:DigestValue\" must have text, and nothing else"},
    {"<ds:DigestValue>AAAA<", "<ds:DigestValue><", "The element \"ds:DigestValue\" must have text, and nothing else"},
    {"<ds:DigestValue>AAAA<", "<ds:DigestValue>AA<!---->AA<",
     "The element \"ds:DigestValue\" must have text, and nothing else"},
    {"<ds:SignatureValue>AAAA<", "<ds:SignatureValue>AA<b/>AA<",
     "The element \"ds:SignatureValue\" must have text, and nothing else"},
    {"<ds:SignatureValue>AAAA<", "<ds:SignatureValue>A-_A<", "The text of \"ds:SignatureValue\" is not Base64"},
    {"<ds:CanonicalizationMethod Algorithm='urn:c'/>",
     "<ds:CanonicalizationMethod Algorithm='urn:c'><e:InclusiveNamespaces "
     "xmlns:e='http://www.w3.org/2001/10/xml-exc-c14n#'/></ds:CanonicalizationMethod>",
     "The element \"e:InclusiveNamespaces\" has no attribute \"PrefixList\""},
    {"<ds:CanonicalizationMethod Algorithm='urn:c'/>",
     "<ds:CanonicalizationMethod Algorithm='urn:c'><e:InclusiveNamespaces PrefixList='' "
     "xmlns:e='http://www.w3.org/2001/10/xml-exc-c14n#'>x</e:InclusiveNamespaces></ds:CanonicalizationMethod>",
     "The element \"e:InclusiveNamespaces\" must be empty"},
};

TEST(CreateSignatureFromDom, RefusesWrongSyntax) {
  for (const SyntaxFault &fault : FAULTS) {
    EXPECT_EQ(fault.message, SyntaxMessage(fault.from, fault.to)) << fault.to;
  }
}

} // namespace
