// SPDX-License-Identifier: Apache-2.0
// Values of 15 MiB in a document or in an argument: messages of the platform, lines of the log, and texts that contain
// these stay short. The library's own messages about a token contain the whole value.

#include "outcome.h"

#include <ssoclient/logger.h>
#include <tarvel/core/exception.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/crypto/private_key.h>
#include <tarvel/http/url.h>
#include <tarvel/io/file_reader.h>
#include <tarvel/service/app.h>
#include <tarvel/system/date_time.h>
#include <tarvel/xml/node.h>
#include <tarvel/xml/parser.h>
#include <tarvel/xml/security/canonicalizer.h>

#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

namespace Attacks {
namespace {

constexpr std::size_t LENGTH = 15u * 1024 * 1024;
constexpr std::size_t LONGEST_MESSAGE = 4 * 1024;
constexpr std::size_t LONGEST_LINE = 8 * 1024;

const std::string LONG(LENGTH, 'x');

const std::string CUT = std::string(1024, 'x') + "... (15727616 more bytes)";

std::string MessageFor(const std::string &from, const std::string &to) {
  return TryToken(Replaced(ReadToken("bearer"), from, to)).text;
}

const std::string LONG_NAME(Tarvel::Xml::MAX_NAME_BYTES, 'x');

const std::string CUT_NAME = std::string(1024, 'x') + "... (3072 more bytes)";

TEST(LongValues, OfASignatureAreCutInItsRefusal) {
  const std::string prefix = "Signature verification error. ";
  const std::string exclusive = "http://www.w3.org/2001/10/xml-exc-c14n#";
  EXPECT_EQ(prefix + "The signature algorithm \"" + CUT + "\" is not accepted",
            MessageFor("http://www.w3.org/2001/04/xmldsig-more#rsa-sha256", LONG));
  EXPECT_EQ(prefix + "The digest algorithm \"" + CUT + "\" is not accepted",
            MessageFor("http://www.w3.org/2001/04/xmlenc#sha256", LONG));
  EXPECT_EQ(prefix + "The canonicalization algorithm \"" + CUT + "\" is not accepted", MessageFor(exclusive, LONG));
  EXPECT_EQ(prefix + "The transform algorithm \"" + CUT + "\" is not accepted",
            MessageFor("http://www.w3.org/2000/09/xmldsig#enveloped-signature", LONG));
  EXPECT_EQ(prefix + "A reference of the type \"" + CUT + "\" is not accepted",
            MessageFor("<ds:Reference ", "<ds:Reference Type=\"" + LONG + "\" "));
  EXPECT_EQ(prefix + "The parameter \"" + CUT_NAME + "\" of the algorithm \"" + exclusive + "\" is not accepted",
            MessageFor("<ds:Transform Algorithm=\"" + exclusive + "\"/>",
                       "<ds:Transform Algorithm=\"" + exclusive + "\"><" + LONG_NAME + "/></ds:Transform>"));
}

TEST(LongValues, OfASignatureAreCutInASyntaxError) {
  EXPECT_EQ("Signature syntax error: Unexpected attribute \"" + CUT_NAME +
                "\" of \"ds:SignedInfo\" at line 2, column 315",
            MessageFor("<ds:SignedInfo>", "<ds:SignedInfo " + LONG_NAME + "=\"\">"));
}

TEST(LongValues, OfAReferenceAreCutInItsRefusal) {
  const std::string xml = ReadToken("bearer");
  const std::size_t begin = xml.find("URI=\"") + 5;
  const std::string uri = xml.substr(begin, xml.find('"', begin) - begin);
  // The reference to the assertion stays; another one is added.
  const std::size_t reference = xml.find("<ds:Reference ");
  const std::string second = xml.substr(reference, xml.find("</ds:SignedInfo>") - reference);
  EXPECT_EQ("Signature verification error. The reference URI \"" + CUT +
                "\" is not accepted: it points outside the document",
            MessageFor("</ds:SignedInfo>", Replaced(second, uri, LONG) + "</ds:SignedInfo>"));
}

TEST(LongValues, OfANameAreCutInAMessageOfTheParser) {
  for (const std::string &xml : {"<a>&" + LONG + ";</a>", "<a></" + LONG_NAME + ">", "<" + LONG_NAME + "></a>",
                                 "<a " + LONG_NAME + "='' " + LONG_NAME + "=''/>", "<?xml version='" + LONG + "'?><a/>",
                                 "<?xml version='1.0' encoding='" + LONG + "'?><a/>", "<a xmlns:b='" + LONG + " '/>"}) {
    const Outcome outcome = TryToken(xml);
    EXPECT_EQ("XMLParseException", outcome.exceptionClass) << xml.substr(0, 40);
    EXPECT_LT(outcome.text.size(), LONGEST_MESSAGE) << xml.substr(0, 40);
  }
}

struct Refused {
  const char *name;
  std::function<void()> refuse;
};

TEST(LongValues, OfArgumentsAreCutInThePlatformsMessages) {
  bool isSecure = false;
  std::string host;
  int port = 0;
  std::string path;
  Tarvel::Ref<Tarvel::Xml::ElementNode> element;
  const std::vector<Refused> refusals{
      {"URL", [&] { Tarvel::Http::ParseHttpURL("https://" + LONG + "/", isSecure, host, port, path); }},
      {"URL with another scheme", [&] { Tarvel::Http::ParseHttpURL(LONG + "://", isSecure, host, port, path); }},
      {"certificate file", [] { Tarvel::Crypto::LoadCertificates(LONG); }},
      {"key file", [] { Tarvel::Crypto::LoadPrivateKey(LONG, {}); }},
      {"date", [] { Tarvel::System::DateTime date(LONG); }},
      {"element name", [&] { Tarvel::Xml::CreateElementNode("", LONG + " ", element); }},
      {"canonicalizer", [] { Tarvel::Xml::Security::CreateCanonicalizer(LONG); }},
  };
  for (const Refused &refused : refusals) {
    try {
      refused.refuse();
      ADD_FAILURE() << refused.name << " was accepted";
    } catch (const Tarvel::Exception &exception) {
      const std::string message = exception.what();
      EXPECT_LT(message.size(), LONGEST_MESSAGE) << refused.name;
      EXPECT_NE(std::string::npos, message.find(" more bytes)")) << refused.name << ": " << message;
    }
  }
}

TEST(LongValues, AreWholeInTheLibrarysMessagesAboutAToken) {
  EXPECT_TRUE("Unknown subject confirmation method: '" + LONG + "'" ==
              MessageFor("urn:oasis:names:tc:SAML:2.0:cm:bearer", LONG));
}

TEST(LongValues, AreCutInALineOfTheLog) {
  std::vector<std::string> lines;
  const auto root = Tarvel::Service::GetApp().GetRootLogger();
  root->SetSink([&](const Tarvel::Service::LogRecord &record) { lines.emplace_back(record.message); });
  LogInternal(SsoClient::getLogger(), SsoClient::LOG_LEVEL_OPERATION, "Requested token for subject `%1'", LONG);
  LogInternal(SsoClient::getLogger(), SsoClient::LOG_LEVEL_OPERATION, "%1",
              MessageFor("urn:oasis:names:tc:SAML:2.0:cm:bearer", LONG));
  root->SetSink({});
  ASSERT_EQ(2u, lines.size());
  EXPECT_EQ("Requested token for subject `xxx", lines[0].substr(0, 32));
  for (const std::string &line : lines) {
    EXPECT_LT(line.size(), LONGEST_LINE);
    EXPECT_EQ(" more bytes)", line.substr(line.size() - 12));
  }
}

} // namespace
} // namespace Attacks
