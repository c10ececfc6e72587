// SPDX-License-Identifier: Apache-2.0

#include "documents.h"

#include <tarvel/xml/security/canonicalizer.h>

#include <gtest/gtest.h>

namespace {

namespace Uri = Tarvel::Xml::Security::CanonicalizationUri;
using Testing::CanonicalDocument;
using Testing::CanonicalForm;
using Testing::FindElement;
using Testing::ParseDocument;

// The examples of Canonical XML 1.0, section 3. The parser refuses document type declarations, so the examples are used
// without them. Nothing is then left of 3.5 (entity references) and 3.7 (XPath subsets).

constexpr std::string_view OUTSIDE_NODES = R"(<?xml version="1.0"?>

<?xml-stylesheet   href="doc.xsl"
   type="text/xsl"   ?>

<doc>Hello, world!<!-- Comment 1 --></doc>

<?pi-without-data     ?>

<!-- Comment 2 -->

<!-- Comment 3 -->
)";

TEST(CanonicalizeExample, NodesOutsideTheDocumentElementWithoutComments) {
  EXPECT_EQ(R"(<?xml-stylesheet href="doc.xsl"
   type="text/xsl"   ?>
<doc>Hello, world!</doc>
<?pi-without-data?>)",
            CanonicalDocument(OUTSIDE_NODES, Uri::INCLUSIVE));
}

TEST(CanonicalizeExample, NodesOutsideTheDocumentElementWithComments) {
  EXPECT_EQ(R"(<?xml-stylesheet href="doc.xsl"
   type="text/xsl"   ?>
<doc>Hello, world!<!-- Comment 1 --></doc>
<?pi-without-data?>
<!-- Comment 2 -->
<!-- Comment 3 -->)",
            CanonicalDocument(OUTSIDE_NODES, Uri::INCLUSIVE_WITH_COMMENTS));
}

TEST(CanonicalizeExample, WhiteSpaceInContentIsKept) {
  constexpr std::string_view TEXT = R"(<doc>
   <clean>   </clean>
   <dirty>   A   B   </dirty>
   <mixed>
      A
      <clean>   </clean>
      B
      <dirty>   A   B   </dirty>
      C
   </mixed>
</doc>)";
  EXPECT_EQ(TEXT, CanonicalDocument(TEXT, Uri::INCLUSIVE));
}

// Without the default attribute that the example declares for e9.
TEST(CanonicalizeExample, StartAndEndTags) {
  EXPECT_EQ(
      R"(<doc>
   <e1></e1>
   <e2></e2>
   <e3 id="elem3" name="elem3"></e3>
   <e4 id="elem4" name="elem4"></e4>
   <e5 xmlns="http://example.org" xmlns:a="http://www.w3.org" xmlns:b="http://www.ietf.org" attr="I'm" attr2="all" b:attr="sorted" a:attr="out"></e5>
   <e6 xmlns:a="http://www.w3.org">
      <e7 xmlns="http://www.ietf.org">
         <e8 xmlns="">
            <e9 xmlns:a="http://www.ietf.org"></e9>
         </e8>
      </e7>
   </e6>
</doc>)",
      CanonicalDocument(R"(<doc>
   <e1   />
   <e2   ></e2>
   <e3   name = "elem3"   id="elem3"   />
   <e4   name="elem4"   id="elem4"   ></e4>
   <e5 a:attr="out" b:attr="sorted" attr2="all" attr="I'm"
      xmlns:b="http://www.ietf.org"
      xmlns:a="http://www.w3.org"
      xmlns="http://example.org"/>
   <e6 xmlns="" xmlns:a="http://www.w3.org">
      <e7 xmlns="http://www.ietf.org">
         <e8 xmlns="" xmlns:a="http://www.w3.org">
            <e9 xmlns="" xmlns:a="http://www.ietf.org"/>
         </e8>
      </e7>
   </e6>
</doc>)",
                        Uri::INCLUSIVE));
}

// Without the attribute whose type the example declares as name tokens.
TEST(CanonicalizeExample, CharacterModifications) {
  EXPECT_EQ(R"(<doc>
   <text>First line&#xD;
Second line</text>
   <value>2</value>
   <compute>value&gt;"0" &amp;&amp; value&lt;"10" ?"valid":"error"</compute>
   <compute expr="value>&quot;0&quot; &amp;&amp; value&lt;&quot;10&quot; ?&quot;valid&quot;:&quot;error&quot;">valid</compute>
   <norm attr=" '    &#xD;&#xA;&#x9;   ' "></norm>
</doc>)",
            CanonicalDocument(R"(<doc>
   <text>First line&#x0d;&#10;Second line</text>
   <value>&#x32;</value>
   <compute><![CDATA[value>"0" && value<"10" ?"valid":"error"]]></compute>
   <compute expr='value>"0" &amp;&amp; value&lt;"10" ?"valid":"error"'>valid</compute>
   <norm attr=' &apos;   &#x20;&#13;&#xa;&#9;   &apos; '/>
</doc>)",
                              Uri::INCLUSIVE));
}

// Without the encoding declaration of the example: the parser accepts no encoding but UTF-8 and its subset US-ASCII.
TEST(CanonicalizeExample, Utf8Encoding) {
  EXPECT_EQ("<doc>\xC2\xA9</doc>", CanonicalDocument("<doc>&#169;</doc>", Uri::INCLUSIVE));
}

// The examples of Exclusive XML Canonicalization 1.0, section 2: one element in two envelopes.

constexpr std::string_view FIRST_ENVELOPE = R"(<n0:local xmlns:n0="foo:bar"
          xmlns:n3="ftp://example.org">
  <n1:elem2 xmlns:n1="http://example.net"
            xml:lang="en">
    <n3:stuff xmlns:n3="ftp://example.org"/>
  </n1:elem2>
</n0:local>)";

constexpr std::string_view SECOND_ENVELOPE = R"(<n2:pdu xmlns:n1="http://example.com"
        xmlns:n2="http://foo.example"
        xml:lang="fr"
        xml:space="retain">
  <n1:elem2 xmlns:n1="http://example.net"
            xml:lang="en">
    <n3:stuff xmlns:n3="ftp://example.org"/>
  </n1:elem2>
</n2:pdu>)";

std::string CanonicalElem2(std::string_view text, std::string_view uri, const std::vector<std::string> &prefixes = {}) {
  const auto document = ParseDocument(text);
  return CanonicalForm(FindElement(*document, "elem2"), uri, prefixes);
}

TEST(CanonicalizeExample, InclusiveFormOfAnElementInheritsTheDeclarationsOfItsEnvelope) {
  EXPECT_EQ(R"(<n1:elem2 xmlns:n0="foo:bar" xmlns:n1="http://example.net" xmlns:n3="ftp://example.org" xml:lang="en">
    <n3:stuff></n3:stuff>
  </n1:elem2>)",
            CanonicalElem2(FIRST_ENVELOPE, Uri::INCLUSIVE));
  EXPECT_EQ(
      R"(<n1:elem2 xmlns:n1="http://example.net" xmlns:n2="http://foo.example" xml:lang="en" xml:space="retain">
    <n3:stuff xmlns:n3="ftp://example.org"></n3:stuff>
  </n1:elem2>)",
      CanonicalElem2(SECOND_ENVELOPE, Uri::INCLUSIVE));
}

TEST(CanonicalizeExample, ExclusiveFormOfAnElementIsTheSameInEveryEnvelope) {
  const std::string expected = R"(<n1:elem2 xmlns:n1="http://example.net" xml:lang="en">
    <n3:stuff xmlns:n3="ftp://example.org"></n3:stuff>
  </n1:elem2>)";
  EXPECT_EQ(expected, CanonicalElem2(FIRST_ENVELOPE, Uri::EXCLUSIVE));
  EXPECT_EQ(expected, CanonicalElem2(SECOND_ENVELOPE, Uri::EXCLUSIVE));
}

TEST(Canonicalize, DeclaresInclusiveNamespacesEvenIfUnused) {
  EXPECT_EQ(R"(<n1:elem2 xmlns:n1="http://example.net" xmlns:n2="http://foo.example" xml:lang="en">
    <n3:stuff xmlns:n3="ftp://example.org"></n3:stuff>
  </n1:elem2>)",
            CanonicalElem2(SECOND_ENVELOPE, Uri::EXCLUSIVE, {"n2", "notdeclared"}));
}

TEST(Canonicalize, DeclaresTheInclusiveDefaultNamespaceEvenIfUnused) {
  constexpr std::string_view TEXT = R"(<a xmlns="urn:a"><p:elem2 xmlns:p="urn:p"><c xmlns=""/></p:elem2></a>)";
  EXPECT_EQ(R"(<p:elem2 xmlns:p="urn:p"><c></c></p:elem2>)", CanonicalElem2(TEXT, Uri::EXCLUSIVE));
  EXPECT_EQ(R"(<p:elem2 xmlns="urn:a" xmlns:p="urn:p"><c xmlns=""></c></p:elem2>)",
            CanonicalElem2(TEXT, Uri::EXCLUSIVE, {"#default"}));
}

TEST(Canonicalize, TreatsTheInclusiveUriWithALoneNumberSignAsTheInclusiveAlgorithm) {
  EXPECT_EQ(CanonicalDocument(FIRST_ENVELOPE, Uri::INCLUSIVE),
            CanonicalDocument(FIRST_ENVELOPE, std::string(Uri::INCLUSIVE) + "#"));
}

TEST(Canonicalize, KeepsCommentsInTheExclusiveFormOnlyIfAskedTo) {
  constexpr std::string_view TEXT = "<!--1--><doc><!--2--></doc><!--3-->";
  EXPECT_EQ("<doc></doc>", CanonicalDocument(TEXT, Uri::EXCLUSIVE));
  EXPECT_EQ("<!--1-->\n<doc><!--2--></doc>\n<!--3-->", CanonicalDocument(TEXT, Uri::EXCLUSIVE_WITH_COMMENTS));
}

TEST(Canonicalize, DeclaresANamespaceInTheExclusiveFormOnEachBranchThatUsesIt) {
  EXPECT_EQ(R"(<r><p:a xmlns:p="urn:p"><p:b></p:b></p:a><p:c xmlns:p="urn:p"></p:c><d xmlns:p="urn:p" p:e=""></d></r>)",
            CanonicalDocument(R"(<r xmlns:p="urn:p"><p:a><p:b/></p:a><p:c/><d p:e=""/></r>)", Uri::EXCLUSIVE));
}

TEST(Canonicalize, WritesARedeclaredPrefixWhereItsMeaningChanges) {
  constexpr std::string_view TEXT =
      R"(<p:a xmlns:p="urn:1"><p:b xmlns:p="urn:2"><p:c xmlns:p="urn:1"/></p:b><p:d xmlns:p="urn:1"/></p:a>)";
  constexpr std::string_view CANONICAL =
      R"(<p:a xmlns:p="urn:1"><p:b xmlns:p="urn:2"><p:c xmlns:p="urn:1"></p:c></p:b><p:d></p:d></p:a>)";
  EXPECT_EQ(CANONICAL, CanonicalDocument(TEXT, Uri::INCLUSIVE));
  EXPECT_EQ(CANONICAL, CanonicalDocument(TEXT, Uri::EXCLUSIVE));
}

TEST(Canonicalize, InheritsTheNearestXmlAttributeOfTheAncestors) {
  const auto document = ParseDocument(R"(<a xml:lang="en" xml:space="preserve"><b xml:lang="de"><c x="y"/></b></a>)");
  EXPECT_EQ(R"(<c x="y" xml:lang="de" xml:space="preserve"></c>)",
            CanonicalForm(FindElement(*document, "c"), Uri::INCLUSIVE));
  EXPECT_EQ(R"(<c x="y"></c>)", CanonicalForm(FindElement(*document, "c"), Uri::EXCLUSIVE));
}

TEST(Canonicalize, NeverWritesADeclarationOfTheXmlPrefix) {
  EXPECT_EQ(
      "<a xml:lang=\"en\"></a>",
      CanonicalDocument(R"(<a xmlns:xml="http://www.w3.org/XML/1998/namespace" xml:lang="en"/>)", Uri::INCLUSIVE));
}

TEST(Canonicalize, WritesATextThatIsLongerThanAnyBuffer) {
  const std::string text = "<doc>" + std::string(100'000, 'x') + "</doc>";
  EXPECT_EQ(text, CanonicalDocument(text, Uri::INCLUSIVE));
}

} // namespace
