// SPDX-License-Identifier: Apache-2.0

#include "documents.h"
#include "support/throws_message.h"

#include <tarvel/xml/security/canonicalizer.h>
#include <tarvel/xml/security/exceptions.h>

#include <gtest/gtest.h>

namespace {

namespace Uri = Tarvel::Xml::Security::CanonicalizationUri;
using Tarvel::Xml::Security::CreateCanonicalizer;
using Tarvel::Xml::Security::XmlSecurityException;
using Testing::CanonicalDocument;
using Testing::CanonicalForm;

constexpr std::string_view ALL_ALGORITHMS[] = {Uri::INCLUSIVE, Uri::INCLUSIVE_WITH_COMMENTS, Uri::EXCLUSIVE,
                                               Uri::EXCLUSIVE_WITH_COMMENTS};

TEST(CreateCanonicalizer, RefusesAndNamesAnotherAlgorithm) {
  EXPECT_THROWS_MESSAGE(CreateCanonicalizer("http://www.w3.org/2006/12/xml-c14n11"), XmlSecurityException,
                        "The canonicalization algorithm \"http://www.w3.org/2006/12/xml-c14n11\" is not accepted");
  EXPECT_THROWS_MESSAGE(CreateCanonicalizer(""), XmlSecurityException,
                        "The canonicalization algorithm \"\" is not accepted");
}

TEST(CreateCanonicalizer, RefusesInclusiveNamespacesForAnInclusiveAlgorithm) {
  EXPECT_THROWS_MESSAGE(CreateCanonicalizer(Uri::INCLUSIVE, {"p"}), XmlSecurityException,
                        "The canonicalization algorithm \"http://www.w3.org/TR/2001/REC-xml-c14n-20010315\" takes no "
                        "list of inclusive namespaces");
}

TEST(Canonicalize, RefusesAnElementWithAnUnboundPrefix) {
  for (const std::string_view algorithm : ALL_ALGORITHMS) {
    EXPECT_THROWS_MESSAGE(CanonicalDocument("<a>\n <p:b/></a>", algorithm), XmlSecurityException,
                          "No canonical form: the prefix \"p\" is not bound at line 2, column 2");
  }
}

TEST(Canonicalize, RefusesAnAttributeWithAnUnboundPrefix) {
  for (const std::string_view algorithm : ALL_ALGORITHMS) {
    EXPECT_THROWS_MESSAGE(CanonicalDocument("<a p:x=''/>", algorithm), XmlSecurityException,
                          "No canonical form: the prefix \"p\" is not bound at line 1, column 1");
  }
}

TEST(Canonicalize, RefusesARelativeNamespaceName) {
  for (const std::string_view algorithm : ALL_ALGORITHMS) {
    for (const std::string name : {"relative", "../up", "#x", "a/b:c", "//host/path", "?q"}) {
      EXPECT_THROWS_MESSAGE(CanonicalDocument("<a xmlns='" + name + "'/>", algorithm), XmlSecurityException,
                            "No canonical form: the namespace name \"" + name + "\" is relative at line 1, column 1");
    }
  }
}

TEST(Canonicalize, RefusesARelativeNamespaceNameOfAnAncestor) {
  const auto document = Testing::ParseDocument("<a xmlns:p='relative'><b/></a>");
  for (const std::string_view algorithm : ALL_ALGORITHMS) {
    EXPECT_THROW(CanonicalForm(Testing::FindElement(*document, "b"), algorithm), XmlSecurityException);
  }
}

TEST(Canonicalize, RefusesAPrefixBoundToTheEmptyNameInATreeMadeByHand) {
  Tarvel::Ref<Tarvel::Xml::ElementNode> element;
  Tarvel::Xml::CreateElementNode("", "a", element);
  element->DefineAttribute("xmlns:p", "");
  EXPECT_THROWS_MESSAGE(CanonicalForm(*element, Uri::INCLUSIVE), XmlSecurityException,
                        "No canonical form: the prefix \"p\" is bound to no namespace");
}

TEST(Canonicalize, RefusesAnAttributeThatOccursTwiceUnderTwoPrefixes) {
  Tarvel::Ref<Tarvel::Xml::ElementNode> element;
  Tarvel::Xml::CreateElementNode("", "a", element);
  element->DefineAttribute("xmlns:p", "urn:x");
  element->DefineAttribute("xmlns:q", "urn:x");
  element->DefineAttribute("p:n", "1");
  element->DefineAttribute("q:n", "2");
  EXPECT_THROWS_MESSAGE(CanonicalForm(*element, Uri::EXCLUSIVE), XmlSecurityException,
                        "No canonical form: the attribute \"q:n\" occurs twice");
}

TEST(Canonicalize, RefusesANamespaceNameThatIsTooLong) {
  const std::string longest = "urn:" + std::string(4092, 'x');
  EXPECT_NO_THROW(CanonicalDocument("<a xmlns='" + longest + "'/>", Uri::INCLUSIVE));
  EXPECT_THROWS_MESSAGE(CanonicalDocument("<a xmlns='" + longest + "x'/>", Uri::INCLUSIVE), XmlSecurityException,
                        "No canonical form: a namespace name is longer than 4096 bytes at line 1, column 1");
}

// Each of the many small elements would be written with the long declaration.
TEST(Canonicalize, RefusesADocumentWhoseExclusiveFormIsFarLongerThanItself) {
  std::string text = "<r xmlns:p='urn:" + std::string(4000, 'x') + "'>";
  for (int count = 0; count < 40'000; ++count) {
    text += "<p:a/>";
  }
  text += "</r>";
  EXPECT_THROWS_MESSAGE(CanonicalDocument(text, Uri::EXCLUSIVE), XmlSecurityException,
                        "The canonical form is longer than 134217728 bytes");
}

} // namespace
