// SPDX-License-Identifier: Apache-2.0

#include "dialect_file.h"

#include "dialect_switches.h"

#include "support/throws_message.h"
#include "support/work_folder.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <gtest/gtest.h>

#include <string>

#include <sys/stat.h>

namespace SsoClient::Tool {
namespace {

using Statement = ServiceDialect::Statement;
using UseKey = ServiceDialect::UseKey;
using Delegation = ServiceDialect::Delegation;

class DialectFile : public testing::Test {
protected:
  ServiceDialect Read(const std::string &text) const { return ReadDialectFile(m_folder.Write("a.json", text)); }

  const Testing::WorkFolder m_folder;
};

TEST_F(DialectFile, WithoutKeysIsTheDefaultDialect) {
  EXPECT_EQ(WriteDialect(ServiceDialect()), WriteDialect(Read("{}")));
}

TEST_F(DialectFile, SetsEachSwitch) {
  const ServiceDialect dialect = Read(R"({
    "charset": "utf-8", "applies-to": "urn:service", "addressing": true, "delegatable": "when-true",
    "renewing": "never", "use-key": "certificate", "delegation": "on-behalf-of", "token-type": "urn:type",
    "token-type-reference": "standard",
    "credential-faults": [{"namespace": "urn:a", "name": "No"}, {"name": "Never", "namespace": "urn:b"}],
    "any-response": true})");
  EXPECT_TRUE(dialect.declaresCharset);
  EXPECT_EQ("urn:service", dialect.appliesTo.value());
  EXPECT_TRUE(dialect.addressing);
  EXPECT_EQ(Statement::WHEN_TRUE, dialect.delegatable);
  EXPECT_EQ(Statement::NEVER, dialect.renewing);
  EXPECT_EQ(UseKey::CERTIFICATE, dialect.useKey);
  EXPECT_EQ(Delegation::ON_BEHALF_OF, dialect.delegation);
  EXPECT_EQ("urn:type", dialect.tokenType);
  EXPECT_TRUE(dialect.standardTokenTypeReference);
  ASSERT_EQ(2u, dialect.credentialFaults.size());
  EXPECT_EQ("urn:a", dialect.credentialFaults[0].namespaceUri);
  EXPECT_EQ("No", dialect.credentialFaults[0].localName);
  EXPECT_EQ("urn:b", dialect.credentialFaults[1].namespaceUri);
  EXPECT_EQ("Never", dialect.credentialFaults[1].localName);
  EXPECT_TRUE(dialect.acceptsAnyResponse);
}

TEST_F(DialectFile, ReadsTheOtherValuesOfTheSwitches) {
  EXPECT_FALSE(Read(R"({"base": "cxf", "charset": "none"})").declaresCharset);
  EXPECT_FALSE(Read(R"({"applies-to": "none"})").appliesTo);
  EXPECT_EQ(Statement::ALWAYS, Read(R"({"base": "cxf", "delegatable": "always"})").delegatable);
  EXPECT_EQ(UseKey::NEVER, Read(R"({"use-key": "never"})").useKey);
  EXPECT_EQ(UseKey::REFERENCE, Read(R"({"base": "cxf", "use-key": "reference"})").useKey);
  EXPECT_EQ(Delegation::ACT_AS, Read(R"({"delegation": "act-as"})").delegation);
  EXPECT_EQ(Delegation::DELEGATE_TO, Read(R"({"base": "cxf", "delegation": "delegate-to"})").delegation);
  EXPECT_FALSE(Read(R"({"base": "cxf", "token-type-reference": "established"})").standardTokenTypeReference);
  EXPECT_TRUE(Read(R"({"base": "cxf", "credential-faults": []})").credentialFaults.empty());
}

TEST_F(DialectFile, ChangesItsBaseEvenIfTheBaseIsTheLastKey) {
  EXPECT_EQ(WriteDialect(GetServiceDialect("cxf")), WriteDialect(Read(R"({"base": "cxf"})")));
  const ServiceDialect dialect = Read(R"({"delegatable": "when-true", "base": "cxf"})");
  EXPECT_EQ(Statement::WHEN_TRUE, dialect.delegatable);
  EXPECT_TRUE(dialect.declaresCharset);
}

TEST_F(DialectFile, ThatWasWrittenIsReadAsTheSameDialect) {
  for (const std::string &name : GetDialectNames()) {
    const std::string text = WriteDialect(GetServiceDialect(name));
    EXPECT_EQ(text, WriteDialect(Read(text))) << name;
  }
}

TEST_F(DialectFile, IsWrittenWithEverySwitchInOneForm) {
  ServiceDialect dialect;
  dialect.appliesTo = "urn:gr\xC3\xBCn";
  dialect.credentialFaults = {{"urn:a", "No"}};
  EXPECT_EQ(R"({
  "charset": "none",
  "applies-to": "urn:gr\u00fcn",
  "addressing": false,
  "delegatable": "always",
  "renewing": "always",
  "use-key": "reference",
  "delegation": "delegate-to",
  "token-type": "urn:oasis:names:tc:SAML:2.0:assertion",
  "token-type-reference": "established",
  "credential-faults": [
    {
      "namespace": "urn:a",
      "name": "No"
    }
  ],
  "any-response": false
}
)",
            WriteDialect(dialect));
}

TEST_F(DialectFile, MayHaveExactlyTheLargestSize) {
  const std::string text = R"({"charset": "utf-8"})";
  EXPECT_TRUE(Read(text + std::string(MAX_DIALECT_BYTES - text.size(), ' ')).declaresCharset);
}

struct Refusal {
  const char *name;
  std::string text;
  std::string reason;
};

#define KEYS                                                                                                           \
  "charset, applies-to, addressing, delegatable, renewing, use-key, delegation, token-type, token-type-reference, "    \
  "credential-faults, any-response"

const Refusal REFUSALS[] = {
    {"Empty", "", "is not JSON at line 1, column 1"},
    {"Cut", "{\n  \"charset\": \"utf-8\",\n", "is not JSON at line 3, column 1"},
    {"TextAfterTheObject", "{}\n x", "is not JSON at line 2, column 2"},
    {"Comment", "{} // no", "is not JSON at line 1, column 4"},
    {"NotUtf8", "{\"applies-to\": \"urn:\xFC\"}", "is not UTF-8"},
    {"NotUtf8OutsideATextAndAfterIt", "{} \xFF", "is not UTF-8"},
    {"TooLarge", "{}" + std::string(MAX_DIALECT_BYTES - 1, ' '), "is larger than 65536 bytes"},
    {"Array", "[]", "must be a JSON object, and is an array"},
    {"Text", "\"cxf\"", "must be a JSON object, and is \"cxf\""},
    {"NumberOutOfRange", R"({"charset": 1e999})", "has a number that is out of range"},
    {"UnknownKey", R"({"encoding": "utf-8"})", "unknown key \"encoding\"; the keys are base, " KEYS},
    {"KeyInCapitals", R"({"Charset": "utf-8"})", "unknown key \"Charset\"; the keys are base, " KEYS},
    {"KeyTwice", R"({"charset": "utf-8", "charset": "utf-8"})", "the key \"charset\" occurs twice"},
    {"BaseTwice", R"({"base": "cxf", "base": "default"})", "the key \"base\" occurs twice"},
    {"KeyTwiceInAFault", R"({"credential-faults": [{"name": "No", "namespace": "urn:a", "name": "Yes"}]})",
     "the key \"name\" occurs twice"},
    {"KeyTwiceByAnEscape", R"({"charset": "utf-8", "\u0063harset": "none"})", "the key \"charset\" occurs twice"},
    {"UnknownBase", R"({"base": "cfx"})", "base: must be one of default, cxf, and is \"cfx\""},
    {"BaseThatIsNotAText", R"({"base": null})", "base: must be one of default, cxf, and is null"},
    {"UnknownCharset", R"({"charset": "latin-1"})", "charset: must be none or utf-8, and is \"latin-1\""},
    {"CharsetThatIsNotAText", R"({"charset": true})", "charset: must be none or utf-8, and is true"},
    {"CharsetThatIsAnObject", R"({"charset": {"a": 1}})", "charset: must be none or utf-8, and is an object"},
    {"AddressThatIsNotAText", R"({"applies-to": null})", "applies-to: must be a URI or none, and is null"},
    {"EmptyTokenType", R"({"token-type": ""})", "token-type: must be a URI, and is \"\""},
    {"BooleanAsText", R"({"addressing": "true"})", "addressing: must be true or false, and is \"true\""},
    {"BooleanAsNumber", R"({"any-response": 1})", "any-response: must be true or false, and is 1"},
    {"UnknownStatement", R"({"delegatable": "sometimes"})",
     "delegatable: must be always, when-true or never, and is \"sometimes\""},
    {"StatementAsBoolean", R"({"renewing": false})", "renewing: must be always, when-true or never, and is false"},
    {"UnknownUseKey", R"({"use-key": "sig"})", "use-key: must be reference, certificate or never, and is \"sig\""},
    {"UnknownDelegation", R"({"delegation": "none"})",
     "delegation: must be delegate-to, on-behalf-of or act-as, and is \"none\""},
    {"UnknownReference", R"({"token-type-reference": "lenient"})",
     "token-type-reference: must be established or standard, and is \"lenient\""},
    {"FaultsAsText", R"({"credential-faults": "{urn:a}No"})",
     "credential-faults: must be an array, and is \"{urn:a}No\""},
    {"FaultAsText", R"({"credential-faults": ["{urn:a}No"]})",
     "credential-faults: each element: must be an object with the texts \"namespace\" and \"name\", and is "
     "\"{urn:a}No\""},
    {"FaultWithoutName", R"({"credential-faults": [{"namespace": "urn:a"}]})",
     "credential-faults: each element: must have the texts \"namespace\" and \"name\""},
    {"FaultWithAnotherKey", R"({"credential-faults": [{"namespace": "urn:a", "name": "No", "code": "1"}]})",
     "credential-faults: unknown key \"code\"; the keys are namespace and name"},
    {"FaultNameThatIsNotAText", R"({"credential-faults": [{"namespace": "urn:a", "name": ["No"]}]})",
     "credential-faults: name: must be a text, and is an array"},
    {"AddressThatIsNotAUri", R"({"applies-to": "mail"})",
     "Invalid argument : ServiceDialect::appliesTo is not an absolute URI: \"mail\""},
    {"UnknownKeyWithControlCharacters", R"({"\u001b[31m\u0000red": 1})",
     "unknown key \"\\u001b[31m\\u0000red\"; the keys are base, " KEYS},
    {"LongText", R"({"charset": ")" + std::string(60000, 'k') + "\"}",
     "charset: must be none or utf-8, and is " + Tarvel::StringUtil::Shorten('"' + std::string(60000, 'k') + '"')},
    {"LongKey", R"({")" + std::string(60000, 'k') + "\": 1}",
     "unknown key " + Tarvel::StringUtil::Shorten('"' + std::string(60000, 'k') + '"') + "; the keys are base, " KEYS},
    {"DeepNesting", R"({"charset": )" + std::string(30000, '[') + std::string(30000, ']') + "}",
     "charset: must be none or utf-8, and is an array"},
};

class RefusedDialectFile : public testing::TestWithParam<Refusal> {};

TEST_P(RefusedDialectFile, IsRefusedWithItsNameAndTheReason) {
  const Testing::WorkFolder folder;
  const std::string path = folder.Write("a.json", GetParam().text);
  EXPECT_THROWS_MESSAGE(ReadDialectFile(path), Tarvel::IOException, path + ": " + GetParam().reason);
}

INSTANTIATE_TEST_SUITE_P(Of, RefusedDialectFile, testing::ValuesIn(REFUSALS),
                         [](const auto &refusal) { return std::string(refusal.param.name); });

TEST_F(DialectFile, ThatDoesNotExistIsRefused) {
  const std::string path = m_folder / "missing.json";
  EXPECT_THROWS_MESSAGE(ReadDialectFile(path), Tarvel::IOException, path + ": No such file or directory");
}

TEST_F(DialectFile, ThatIsNotARegularFileIsRefusedWithoutReadingIt) {
  const std::string pipe = m_folder / "pipe";
  ASSERT_EQ(0, mkfifo(pipe.c_str(), 0600)); // opening it in the ordinary way waits for a writer
  for (const std::string &path : {pipe, m_folder.Path(), std::string("/dev/zero")}) {
    EXPECT_THROWS_MESSAGE(ReadDialectFile(path), Tarvel::IOException, path + ": is not a regular file");
  }
}

TEST(DialectSwitches, ReadTheFaultsOfACommandLine) {
  const DialectSwitch &faults = *FindDialectSwitch("credential-faults");
  ServiceDialect dialect;
  EXPECT_EQ("none", faults.get(dialect));
  ASSERT_TRUE(faults.set(dialect, "{urn:a}No {urn:{b}}Never"));
  ASSERT_EQ(2u, dialect.credentialFaults.size());
  EXPECT_EQ("urn:a", dialect.credentialFaults[0].namespaceUri);
  EXPECT_EQ("No", dialect.credentialFaults[0].localName);
  EXPECT_EQ("urn:{b}", dialect.credentialFaults[1].namespaceUri);
  EXPECT_EQ("Never", dialect.credentialFaults[1].localName);
  EXPECT_EQ("{urn:a}No {urn:{b}}Never", faults.get(dialect));
  for (const char *wrong : {"", "No", "{urn:a", "{urn:a}", "urn:a}No", "{urn:a}No ", " {urn:a}No",
                            "{urn:a}No  {urn:b}No", "{urn:a}No none", "None"}) {
    EXPECT_FALSE(faults.set(dialect, wrong)) << wrong;
    EXPECT_EQ(2u, dialect.credentialFaults.size()) << wrong;
  }
  ASSERT_TRUE(faults.set(dialect, "none"));
  EXPECT_TRUE(dialect.credentialFaults.empty());
}

TEST(DialectSwitches, AreFoundByTheirNamesOnly) {
  EXPECT_EQ("charset", FindDialectSwitch("charset")->name);
  EXPECT_EQ(nullptr, FindDialectSwitch("char"));
  EXPECT_EQ(nullptr, FindDialectSwitch(""));
  EXPECT_EQ(KEYS, DialectSwitchNames());
}

} // namespace
} // namespace SsoClient::Tool
